#pragma once

#include "Hdf5File.h"

#include <string>

namespace ModelingProgram {

// The HDF5 library runs in processes of its own. It may crash or run forever on a broken file; and after a write has
// failed, such as on a full disk, it crashes when the program ends. A process shares the memory of the program, so that
// nothing is copied.

/// The outline of an HDF5 file.
/// \throws FileError  if the library cannot make one with limited time and memory
std::string outlineOf(
    std::filesystem::path const& file, Hdf5Selection selection, std::string const& name, std::uint64_t fileBytes);

/// Writes a file.
/// \throws std::runtime_error  that says why the file cannot be written
/// \throws std::bad_alloc
void writeHdf5With(std::vector<Hdf5Object> const& objects, std::filesystem::path const& file, unsigned int compression);

}
