#pragma once

namespace ModelingProgram {

/// Parses the command line, runs the command and prints its report. \return the exit code
int runProgram(int argumentCount, char const* const* arguments);

}
