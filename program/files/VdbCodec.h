#pragma once

#include "VdbFile.h"
#include "VdbOutline.h"

namespace ModelingProgram {

// Functions that need OpenVDB, in a separate library: it takes ten times as long to load as the rest of the program, so
// it is loaded only if needed.

constexpr char const* kVdbCodec = "libModelingVdb.so";

/// \pre  `checkVdbFloatGrid` has accepted the grid
extern "C" void modelingReadVdb(
    InputFile const& file, VdbGridEntry const& entry, std::vector<VdbGridEntry> const& all, SparseVolume& volume);

/// Serializes the volume to the contents of a file.
extern "C" void modelingWriteVdb(SparseVolume const& volume, std::string& bytes);

}
