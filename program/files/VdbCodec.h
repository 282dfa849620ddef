#pragma once

#include "VdbFile.h"
#include "VdbOutline.h"

namespace ModelingProgram {

// What OpenVDB itself does, in a library of its own: it takes ten times as long to load as the rest of the program, so
// that is done by those who need it.

constexpr char const* kVdbCodec = "libModelingVdb.so";

/// \pre  `checkVdbFloatGrid` has found nothing
extern "C" void modelingReadVdb(
    InputFile const& file, VdbGridEntry const& entry, std::vector<VdbGridEntry> const& all, SparseVolume& volume);

/// The bytes of a file.
extern "C" void modelingWriteVdb(SparseVolume const& volume, std::string& bytes);

}
