#include "Cancellation.h"

#include "Failure.h"

#include <OrvanCppOpSDK/Job.h>

#include <cerrno>

#include <unistd.h>

namespace ModelingProgram {

namespace {

    // Runs in the middle of anything: no memory, no locks, no buffered output.
    void cancelJob(int)
    {
        constexpr char kText[] = "\nmodeling: stopping; once more ends the program at once\n";
        int const oldError = errno;
        Orvan::setJobCancelled(true);
        // Nobody is left to tell when this fails.
        [[maybe_unused]] auto const written = ::write(STDERR_FILENO, kText, sizeof kText - 1);
        errno = oldError;
    }

}

CancelOnSignal::CancelOnSignal()
{
    struct sigaction action = {};
    action.sa_handler = cancelJob;
    sigemptyset(&action.sa_mask);
    // Back to the default after the first signal, and no read or write of a file fails because of it.
    action.sa_flags = static_cast<int>(SA_RESETHAND) | SA_RESTART;
    ::sigaction(SIGINT, &action, &oldInterrupt_);
    ::sigaction(SIGTERM, &action, &oldTerminate_);
}

CancelOnSignal::~CancelOnSignal()
{
    ::sigaction(SIGINT, &oldInterrupt_, nullptr);
    ::sigaction(SIGTERM, &oldTerminate_, nullptr);
}

void stopIfCancelled()
{
    if (Orvan::isJobCancelled())
        throw Failure(ExitCode::Cancelled, "cancelled; nothing was written");
}

}
