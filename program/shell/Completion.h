#pragma once

#include "CommandLine.h"

#include <string>

namespace ModelingProgram {

// Scripts that complete the names of commands, options and values in a shell, made from the declarations.

std::string bashCompletion(ProgramDescription const& program);
std::string zshCompletion(ProgramDescription const& program);
std::string fishCompletion(ProgramDescription const& program);

}
