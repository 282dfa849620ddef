#include "Cancellation.h"

#include "Failure.h"
#include "Progress.h"
#include "files/OutputFile.h"

#include <OrvanCppOpSDK/Job.h>

#include <atomic>
#include <cerrno>

#include <unistd.h>

namespace ModelingProgram {

namespace {

    constexpr int kCancelling[] = {SIGINT, SIGTERM, SIGHUP};
    constexpr int kEnding[] = {SIGQUIT, SIGALRM, SIGUSR1, SIGUSR2, SIGXCPU};

    std::atomic<bool> isStopping = false;

    // The handlers must be async-signal-safe: no allocation, no locks, no buffered output.

    void endProgram(int signal)
    {
        OutputFile::removeUnfinished();
        removeProgressBar();
        struct sigaction action = {};
        action.sa_handler = SIG_DFL;
        ::sigaction(signal, &action, nullptr);
        ::raise(signal); // delivered when the handler returns; terminates the program as if there were no handler
    }

    void cancelJob(int signal)
    {
        constexpr char kText[] = "\nmodeling: stopping; interrupt again to quit immediately\n";
        if (isStopping.exchange(true)) {
            endProgram(signal);
            return;
        }
        int const oldError = errno;
        Orvan::setJobCancelled(true);
        removeProgressBar();
        // A failure to write cannot be reported anywhere.
        [[maybe_unused]] auto const written = ::write(STDERR_FILENO, kText, sizeof kText - 1);
        errno = oldError;
    }

}

CancelOnSignal::CancelOnSignal()
{
    isStopping = false;
    for (int const signal : kCancelling)
        handle(signal, cancelJob);
    for (int const signal : kEnding)
        handle(signal, endProgram);
    for (int const signal : {SIGXFSZ, SIGPIPE})
        handle(signal, SIG_IGN); // writing then fails as on a full disk
}

CancelOnSignal::~CancelOnSignal()
{
    for (auto const& [signal, action] : oldActions_)
        ::sigaction(signal, &action, nullptr);
}

void CancelOnSignal::handle(int signal, void (*handler)(int))
{
    struct sigaction action = {};
    if (::sigaction(signal, nullptr, &action) != 0 || action.sa_handler == SIG_IGN)
        return; // nohup and background jobs start with signals ignored
    oldActions_.emplace_back(signal, action);
    action = {};
    action.sa_handler = handler;
    sigemptyset(&action.sa_mask);
    action.sa_flags = SA_RESTART; // reads and writes of files are not interrupted
    ::sigaction(signal, &action, nullptr);
}

void stopIfCancelled()
{
    if (Orvan::isJobCancelled())
        throw Failure(ExitCode::Cancelled, "cancelled; nothing was written");
}

}
