#include "Measuring.h"
#ifdef MODELING_HAS_CGAL
#include "peers/cgalRefinement.h"
#endif
#ifdef MODELING_HAS_OPENMESH
#include "peers/openMeshRefinement.h"
#endif

#include "frame/Arrays.h"
#include "frame/PointCorners.h"
#include "frame/VectorMath.h"
#include "subdivision/refineMesh.h"

#include "support/MeshBuilder.h"

#include <Modeling/HalfEdgeDataStructure.h>
#include <Modeling/subdivide.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Names.h>

#include <algorithm>
#include <cmath>
#include <map>
#include <memory>

using namespace Benchmarks;
using namespace Modeling;
using Geometry::Mesh::HalfEdgeDataStructure;
using TestSupport::MeshBuilder;

namespace {

constexpr unsigned int kUniformSteps = 4;

MeshBuilder const& sphereOf(std::size_t faces, bool isShuffled)
{
    return madeOnce(std::pair(faces, isShuffled), [](auto const& key) {
        MeshBuilder sphere = MeshBuilder::sphereWithFaces(key.first);
        return key.second ? std::move(sphere).shuffled(1) : sphere;
    });
}

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

struct FlatMesh {
    Orvan::Array<float3> points;
    Orvan::Array<unsigned int> faceVertex;
    Orvan::Array<unsigned int> faceOffset;

