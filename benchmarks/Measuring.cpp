#include "Measuring.h"

#include "support/AllocationHooks.h"

#include <atomic>
#include <cstdlib>
#include <cstring>
#include <new>

#include <malloc.h>

namespace {

std::atomic<bool> isCounting = false; // off while time is measured
std::atomic<std::int64_t> allocated = 0;
std::atomic<std::int64_t> mostAllocated = 0;

}

namespace Benchmarks {

Row::Row(std::string const& name, Sizes const& sizes, std::vector<std::string> const& variants, Measure const& measure)
{
    for (std::string const& variant : variants) {
        auto* const row = benchmark::RegisterBenchmark((name + variant).c_str(), [=](benchmark::State& state) {
            Run run{state, variant};
            measure(run);
        });
        for (auto const& arguments : sizes)
            row->Args(arguments);
        row->UseRealTime();
    }
}

void Run::reportTimePerElement(std::size_t elements) const
{
    auto const all = static_cast<double>(state.iterations()) * static_cast<double>(elements);
    state.counters["time/element"] = benchmark::Counter(all, benchmark::Counter::kIsRate | benchmark::Counter::kInvert);
}

bool Run::copies(std::size_t bytes, std::size_t elements) const
{
    if (variant != ":memcpy")
        return false;
    Orvan::Array<unsigned char> const source(bytes);
    for (auto _ : state) {
        Orvan::Array<unsigned char> target(bytes, Orvan::kUninitialized); // by the allocator of the library's arrays
        std::memcpy(target.data, source.data, bytes);
        DoNotOptimize(target.data);
        benchmark::ClobberMemory();
    }
    state.SetBytesProcessed(static_cast<std::int64_t>(state.iterations()) * static_cast<std::int64_t>(bytes));
    if (elements != 0)
        reportTimePerElement(elements);
    return true;
}

Memory memoryOf(std::function<void()> const& work)
{
    allocated = mostAllocated = 0;
    isCounting = true;
    work();
    isCounting = false;
    return {static_cast<double>(mostAllocated), static_cast<double>(allocated)};
}

}

void* TestSupport::allocateBlock(std::size_t bytes, std::size_t alignment)
{
    void* const block = systemBlock(bytes, alignment);
    if (!block)
        throw std::bad_alloc();
    if (isCounting.load(std::memory_order_relaxed)) {
        auto const usable = static_cast<std::int64_t>(::malloc_usable_size(block));
        std::int64_t const now = allocated.fetch_add(usable) + usable;
        std::int64_t most = mostAllocated.load();
        while (now > most && !mostAllocated.compare_exchange_weak(most, now)) { }
    }
    return block;
}

void TestSupport::freeBlock(void* block) noexcept
{
    if (block && isCounting.load(std::memory_order_relaxed))
        allocated.fetch_sub(static_cast<std::int64_t>(::malloc_usable_size(block)));
    std::free(block);
}
