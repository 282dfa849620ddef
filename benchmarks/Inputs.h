#pragma once

#include "Measuring.h"

#include "support/MeshBuilder.h"

#include <TessaraGeometryVolume/VolumeBuilder.h>

#include <cmath>

// What our rows and those of peers are measured on, and the sizes that they have in common.

namespace Benchmarks {

using Tessara::Math::float2, Tessara::Math::float3, Tessara::Math::uchar4;
using TestSupport::MeshBuilder, TestSupport::PolygonMesh, TSR::TileTree3D::Voxel;
using Points = Orvan::Array<float3>;
using Indices = Orvan::Array<unsigned int>;

/// Meshes of at least that many faces. All but the last two are triangles on the unit sphere or close to it.
struct Meshes {
    static MeshBuilder ball(std::size_t faces) { return MeshBuilder::sphereWithFaces(faces); }
    static PolygonMesh sphere(std::size_t faces) { return ball(faces).polygons(); }
    static PolygonMesh shuffled(std::size_t faces) { return ball(faces).shuffled(1).polygons(); }
    static PolygonMesh noisy(std::size_t faces)
    {
        return ball(faces).withNoise(0.1f / std::sqrt(static_cast<float>(faces)), 1).polygons();
    }
    /// 23,520 needles at 500,000 faces: each cut makes two.
    static PolygonMesh needled(std::size_t faces) { return ball(faces).withNeedles(faces * 1176 / 50'000).polygons(); }
    static PolygonMesh graded(std::size_t faces) { return ball(faces).graded().polygons(); }
    static PolygonMesh concave(std::size_t faces) { return PolygonMesh::stars(faces, 4, 12, 1); }
    /// About that many quads, none of them planar.
    static PolygonMesh bentQuads(std::size_t faces)
    {
        auto const segments = static_cast<unsigned int>(std::sqrt(static_cast<double>(faces)));
        return PolygonMesh::quads(segments).withNoise(0.2f, 1);
    }
};

/// What `make(size)` returned first: meshes take longer to make than what is measured.
using MakeMesh = PolygonMesh (*)(std::size_t size);
PolygonMesh const& made(MakeMesh make, std::size_t size);

/// A mesh in the library's arrays.
struct FlatMesh {
    Points points;
    Indices faceVertex, faceOffset;

    FlatMesh(MakeMesh make, std::size_t size)
        : points(made(make, size).points)
        , faceVertex(made(make, size).faceVertex)
        , faceOffset(made(make, size).faceOffset)
    {
    }
    unsigned int pointCount() const { return static_cast<unsigned int>(points.size); }
    unsigned int faceCount() const { return static_cast<unsigned int>(faceOffset.size - 1); }
};

/// What `rule(i)` gives for each i below the count.
template <class Rule> auto arrayOf(std::size_t count, Rule rule)
{
    Orvan::Array<decltype(rule(count))> array(count);
    for (std::size_t i = 0; i != count; ++i)
        array[i] = rule(i);
    return array;
}

/// A sphere with 24 bytes per point and 44 per face, of which half are to be deleted in patches of a hundred.
struct PatchedSphere : FlatMesh {
    Points normals = points;
    Orvan::Array<float2> coordinates = Orvan::Array<float2>(faceVertex.size, float2{0.5f, 0.25f}); // of corners
    Orvan::Array<int> materials = Orvan::Array<int>(faceCount(), 7); // of faces
    Orvan::Array<bool> deleted = arrayOf(faceCount(), [](std::size_t face) { return face / 100 % 2 == 1; });

    explicit PatchedSphere(std::size_t faces)
        : FlatMesh(Meshes::sphere, faces)
    {
    }
    std::size_t bytes() const { return points.size * 24 + faceVertex.size * 12 + materials.size * 8 + 4; }
    Orvan::MutablePtr<Object> build() const;
};

/// Points with 32 bytes each.
struct FlatCloud {
    std::size_t count;
    Points positions =
        arrayOf(count, [random = TestSupport::Random(1)](std::size_t) mutable { return random.point(); });
    Points normals = Points(count, float3{0, 0, 1});
    Orvan::Array<uchar4> colors = arrayOf(count, [](std::size_t i) {
        return uchar4{static_cast<unsigned char>(i), 0, 0, 0};
    });
    Orvan::Array<float> intensities = Orvan::Array<float>(count, 0.5f);

    Orvan::MutablePtr<Object> build() const;
};

/// Half of the points, in no order.
Indices everySecondAtRandom(std::size_t points);

/// A polygon in the plane with points inside it.
struct DrawnPolygon {
    Points corners, points;
};
/// Polygons of 4 to 8 corners, mostly concave, each with a hundred points inside that are not on edges.
std::vector<DrawnPolygon> drawnPolygons(std::size_t pointCount);

constexpr int kRadius = 28; // of the sphere of voxels that is sampled
/// A band of voxels around a sphere, up to 3 voxels from it, with values that grow along x; a tenth of the surface is left
/// out. 28 voxels of radius give 53,000 of them, a million take 122.
std::vector<Voxel> bandOfVoxels(std::size_t radius);
/// The second corners of the faces of a unit sphere, in order of the faces, that are in the band.
std::vector<float3> pointsInBand(std::size_t faces, float scale);

/// Of the triangles that come first in the corners, which are indices into the points.
double areaOf(std::size_t triangles, float3 const* points, unsigned int const* corners);
/// How far points are from the origin on average.
double meanRadius(Points const& points);

constexpr float kSliverRatio = 0.05f;
constexpr int kSmoothingSteps = 10;
constexpr unsigned int kUniformSteps = 4; // give 81 times as many faces
/// For the graded sphere of that many faces, so that the result has about 15 times as many.
inline float toleranceFor(std::size_t faces)
{
    return 0.0042f / std::sqrt(static_cast<float>(faces) / 81'920);
}

/// Peers are not measured on the largest meshes.
inline Sizes withoutLargest(Sizes sizes)
{
    sizes.pop_back();
    return sizes;
}

/// What is measured of the library only.
inline Sizes with(std::int64_t size, Sizes sizes)
{
    sizes.push_back({size});
    return sizes;
}

inline Sizes const kTriangles{{5'000}, {50'000}, {500'000}}; // for cleaning up
inline Sizes const kPoints{{1'000}, {100'000}, {10'000'000}}, kFaces{{1'000}, {100'000}, {1'000'000}}; // for deleting
// Points there, points added.
inline Sizes const kAdded{{1'000, 1'000}, {1'000'000, 1'000}, {9'000'000, 1'000'000}};
inline Sizes const kAddedInPlace{{1'000, 1'000}, {1'000'000, 100'000}, {10'000'000, 1'000'000}};
inline Sizes const kQuads{{10'000}, {102'400}, {1'000'000}}, kPolygons{{2'000}, {20'000}, {200'000}};
inline Sizes const kHalfEdges{{100'000}, {2'000'000}, {10'000'000}};
inline Sizes const kUniform{{1'280}, {20'480}, {81'920}}; // faces of the coarse mesh
inline Sizes const kAdaptive{{5'120}, {81'920}, {640'000}};
inline Sizes const kSampled{{20'000}, {200'000}, {2'000'000}}, kRadii{{kRadius}, {122}};
// The number of inputs to merge, and about how many elements each has.
inline Sizes const kMeshes{{2, 1'000'000}, {100, 20'480}, {3'000, 500}};
inline Sizes const kClouds{{10, 10'000}, {10, 100'000}, {10, 1'000'000}};

}
