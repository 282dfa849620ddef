#include "Measuring.h"
#include "peers/cgalNeedles.h"
#include "peers/smoothers.h"

#include "frame/Arrays.h"
#include "frame/PointCorners.h"
#include "frame/VectorMath.h"

#include <Modeling/removeSlivers.h>
#include <Modeling/smooth.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Names.h>

#include <cmath>

using namespace Benchmarks;
using namespace Modeling;

namespace {

Sizes const kSizes{{5'000}, {50'000}, {500'000}};
constexpr float kRatio = 0.05f;

/// A sphere with needles, 23,520 of them at 500,000 faces: each cut makes two.
MeshBuilder const& needledSphere(State const& state)
{
    return madeOnce(sizeOf(state),
        [](std::size_t faces) { return MeshBuilder::sphereWithFaces(faces).withNeedles(faces * 1176 / 50'000); });
}

std::size_t bytesOf(std::size_t pointCount, std::size_t faceCount)
{
    return pointCount * sizeof(float3) + faceCount * 4 * sizeof(unsigned int); // corners and offsets
}

Row const removesSlivers("removeSlivers", kSizes, [](State& state) {
    using namespace Tessara::Geometry;
    auto const source = needledSphere(state).build();
    auto const edit = [](Object& mesh) { Geometry::Mesh::removeSlivers(kRatio, mesh); };
    Object result = *source;
    edit(result);
    measureEdit(state, sizeOf(state), bytesOf(getElementCount(result, sPointComp), getElementCount(result, sFaceComp)),
        *source, edit);
});

/// The shortest edges of all faces end at one of two hubs.
Row const removesSliversAtHubs("removeSlivers:hubs", kSizes, [](State& state) {
    auto const source = MeshBuilder::wheel(static_cast<unsigned int>(sizeOf(state) / 2)).build();
    timeOnCopies(state, sizeOf(state), *source, [](Object& mesh) { Geometry::Mesh::removeSlivers(0.5f, mesh); });
});

/// The face across edge k of a face.
unsigned int twinOf(PointCorners const& around, unsigned int const* corner, unsigned int face, unsigned int k)
{
    unsigned int const* const c = corner + std::size_t{3} * face;
    unsigned int const end = c[k == 2 ? 0 : k + 1];
    for (unsigned int i = around.offsets[end]; i != around.offsets[end + 1]; ++i) {
        unsigned int const other = around.corners[i];
        if (corner[other % 3 == 2 ? other - 2 : other + 1] == c[k])
            return other / 3;
    }
    return Tessara::Geometry::kInvalidIndex;
}

/// What any method needs: adjacency, normals and one measuring sweep over flat arrays.
Row const flatPasses("removeSlivers:flat passes", kSizes, [](State& state) {
    FlatMesh const mesh(needledSphere(state).polygons());
    unsigned int const* const corner = mesh.faceVertex.data;
    float3 const* const position = mesh.points.data;
    timeRuns(state, sizeOf(state), [&] {
        PointCorners const around = cornersByPoint(mesh.pointCount(), corner, mesh.faceVertex.size);
        auto adjacency = uninitializedArray<unsigned int>(mesh.faceVertex.size);
        auto normals = uninitializedArray<float3>(mesh.faceCount());
        auto ratios = uninitializedArray<float>(mesh.faceCount());
        parallelFor(tbb::blocked_range<unsigned int>(0, mesh.faceCount(), 1), [&](auto const& faces) {
            for (unsigned int face = faces.begin(); face != faces.end(); ++face) {
                unsigned int const* const c = corner + std::size_t{3} * face;
                for (unsigned int k = 0; k != 3; ++k)
                    adjacency[std::size_t{3} * face + k] = twinOf(around, corner, face, k);
                float3 const a = position[c[0]], b = position[c[1]], d = position[c[2]];
                normals[face] = cross(safeNormalize(b - a), safeNormalize(d - a));
                float const ab = length(b - a), bd = length(d - b), da = length(a - d);
                ratios[face] = std::min({ab, bd, da}) / std::max({ab, bd, da});
            }
        });
        benchmark::DoNotOptimize(adjacency.data);
        benchmark::DoNotOptimize(normals.data);
        benchmark::DoNotOptimize(ratios.data);
    });
});

CopyRow const sliverBytes("removeSlivers", kSizes, [](State const& state) -> CopyRow::Input {
    MeshBuilder const& mesh = needledSphere(state);
    return {bytesOf(mesh.points.size(), mesh.faces.size()), sizeOf(state)};
});

constexpr int kSteps = 10;
constexpr float kAmount = 0.9f * kSteps - 0.1f; // rounding leaves no further step

PolygonMesh noisySphere(std::size_t faces)
{
    float const noise = 0.1f / std::sqrt(static_cast<float>(faces));
    return MeshBuilder::sphereWithFaces(faces).withNoise(noise, 1).polygons();
}

void measureSmoothing(State& state, FlatMesh mesh, std::size_t elementsPerStep)
{
    auto const run = [&] {
        Geometry::Mesh::smooth(kAmount, mesh.pointCount(), mesh.faceCount(), mesh.faceVertex, mesh.faceOffset, nullptr,
            mesh.points, CoreGL::NOPLogger());
    };
    timeRuns(state, elementsPerStep * kSteps, run);
    state.counters["working bytes/corner"] =
        static_cast<double>(memoryOf(run).peak) / static_cast<double>(mesh.faceVertex.size);
}

// An element is a face and step for triangles, a corner and step for others.
Row const smoothsTriangles("smooth triangles", kSizes, [](State& state) {
    FlatMesh const mesh(noisySphere(sizeOf(state)));
    measureSmoothing(state, mesh, mesh.faceCount());
});

CopyRow const positionBytes("smooth triangles", kSizes, [](State const& state) -> CopyRow::Input { // once per step
    PolygonMesh const mesh = noisySphere(sizeOf(state));
    return {mesh.points.size() * sizeof(float3), mesh.faceCount()};
});

Row const smoothsQuads("smooth quads, a corner", kSizes, [](State& state) {
    FlatMesh const mesh(bentQuads(sizeOf(state)));
    measureSmoothing(state, mesh, mesh.faceVertex.size);
});

template <class Peer> [[maybe_unused]] void smoothWithPeer(State& state)
{
    PolygonMesh const mesh = noisySphere(sizeOf(state));
    Peer peer(mesh);
    timeRuns(state, mesh.faceCount() * kSteps, [&] { peer.smooth(kSteps); });
}

#ifdef MODELING_HAS_CGAL
Row const cgalNeedles("removeSlivers:CGAL", kSizes, [](State& state) {
    timeOnCopies(
        state, sizeOf(state), CgalMesh(needledSphere(state)), [](CgalMesh& mesh) { mesh.removeNeedles(kRatio); });
});
#endif
#ifdef MODELING_HAS_OPENMESH
Row const openMeshSmoothing("smooth triangles:OpenMesh", kSizes, smoothWithPeer<OpenMeshSmoother>);
#endif
#ifdef MODELING_HAS_VTK
Row const vtkSmoothing("smooth triangles:VTK", kSizes, smoothWithPeer<VtkSmoother>);
#endif

}
