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

using namespace Modeling;
using Geometry::Mesh::HalfEdgeDataStructure;
using TestSupport::MeshBuilder;

namespace {

constexpr unsigned int kUniformSteps = 4;

// Meshes are made once: that takes longer than what is measured.

MeshBuilder const& sphereOf(std::size_t faces, bool isShuffled)
{
    static std::map<std::pair<std::size_t, bool>, MeshBuilder> made;
    auto const [entry, isNew] = made.try_emplace({faces, isShuffled});
    if (isNew) {
        MeshBuilder sphere = MeshBuilder::sphereWithFaces(faces);
        entry->second = isShuffled ? std::move(sphere).shuffled(1) : std::move(sphere);
    }
    return entry->second;
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
    static std::map<std::size_t, MeshBuilder> made;
    auto const [entry, isNew] = made.try_emplace(faces);
    if (isNew) {
        MeshBuilder mesh = MeshBuilder::icosahedron();
        for (float3& p : mesh.points)
            p = safeNormalize(p);
        while (mesh.faces.size() < faces)
            mesh = cutIntoFour(std::move(mesh));
        entry->second = std::move(mesh);
    }
    return entry->second;
}

/// A sphere whose faces are larger the closer they are to one side of it, by a factor of up to about 10.
MeshBuilder const& gradedSphereOf(std::size_t faces)
{
    static std::map<std::size_t, MeshBuilder> made;
    auto const [entry, isNew] = made.try_emplace(faces);
    if (isNew) {
        entry->second = icosphereOf(faces);
        for (float3& p : entry->second.points) {
            // The same sphere seen from a point close to its surface.
            float3 const from{p.x, p.y, p.z + 0.5f};
            float const norm = length(from);
            p = from * (1 / (norm * norm));
        }
    }
    return entry->second;
}

std::size_t facesOf(benchmark::State const& state)
{
    return static_cast<std::size_t>(state.range(0));
}

std::size_t faceCountOf(Tessara::Object const& mesh)
{
    return Tessara::Geometry::getElementCount(mesh, Tessara::Geometry::sFaceComp);
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
    FlatMesh const mesh(sphereOf(facesOf(state), isShuffled));
    auto const build = [&] {
        HalfEdgeDataStructure const built(static_cast<unsigned int>(mesh.points.size),
            static_cast<unsigned int>(mesh.faceOffset.size - 1), mesh.faceVertex, mesh.faceOffset);
        benchmark::DoNotOptimize(built.valence(0));
    };
    for (auto _ : state)
        build();
    std::size_t const faces = mesh.faceOffset.size - 1;
    Benchmarks::countElements(state, faces);
    state.counters["working bytes/element"] =
        static_cast<double>(Benchmarks::peakBytesOf(build)) / static_cast<double>(faces);
}

void copyCorners(benchmark::State& state)
{
    MeshBuilder const& mesh = sphereOf(facesOf(state), false);
    Benchmarks::copyBytes(state, mesh.faces.size() * 3 * sizeof(unsigned int));
    Benchmarks::countElements(state, mesh.faces.size());
}

/// Runs `refine(mesh)` on shared copies of a mesh; elements are the faces of the result.
template <class Refine>
void measureRefinement(benchmark::State& state, MeshBuilder const& builder, Refine const& refine)
{
    auto const source = builder.build();
    std::size_t faces = 0;
    for (auto _ : state) {
        state.PauseTiming();
        auto mesh = Tessara::createObject();
        *mesh = *source; // shares the arrays, as a host's document does
        state.ResumeTiming();
        refine(*mesh);
        state.PauseTiming();
        faces = faceCountOf(*mesh);
        mesh = nullptr;
        state.ResumeTiming();
    }
    Benchmarks::countElements(state, faces);
    state.counters["result faces"] = static_cast<double>(faces);
    Tessara::Object mesh = *source;
    state.counters["working bytes/element"] =
        static_cast<double>(Benchmarks::peakBytesOf([&] { refine(mesh); })) / static_cast<double>(faces);
}

void subdivideUniformly(benchmark::State& state)
{
    measureRefinement(state, icosphereOf(facesOf(state)), [](Tessara::Object& mesh) {
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
    float const tolerance = toleranceFor(facesOf(state));
    measureRefinement(state, gradedSphereOf(facesOf(state)),
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
    FlatMesh const mesh(icosphereOf(facesOf(state)));
    std::size_t faces = 0;
    for (auto _ : state) {
        Orvan::Array<float3> points = mesh.points;
        Orvan::Array<unsigned int> corners = mesh.faceVertex;
        for (unsigned int step = 0; step != kUniformSteps; ++step)
            flatStep(points, corners);
        faces = corners.size / 3;
        benchmark::DoNotOptimize(points.data);
    }
    Benchmarks::countElements(state, faces);
}

/// The result's own bytes.
void copyRefined(benchmark::State& state)
{
    std::size_t const faces = facesOf(state) * 81;
    Benchmarks::copyBytes(state, faces * (4 * sizeof(unsigned int) + sizeof(float3) / 2));
    Benchmarks::countElements(state, faces);
}

/// Runs `refine()`, which gives a number of faces. Peers take their mesh from arrays in the time that is measured.
template <class Refine> void measurePeer(benchmark::State& state, Refine const& refine)
{
    std::size_t faces = 0;
    for (auto _ : state)
        faces = refine();
    Benchmarks::countElements(state, faces);
    state.counters["result faces"] = static_cast<double>(faces);
    state.counters["working bytes/element"] =
        static_cast<double>(Benchmarks::peakBytesOf([&] { refine(); })) / static_cast<double>(faces);
}

#ifdef MODELING_HAS_CGAL
void cgalAdjacency(benchmark::State& state, bool isShuffled)
{
    MeshBuilder const& sphere = sphereOf(facesOf(state), isShuffled);
    Benchmarks::CgalRefinement const mesh(sphere);
    measurePeer(state, [&] { return mesh.buildAdjacency() / 3; });
}

void cgalUniform(benchmark::State& state)
{
    Benchmarks::CgalRefinement const mesh(icosphereOf(facesOf(state)));
    measurePeer(state, [&] { return mesh.refine(kUniformSteps); });
}
#endif

#ifdef MODELING_HAS_OPENMESH
void openMeshAdjacency(benchmark::State& state, bool isShuffled)
{
    MeshBuilder const& sphere = sphereOf(facesOf(state), isShuffled);
    measurePeer(state, [&] { return Benchmarks::buildOpenMesh(sphere) / 3; });
}

void openMeshUniform(benchmark::State& state)
{
    MeshBuilder const& mesh = icosphereOf(facesOf(state));
    measurePeer(state, [&] { return Benchmarks::refineOpenMesh(mesh, kUniformSteps); });
}

void openMeshAdaptive(benchmark::State& state)
{
    MeshBuilder const& mesh = gradedSphereOf(facesOf(state));
    float const tolerance = toleranceFor(facesOf(state));
    measurePeer(state, [&] { return Benchmarks::refineOpenMeshAdaptively(mesh, tolerance); });
}
#endif

#define MODELING_SIZES Arg(100'000)->Arg(2'000'000)->Arg(10'000'000)->UseRealTime()
#define MODELING_PEER_SIZES Arg(100'000)->Arg(2'000'000)->UseRealTime()
BENCHMARK_CAPTURE(halfEdges, ordered, false)->Name("halfEdges")->MODELING_SIZES;
BENCHMARK(copyCorners)->Name("halfEdges:memcpy")->MODELING_SIZES;
BENCHMARK_CAPTURE(halfEdges, shuffled, true)->Name("halfEdges shuffled")->MODELING_SIZES;
#ifdef MODELING_HAS_CGAL
BENCHMARK_CAPTURE(cgalAdjacency, ordered, false)->Name("halfEdges:CGAL")->MODELING_PEER_SIZES;
BENCHMARK_CAPTURE(cgalAdjacency, shuffled, true)->Name("halfEdges shuffled:CGAL")->MODELING_PEER_SIZES;
#endif
#ifdef MODELING_HAS_OPENMESH
BENCHMARK_CAPTURE(openMeshAdjacency, ordered, false)->Name("halfEdges:OpenMesh")->MODELING_PEER_SIZES;
BENCHMARK_CAPTURE(openMeshAdjacency, shuffled, true)->Name("halfEdges shuffled:OpenMesh")->MODELING_PEER_SIZES;
#endif
#undef MODELING_SIZES
#undef MODELING_PEER_SIZES

// Faces of the coarse mesh; 81 times as many in the result.
#define MODELING_SIZES Arg(1'280)->Arg(20'480)->Arg(81'920)->UseRealTime()
#define MODELING_PEER_SIZES Arg(1'280)->Arg(20'480)->UseRealTime()
BENCHMARK(subdivideUniformly)->Name("subdivide uniform")->MODELING_SIZES;
BENCHMARK(flatUniform)->Name("subdivide uniform:flat kernel")->MODELING_SIZES;
BENCHMARK(copyRefined)->Name("subdivide uniform:memcpy")->MODELING_SIZES;
#ifdef MODELING_HAS_CGAL
BENCHMARK(cgalUniform)->Name("subdivide uniform:CGAL")->MODELING_PEER_SIZES;
#endif
#ifdef MODELING_HAS_OPENMESH
BENCHMARK(openMeshUniform)->Name("subdivide uniform:OpenMesh")->MODELING_PEER_SIZES;
#endif
#undef MODELING_SIZES
#undef MODELING_PEER_SIZES

// Faces of the coarse mesh; about 15 times as many in the result.
BENCHMARK(subdivideAdaptively)->Name("subdivide adaptive")->Arg(5'120)->Arg(81'920)->Arg(1'310'720)->UseRealTime();
#ifdef MODELING_HAS_OPENMESH
BENCHMARK(openMeshAdaptive)->Name("subdivide adaptive:OpenMesh")->Arg(5'120)->Arg(81'920)->UseRealTime();
#endif

}
