#pragma once

#include "CommandLine.h"

#include <string>

namespace ModelingProgram {

/// The manual page of the program in the language of man(1), made from the declarations.
std::string manualPage(ProgramDescription const& program);

}
