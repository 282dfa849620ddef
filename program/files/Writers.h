#pragma once

#include "ElementLayout.h"
#include "OutputFile.h"

#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Validators.h>

namespace ModelingProgram {

/// A property with one value per element of a component, which files may store.
struct Attribute {
    std::string name; // in the file: without the prefix that distinguishes it in the object
    Orvan::String component;
    Tessara::PropertyValue values; // a Ptr to an Array of one of the forty types, of the right length
    std::string columnNames; // from the input file, if any
};

/// Names of faces, each stored once. Files other than OBJ cannot hold them.
struct FaceNames {
    std::string name; // of the range
    Attribute data; // of the range
    Orvan::Ptr<Orvan::Array<Orvan::String>> texts;
    Orvan::Ptr<Orvan::Array<unsigned int>> numbers; // one entry per face: its text, perhaps beyond the last one

    std::string_view textAt(unsigned int number) const
    {
        return number < texts->size ? (*texts)[number].view() : std::string_view();
    }
};

/// The arrays of a valid object. A mesh has faces, a strand set has strands, a point cloud has neither.
struct WritableGeometry {
    enum class Kind { Mesh, Strands, PointCloud } kind;
    Orvan::Ptr<Orvan::Array<Tessara::Math::float3>> positions;
    Orvan::Ptr<Orvan::Array<unsigned int>> faceVertex;
    Orvan::Ptr<Orvan::Array<unsigned int>> offsets; // of faces or strands
    std::vector<Attribute> attributes;
    std::vector<FaceNames> faceNames;
    std::string remark; // becomes a comment
    std::vector<std::string> leftOut; // what the file does not contain, one sentence each
    Existing existing = Existing::Replace;

    std::uint64_t pointCount() const { return positions->size; }
    /// Empty geometry has no type in most files.
    bool isEmpty() const { return pointCount() == 0 && cellCount() == 0; }
    /// Faces or strands.
    std::uint64_t cellCount() const { return offsets ? offsets->size - 1 : 0; }
};

/// Visits the values if they have the type `T`. \return whether they do
template <class T, class Visit> bool visitAs(Tessara::PropertyValue const& values, Visit&& visit)
{
    auto const* const array = values.get<Orvan::Ptr<Orvan::Array<T>>>();
    if (array)
        visit(**array);
    return array != nullptr;
}

/// Adds a sentence on why an attribute is left out.
void leaveOut(Attribute const& attribute, std::string const& why, std::vector<std::string>& sentences);

/// Validates an object with faces as a mesh, one with strands as a strand set, any other as a point cloud.
Tessara::Geometry::GeoValidator::Status validateGeometry(Tessara::Object const& object);

/// About how large the file will be.
std::uint64_t estimateFileBytes(WritableGeometry const& geometry, std::string_view extension);

/// Checks what all formats require: a valid object, finite positions, at least three corners per face.
/// \throws FileError, which names the file
WritableGeometry takeApart(Tessara::Object const& object, std::filesystem::path const& file);
/// The same without checks, for what can show any values.
/// \pre  the object is valid
WritableGeometry takeApartUnchecked(Tessara::Object const& object);

/// The text with U+FFFD in place of bytes that are not UTF-8, for formats that have to be.
std::string validUtf8(std::string_view text);

// One writer per format. They add to `leftOut`, and throw `FileError` if the format cannot hold the type of geometry.

void writeGltf(WritableGeometry& geometry, std::filesystem::path const& file);
/// The same with another limit than 4 GiB, for tests.
void writeGltf(WritableGeometry& geometry, std::filesystem::path const& file, std::uint64_t mostBytes);
void writeObj(WritableGeometry& geometry, std::filesystem::path const& file);
void writePly(WritableGeometry& geometry, std::filesystem::path const& file);
void writeStl(WritableGeometry& geometry, std::filesystem::path const& file);
void writeVtp(WritableGeometry& geometry, std::filesystem::path const& file);

}
