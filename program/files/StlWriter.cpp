#include "OutputBlocks.h"
#include "Writers.h"

#include "frame/ParallelFor.h"

#include <algorithm>
#include <atomic>
#include <bit>
#include <cmath>

namespace ModelingProgram {

using namespace Tessara::Geometry;
using Tessara::Math::float3;

namespace {

    static_assert(std::endian::native == std::endian::little, "numbers are written with the byte order of memory");

    constexpr std::size_t kBytesPerTriangle = 50;

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

    void fillTriangle(WritableGeometry const& geometry, std::uint64_t face, unsigned short attribute, char* target)
    {
        float3 vectors[4]; // the normal and the corners
        for (std::size_t i = 0; i < 3; ++i)
            vectors[i + 1] = (*geometry.positions)[(*geometry.faceVertex)[3 * face + i]];
        vectors[0] = normalOf(vectors[1], vectors[2], vectors[3]);
        std::memcpy(target, vectors, sizeof(vectors));
        std::memcpy(target + sizeof(vectors), &attribute, sizeof(attribute));
    }

    void noteUnusedPoints(WritableGeometry& geometry)
    {
        Orvan::Array<bool> isUsed(geometry.pointCount());
        unsigned int const* const point = geometry.faceVertex->data;
        // Several threads may set the same flag, all to the same value.
        Modeling::parallelFor(tbb::blocked_range<std::uint64_t>(0, geometry.faceVertex->size, Modeling::kScatterGrain),
            [&](tbb::blocked_range<std::uint64_t> const& corners) {
                for (std::uint64_t corner = corners.begin(); corner != corners.end(); ++corner)
                    std::atomic_ref(isUsed[point[corner]]).store(true, std::memory_order_relaxed);
            });
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
    writeInBlocks(
        geometry.cellCount(), kBytesPerTriangle,
        [&](std::uint64_t first, std::uint64_t end, OutputBuffer& block) {
            char* triangle = block.extend((end - first) * kBytesPerTriangle);
            for (std::uint64_t face = first; face != end; ++face, triangle += kBytesPerTriangle)
                fillTriangle(geometry, face, attributes ? (*attributes)[face] : 0, triangle);
        },
        out);
    out.commit();
}

}
