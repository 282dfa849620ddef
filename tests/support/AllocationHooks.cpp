#include "AllocationHooks.h"

#include <algorithm>
#include <cstdlib>
#include <new>

namespace TestSupport {

void* systemBlock(std::size_t bytes, std::size_t alignment) noexcept
{
    std::size_t const whole = (std::max<std::size_t>(bytes, 1) + alignment - 1) / alignment * alignment;
    return alignment <= alignof(std::max_align_t) ? std::malloc(whole) : std::aligned_alloc(alignment, whole);
}

}

void* operator new(std::size_t bytes)
{
    return TestSupport::allocateBlock(bytes, alignof(std::max_align_t));
}

// Algorithms of the standard library allocate temporary buffers this way.
void* operator new(std::size_t bytes, std::nothrow_t const&) noexcept
{
    try {
        return operator new(bytes);
    } catch (std::bad_alloc const&) {
        return nullptr;
    }
}

void* operator new(std::size_t bytes, std::align_val_t alignment)
{
    return TestSupport::allocateBlock(bytes, static_cast<std::size_t>(alignment));
}

void operator delete(void* block) noexcept
{
    TestSupport::freeBlock(block);
}

void operator delete(void* block, std::size_t) noexcept
{
    TestSupport::freeBlock(block);
}

void operator delete(void* block, std::align_val_t) noexcept
{
    TestSupport::freeBlock(block);
}

void operator delete(void* block, std::size_t, std::align_val_t) noexcept
{
    TestSupport::freeBlock(block);
}
