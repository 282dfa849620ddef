#include "frame/ParallelFor.h"

#include "support/Threads.h"

#include <OrvanCppOpSDK/Job.h>
#include <TessaraMathSupport/ExceptionMessage.h>
#include <gtest/gtest.h>

#include <atomic>
#include <new>
#include <vector>

using namespace Modeling;
using Range = tbb::blocked_range<std::size_t>;

namespace {

/// Cancels the job for as long as it lives.
struct CancelledJob {
    CancelledJob() { Orvan::setJobCancelled(true); }
    ~CancelledJob() { Orvan::setJobCancelled(false); }
};

auto const doNothing = [](Range const&) {};

}

TEST(ParallelFor, staysOnTheCallingThreadUpToItsGrain)
{
    auto const callsFor = [](std::size_t size) {
        std::atomic<int> calls = 0;
        parallelFor(Range(0, size, 1000), [&](Range const&) { ++calls; });
        return calls.load();
    };
    EXPECT_EQ(callsFor(0), 0);
    EXPECT_EQ(callsFor(1000), 1);
    EXPECT_GT(callsFor(1001), 1);
}

TEST(ParallelFor, looksAtCancellationOnlyWhenNotIsolatedAndLargerThanItsGrain)
{
    CancelledJob const cancelled;
    EXPECT_NO_THROW(parallelFor(Range(0, 1000, 1000), doNothing, false));
    EXPECT_NO_THROW(parallelFor(Range(0, 1001, 1000), doNothing, true));
    std::atomic<std::size_t> visited = 0;
    try {
        parallelFor(
            Range(0, 1001, 1000), [&](Range const& range) { visited += range.size(); }, false);
        ADD_FAILURE() << "no exception";
    } catch (std::runtime_error const& error) {
        EXPECT_STREQ(error.what(), "job cancelled");
    }
    EXPECT_EQ(visited, 1001u) << "the loop itself runs to its end";
}

TEST(ParallelFor, isOutOfReachOfACancelledGroupWhenIsolated)
{
    std::atomic<std::size_t> visited = 0;
    std::atomic<bool> hasRun = false;
    tbb::task_group group;
    group.run_and_wait([&] {
        group.cancel();
        parallelFor(Range(0, 5000, 1), [&](Range const& range) { visited += range.size(); });
        runIsolated([&] { hasRun = true; });
    });
    EXPECT_EQ(visited, 5000u);
    EXPECT_TRUE(hasRun);
}

TEST(ParallelFor, carriesExceptionsToTheCaller)
{
    auto const fails = [](Range const& range) {
        if (range.begin() <= 700 && 700 < range.end())
            throw std::bad_alloc();
    };
    EXPECT_THROW(parallelFor(Range(0, 2000, 1), fails), std::bad_alloc);
    EXPECT_THROW(parallelFor(Range(0, 1000, 1000), fails), std::bad_alloc);
}
