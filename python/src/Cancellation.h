#pragma once

#include <pybind11/pybind11.h>

#include <functional>
#include <optional>
#include <type_traits>
#include <utility>

#include <unistd.h>

namespace ModelingPython {

namespace py = pybind11;

/// Gives the interpreter lock back during its lifetime. A daemon thread that is still at work when the interpreter ends never
/// gets it again: Python would end that thread by unwinding its stack, which does not pass through C++; it waits instead.
class Unlocked {
public:
    Unlocked() = default;
    Unlocked(Unlocked const&) = delete;
    Unlocked& operator=(Unlocked const&) = delete;
    ~Unlocked()
    {
        try {
            PyEval_RestoreThread(state_);
        } catch (...) { // nothing but that unwinding
            for (;;)
                ::pause();
        }
    }

private:
    PyThreadState* state_ = PyEval_SaveThread();
};

/// Runs `work` without the interpreter lock, so that other Python threads continue. It must not use Python objects.
template <class Work> auto withoutLock(Work const& work)
{
    Unlocked const unlocked;
    return work();
}

namespace Internal {
    void runCancellable(std::function<void()> const& work, bool isBrief);
}

/// Does the same for work that checks whether the job is cancelled. On the main thread, Ctrl-C cancels it, and the
/// exception that the Python handler of SIGINT raises is thrown. If the handler raises none, or if the job of another
/// thread was meant, the work starts again: so it must not have side effects if it is cancelled.
/// \param isBrief  the work takes milliseconds: Ctrl-C waits for its end, which saves hooking the signal
template <class Work> auto runCancellable(Work const& work, bool isBrief = false)
{
    using Result = std::invoke_result_t<Work>;
    std::optional<Result> result;
    Internal::runCancellable(
        [&] {
            result.reset();
            result.emplace(work());
        },
        isBrief);
    return std::move(*result);
}

/// Ends a loop that the library does not cancel.
/// \throws  what `runCancellable` takes for a cancellation, if the job of this thread is cancelled
void stopIfCancelled();

/// Whether this thread runs cancellable work.
bool isCancellable() noexcept;

}
