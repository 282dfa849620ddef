#pragma once

#include <cstddef>
#include <cstdint>

namespace ModelingProgram {

/// Copies `count` pieces of a fixed number of bytes each, that are `fromStride` and `toStride` bytes apart.
void copyStrided(
    void const* from, std::size_t fromStride, std::size_t bytes, void* to, std::size_t toStride, std::uint64_t count);

}
