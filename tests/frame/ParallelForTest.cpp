#include "frame/Arrays.h"

#include "support/FailingAllocations.h"
#include "support/Testing.h"

#include <OrvanCppOpSDK/Job.h>
#include <TessaraMathSupport/ExceptionMessage.h>
#include <gtest/gtest.h>

#include <atomic>
#include <cstdlib>
#include <new>
#include <optional>

using namespace Modeling;
using Range = tbb::blocked_range<std::size_t>;

namespace {

/// Cancels the job during its lifetime.
struct CancelledJob {
    CancelledJob() { Orvan::setJobCancelled(true); }
    ~CancelledJob() { Orvan::setJobCancelled(false); }
};

auto const doNothing = [](Range const&) {};

}

TEST(ParallelFor, StaysOnTheCallingThreadUpToItsGrain)
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

TEST(ParallelFor, ChecksForCancellationOnlyIfNotIsolatedAndLargerThanItsGrain)
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
    EXPECT_EQ(visited, 1001u) << "the loop itself is completed";
}

TEST(ParallelFor, IgnoresACancelledGroupWhenIsolated)
{
    std::atomic<std::size_t> visited = 0;
    std::atomic<bool> hasRun = false;
    tbb::task_group group;
    group.run_and_wait([&] {
        group.cancel();
        parallelFor(
            Range(0, 5000, 1), [](Range const&) { ADD_FAILURE() << "not isolated"; }, false);
        parallelFor(Range(0, 5000, 1), [&](Range const& range) { visited += range.size(); });
        EXPECT_TRUE(runIsolated([&] { hasRun = true; }));
    });
    EXPECT_EQ(visited, 5000u);
    EXPECT_TRUE(hasRun);
}

TEST(ParallelFor, RethrowsExceptionsEvenIfMemoryIsExhausted)
{
    std::optional<TestSupport::ExhaustedMemory> exhausted;
    auto const caught = [&](auto const& work) {
        bool isCaught = false;
        try {
            work([&] {
                exhausted.emplace();
                throw std::bad_alloc();
            });
        } catch (std::bad_alloc const&) {
            isCaught = true;
        }
        exhausted.reset();
        return isCaught;
    };
    auto const loopOf = [](std::size_t grain) {
        return [=](auto const& fail) {
            parallelFor(Range(0, 1000, grain), [&](Range const& range) {
                if (range.begin() <= 700 && 700 < range.end())
                    fail();
            });
        };
    };
    auto const tasks = [](auto const& fail) { EXPECT_TRUE(runTasks([] {}, fail, [] {})); };
    TestSupport::withThreads(1, [&] { // one thread keeps the memory of its tasks for the next loop
        loopOf(1)([] {});
        EXPECT_TRUE(caught(loopOf(1)));
        EXPECT_TRUE(caught(loopOf(1000)));
        EXPECT_TRUE(caught(tasks));
    });
    EXPECT_THROW(loopOf(1)([] { throw CancelledJob(); }), CancelledJob) << "with several threads";
}

TEST(ParallelFor, RunsOnTheCallingThreadIfNoOtherCanBeCreated)
{
    GTEST_FLAG_SET(death_test_style, "threadsafe"); // in a process that has no worker threads yet
    auto const runEverything = [] {
        TestSupport::NoNewThreads const none;
        std::size_t visited = 0;
        for (bool const isolated : {true, false})
            parallelFor(
                Range(0, 5000, 1), [&](Range const& range) { visited += range.size(); }, isolated);
        bool const isDone = runTasks([&] { ++visited; }, [&] { ++visited; });
        return isDone && visited == 10'002 && offsetsFromCounts(5000, [](std::size_t) { return 2u; })[5000] == 10'000;
    };
    EXPECT_EXIT(std::_Exit(TestSupport::withThreads(8, runEverything) ? 0 : 1), testing::ExitedWithCode(0), "");
}

TEST(RunTasks, ReportsThatSomeWereSkipped)
{
    std::atomic<int> runCount = 0;
    TestSupport::withThreads(1, [&] {
        tbb::task_group group;
        group.run_and_wait([&] {
            auto const task = [&] {
                ++runCount;
                group.cancel();
            };
            EXPECT_FALSE(runTasks(task, task, task));
        });
    });
    EXPECT_EQ(runCount, 1);
}
