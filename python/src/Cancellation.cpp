#include "Cancellation.h"

#include "files/Streams.h"
#include "shell/Failure.h"

#include <OrvanCppOpSDK/Job.h>

#include <atomic>
#include <chrono>
#include <csignal>
#include <thread>

#include <pthread.h>
#include <unistd.h>

namespace ModelingPython {

namespace {

    using ModelingProgram::ExitCode;
    using ModelingProgram::Failure;

    std::atomic<bool> wasInterrupted = false;
    struct sigaction pythonAction = {}; // while `CancelOnInterrupt` exists
    thread_local bool runsCancellable = false;

    /// Async-signal-safe, like the handler of Python, which only sets flags.
    void cancelJob(int signal, siginfo_t* information, void* context)
    {
        wasInterrupted = true;
        Orvan::setJobCancelled(true);
        if (pythonAction.sa_flags & SA_SIGINFO)
            pythonAction.sa_sigaction(signal, information, context);
        else if (pythonAction.sa_handler != SIG_IGN && pythonAction.sa_handler != SIG_DFL)
            pythonAction.sa_handler(signal);
    }

    void forgetInterrupt()
    {
        if (wasInterrupted.exchange(false))
            Orvan::setJobCancelled(false);
    }

    /// Whether Python runs handlers of signals on this thread. A thread that forks becomes the main thread of the child.
    bool isMainThread()
    {
        static thread_local int known = -1;
        static bool const isWatched = ::pthread_atfork(nullptr, nullptr, [] { known = 1; }) == 0;
        if (known < 0 || !isWatched)
            known = ::gettid() == ::getpid();
        return known != 0;
    }

    /// During its lifetime, SIGINT cancels the job, and then does what it did before. Only the main thread makes one.
    class CancelOnInterrupt {
    public:
        CancelOnInterrupt()
        {
            forgetInterrupt(); // one that arrived on another thread when the last operation had just ended
            struct sigaction action = {};
            action.sa_sigaction = cancelJob;
            action.sa_flags = SA_SIGINFO | SA_RESTART | SA_ONSTACK;
            sigemptyset(&action.sa_mask);
            isHooked_ = ::sigaction(SIGINT, &action, &pythonAction) == 0;
            if (isHooked_ && (pythonAction.sa_handler == SIG_IGN || pythonAction.sa_handler == SIG_DFL))
                unhook(); // Python does not handle it
        }
        CancelOnInterrupt(CancelOnInterrupt const&) = delete;
        CancelOnInterrupt& operator=(CancelOnInterrupt const&) = delete;
        ~CancelOnInterrupt()
        {
            if (isHooked_)
                unhook();
        }

    private:
        void unhook()
        {
            ::sigaction(SIGINT, &pythonAction, nullptr);
            isHooked_ = false;
        }

        bool isHooked_ = false;
    };

    class Mark {
    public:
        Mark() { runsCancellable = true; }
        Mark(Mark const&) = delete;
        Mark& operator=(Mark const&) = delete;
        ~Mark() { runsCancellable = false; }
    };

    /// Returns false if the work was cancelled.
    bool runOnce(std::function<void()> const& work)
    {
        Mark const mark;
        try {
            work();
            return true;
        } catch (std::bad_alloc const&) {
            throw;
        } catch (Failure const& failure) {
            if (failure.code != ExitCode::Cancelled)
                throw;
        } catch (ModelingProgram::Cancelled const&) {
        } catch (std::exception const&) {
            if (!Orvan::isJobCancelled()) // a cancelled operation throws the exception of the host
                throw;
        }
        return false;
    }

    void checkSignals()
    {
        if (PyErr_CheckSignals() != 0)
            throw py::error_already_set();
    }

    /// Runs the work on the main thread. Returns false if it was cancelled, but not by Ctrl-C.
    bool runInterruptibly(std::function<void()> const& work)
    {
        bool isDone = false;
        {
            CancelOnInterrupt const cancelling;
            checkSignals(); // those that arrived before
            Unlocked const unlocked;
            try {
                isDone = runOnce(work);
            } catch (...) {
                if (wasInterrupted)
                    Orvan::setJobCancelled(false);
                throw;
            }
        }
        if (wasInterrupted) {
            Orvan::setJobCancelled(false);
            checkSignals();
        }
        return isDone;
    }

    /// The job of another thread was cancelled, which ends soon.
    void waitForOthers()
    {
        constexpr std::chrono::milliseconds kPause{1};
        while (Orvan::isJobCancelled()) {
            {
                Unlocked const unlocked;
                std::this_thread::sleep_for(kPause);
            }
            checkSignals();
        }
    }

}

void Internal::runCancellable(std::function<void()> const& work, bool isBrief)
{
    auto const run = [&] {
        if (!isBrief && isMainThread())
            return runInterruptibly(work);
        Unlocked const unlocked;
        return runOnce(work);
    };
    while (!run())
        waitForOthers();
}

void stopIfCancelled()
{
    if (runsCancellable && Orvan::isJobCancelled())
        throw ModelingProgram::Cancelled();
}

bool isCancellable() noexcept
{
    return runsCancellable;
}

}
