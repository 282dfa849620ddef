#include "Inputs.h"

#include <open3d/geometry/PointCloud.h>
#include <open3d/geometry/TriangleMesh.h>

// Positions, normals and colors are in double precision here: a point of a cloud has 72 bytes, one of a mesh 48.

using namespace Benchmarks;
using open3d::geometry::PointCloud, open3d::geometry::TriangleMesh;

namespace {

TriangleMesh meshOf(PolygonMesh const& source)
{
    TriangleMesh mesh;
    for (auto const& p : source.points)
        mesh.vertices_.emplace_back(p.x, p.y, p.z);
    for (std::size_t corner = 0; corner != source.faceVertex.size(); corner += 3) {
        unsigned int const* const c = source.faceVertex.data() + corner;
        mesh.triangles_.emplace_back(static_cast<int>(c[0]), static_cast<int>(c[1]), static_cast<int>(c[2]));
    }
    return mesh;
}

/// With normals and texture coordinates; faces have no arrays of their own.
TriangleMesh attributedSphere(std::size_t faces)
{
    TriangleMesh mesh = meshOf(made(Meshes::sphere, faces));
    mesh.vertex_normals_.assign(mesh.vertices_.size(), {0, 0, 1});
    mesh.triangle_uvs_.assign(3 * mesh.triangles_.size(), {0.5, 0.25});
    mesh.triangle_material_ids_.assign(mesh.triangles_.size(), 7);
    return mesh;
}

PointCloud cloudOf(std::size_t count)
{
    PointCloud cloud;
    cloud.points_.assign(count, {1, 2, 3});
    cloud.normals_.assign(count, {0, 0, 1});
    cloud.colors_.assign(count, {0, 0, 0});
    return cloud;
}

/// Weighs neighbors by their distance and moves points along their normals too.
Row const smoothing("smooth triangles:Open3D", withoutLargest(kTriangles), [](Run& run) {
    TriangleMesh const mesh = meshOf(made(Meshes::noisy, run.size()));
    std::shared_ptr<TriangleMesh> smooth;
    timeRuns(run, mesh.triangles_.size() * kSmoothingSteps,
        [&] { smooth = mesh.FilterSmoothLaplacian(kSmoothingSteps, 0.9); });
    Points points;
    for (auto const& p : smooth->vertices_)
        points.append({static_cast<float>(p[0]), static_cast<float>(p[1]), static_cast<float>(p[2])});
    run.reportSimilarResult(meanRadius(points));
});

/// Texture coordinates and materials are left behind, so the mesh has none.
Row const deletion("deleteFaces:Open3D", kFaces, [](Run& run) {
    PatchedSphere const sphere(run.size());
    TriangleMesh source = attributedSphere(run.size());
    source.triangle_uvs_.clear();
    source.triangle_material_ids_.clear();
    std::vector<bool> const deleted(sphere.deleted.begin(), sphere.deleted.end());
    std::size_t remaining = 0;
    timeOnCopies(run, sphere.faceCount(), source, [&](TriangleMesh& mesh) {
        mesh.RemoveTrianglesByMask(deleted);
        mesh.RemoveUnreferencedVertices();
        remaining = mesh.triangles_.size();
    });
    run.reportResult(static_cast<double>(remaining));
});

Row const deletingPoints("deletePointsInPointCloud:Open3D", kPoints, [](Run& run) {
    PointCloud const cloud = cloudOf(run.size());
    Indices const indices = everySecondAtRandom(run.size());
    std::vector<std::size_t> const picked(indices.begin(), indices.end());
    std::size_t remaining = 0;
    timeRuns(run, run.size(), [&] { remaining = cloud.SelectByIndex(picked, true)->points_.size(); });
    run.reportResult(static_cast<double>(remaining));
});

/// Adds input after input to the first, which is how meshes and clouds are joined here.
template <class Geometry> Geometry merged(std::vector<Geometry> const& inputs)
{
    Geometry result;
    for (Geometry const& input : inputs)
        result += input;
    return result;
}

Row const mergingMeshes("mergeMeshes:Open3D", kMeshes, [](Run& run) {
    std::vector<TriangleMesh> const inputs(run.size(), attributedSphere(run.size(1)));
    std::size_t faces = 0;
    timeRuns(run, run.size() * inputs[0].triangles_.size(), [&] { faces = merged(inputs).triangles_.size(); });
    run.reportResult(static_cast<double>(faces));
});

Row const mergingClouds("mergePointClouds:Open3D", kClouds, [](Run& run) {
    std::vector<PointCloud> const inputs(run.size(), cloudOf(run.size(1)));
    std::size_t points = 0;
    timeRuns(run, run.size() * run.size(1), [&] { points = merged(inputs).points_.size(); });
    run.reportResult(static_cast<double>(points));
});

Row const adding("addPointsToPointCloud:Open3D", kAdded, [](Run& run) {
    PointCloud const source = cloudOf(run.size()), added = cloudOf(run.size(1));
    std::size_t count = 0;
    timeRuns(run, run.size() + run.size(1), [&] { count = (source + added).points_.size(); });
    run.reportResult(static_cast<double>(count));
});

}
