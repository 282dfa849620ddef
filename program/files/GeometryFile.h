#pragma once

#include <TessaraMathSupport/Types.h>
#include <TessaraObject/Object.h>

#include <cstdint>
#include <filesystem>
#include <functional>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

namespace ModelingProgram {

/// A file that cannot be read or written. The text names the file, and the line (counted from 1) or element (counted
/// from 0) if there is one.
class FileError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// How a file is read.
struct ReadOptions {
    /// Leaves out points that are NaN or infinite, the faces and polylines at them, faces with fewer than three
    /// corners, and bytes after the last element. By default such files are refused.
    bool isLenient = false;
    /// Subtracts a point near the middle of the geometry from all positions, in double precision: far from the origin,
    /// single precision has only a few decimal places.
    bool isCentered = false;
    /// Subtracts this point instead, such as the center of a file read before.
    std::optional<Tessara::Math::double3> origin = {};
    /// Called with the number of bytes before larger arrays of HDF5 and glTF files are allocated; may throw to refuse
    /// them. Other formats do not need more memory than the size of the file suggests.
    std::function<void(std::uint64_t)> onSize = {};
    /// The format of a file whose name does not tell it, as an extension: ".ply". If it is empty, the first bytes tell.
    std::string format = {};
    /// The format if the first bytes do not tell either.
    std::string fallbackFormat = {};
};

/// The contents of a file: a mesh if there are faces, otherwise a strand set if there are polylines, otherwise a point
/// cloud.
struct GeometryFile {
    Orvan::MutablePtr<Tessara::Object> object;
    std::string format; // "OBJ", "PLY (binary, little endian)", ...
    // What the file contains but the object does not, and what was guessed; one sentence each.
    std::vector<std::string> notes;
    std::optional<Tessara::Math::double3> origin = {}; // what was subtracted from all positions
};

/// Reads OBJ, PLY, STL, OFF, XYZ, glTF (.glb, .gltf) and HDF5 files, determined by the extension in upper or lower case,
/// or as `ReadOptions` says. Standard input (/dev/stdin) and pipes are read to their end first.
/// "scan.h5#left" is one of several objects in an HDF5 file. The object of an HDF5 file may be invalid, that of other
/// files never is.
/// \throws FileError  if the file does not exist, is cut off, or is malformed
GeometryFile readGeometryFile(std::filesystem::path const& file, ReadOptions const& options = {});

/// What to do if the output file exists. Links, devices and pipes do not count as files here.
enum class Existing { Replace, Keep };

struct WriteOptions {
    Existing existing = Existing::Replace;
    std::string remark = {}; // a line of text without a line end, stored as a comment; empty for none
    unsigned int compression = 0; // of HDF5 files, 1 to 9 as those of gzip; 0 for none
    std::function<void(std::uint64_t)> onSize = {}; // as in `ReadOptions`, for objects of a file that are kept
    std::string format = {}; // if the name does not tell it, as an extension: ".ply"
};

/// Writes OBJ, PLY (binary, little-endian), STL (binary), VTP, GLB (binary glTF) and HDF5 files. The file appears under
/// its name only when it is complete: it is written to a temporary file in the same folder first.
/// \return what the format cannot hold and was therefore dropped or converted, one sentence each
/// \throws FileError  if the file cannot be written, the format cannot hold this type of geometry, or the geometry is
///                    invalid, has positions that are not finite or faces with fewer than three corners; an existing
///                    file is then unchanged
std::vector<std::string> writeGeometryFile(
    Tessara::Object const& object, std::filesystem::path const& file, WriteOptions const& options = {});

/// The extensions of all formats that are read or written, without dots.
std::vector<std::string> geometryFormats();
/// Whether `writeGeometryFile` supports a format, such as ".ply".
bool isWritableFormat(std::string const& format);

/// What determines the format: a known extension in lower case, ".h5" for all HDF5 files. If the name does not end in
/// one, `otherwise`, or if that is empty the extension all the same.
std::string formatOf(std::filesystem::path const& file, std::string const& otherwise = {});
/// The file without the object that it names: "scan.h5" for "scan.h5#left".
std::filesystem::path fileOf(std::filesystem::path const& file);

}
