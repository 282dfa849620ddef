#pragma once

#include "GeometryFile.h"

#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace ModelingProgram {

// HDF5 files hold whole objects, without loss: every key with its value, to the bit. docs/file-layout.md is the
// description of the files.

/// An object in an HDF5 file as command lines name it: "scan.h5", or "scan.h5#left" for one of several.
struct Hdf5Location {
    std::filesystem::path file;
    std::optional<std::string> object; // its name in the file
};

/// Nullopt if the path does not name an HDF5 file.
std::optional<Hdf5Location> hdf5LocationOf(std::filesystem::path const& path);

struct Hdf5Object {
    std::string name; // in the file; see `escapedName`
    Orvan::Ptr<Tessara::Object> object;
    std::string remark = {};
};

inline constexpr char const* kHdf5DefaultName = "object";
/// Objects that contain objects this many levels deep are neither read nor written.
inline constexpr int kHdf5MostLevels = 100;

enum class Hdf5Selection { All, Named, Only };

/// Reads objects of any content. Nothing in the file is trusted: the HDF5 library, which crashes on some broken files,
/// looks at the structure in a process of its own, and the arrays are read here.
/// \param name    of the object, for `Named`
/// \param onSize  called with the bytes of larger arrays before they are allocated; may throw to refuse them. Arrays that
///                are not compressed occupy no more memory than the file.
/// \throws FileError  which names the file, the path in the file, and the element if there is one
std::vector<Hdf5Object> readHdf5Objects(std::filesystem::path const& file, Hdf5Selection selection,
    std::string const& name = {}, std::function<void(std::uint64_t)> const& onSize = {});

/// The second half of it: reads the objects that an outline (`Hdf5Outline.h`) describes, which may be nonsense.
std::vector<Hdf5Object> readOutlinedObjects(
    std::string_view outline, std::filesystem::path const& file, std::function<void(std::uint64_t)> const& onSize);

/// Writes a file with these objects. Values that several keys share are stored once, and are shared when they are read.
/// \param options.compression  0 to 9; arrays are stored in one piece if it is 0
/// \throws FileError  also for values of types that the files cannot hold
void writeHdf5Objects(
    std::vector<Hdf5Object> const& objects, std::filesystem::path const& file, WriteOptions const& options = {});

/// Reads geometry as `readGeometryFile` does.
GeometryFile readHdf5Geometry(Hdf5Location const& location, ReadOptions const& options);

/// Writes geometry as `writeGeometryFile` does, after `takeApart` has checked it. If the location names an object, the
/// other objects of an existing file are kept.
void writeHdf5Geometry(Tessara::Object const& object, Hdf5Location const& location, WriteOptions const& options);

}
