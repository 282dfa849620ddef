#include "Measuring.h"

#include "support/AllocationHooks.h"

#include <atomic>
#include <cmath>
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

Row::Row(std::string const& name, Sizes const& sizes, std::function<void(State&)> const& run)
{
    auto* const row = benchmark::RegisterBenchmark(name.c_str(), run);
    for (auto const& arguments : sizes)
        row->Args(arguments);
    row->UseRealTime();
}

CopyRow::CopyRow(std::string const& name, Sizes const& sizes, std::function<Input(State const&)> const& inputOf)
    : Row(name + ":memcpy", sizes, [=](State& state) {
        auto const [bytes, elements] = inputOf(state);
        Orvan::Array<unsigned char> const source(bytes);
        for (auto _ : state) {
            Orvan::Array<unsigned char> target(bytes, Orvan::kUninitialized);
            std::memcpy(target.data, source.data, bytes);
            benchmark::DoNotOptimize(target.data);
            benchmark::ClobberMemory();
        }
        state.SetBytesProcessed(static_cast<std::int64_t>(state.iterations()) * static_cast<std::int64_t>(bytes));
        if (elements != 0)
            countElements(state, elements);
    })
{
}

MeshBuilder const& sphereOf(std::size_t faces)
{
    return madeOnce(faces, [](std::size_t count) { return MeshBuilder::sphereWithFaces(count); });
}

MeshBuilder const& shuffledSphereOf(std::size_t faces)
{
    return madeOnce(faces, [](std::size_t count) { return MeshBuilder::sphereWithFaces(count).shuffled(1); });
}

PolygonMesh bentQuads(std::size_t faces)
{
    auto const segments = static_cast<unsigned int>(std::sqrt(static_cast<double>(faces)));
    return PolygonMesh::quads(segments).withNoise(0.2f, 1);
}

void countElements(State& state, std::size_t elements)
{
    auto const all = static_cast<double>(state.iterations()) * static_cast<double>(elements);
    state.counters["time/element"] = benchmark::Counter(all, benchmark::Counter::kIsRate | benchmark::Counter::kInvert);
}

Memory memoryOf(std::function<void()> const& work)
{
    allocated = mostAllocated = 0;
    isCounting = true;
    work();
    isCounting = false;
    return {mostAllocated, allocated};
}

void countWorkingBytes(State& state, std::size_t elements, std::size_t resultBytes, std::function<void()> const& work)
{
    auto const bytes = static_cast<double>(memoryOf(work).peak) - static_cast<double>(resultBytes);
    state.counters["working bytes/element"] = bytes / static_cast<double>(elements);
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