    explicit FlatMesh(MeshBuilder const& mesh)
        : points(mesh.points)
        , faceVertex(std::span(mesh.faces[0].data(), 3 * mesh.faces.size()))
        , faceOffset(mesh.faces.size() + 1)
    {
        for (std::size_t face = 0; face != faceOffset.size; ++face)
            faceOffset[face] = static_cast<unsigned int>(3 * face);
    }
};

void halfEdges(benchmark::State& state, bool isShuffled)
{
    FlatMesh const mesh(sphereOf(sizeOf(state), isShuffled));
    auto const faces = static_cast<unsigned int>(mesh.faceOffset.size - 1);
    auto const build = [&] {
        HalfEdgeDataStructure const built(
            static_cast<unsigned int>(mesh.points.size), faces, mesh.faceVertex, mesh.faceOffset);
        benchmark::DoNotOptimize(built.valence(0));
    };
    for (auto _ : state)
        build();
    countElements(state, faces);
    countWorkingBytes(state, faces, 0, build);
}

/// Elements are the faces of the result.
void countRefinement(benchmark::State& state, std::size_t faces, std::function<void()> const& refine)
{
    countElements(state, faces);
    state.counters["result faces"] = static_cast<double>(faces);
    countWorkingBytes(state, faces, 0, refine);
}

template <class Refine>
void measureRefinement(benchmark::State& state, MeshBuilder const& builder, Refine const& refine)
{
    auto const source = builder.build();
    auto const result = timeOnCopies(state, *source, refine);
    Tessara::Object mesh = *source;
    countRefinement(
        state, Tessara::Geometry::getElementCount(*result, Tessara::Geometry::sFaceComp), [&] { refine(mesh); });
}

void subdivideUniformly(benchmark::State& state)
{
    measureRefinement(state, icosphereOf(sizeOf(state)), [](Tessara::Object& mesh) {
        unsigned int pass = 0;
        auto const markAll = [&](auto const&, Orvan::Array<bool>& marks) {
            if (pass++ != kUniformSteps)
                fillElements(marks.data, marks.size, true);
        };
        Geometry::Mesh::Internal::refineMesh(markAll, mesh);
    });
}

/// For the graded sphere of that many faces, so that the result has about 15 times as many.
float toleranceFor(std::size_t faces)
{
    return 0.0042f / std::sqrt(static_cast<float>(faces) / 81'920);
}

void subdivideAdaptively(benchmark::State& state)
{
    float const tolerance = toleranceFor(sizeOf(state));
    measureRefinement(state, gradedSphereOf(sizeOf(state)),
        [=](Tessara::Object& mesh) { Geometry::Mesh::subdivide(tolerance, mesh); });
}

/// One uniform step on plain arrays, all on one level: twins, middles, turned edges, and the old points relaxed.
void flatStep(Orvan::Array<float3>& points, Orvan::Array<unsigned int>& corners)
{
    auto const pointCount = static_cast<unsigned int>(points.size);
    auto const faceCount = static_cast<unsigned int>(corners.size / 3);
    PointCorners const around = cornersByPoint(pointCount, corners.data, corners.size);
    auto newPoints = uninitializedArray<float3>(std::uint64_t{pointCount} + faceCount);
    auto newCorners = uninitializedArray<unsigned int>(3 * corners.size);
    parallelFor(tbb::blocked_range<unsigned int>(0, faceCount, 1), [&](auto const& faces) {
        for (unsigned int face = faces.begin(); face != faces.end(); ++face) {
            unsigned int const* const c = corners.data + std::size_t{3} * face;
            newPoints[pointCount + face] = (points[c[0]] + points[c[1]] + points[c[2]]) * (1.0f / 3);
            for (unsigned int k = 0; k != 3; ++k) {
                unsigned int const a = c[k], b = c[k == 2 ? 0 : k + 1];
                unsigned int i = around.offsets[a];
                while (corners[around.corners[i] % 3 == 0 ? around.corners[i] + 2 : around.corners[i] - 1] != b)
                    ++i;
                unsigned int* const target = newCorners.data + 3 * (std::size_t{3} * face + k);
                target[0] = a;
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
                sum = sum + points[corners[around.corners[i] % 3 == 0 ? around.corners[i] + 2 : around.corners[i] - 1]];
            auto const valence = static_cast<float>(last - first);
            float const weight = (4 - 2 * std::cos(6.2831855f / valence)) / 9;
            newPoints[point] = points[point] * (1 - weight) + sum * (weight / valence);
        }
    });
    points.swap(newPoints);
    corners.swap(newCorners);
}

void flatUniform(benchmark::State& state)
{
    FlatMesh const mesh(icosphereOf(sizeOf(state)));
    std::size_t faces = 0;
    for (auto _ : state) {
        Orvan::Array<float3> points = mesh.points;
        Orvan::Array<unsigned int> corners = mesh.faceVertex;
        for (unsigned int step = 0; step != kUniformSteps; ++step)
            flatStep(points, corners);
        faces = corners.size / 3;
        benchmark::DoNotOptimize(points.data);
    }
    countElements(state, faces);
}

/// `prepare(state)` returns what is timed, which returns a number of faces. Peers take their mesh from arrays in that time.
template <class Prepare> [[maybe_unused]] void addPeer(char const* name, Sizes const& sizes, Prepare const& prepare)
{
    addRow(name, sizes, [=](benchmark::State& state) {
        auto const refine = prepare(state);
        std::size_t faces = 0;
        for (auto _ : state)
            faces = refine();
        countRefinement(state, faces, refine);
    });
}

[[maybe_unused]] bool const areRowsAdded = [] {
    Sizes const sizes{{100'000}, {2'000'000}, {10'000'000}};
    Sizes const uniform{{1'280}, {20'480}, {81'920}}; // faces of the coarse mesh; 81 times as many in the result
    Sizes const adaptive{{5'120}, {81'920}, {1'310'720}}; // about 15 times as many in the result
    addRow("halfEdges", sizes, [](benchmark::State& state) { halfEdges(state, false); });
    addRow("halfEdges:memcpy", sizes, [](benchmark::State& state) {
        std::size_t const faces = sphereOf(sizeOf(state), false).faces.size();
        copyBytes(state, faces * 3 * sizeof(unsigned int), faces);
    });
    addRow("halfEdges shuffled", sizes, [](benchmark::State& state) { halfEdges(state, true); });
    addRow("subdivide uniform", uniform, subdivideUniformly);
    addRow("subdivide uniform:flat kernel", uniform, flatUniform);
    addRow("subdivide uniform:memcpy", uniform, [](benchmark::State& state) { // the result's own bytes
        std::size_t const faces = sizeOf(state) * 81;
        copyBytes(state, faces * (4 * sizeof(unsigned int) + sizeof(float3) / 2), faces);
    });
    addRow("subdivide adaptive", adaptive, subdivideAdaptively);

    // Peers are not measured on the largest meshes.
    [[maybe_unused]] Sizes const peerSizes{sizes[0], sizes[1]}, peerUniform{uniform[0], uniform[1]};
    [[maybe_unused]] Sizes const peerAdaptive{adaptive[0], adaptive[1]};
#ifdef MODELING_HAS_CGAL
    auto const cgalAdjacency = [](bool isShuffled) {
        return [=](benchmark::State const& state) {
            auto const mesh = std::make_shared<CgalRefinement>(sphereOf(sizeOf(state), isShuffled));
            return [=] { return mesh->buildAdjacency() / 3; };
        };
    };
    addPeer("halfEdges:CGAL", peerSizes, cgalAdjacency(false));
    addPeer("halfEdges shuffled:CGAL", peerSizes, cgalAdjacency(true));
    addPeer("subdivide uniform:CGAL", peerUniform, [](benchmark::State const& state) {
        auto const mesh = std::make_shared<CgalRefinement>(icosphereOf(sizeOf(state)));
        return [=] { return mesh->refine(kUniformSteps); };
    });
#endif
#ifdef MODELING_HAS_OPENMESH
    auto const openMeshAdjacency = [](bool isShuffled) {
        return [=](benchmark::State const& state) {
            return [&mesh = sphereOf(sizeOf(state), isShuffled)] { return buildOpenMesh(mesh) / 3; };
        };
    };
    addPeer("halfEdges:OpenMesh", peerSizes, openMeshAdjacency(false));
    addPeer("halfEdges shuffled:OpenMesh", peerSizes, openMeshAdjacency(true));
    addPeer("subdivide uniform:OpenMesh", peerUniform, [](benchmark::State const& state) {
        return [&mesh = icosphereOf(sizeOf(state))] { return refineOpenMesh(mesh, kUniformSteps); };
    });
    addPeer("subdivide adaptive:OpenMesh", peerAdaptive, [](benchmark::State const& state) {
        float const tolerance = toleranceFor(sizeOf(state));
        return [tolerance, &mesh = gradedSphereOf(sizeOf(state))] { return refineOpenMeshAdaptively(mesh, tolerance); };
    });
#endif
    return true;
}();

}
