#pragma once

#include <csignal>

namespace ModelingProgram {

/// While it lives, the first Ctrl-C (or SIGTERM) asks the running operation to stop, and a second one ends the program
/// at once.
class CancelOnSignal {
public:
    CancelOnSignal();
    CancelOnSignal(CancelOnSignal const&) = delete;
    CancelOnSignal& operator=(CancelOnSignal const&) = delete;
    ~CancelOnSignal();

private:
    struct sigaction oldInterrupt_ = {};
    struct sigaction oldTerminate_ = {};
};

/// \throws Failure  once the job is cancelled
void stopIfCancelled();

}
