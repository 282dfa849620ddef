#include "Measuring.h"
#include "peers/cgalRefinement.h"
#include "peers/openMeshRefinement.h"

#include "frame/Arrays.h"
#include "frame/PointCorners.h"
#include "frame/VectorMath.h"
#include "subdivision/refineMesh.h"

#include <Modeling/HalfEdgeDataStructure.h>
#include <Modeling/subdivide.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Names.h>

#include <algorithm>
#include <cmath>

using namespace Benchmarks;
using namespace Modeling;

namespace {

using MakeMesh = MeshBuilder const& (*)(std::size_t faces);

constexpr unsigned int kUniformSteps = 4; // give 81 times as many faces
Sizes const kHalfEdges{{100'000}, {2'000'000}, {10'000'000}};
Sizes const kUniform{{1'280}, {20'480}, {81'920}}; // faces of the coarse mesh
Sizes const kAdaptive{{5'120}, {81'920}, {1'310'720}}; // about 15 times as many in the result

/// Cuts each face into four, with the new points moved out to the unit sphere.
MeshBuilder cutIntoFour(MeshBuilder mesh)
{
    std::map<std::pair<unsigned int, unsigned int>, unsigned int> middles;
    auto const middle = [&](unsigned int a, unsigned int b) {
        auto const [entry, isNew] =
            middles.try_emplace(std::minmax(a, b), static_cast<unsigned int>(mesh.points.size()));
        if (isNew)
            mesh.points.push_back(safeNormalize(mesh.points[a] + mesh.points[b]));
        return entry->second;
    };
    std::vector<MeshBuilder::Triangle> faces;
    for (auto const& [a, b, c] : mesh.faces) {
        unsigned int const ab = middle(a, b), bc = middle(b, c), ca = middle(c, a);
        faces.insert(faces.end(), {{a, ab, ca}, {b, bc, ab}, {c, ca, bc}, {ab, bc, ca}});
    }
    mesh.faces = std::move(faces);
    return mesh;
}

/// 20 · 4ⁿ faces.
MeshBuilder const& icosphereOf(std::size_t faces)
{
    return madeOnce(faces, [](std::size_t count) {
        MeshBuilder mesh = MeshBuilder::icosahedron();
        for (float3& p : mesh.points)
            p = safeNormalize(p);
        while (mesh.faces.size() < count)
            mesh = cutIntoFour(std::move(mesh));
        return mesh;
    });
}

MeshBuilder const& gradedSphereOf(std::size_t faces)
{
    return madeOnce(faces, [](std::size_t count) { return MeshBuilder(icosphereOf(count)).graded(); });
}

Row halfEdges(char const* name, MakeMesh meshOf)
{
    return Row(name, kHalfEdges, [=](State& state) {
        FlatMesh const mesh(meshOf(sizeOf(state)).polygons());
        auto const build = [&] {
            Geometry::Mesh::HalfEdgeDataStructure const built(
                mesh.pointCount(), mesh.faceCount(), mesh.faceVertex, mesh.faceOffset);
            benchmark::DoNotOptimize(built.valence(0));
        };
        timeRuns(state, mesh.faceCount(), build);
        countWorkingBytes(state, mesh.faceCount(), 0, build);
    });
}
Row const inOrder = halfEdges("halfEdges", sphereOf), shuffled = halfEdges("halfEdges shuffled", shuffledSphereOf);

CopyRow const cornerBytes("halfEdges", kHalfEdges, [](State const& state) -> CopyRow::Input {
    std::size_t const faces = sphereOf(sizeOf(state)).faces.size();
    return {faces * 3 * sizeof(unsigned int), faces};
});

/// Elements are the faces of the result.
template <class Refine> void measureRefinement(State& state, MeshBuilder const& builder, Refine const& refine)
{
    auto const source = builder.build();
    Object result = *source;
    refine(result);
    std::size_t const faces = Tessara::Geometry::getElementCount(result, Tessara::Geometry::sFaceComp);
    measureEdit(state, faces, 0, *source, refine);
    state.counters["result faces"] = static_cast<double>(faces);
}

Row const uniform("subdivide uniform", kUniform, [](State& state) {
    measureRefinement(state, icosphereOf(sizeOf(state)), [](Object& mesh) {
        unsigned int pass = 0;
        auto const markAll = [&](auto const&, Orvan::Array<bool>& marks) {
            if (pass++ != kUniformSteps)
                fillElements(marks.data, marks.size, true);
        };
        Geometry::Mesh::Internal::refineMesh(markAll, mesh);
    });
});

/// For the graded sphere of that many faces, so that the result has about 15 times as many.
float toleranceFor(std::size_t faces)
{
    return 0.0042f / std::sqrt(static_cast<float>(faces) / 81'920);
}

Row const adaptive("subdivide adaptive", kAdaptive, [](State& state) {
    measureRefinement(state, gradedSphereOf(sizeOf(state)),
        [tolerance = toleranceFor(sizeOf(state))](Object& mesh) { Geometry::Mesh::subdivide(tolerance, mesh); });
});

/// One uniform step on plain arrays, all on one level: twins, middles, turned edges, and the old points relaxed.
void flatStep(Orvan::Array<float3>& points, Indices& corners)
{
    auto const pointCount = static_cast<unsigned int>(points.size);
    auto const faceCount = static_cast<unsigned int>(corners.size / 3);
    PointCorners const around = cornersByPoint(pointCount, corners.data, corners.size);
    auto const before = [&](unsigned int i) { // the point before a corner in its face
        return corners[around.corners[i] % 3 == 0 ? around.corners[i] + 2 : around.corners[i] - 1];
    };
    auto newPoints = uninitializedArray<float3>(std::uint64_t{pointCount} + faceCount);
    auto newCorners = uninitializedArray<unsigned int>(3 * corners.size);
    parallelFor(tbb::blocked_range<unsigned int>(0, faceCount, 1), [&](auto const& faces) {
        for (unsigned int face = faces.begin(); face != faces.end(); ++face) {
            unsigned int const* const c = corners.data + std::size_t{3} * face;
            newPoints[pointCount + face] = (points[c[0]] + points[c[1]] + points[c[2]]) * (1.0f / 3);
            for (unsigned int k = 0; k != 3; ++k) {
                unsigned int i = around.offsets[c[k]];
                while (before(i) != c[k == 2 ? 0 : k + 1])
                    ++i;
                unsigned int* const target = newCorners.data + 3 * (std::size_t{3} * face + k);
                target[0] = c[k];
                target[1] = pointCount + around.corners[i] / 3;
                target[2] = pointCount + face;
            }
        }
    });
    parallelFor(tbb::blocked_range<unsigned int>(0, pointCount, 1), [&](auto const& range) {
        for (unsigned int point = range.begin(); point != range.end(); ++point) {
            unsigned int const first = around.offsets[point], last = around.offsets[point + 1];
            float3 sum{0, 0, 0};
            for (unsigned int i = first; i != last; ++i)
                sum = sum + points[before(i)];
            auto const valence = static_cast<float>(last - first);
            float const weight = (4 - 2 * std::cos(6.2831855f / valence)) / 9;
            newPoints[point] = points[point] * (1 - weight) + sum * (weight / valence);
        }
    });
    points.swap(newPoints);
    corners.swap(newCorners);
}

Row const flatUniform("subdivide uniform:flat kernel", kUniform, [](State& state) {
    FlatMesh const mesh(icosphereOf(sizeOf(state)).polygons());
    timeRuns(state, 81 * std::size_t{mesh.faceCount()}, [&] {
        Orvan::Array<float3> points = mesh.points;
        Indices corners = mesh.faceVertex;
        for (unsigned int step = 0; step != kUniformSteps; ++step)
            flatStep(points, corners);
        benchmark::DoNotOptimize(points.data);
    });
});

CopyRow const resultBytes("subdivide uniform", kUniform, [](State const& state) -> CopyRow::Input {
    std::size_t const faces = sizeOf(state) * 81;
    return {faces * (4 * sizeof(unsigned int) + sizeof(float3) / 2), faces};
});

/// A row of a peer, whose `refine(mesh, size)` returns a number of faces. Peers take their mesh from arrays in that time, and
/// are not measured on the largest meshes.
template <class Mesh, class Refine>
[[maybe_unused]] Row peer(char const* name, Sizes const& sizes, MakeMesh meshOf, Refine const& refine)
{
    return Row(name, {sizes[0], sizes[1]}, [=](State& state) {
        Mesh const mesh(meshOf(sizeOf(state)));
        std::size_t faces = 0;
        auto const run = [&] { faces = refine(mesh, sizeOf(state)); };
        for (auto _ : state)
            run();
        countElements(state, faces);
        countWorkingBytes(state, faces, 0, run);
        state.counters["result faces"] = static_cast<double>(faces);
    });
}

#ifdef MODELING_HAS_CGAL
auto const cgalAdjacency = [](CgalRefinement const& mesh, std::size_t) { return mesh.buildAdjacency() / 3; };
auto const cgalUniform = [](CgalRefinement const& mesh, std::size_t) { return mesh.refine(kUniformSteps); };
Row const cgal[]{
    peer<CgalRefinement>("halfEdges:CGAL", kHalfEdges, sphereOf, cgalAdjacency),
    peer<CgalRefinement>("halfEdges shuffled:CGAL", kHalfEdges, shuffledSphereOf, cgalAdjacency),
    peer<CgalRefinement>("subdivide uniform:CGAL", kUniform, icosphereOf, cgalUniform),
};
#endif
#ifdef MODELING_HAS_OPENMESH
auto const openMeshAdjacency = [](MeshBuilder const& mesh, std::size_t) { return buildOpenMesh(mesh) / 3; };
auto const openMeshUniform = [](MeshBuilder const& mesh, std::size_t) { return refineOpenMesh(mesh, kUniformSteps); };
auto const openMeshAdaptive = [](MeshBuilder const& mesh, std::size_t size) {
    return refineOpenMeshAdaptively(mesh, toleranceFor(size));
};
Row const openMesh[]{
    peer<MeshBuilder>("halfEdges:OpenMesh", kHalfEdges, sphereOf, openMeshAdjacency),
    peer<MeshBuilder>("halfEdges shuffled:OpenMesh", kHalfEdges, shuffledSphereOf, openMeshAdjacency),
    peer<MeshBuilder>("subdivide uniform:OpenMesh", kUniform, icosphereOf, openMeshUniform),
    peer<MeshBuilder>("subdivide adaptive:OpenMesh", kAdaptive, gradedSphereOf, openMeshAdaptive),
};
#endif

}
