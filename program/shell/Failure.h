#pragma once

#include <stdexcept>
#include <string>
#include <vector>

namespace ModelingProgram {

/// What the program returns to the shell. The meanings are printed by --help and listed in docs/program.md.
enum class ExitCode {
    Done = 0,
    Unexpected = 1,
    CommandLine = 2,
    File = 3,
    Invalid = 4,
    Refused = 5,
    Cancelled = 6,
    OutOfMemory = 7
};

/// Ends a command. The sentence is for the user; the reasons, if there are any, stand below it, a line each.
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
