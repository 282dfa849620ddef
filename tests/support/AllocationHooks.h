#pragma once

#include <cstddef>

namespace TestSupport {

// AllocationHooks.cpp replaces all forms of `operator new` and `operator delete` by these two, which the program defines.

/// Throws std::bad_alloc instead of returning null.
void* allocateBlock(std::size_t bytes, std::size_t alignment);
void freeBlock(void* block) noexcept;

/// The system's allocation, to be released by `std::free`; null if there is no memory.
void* systemBlock(std::size_t bytes, std::size_t alignment) noexcept;

}
