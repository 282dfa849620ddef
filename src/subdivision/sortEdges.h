#pragma once

#include <cstddef>
#include <cstdint>

namespace Modeling::Internal {

/// Sorts the edges that end at one point. `sorted` may be the same array.
/// \return whether two have the same start
bool sortEdges(std::uint64_t const* edges, std::size_t count, std::uint64_t* sorted);

}
