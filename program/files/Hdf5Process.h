#pragma once

#include "Hdf5File.h"

#include <string>

namespace ModelingProgram {

/// The outline of an HDF5 file, which the library makes in a process of its own: it may crash or run forever on a broken
/// file, and reading there needs no more memory than the process may use.
/// \throws FileError  if that process fails
std::string outlineOf(
    std::filesystem::path const& file, Hdf5Selection selection, std::string const& name, std::uint64_t fileBytes);

/// Calls the library to write a file, in this process.
void writeHdf5With(std::vector<Hdf5Object> const& objects, std::filesystem::path const& file, unsigned int compression);

}
