#pragma once

#include <OrvanCore/Array.h>

#include <benchmark/benchmark.h>

#include <cstdint>
#include <cstring>
#include <functional>

// Names tell how the table relates its rows: "<name>/<size>" is compared with "<name>:memcpy/<size>", which copies the
// bytes of the same input into fresh memory on one thread, and with "<name>:<peer>/<size>".

namespace Benchmarks {

/// What `memcpy` takes for that many bytes into memory fresh from the same allocator as the library's arrays.
inline void copyBytes(benchmark::State& state, std::size_t bytes)
{
    Orvan::Array<unsigned char> const source(bytes);
    for (auto _ : state) {
        Orvan::Array<unsigned char> target(bytes, Orvan::kUninitialized);
        std::memcpy(target.data, source.data, bytes);
        benchmark::DoNotOptimize(target.data);
        benchmark::ClobberMemory();
    }
    state.SetBytesProcessed(static_cast<std::int64_t>(state.iterations()) * static_cast<std::int64_t>(bytes));
}

/// What the work takes through `operator new`, beyond what was taken before it: the most at one time, and what is still
/// taken when it is over.
struct Memory {
    std::int64_t peak;
    std::int64_t kept;
};
Memory memoryOf(std::function<void()> const& work);
inline std::int64_t peakBytesOf(std::function<void()> const& work)
{
    return memoryOf(work).peak;
}

/// Reports the wall time for each element.
inline void countElements(benchmark::State& state, std::size_t elements)
{
    auto const all = static_cast<double>(state.iterations()) * static_cast<double>(elements);
    state.counters["time/element"] = benchmark::Counter(all, benchmark::Counter::kIsRate | benchmark::Counter::kInvert);
}

}
