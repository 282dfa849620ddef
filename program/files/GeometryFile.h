#pragma once

#include <TessaraMathSupport/Types.h>
#include <TessaraObject/Object.h>

#include <filesystem>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

namespace ModelingProgram {

/// A file that cannot be read or written: the text names the file, and the line (counted from 1) or element (counted
/// from 0) where there is one.
class FileError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// How a file is read.
struct ReadOptions {
    /// Leaves out points that are NaN or infinite, the faces and polylines at them, faces with fewer than three corners,
    /// and bytes after the last element. Otherwise they are refused.
    bool isLenient = false;
    /// Subtracts a place near the middle of the geometry from all positions, in double precision: far from the origin
    /// single precision holds only few digits behind the decimal point.
    bool isCentered = false;
    /// Subtracts this place instead: the one of a file read before, for instance.
    std::optional<Tessara::Math::double3> origin = {};
};

/// What a file held, as the library takes it: a mesh where there are faces, otherwise a strand set where there are
/// polylines, otherwise a point cloud.
struct GeometryFile {
    Orvan::MutablePtr<Tessara::Object> object;
    std::string format; // "OBJ", "PLY (binary, little endian)", ...
    std::vector<std::string> notes; // what was in the file and is not in the object, a sentence each
    std::optional<Tessara::Math::double3> origin = {}; // what was subtracted from all positions
};

/// Reads OBJ, PLY, STL, OFF and XYZ files, told apart by the extension of the name, in any case.
/// \throws FileError  for a file that is not there, is cut off, or holds what cannot be right
GeometryFile readGeometryFile(std::filesystem::path const& file, ReadOptions const& options = {});

/// What is done about a file that exists already. Links, devices and pipes are not files in this sense.
enum class Existing { Replace, Keep };

struct WriteOptions {
    Existing existing = Existing::Replace;
    std::string remark = {}; // a line of text without a line end, stored as a comment; empty for none
};

/// Writes OBJ, PLY (binary, little endian), STL (binary) and VTP files. The file appears under its name only when it is
/// complete: it is written beside it first.
/// \return what the format cannot hold and was therefore dropped or written in another form, a sentence each
/// \throws FileError  where the file cannot be written, the format cannot hold the kind of geometry at all, or the
///                    geometry is not valid, has positions that are not finite or faces of fewer than three corners; a
///                    file of that name is then as it was
std::vector<std::string> writeGeometryFile(
    Tessara::Object const& object, std::filesystem::path const& file, WriteOptions const& options = {});

/// Whether `writeGeometryFile` knows the extension: asked before work is done that could not be kept.
bool isWritableFormat(std::filesystem::path const& file);

}
