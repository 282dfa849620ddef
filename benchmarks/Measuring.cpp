#include "Measuring.h"

#include <cstring>

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

}
