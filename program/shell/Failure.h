#pragma once

#include <stdexcept>
#include <string>
#include <vector>

namespace ModelingProgram {

/// Exit codes of the program. --help and docs/program.md list their meanings.
enum class ExitCode {
    Done = 0,
    Unexpected = 1,
    CommandLine = 2,
    File = 3,
    Invalid = 4,
    Refused = 5,
    Cancelled = 6,
    OutOfMemory = 7,
    Warned = 8
};

/// Ends a command with a sentence for the user. The reasons, if any, are printed below it, one per line.
class Failure : public std::runtime_error {
public:
    Failure(ExitCode exitCode, std::string const& sentence, std::vector<std::string> reasonList = {})
        : std::runtime_error(sentence)
        , code(exitCode)
        , reasons(std::move(reasonList))
    {
    }

    ExitCode code;
    std::vector<std::string> reasons;
};

}
