#pragma once

#include <csignal>
#include <utility>
#include <vector>

namespace ModelingProgram {

/// While it lives, the first Ctrl-C (or SIGTERM) asks the running operation to stop. A second one ends the program at once,
/// and so do SIGHUP, SIGPIPE and SIGQUIT; the file that is being written is removed first.
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

/// \throws Failure  once the job is cancelled
void stopIfCancelled();

}
