#include "Measuring.h"
#if defined(MODELING_HAS_OPENMESH) || defined(MODELING_HAS_VTK)
#include "peers/smoothers.h"
#endif

#include "support/MeshBuilder.h"

#include <Modeling/smooth.h>

#include <cmath>

using namespace Benchmarks;
using TestSupport::PolygonMesh;

namespace {

constexpr int kSteps = 10;
constexpr float kAmount = 0.9f * kSteps - 0.1f; // rounding leaves no further step

PolygonMesh noisySphere(std::size_t faces)
{
    float const noise = 0.1f / std::sqrt(static_cast<float>(faces));
    return TestSupport::MeshBuilder::sphereWithFaces(faces).withNoise(noise, 1).polygons();
}

PolygonMesh noisyQuads(std::size_t faces)
{
    auto const segments = static_cast<unsigned int>(std::sqrt(static_cast<double>(faces)));
    return PolygonMesh::quads(segments).withNoise(0.2f, 1);
}

/// An element is a face and step for triangles, a corner and step for others.
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
    countElements(state, elements * kSteps);
    state.counters["working bytes/corner"] =
        static_cast<double>(memoryOf(run).peak) / static_cast<double>(mesh.faceVertex.size());
}

template <class Peer> [[maybe_unused]] void smoothWithPeer(benchmark::State& state)
{
    PolygonMesh const mesh = noisySphere(sizeOf(state));
    Peer peer(mesh);
    for (auto _ : state)
        peer.smooth(kSteps);
    countElements(state, mesh.faceCount() * kSteps);
}

[[maybe_unused]] bool const areRowsAdded = [] {
    Sizes const sizes{{5'000}, {50'000}, {500'000}};
    addRow("smooth triangles", sizes, [](benchmark::State& state) {
        PolygonMesh const mesh = noisySphere(sizeOf(state));
        smoothMesh(state, mesh, mesh.faceCount());
    });
    addRow("smooth triangles:memcpy", sizes, [](benchmark::State& state) { // the positions, once per step
        PolygonMesh const mesh = noisySphere(sizeOf(state));
        copyBytes(state, mesh.points.size() * sizeof(TestSupport::float3), mesh.faceCount());
    });
    addRow("smooth quads, a corner", sizes, [](benchmark::State& state) {
        PolygonMesh const mesh = noisyQuads(sizeOf(state));
        smoothMesh(state, mesh, mesh.faceVertex.size());
    });
#ifdef MODELING_HAS_OPENMESH
    addRow("smooth triangles:OpenMesh", sizes, smoothWithPeer<OpenMeshSmoother>);
#endif
#ifdef MODELING_HAS_VTK
    addRow("smooth triangles:VTK", sizes, smoothWithPeer<VtkSmoother>);
#endif
    return true;
}();

}
