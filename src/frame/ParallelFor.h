#pragma once

#include <tbb/blocked_range.h>
#include <tbb/task_group.h>

#include <atomic>
#include <cstddef>

namespace Modeling {

// Grain sizes: how many elements a loop runs through before it is worth a task of its own.
inline constexpr std::size_t kElementGrain = 1000; // a small fixed amount of work: copy, fill, transfer a value
inline constexpr std::size_t kScatterGrain = 100; // scattering index lists into flag arrays
inline constexpr unsigned int kFaceGrain = 1; // a whole face, point neighbourhood or property: large or uneven work

namespace Internal {

    /// What a loop does, without its type: so the loop itself is compiled once, and not again for each body and each
    /// element type in it.
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
/// A range not larger than its grain is one call of `body` on the calling thread: no task, no look at cancellation; an
/// empty one is none. `body` walks its sub-range upwards and writes only what belongs to the elements at hand. All
/// threads share it: it is not copied.
///
/// \param isolated  True: a cancellation of an enclosing oneTBB group does not reach the loop. False: it does, and
///                  after the loop the job's cancellation is looked at. Only the balance sweep of subdivision does
///                  that; all other operations run to their end once started.
/// \throws          std::runtime_error with the text of `TSR::exceptionMessage` when not isolated and the job is
///                  cancelled; the first exception of `body`, which ends the other sub-ranges as soon as they return.
///                  If oneTBB can allocate no tasks or start no worker thread, the whole range runs on the calling
///                  thread; std::bad_alloc if by then part of the range has run.
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

/// Runs tasks concurrently and waits for all of them, even if one throws. Failures are those of `parallelFor`.
/// \return false if some were skipped, which oneTBB does silently if an enclosing task group is cancelled
template <class... Task> [[nodiscard]] bool runTasks(Task const&... tasks)
{
    std::atomic<std::size_t> runCount = 0;
    auto const runOne = [&](std::size_t wanted) {
        std::size_t place = 0;
        ((place++ == wanted ? tasks() : void()), ...);
        runCount.fetch_add(1, std::memory_order_relaxed);
    };
    auto const runSome = [&](tbb::blocked_range<std::size_t> const& places) {
        for (std::size_t place = places.begin(); place != places.end(); ++place)
            runOne(place);
    };
    Internal::runLoop({0, sizeof...(Task), 1}, Internal::LoopBody::of<std::size_t>(runSome), false);
    return runCount.load(std::memory_order_relaxed) == sizeof...(Task);
}

/// Runs a scan or reduction of oneTBB out of reach of a cancellation of an enclosing task group, which would make
/// oneTBB skip it silently.
/// \param work  Its loop bodies do not throw.
/// \return false if oneTBB could allocate no tasks or start no worker thread; part of the work is done then. If oneTBB
///         runs out of memory between two tasks of one scan, it may end the process.
template <class Work> [[nodiscard]] bool runIsolated(Work const& work)
{
    tbb::task_group_context context(tbb::task_group_context::isolated);
    tbb::task_group group(context);
    bool isDone = false;
    group.run_and_wait([&] {
        try {
            work();
            isDone = true;
        } catch (...) { // of oneTBB; if it passed through the group, oneTBB would allocate for it once more
        }
    });
    return isDone;
}

}
