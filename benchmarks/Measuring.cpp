#include "Measuring.h"

#include <algorithm>
#include <atomic>
#include <cstdlib>
#include <new>

#include <malloc.h>

namespace Benchmarks {

namespace {

    std::atomic<bool> isCounting = false; // off while time is measured
    std::atomic<std::int64_t> taken = 0;
    std::atomic<std::int64_t> mostTaken = 0;

    void* take(void* block)
    {
        if (!block)
            throw std::bad_alloc();
        if (isCounting.load(std::memory_order_relaxed)) {
            auto const bytes = static_cast<std::int64_t>(::malloc_usable_size(block));
            std::int64_t const now = taken.fetch_add(bytes) + bytes;
            std::int64_t most = mostTaken.load();
            while (now > most && !mostTaken.compare_exchange_weak(most, now)) { }
        }
        return block;
    }

    void giveBack(void* block) noexcept
    {
        if (block && isCounting.load(std::memory_order_relaxed))
            taken.fetch_sub(static_cast<std::int64_t>(::malloc_usable_size(block)));
        std::free(block);
    }

}

Memory memoryOf(std::function<void()> const& work)
{
    taken = mostTaken = 0;
    isCounting = true;
    work();
    isCounting = false;
    return {mostTaken, taken};
}

}

void* operator new(std::size_t bytes)
{
    return Benchmarks::take(std::malloc(std::max<std::size_t>(bytes, 1)));
}

void* operator new(std::size_t bytes, std::align_val_t alignment)
{
    auto const multiple = static_cast<std::size_t>(alignment);
    return Benchmarks::take(std::aligned_alloc(multiple, (bytes + multiple - 1) / multiple * multiple));
}

void operator delete(void* block) noexcept
{
    Benchmarks::giveBack(block);
}

void operator delete(void* block, std::size_t) noexcept
{
    Benchmarks::giveBack(block);
}

void operator delete(void* block, std::align_val_t) noexcept
{
    Benchmarks::giveBack(block);
}

void operator delete(void* block, std::size_t, std::align_val_t) noexcept
{
    Benchmarks::giveBack(block);
}
