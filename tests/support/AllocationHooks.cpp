#include "AllocationHooks.h"

#include <algorithm>
#include <cstdlib>
#include <new>

#include <malloc.h>

namespace TestSupport {

namespace {

    std::atomic<bool> isCounting = false;
    std::atomic<std::int64_t> allocated = 0, mostAllocated = 0;

    void count(void* block)
    {
        auto const usable = static_cast<std::int64_t>(::malloc_usable_size(block));
        std::int64_t const now = allocated.fetch_add(usable) + usable;
        std::int64_t most = mostAllocated.load();
        while (now > most && !mostAllocated.compare_exchange_weak(most, now)) { }
    }

    void* allocateBlock(std::size_t bytes, std::size_t alignment)
    {
        auto const isAllowed = mayAllocate.load(std::memory_order_relaxed);
        void* const block = isAllowed && !isAllowed() ? nullptr : systemBlock(bytes, alignment);
        if (!block)
            throw std::bad_alloc();
        if (auto const visit = onAllocated.load(std::memory_order_relaxed))
            visit(block, bytes);
        if (isCounting.load(std::memory_order_relaxed))
            count(block);
        return block;
    }

    void freeBlock(void* block) noexcept
    {
        if (block && isCounting.load(std::memory_order_relaxed))
            allocated.fetch_sub(static_cast<std::int64_t>(::malloc_usable_size(block)));
        std::free(block);
    }

}

Memory memoryOf(std::function<void()> const& work)
{
    allocated = mostAllocated = 0;
    isCounting = true;
    work();
    isCounting = false;
    return {mostAllocated, allocated};
}

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

// The allocator of arrays asks this way. A sanitizer has one of its own, whose blocks `std::free` does not take.
void* operator new(std::size_t bytes, std::align_val_t alignment, std::nothrow_t const&) noexcept
{
    try {
        return operator new(bytes, alignment);
    } catch (std::bad_alloc const&) {
        return nullptr;
    }
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
