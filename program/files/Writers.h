#pragma once

#include "ElementLayout.h"
#include "OutputFile.h"

#include <TessaraGeometry/Names.h>

namespace ModelingProgram {

/// A property with a value for each element of a component, as files may keep it.
struct Attribute {
    std::string name; // as files call it: without the prefix that told it apart in the object
    Orvan::String component;
    Tessara::PropertyValue values; // a Ptr to an Array of one of the forty types, of the right length
    std::string columnNames; // that it came with, if any
};

/// A valid object, taken apart for the writers. A mesh has faces, a strand set strands, a point cloud neither.
struct WritableGeometry {
    enum class Kind { Mesh, Strands, PointCloud } kind;
    Orvan::Ptr<Orvan::Array<Tessara::Math::float3>> positions;
    Orvan::Ptr<Orvan::Array<unsigned int>> faceVertex;
    Orvan::Ptr<Orvan::Array<unsigned int>> offsets; // of faces or strands
    std::vector<Attribute> attributes;
    std::string remark; // becomes a comment
    std::vector<std::string> leftOut; // what the file does not hold, a sentence each
    Existing existing = Existing::Replace;

    std::uint64_t pointCount() const { return positions->size; }
    /// Faces or strands.
    std::uint64_t cellCount() const { return offsets ? offsets->size - 1 : 0; }
};

/// Whether values are of the type `T`, which then are visited.
template <class T, class Visit> bool visitAs(Tessara::PropertyValue const& values, Visit&& visit)
{
    auto const* const array = values.get<Orvan::Ptr<Orvan::Array<T>>>();
    if (array)
        visit(**array);
    return array != nullptr;
}

/// Says that an attribute is left out, and why.
void leaveOut(Attribute const& attribute, std::string const& why, std::vector<std::string>& sentences);

/// What all formats ask for: a valid object, finite positions, three corners a face and more.
/// \throws FileError, which names the file
WritableGeometry takeApart(Tessara::Object const& object, std::filesystem::path const& file);

// One writer a format. They add to `leftOut`, and throw `FileError` for a kind of geometry that the format cannot hold.

void writeObj(WritableGeometry& geometry, std::filesystem::path const& file);
void writePly(WritableGeometry& geometry, std::filesystem::path const& file);
void writeStl(WritableGeometry& geometry, std::filesystem::path const& file);
void writeVtp(WritableGeometry& geometry, std::filesystem::path const& file);

}
