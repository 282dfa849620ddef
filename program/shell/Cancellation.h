#pragma once

#include <csignal>
#include <utility>
#include <vector>

namespace ModelingProgram {

/// During its lifetime, the first Ctrl-C (or SIGTERM, or SIGHUP when a terminal is closed) asks the running operation to
/// stop. A second one terminates the program immediately, as do SIGQUIT and other signals; a temporary file is
/// removed first.
class CancelOnSignal {
public:
    CancelOnSignal();
    CancelOnSignal(CancelOnSignal const&) = delete;
    CancelOnSignal& operator=(CancelOnSignal const&) = delete;
    ~CancelOnSignal();

private:
    void handle(int signal, void (*handler)(int));

    std::vector<std::pair<int, struct sigaction>> oldActions_;
};

/// \throws Failure  if the job is cancelled
void stopIfCancelled();

}
