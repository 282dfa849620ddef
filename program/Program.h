#pragma once

namespace ModelingProgram {

/// The program: reads the command line, runs the command, prints what it tells. Returns the exit code.
int runProgram(int argumentCount, char const* const* arguments);

}
