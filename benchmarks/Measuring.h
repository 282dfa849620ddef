#pragma once

#include "support/AllocationHooks.h"

#include <OrvanCore/Array.h>
#include <OrvanCore/CachedBlocks.h>
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

/// What work allocates; blocks that the allocator keeps are part of the peak only.
template <class Work> TestSupport::Memory memoryOf(Work const& work)
{
    Orvan::releaseCachedBlocks();
    return TestSupport::memoryOf([&] {
        work();
        Orvan::releaseCachedBlocks();
    });
}

/// The arguments of each run of a row; most rows have one, the number of elements.
using Sizes = std::vector<std::vector<std::int64_t>>;

/// A run of a row, or of a variant of it, for one of its sizes.
struct Run {
    benchmark::State& state;
    std::string const variant = {};

    std::size_t size(std::size_t argument = 0) const { return static_cast<std::size_t>(state.range(argument)); }
    void report(char const* counter, double value) const { state.counters[counter] = value; }
    void reportTimePerElement(std::size_t elements) const;
    void reportWorkingBytes(std::size_t elements, std::int64_t bytes) const
    {
        report("working bytes/element", static_cast<double>(bytes) / static_cast<double>(elements));
    }
    /// A number that all contenders of a row must get, but for rounding: the first run of each process is compared.
    void reportResult(double value) const { report("result", value); }
    /// The same if contenders use different methods: the numbers must differ by less than a fifth.
    void reportSimilarResult(double value) const { report("similar result", value); }
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

/// How much more memory is resident at the peak than when this is started, in the first run of a process; later runs leave it
/// alone, because starting returns free memory to the system.
class PeakMemory {
public:
    void start();
    void report(Run const& run, std::size_t elements) const;

private:
    bool isStarted_ = false;
    std::int64_t before_ = 0;
};

/// How many threads work while it is started: processor time of the process over wall time. If it is started several times,
/// the median counts: in single runs all threads of a virtual machine wait for memory or processors of its host.
class BusyThreads {
public:
    void start();
    void stop();
    void report(Run const& run) const;

private:
    double processorSeconds_ = 0, wallSeconds_ = 0; // of the clocks at the start
    std::vector<double> counts_;
};

/// Times `work()`, and reports the wall time per element as all of these do. The number of elements may be known only then.
template <class Work> void timeRuns(Run& run, std::size_t const& elements, Work const& work)
{
    bool const areFew = run.state.max_iterations < 1000; // else they are short, and reading clocks for each would show
    PeakMemory peak;
    BusyThreads busy;
    peak.start();
    busy.start();
    for (auto _ : run.state) {
        work();
        benchmark::ClobberMemory();
        if (areFew) {
            busy.stop();
            busy.start();
        }
    }
    if (!areFew)
        busy.stop();
    peak.report(run, elements);
    busy.report(run);
    run.reportTimePerElement(elements);
}

/// Times `work(made)`. Making and releasing what it works on is not timed.
template <class Make, class Work> void timeOnEach(Run& run, std::size_t elements, Make const& make, Work const& work)
{
    PeakMemory peak;
    BusyThreads busy;
    for (auto _ : run.state) {
        run.state.PauseTiming();
        {
            auto made = make();
            peak.start();
            busy.start();
            run.state.ResumeTiming();
            work(made);
            benchmark::ClobberMemory();
            run.state.PauseTiming();
            busy.stop();
        }
        run.state.ResumeTiming();
    }
    peak.report(run, elements);
    busy.report(run);
    run.reportTimePerElement(elements);
}

/// Times `work(copy)` on copies of the source. Copies of an object share its arrays, as those of a host's document do.
template <class Source, class Work>
void timeOnCopies(Run& run, std::size_t elements, Source const& source, Work const& work)
{
    timeOnEach(
        run, elements, [&] { return source; }, work);
}

/// Times `edit(copy)` on copies of the source, and reports what it allocates beyond what the result keeps. Returns one result.
template <class Edit> Object measureEdit(Run& run, std::size_t elements, Object const& source, Edit const& edit)
{
    timeOnCopies(run, elements, source, edit);
    Object object = source;
    auto const memory = memoryOf([&] { edit(object); });
    run.reportWorkingBytes(elements, memory.peak - memory.kept);
    return object;
}

/// Times `refine()`, which makes a mesh from arrays or shared ones and returns its number of faces: these are the elements.
template <class Refine> void measureRefinement(Run& run, Refine const& refine)
{
    std::size_t faces = 0;
    auto const work = [&] { faces = refine(); };
    timeRuns(run, faces, work);
    run.reportWorkingBytes(faces, memoryOf(work).peak);
    run.reportSimilarResult(static_cast<double>(faces));
}

}
