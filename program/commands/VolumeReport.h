#pragma once

#include "files/VdbFile.h"
#include "shell/Report.h"

namespace ModelingProgram {

/// Adds name, size, background and the range of the active values of a grid to the report.
void reportVolume(SparseVolume const& volume, float least, float most, Report& report);

}
