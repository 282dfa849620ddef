#include "Measuring.h"
#if defined(MODELING_HAS_OPENMESH) || defined(MODELING_HAS_VTK)
#include "peers/smoothers.h"
#endif

#include "support/MeshBuilder.h"
#include "support/PolygonMesh.h"

#include <Modeling/smooth.h>

#include <cmath>

using TestSupport::MeshBuilder;
using TestSupport::PolygonMesh;

namespace {

constexpr int kSteps = 10;
constexpr float kAmount = 0.9f * kSteps - 0.1f; // rounding leaves no further step

PolygonMesh noisySphere(std::size_t faces)
{
    MeshBuilder const sphere =
        MeshBuilder::sphereWithFaces(faces).withNoise(0.1f / std::sqrt(static_cast<float>(faces)), 1);
    PolygonMesh mesh;
    mesh.points = sphere.points;
    for (MeshBuilder::Triangle const& face : sphere.faces) {
        mesh.faceVertex.insert(mesh.faceVertex.end(), face.begin(), face.end());
        mesh.faceOffset.push_back(static_cast<unsigned int>(mesh.faceVertex.size()));
    }
    return mesh;
}

PolygonMesh noisyQuads(std::size_t faces)
{
    auto const segments = static_cast<unsigned int>(std::sqrt(static_cast<double>(faces)));
    return PolygonMesh::quads(segments).withNoise(0.2f, 1);
}

/// Counts a face and step for triangles, a corner and step for others.
void smoothMesh(benchmark::State& state, PolygonMesh const& mesh, std::size_t elements)
{
    Orvan::Array<unsigned int> const faceVertex{std::span(mesh.faceVertex)};
    Orvan::Array<unsigned int> const faceOffset{std::span(mesh.faceOffset)};
    Orvan::Array<TestSupport::float3> positions{std::span(mesh.points)};
    auto const run = [&] {
        Geometry::Mesh::smooth(kAmount, static_cast<unsigned int>(mesh.points.size()),
            static_cast<unsigned int>(mesh.faceCount()), faceVertex, faceOffset, nullptr, positions,
            CoreGL::NOPLogger());
    };
    for (auto _ : state)
        run();
    Benchmarks::countElements(state, elements * kSteps);
    state.counters["working bytes/corner"] =
        static_cast<double>(Benchmarks::peakBytesOf(run)) / static_cast<double>(mesh.faceVertex.size());
}

void smoothTriangles(benchmark::State& state)
{
    PolygonMesh const mesh = noisySphere(static_cast<std::size_t>(state.range(0)));
    smoothMesh(state, mesh, mesh.faceCount());
}

void smoothQuads(benchmark::State& state)
{
    PolygonMesh const mesh = noisyQuads(static_cast<std::size_t>(state.range(0)));
    smoothMesh(state, mesh, mesh.faceVertex.size());
}

/// The positions, once a step.
void copyPositions(benchmark::State& state)
{
    PolygonMesh const mesh = noisySphere(static_cast<std::size_t>(state.range(0)));
    Benchmarks::copyBytes(state, mesh.points.size() * sizeof(TestSupport::float3));
    Benchmarks::countElements(state, mesh.faceCount());
}

template <class Peer> void measurePeer(benchmark::State& state)
{
    PolygonMesh const mesh = noisySphere(static_cast<std::size_t>(state.range(0)));
    Peer peer(mesh);
    for (auto _ : state)
        peer.smooth(kSteps);
    Benchmarks::countElements(state, mesh.faceCount() * kSteps);
}

#ifdef MODELING_HAS_OPENMESH
void openMesh(benchmark::State& state)
{
    measurePeer<Benchmarks::OpenMeshSmoother>(state);
}
#endif

#ifdef MODELING_HAS_VTK
void vtk(benchmark::State& state)
{
    measurePeer<Benchmarks::VtkSmoother>(state);
}
#endif

#define MODELING_SIZES Arg(5'000)->Arg(50'000)->Arg(500'000)->UseRealTime()
BENCHMARK(smoothTriangles)->Name("smooth triangles")->MODELING_SIZES;
BENCHMARK(copyPositions)->Name("smooth triangles:memcpy")->MODELING_SIZES;
BENCHMARK(smoothQuads)->Name("smooth quads, a corner")->MODELING_SIZES;
#ifdef MODELING_HAS_OPENMESH
BENCHMARK(openMesh)->Name("smooth triangles:OpenMesh")->MODELING_SIZES;
#endif
#ifdef MODELING_HAS_VTK
BENCHMARK(vtk)->Name("smooth triangles:VTK")->MODELING_SIZES;
#endif

}
