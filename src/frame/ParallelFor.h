#pragma once

#include <tbb/blocked_range.h>
#include <tbb/task_group.h>

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
    };

    void runLoop(tbb::blocked_range<std::size_t> const& range, LoopBody const& body, bool isolated);

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
///                  cancelled; and what `body` throws, which ends the other sub-ranges as soon as they return.
template <class Index, class Body>
void parallelFor(tbb::blocked_range<Index> const& range, Body const& body, bool isolated = true)
{
    if (range.size() <= range.grainsize()) {
        if (!range.empty())
            body(range);
        return;
    }
    auto const run = [](void const* erased, std::size_t begin, std::size_t end) {
        (*static_cast<Body const*>(erased))(
            tbb::blocked_range<Index>(static_cast<Index>(begin), static_cast<Index>(end)));
    };
    Internal::runLoop({range.begin(), range.end(), range.grainsize()}, {&body, run}, isolated);
}

/// Runs tasks side by side and waits for all of them, also where one fails or cannot be started. They are left out
/// where an enclosing oneTBB group has been cancelled: let each leave a mark that it was run.
template <class... Task> void runTasks(Task const&... tasks)
{
    tbb::task_group group;
    try {
        (group.run([&tasks] { tasks(); }), ...);
    } catch (...) {
        group.wait();
        throw;
    }
    group.wait();
}

/// Runs `work` out of reach of a cancellation of an enclosing oneTBB group: for scans and reductions, which oneTBB
/// would otherwise leave out silently.
template <class Work> void runIsolated(Work const& work)
{
    tbb::task_group_context context(tbb::task_group_context::isolated);
    tbb::task_group group(context);
    group.run_and_wait(work);
}

}
