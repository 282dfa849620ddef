#include "Inputs.h"

#include <meshoptimizer.h>

using namespace Benchmarks;

namespace {

/// The point across each edge of each triangle. Edges are matched by their positions, and points have no list of faces.
template <auto make> void measureAdjacency(Run& run)
{
    FlatMesh const mesh(make, run.size());
    measureRefinement(run, [&] {
        Indices patches(2 * mesh.faceVertex.size, Orvan::kUninitialized);
        meshopt_generateAdjacencyIndexBuffer(patches.data, mesh.faceVertex.data, mesh.faceVertex.size,
            &mesh.points.data->x, mesh.points.size, sizeof(float3));
        DoNotOptimize(patches.data);
        return mesh.faceCount();
    });
}
Row const adjacency("halfEdges:meshoptimizer", withoutLargest(kHalfEdges), measureAdjacency<Meshes::sphere>);
Row const shuffled("halfEdges shuffled:meshoptimizer", withoutLargest(kHalfEdges), measureAdjacency<Meshes::shuffled>);

/// Compacts the corners that remain in a loop of ours, then numbers the points that they use, which also puts these in order of
/// use, and moves positions and normals.
Row const deletion("deleteFaces:meshoptimizer", kFaces, [](Run& run) {
    PatchedSphere const sphere(run.size());
    std::size_t remaining = 0;
    timeOnCopies(run, sphere.faceCount(), sphere, [&](PatchedSphere& mesh) {
        std::size_t corners = 0, faces = 0;
        for (std::size_t face = 0; face != sphere.faceCount(); ++face) {
            if (sphere.deleted[face])
                continue;
            for (std::size_t corner = 3 * face; corner != 3 * face + 3; ++corner) {
                mesh.faceVertex[corners] = mesh.faceVertex[corner];
                mesh.coordinates[corners++] = mesh.coordinates[corner];
            }
            mesh.materials[faces++] = mesh.materials[face];
        }
        Indices remap(mesh.points.size, Orvan::kUninitialized);
        std::size_t const count =
            meshopt_optimizeVertexFetchRemap(remap.data, mesh.faceVertex.data, corners, mesh.points.size);
        meshopt_remapIndexBuffer(mesh.faceVertex.data, mesh.faceVertex.data, corners, remap.data);
        for (Points* const array : {&mesh.points, &mesh.normals}) {
            Points moved(count, Orvan::kUninitialized);
            meshopt_remapVertexBuffer(moved.data, array->data, array->size, sizeof(float3), remap.data);
            array->swap(moved);
        }
        DoNotOptimize(mesh.points.data);
        remaining = faces;
    });
    run.reportResult(static_cast<double>(remaining));
});

}
