#include "Writers.h"

#include <bit>
#include <cmath>

namespace ModelingProgram {

using namespace Tessara::Geometry;
using Tessara::Math::float3;

namespace {

    static_assert(std::endian::native == std::endian::little, "numbers are written with the byte order of memory");

    void checkTriangles(WritableGeometry const& geometry, std::filesystem::path const& file)
    {
        auto const refuse = [&](std::string const& why) {
            throw FileError(file.string() + " cannot be written: STL files hold triangles only, " + why);
        };
        if (geometry.isEmpty())
            return;
        if (geometry.kind != WritableGeometry::Kind::Mesh)
            refuse("and this is not a mesh");
        Orvan::Array<unsigned int> const& offset = *geometry.offsets;
        for (std::uint64_t face = 0; face + 1 < offset.size; ++face) {
            if (offset[face + 1] - offset[face] != 3)
                refuse("but face " + std::to_string(face) + " has " + std::to_string(offset[face + 1] - offset[face])
                    + " corners; OBJ, PLY and VTP files can hold it");
        }
    }

    /// A unit vector, or zero if the corners are collinear.
    float3 normalOf(float3 const& a, float3 const& b, float3 const& c)
    {
        double const u[3] = {double(b.x) - a.x, double(b.y) - a.y, double(b.z) - a.z};
        double const v[3] = {double(c.x) - a.x, double(c.y) - a.y, double(c.z) - a.z};
        double const n[3] = {u[1] * v[2] - u[2] * v[1], u[2] * v[0] - u[0] * v[2], u[0] * v[1] - u[1] * v[0]};
        double const length = std::hypot(n[0], n[1], n[2]);
        if (!(length > 0))
            return {0, 0, 0};
        return {
            static_cast<float>(n[0] / length), static_cast<float>(n[1] / length), static_cast<float>(n[2] / length)};
    }

    void noteUnusedPoints(WritableGeometry& geometry)
    {
        std::vector<bool> isUsed(geometry.pointCount());
        for (unsigned int const point : *geometry.faceVertex)
            isUsed[point] = true;
        auto const unused = std::count(isUsed.begin(), isUsed.end(), false);
        if (unused != 0)
            geometry.leftOut.push_back(
                std::to_string(unused) + " points of no face are left out: STL files cannot hold them");
    }

}

void writeStl(WritableGeometry& geometry, std::filesystem::path const& file)
{
    checkTriangles(geometry, file);
    Orvan::Ptr<Orvan::Array<unsigned short>> attributes;
    for (Attribute const& attribute : geometry.attributes) {
        auto const* const shorts = attribute.values.get<Orvan::Ptr<Orvan::Array<unsigned short>>>();
        if (shorts && attribute.name == "attribute" && attribute.component == sFaceComp)
            attributes = *shorts;
        else
            leaveOut(attribute, "STL files cannot hold it", geometry.leftOut);
    }
    if (!geometry.isEmpty())
        noteUnusedPoints(geometry);

    OutputFile out(file, geometry.existing);
    // The header must not begin with "solid", like a text file.
    std::string header = "binary STL" + (geometry.remark.empty() ? "" : ", " + geometry.remark);
    header.resize(80);
    out.write(header.data(), header.size());
    out.writeBinary(static_cast<std::uint32_t>(geometry.cellCount()));
    for (std::uint64_t face = 0; face < geometry.cellCount(); ++face) {
        unsigned int const* const points = geometry.faceVertex->data + 3 * face;
        float3 corners[3];
        for (int i = 0; i < 3; ++i)
            corners[i] = (*geometry.positions)[points[i]];
        out.writeBinary(normalOf(corners[0], corners[1], corners[2]));
        out.write(corners, sizeof(corners));
        out.writeBinary<unsigned short>(attributes ? (*attributes)[face] : 0);
    }
    out.commit();
}

}
