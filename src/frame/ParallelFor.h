#pragma once

#include "grains.h"

#include <tbb/blocked_range.h>
#include <tbb/task_group.h>

#include <atomic>
#include <cstddef>

namespace Modeling {

namespace Internal {

    /// A type-erased loop body, so that the oneTBB loop is compiled once, not once per body and element type.
    struct LoopBody {
        void const* body;
        void (*run)(void const* body, std::size_t begin, std::size_t end);

        template <class Index, class Body> static LoopBody of(Body const& body)
        {
            return {&body, [](void const* erased, std::size_t begin, std::size_t end) {
                        (*static_cast<Body const*>(erased))(
                            tbb::blocked_range<Index>(static_cast<Index>(begin), static_cast<Index>(end)));
                    }};
        }
    };

    void runLoop(tbb::blocked_range<std::size_t> const& range, LoopBody const& body, bool isolated);

    void throwIfJobIsCancelled();

}

/// Runs `body` over sub-ranges of `range`, on the caller's thread and oneTBB's workers. All loops go through here.
///
/// If the range is not larger than its grain, `body` is called once on the calling thread, without a task or a check
/// for cancellation; for an empty range it is not called. `body` must walk its sub-range in ascending order and write
/// only what belongs to these elements. All threads share it; it is not copied.
///
/// \param isolated  True: a cancellation of an enclosing oneTBB group does not reach the loop. False: it does, and the
///                  job's cancellation is checked after the loop. Only subdivision passes false, where it balances
///                  marks; all other operations run to completion once started.
/// \throws          std::runtime_error with the text of `TSR::exceptionMessage` if not isolated and the job is
///                  cancelled. The first exception of `body`, which cancels sub-ranges that have not started.
///                  std::bad_alloc if oneTBB can allocate no tasks or start no worker thread after part of the range
///                  has run; if nothing has run yet, the whole range runs on the calling thread instead.
template <class Index, class Body>
void parallelFor(tbb::blocked_range<Index> const& range, Body const& body, bool isolated = true)
{
    if (range.size() <= range.grainsize()) {
        if (!range.empty())
            body(range);
        return;
    }
    Internal::runLoop({range.begin(), range.end(), range.grainsize()}, Internal::LoopBody::of<Index>(body), isolated);
    if (!isolated)
        Internal::throwIfJobIsCancelled();
}

/// Runs tasks concurrently and waits for all of them, even if one throws. Throws like `parallelFor`.
/// \return false if some were skipped, which oneTBB does silently if an enclosing task group is cancelled
template <class... Task> [[nodiscard]] bool runTasks(Task const&... tasks)
{
    std::atomic<std::size_t> runCount = 0;
    auto const runOne = [&](std::size_t number) {
        std::size_t next = 0;
        ((next++ == number ? tasks() : void()), ...);
        runCount.fetch_add(1, std::memory_order_relaxed);
    };
    auto const runSome = [&](tbb::blocked_range<std::size_t> const& numbers) {
        for (std::size_t number = numbers.begin(); number != numbers.end(); ++number)
            runOne(number);
    };
    Internal::runLoop({0, sizeof...(Task), 1}, Internal::LoopBody::of<std::size_t>(runSome), false);
    return runCount.load(std::memory_order_relaxed) == sizeof...(Task);
}

/// Runs a scan or reduction of oneTBB isolated from the cancellation of enclosing task groups, in which case oneTBB
/// would skip it silently.
/// \param work  Calls the oneTBB algorithm. Its loop bodies must not throw.
/// \return false if oneTBB could allocate no tasks or start no worker thread; part of the work may have been done. If
///         oneTBB runs out of memory between two tasks of one scan, it may terminate the process.
template <class Work> [[nodiscard]] bool runIsolated(Work const& work)
{
    tbb::task_group_context context(tbb::task_group_context::isolated);
    tbb::task_group group(context);
    bool isDone = false;
    group.run_and_wait([&] {
        try {
            work();
            isDone = true;
        } catch (...) { // thrown by oneTBB, which would allocate once more to pass it through the group
        }
    });
    return isDone;
}

}
