#pragma once

#include "Hdf5File.h"

namespace ModelingProgram {

// Functions that need the HDF5 library, in a separate library that is loaded only if needed: with all that it depends
// on, it takes longer to load than the program.

constexpr char const* kHdf5Codec = "libModelingHdf5.so";

/// Writes the outline of a file to a pipe. Returns when it is complete or the file is refused; may crash or run forever
/// on a broken file.
extern "C" void modelingDescribeHdf5(char const* file, Hdf5Selection selection, char const* name, int pipe);

/// Creates a file.
/// \throws std::runtime_error  that says why the file cannot be written
extern "C" void modelingWriteHdf5(std::vector<Hdf5Object> const& objects, char const* file, unsigned int compression);

}
