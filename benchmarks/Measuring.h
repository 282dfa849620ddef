#pragma once

#include <OrvanCore/Array.h>
#include <TessaraObject/Object.h>

#include <benchmark/benchmark.h>

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

// Row names tell the table how rows are related: "<name>/<size>" is compared with "<name>:memcpy/<size>", which copies the
// bytes of the same input into fresh memory on one thread, and with "<name>:<peer>/<size>".

namespace Benchmarks {

using benchmark::DoNotOptimize;
using Tessara::Object;

/// The arguments of each run of a row; most rows have one, the number of elements.
using Sizes = std::vector<std::vector<std::int64_t>>;

/// A run of a row, or of a variant of it, for one of its sizes.
struct Run {
    benchmark::State& state;
    std::string const variant = {};

    std::size_t size(std::size_t argument = 0) const { return static_cast<std::size_t>(state.range(argument)); }
    void report(char const* counter, double value) const { state.counters[counter] = value; }
    void reportTimePerElement(std::size_t elements) const;
    void reportWorkingBytes(std::size_t elements, double bytes) const
    {
        report("working bytes/element", bytes / static_cast<double>(elements));
    }
    /// False, unless this is the variant `:memcpy`: then copies that much, and reports no time per element if there are none.
    bool copies(std::size_t bytes, std::size_t elements = 0) const;
};

/// Registers a row that is measured in wall time, as "<name><variant>" for each of its variants.
struct Row {
    using Measure = std::function<void(Run&)>;
    Row(std::string const& name, Sizes const& sizes, std::vector<std::string> const& variants, Measure const& measure);
    Row(std::string const& name, Sizes const& sizes, Measure const& measure)
        : Row(name, sizes, {""}, measure)
    {
    }
};
inline std::vector<std::string> const kBesideCopy{"", ":memcpy"}; // `measure` returns if `run.copies()`

/// Bytes that work allocates through `operator new`: the most at one time, and what is left when it ends.
struct Memory {
    double peak, kept;
};
Memory memoryOf(std::function<void()> const& work);

/// Times `work()`, and reports the wall time per element as all of these do.
template <class Work> void timeRuns(Run& run, std::size_t elements, Work const& work)
{
    for (auto _ : run.state) {
        work();
        benchmark::ClobberMemory();
    }
    run.reportTimePerElement(elements);
}

/// Times `work(made)`. Making and releasing what it works on is not timed.
template <class Make, class Work> void timeOnEach(Run& run, std::size_t elements, Make const& make, Work const& work)
{
    for (auto _ : run.state) {
        run.state.PauseTiming();
        {
            auto made = make();
            run.state.ResumeTiming();
            work(made);
            benchmark::ClobberMemory();
            run.state.PauseTiming();
        }
        run.state.ResumeTiming();
    }
    run.reportTimePerElement(elements);
}

/// Times `work(copy)` on copies of the source. Copies of an object share its arrays, as those of a host's document do.
template <class Source, class Work>
void timeOnCopies(Run& run, std::size_t elements, Source const& source, Work const& work)
{
    timeOnEach(
        run, elements, [&] { return source; }, work);
}

/// Times `edit(copy)` on copies of the source, and reports what it allocates beyond the bytes of the result.
template <class Edit>
void measureEdit(Run& run, std::size_t elements, std::size_t resultBytes, Object const& source, Edit const& edit)
{
    timeOnCopies(run, elements, source, edit);
    Object object = source;
    double const bytes = memoryOf([&] { edit(object); }).peak - static_cast<double>(resultBytes);
    run.reportWorkingBytes(elements, bytes);
}

}
