#pragma once

#include <filesystem>
#include <string>

namespace ModelingProgram {

/// The format of a file as an extension (".ply"), if its first bytes can belong to no other one; otherwise empty. Tables
/// of points have no such bytes, and binary STL files are recognized by their length.
/// \throws FileError  if the file cannot be opened
std::string recognizedFormat(std::filesystem::path const& file);

}
