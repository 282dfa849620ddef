#include "Measuring.h"

#include <algorithm>
#include <cstddef>
#include <cstring>
#include <fstream>
#include <string>
#include <utility>

#include <malloc.h>
#include <time.h>

namespace Benchmarks {

namespace {

    /// VmRSS or VmHWM, in bytes; 0 if the system does not tell.
    std::int64_t statusOfProcess(std::string const& name)
    {
        std::ifstream status("/proc/self/status");
        for (std::string line; std::getline(status, line);)
            if (line.starts_with(name))
                return 1024 * std::stoll(line.substr(name.size() + 1));
        return 0;
    }

    double secondsOf(clockid_t clock)
    {
        timespec now{};
        ::clock_gettime(clock, &now);
        return static_cast<double>(now.tv_sec) + 1e-9 * static_cast<double>(now.tv_nsec);
    }

}

void PeakMemory::start()
{
    static bool isFirst = true;
    if (!std::exchange(isFirst, false))
        return;
    isStarted_ = true;
    Orvan::releaseCachedBlocks();
    ::malloc_trim(0);
    std::ofstream("/proc/self/clear_refs") << 5; // sets VmHWM to VmRSS
    before_ = statusOfProcess("VmRSS");
}

void PeakMemory::report(Run const& run, std::size_t elements) const
{
    if (isStarted_ && before_ != 0)
        run.report("peak bytes/element",
            static_cast<double>(statusOfProcess("VmHWM") - before_) / static_cast<double>(elements));
}

void BusyThreads::start()
{
    processorSeconds_ = secondsOf(CLOCK_PROCESS_CPUTIME_ID);
    wallSeconds_ = secondsOf(CLOCK_MONOTONIC);
}

void BusyThreads::stop()
{
    double const processorSeconds = secondsOf(CLOCK_PROCESS_CPUTIME_ID) - processorSeconds_;
    counts_.push_back(processorSeconds / (secondsOf(CLOCK_MONOTONIC) - wallSeconds_));
}

void BusyThreads::report(Run const& run) const
{
    if (counts_.empty()) // the row was skipped
        return;
    auto counts = counts_;
    auto const middle = counts.begin() + static_cast<std::ptrdiff_t>(counts.size() / 2);
    std::nth_element(counts.begin(), middle, counts.end());
    run.report("busy threads", *middle);
}

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
    Orvan::Array<unsigned char> const source(bytes, static_cast<unsigned char>(1)); // resident, unlike zeros
    PeakMemory peak;
    peak.start();
    for (auto _ : state) {
        Orvan::Array<unsigned char> target(bytes, Orvan::kUninitialized); // by the allocator of the library's arrays
        std::memcpy(target.data, source.data, bytes);
        DoNotOptimize(target.data);
        benchmark::ClobberMemory();
    }
    state.SetBytesProcessed(static_cast<std::int64_t>(state.iterations()) * static_cast<std::int64_t>(bytes));
    if (elements != 0) {
        peak.report(*this, elements);
        reportTimePerElement(elements);
    }
    return true;
}

}
