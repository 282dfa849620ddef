#pragma once

#include "shell/Failure.h"

namespace ModelingProgram {

/// Parses the command line, runs the command and prints its report. \return the exit code
int runProgram(int argumentCount, char const* const* arguments);

/// The failure that the exception being handled stands for.
/// \pre  an exception is being handled
Failure currentFailure();

}
