#pragma once

#include "shell/Failure.h"

namespace ModelingProgram {

class CommandLine;
struct Invocation;

/// Adds all commands. Both arguments have to outlive what the invocation runs after parsing.
void addCommands(CommandLine& program, Invocation& invocation);

/// Parses the command line, runs the command and prints its report. \return the exit code
int runProgram(int argumentCount, char const* const* arguments);

/// The failure that the exception being handled stands for.
/// \pre  an exception is being handled
Failure currentFailure();

}
