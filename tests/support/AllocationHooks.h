#pragma once

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <functional>

namespace TestSupport {

// Programs that link AllocationHooks.cpp allocate through a replaced `operator new`.

/// Bytes that work allocates: the most at one time, and what is left when it ends.
struct Memory {
    std::int64_t peak, kept;
};
Memory memoryOf(std::function<void()> const& work);

/// Asked before each allocation if it is set; the allocation fails if it returns false.
inline std::atomic<bool (*)()> mayAllocate = nullptr;
/// Called with each new block if it is set.
inline std::atomic<void (*)(void* block, std::size_t bytes)> onAllocated = nullptr;

/// The system's allocation, to be released by `std::free`; null if there is no memory.
void* systemBlock(std::size_t bytes, std::size_t alignment) noexcept;

}
