#include "Inputs.h"

#include "frame/Arrays.h"
#include "subdivision/refineMesh.h"

#include <Modeling/HalfEdgeDataStructure.h>
#include <Modeling/addPointsToPointCloud.h>
#include <Modeling/deleteFaces.h>
#include <Modeling/deletePointsInPointCloud.h>
#include <Modeling/mergeMeshes.h>
#include <Modeling/mergePointClouds.h>
#include <Modeling/removeSlivers.h>
#include <Modeling/smooth.h>
#include <Modeling/subdivide.h>
#include <Modeling/triangulate.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>

using namespace Benchmarks;
using namespace Tessara::Geometry;
using namespace Tessara::GeometryAlgorithms;

namespace {

constexpr std::size_t kTriangleBytes = 4 * sizeof(unsigned int); // corners and offset
constexpr std::size_t kPointBytes = 32; // in the clouds that are edited and merged

template <class Edit> Object edited(Object object, Edit const& edit)
{
    edit(object);
    return object;
}

RowBesideCopy const slivers("removeSlivers", kTriangles, [](Run& run) {
    auto const bytes = [](std::size_t points, std::size_t faces) {
        return points * sizeof(float3) + faces * kTriangleBytes;
    };
    PolygonMesh const& mesh = made(Meshes::needled, run.size());
    if (run.copies(bytes(mesh.points.size(), mesh.faceCount()), run.size()))
        return;
    auto const edit = [](Object& object) { Geometry::Mesh::removeSlivers(kSliverRatio, object); };
    auto const source = mesh.build();
    Object const result = edited(*source, edit);
    measureEdit(
        run, run.size(), bytes(getElementCount(result, sPointComp), getElementCount(result, sFaceComp)), *source, edit);
});

/// The shortest edges of all faces end at one of two hubs.
Row const sliversAtHubs("removeSlivers:hubs", kTriangles, [](Run& run) {
    auto const source = MeshBuilder::wheel(static_cast<unsigned int>(run.size() / 2)).build();
    timeOnCopies(run, run.size(), *source, [](Object& mesh) { Geometry::Mesh::removeSlivers(0.5f, mesh); });
});

void measureSmoothing(Run& run, FlatMesh mesh, std::size_t elementsPerStep)
{
    float const amount = 0.9f * kSmoothingSteps - 0.1f; // rounding leaves no further step
    auto const smooth = [&] {
        Geometry::Mesh::smooth(amount, mesh.pointCount(), mesh.faceCount(), mesh.faceVertex, mesh.faceOffset, nullptr,
            mesh.points, CoreGL::NOPLogger());
    };
    timeRuns(run, elementsPerStep * kSmoothingSteps, smooth);
    run.report("working bytes/corner", memoryOf(smooth).peak / static_cast<double>(mesh.faceVertex.size));
}

RowBesideCopy const smoothing("smooth triangles", kTriangles, [](Run& run) {
    FlatMesh const mesh(Meshes::noisy, run.size());
    if (!run.copies(mesh.points.size * sizeof(float3), mesh.faceCount())) // once per step
        measureSmoothing(run, mesh, mesh.faceCount());
});

Row const smoothingQuads("smooth quads, a corner", kTriangles, [](Run& run) {
    FlatMesh const mesh(Meshes::bentQuads, run.size());
    measureSmoothing(run, mesh, mesh.faceVertex.size);
});

Orvan::MutablePtr<Object> makeObject(FlatCloud const& cloud)
{
    auto object = makePointCloud(cloud.positions);
    addDataProperty("normal", sPointComp, cloud.normals, *object);
    addDataProperty("color", sPointComp, cloud.colors, *object);
    addDataProperty("intensity", sPointComp, cloud.intensities, *object);
    return object;
}

RowBesideCopy const adding("addPointsToPointCloud", kAdded, [](Run& run) {
    std::size_t const count = run.size() + run.size(1), bytes = count * kPointBytes;
    if (run.copies(bytes, count))
        return;
    auto const cloud = makeObject(FlatCloud(run.size()));
    Points const positions(run.size(1), float3{1, 2, 3});
    // The result has as much unused capacity, whose memory is never touched.
    measureEdit(
        run, count, 2 * bytes, *cloud, [&](Object& object) { addPointsToPointCloud(positions, {}, object, nullptr); });
});

RowBesideCopy const deletingPoints("deletePointsInPointCloud", kPoints, [](Run& run) {
    if (run.copies(run.size() * kPointBytes, run.size()))
        return;
    auto const cloud = makeObject(FlatCloud(run.size()));
    auto const indices = everySecondAtRandom(run.size());
    measureEdit(run, run.size(), (run.size() - indices.size) * kPointBytes, *cloud,
        [&](Object& object) { deletePointsInPointCloud(indices, object, nullptr); });
});

/// On an object that is not shared: arrays are edited in place.
Row const deletingInPlace("deletePointsInPointCloud:in place", kPoints, [](Run& run) {
    auto const make = [cloud = FlatCloud(run.size())] { return makeObject(cloud); };
    auto const indices = everySecondAtRandom(run.size());
    timeOnEach(run, run.size(), make, [&](auto const& object) { deletePointsInPointCloud(indices, *object, nullptr); });
});

RowBesideCopy const deletingFaces("deleteFaces", kFaces, [](Run& run) {
    PatchedSphere const sphere(run.size());
    if (!run.copies(sphere.bytes(), sphere.faceCount()))
        measureEdit(run, sphere.faceCount(), sphere.bytes() / 2, *sphere.build(),
            [&](Object& object) { deleteFaces(sphere.deleted, object); });
});

/// `elements` and `bytes` are those of each input.
void measureMerging(Run& run, std::size_t elements, std::size_t bytes, decltype(&mergeMeshes) merge,
    std::function<Orvan::MutablePtr<Object>()> const& makeInput)
{
    if (run.copies(run.size() * bytes, run.size() * elements))
        return;
    Orvan::Array<Orvan::Ptr<Object>> inputs;
    while (inputs.size != run.size())
        inputs.append(makeInput());
    auto const mergeInto = [&](Object& output) { merge(inputs, output, nullptr); };
    timeOnCopies(run, run.size() * elements, Object(), mergeInto);
    Object output;
    Memory const memory = memoryOf([&] { mergeInto(output); });
    run.report("peak/result", memory.peak / memory.kept);
}

RowBesideCopy const mergingMeshes("mergeMeshes", kMeshes, [](Run& run) {
    PatchedSphere const sphere(run.size(1));
    std::size_t const bytes = sphere.bytes() - sizeof(unsigned int); // the offset behind the last face
    measureMerging(run, sphere.faceCount(), bytes, mergeMeshes, [&] { return sphere.build(); });
});

RowBesideCopy const mergingClouds("mergePointClouds", kClouds, [](Run& run) {
    std::size_t const points = run.size(1);
    measureMerging(run, points, points * kPointBytes, mergePointClouds, [=] {
        auto cloud = makePointCloud(Points(points, float3{1, 2, 3}));
        addDataProperty("color", sPointComp, Orvan::Array<int>(points, 1), *cloud);
        addDataProperty("weight", sPointComp, Orvan::Array<double>(points, 0.5), *cloud);
        addDataProperty("id", sPointComp, Orvan::Array<unsigned int>(points, 3u), *cloud);
        addDataProperty("radius", sPointComp, Orvan::Array<float>(points, 1.0f), *cloud);
        return cloud;
    });
});

/// One polygon with that many corners.
PolygonMesh comb(std::size_t corners)
{
    auto const teeth = static_cast<float>(corners / 2 - 1);
    std::vector<float3> outline{{teeth / 2, -10, 0}, {teeth, 0, 0}};
    for (float tooth = teeth - 1; tooth >= 0; --tooth)
        outline.insert(outline.end(), {{tooth + 0.5f, 5, 0}, {tooth, 0, 0}});
    PolygonMesh mesh;
    mesh.addPolygon(outline);
    return mesh;
}

std::size_t triangleCountOf(PolygonMesh const& mesh)
{
    return mesh.faceVertex.size() - 2 * mesh.faceCount();
}

void triangulateAll(Object& object)
{
    Geometry::Mesh::triangulate("*", object);
}

void measureTriangulation(Run& run, MakeMesh make)
{
    PolygonMesh const& mesh = made(make, run.size());
    std::size_t const triangles = triangleCountOf(mesh), bytes = triangles * kTriangleBytes;
    if (!run.copies(bytes, triangles))
        measureEdit(run, triangles, bytes, *mesh.build(), triangulateAll);
}

RowBesideCopy const quads("triangulate quads", kQuads, [](Run& run) { measureTriangulation(run, Meshes::bentQuads); });
RowBesideCopy const polygons(
    "triangulate polygons", kPolygons, [](Run& run) { measureTriangulation(run, Meshes::concave); });
Row const combs("triangulate comb", {{100}, {1'000}, {10'000}}, [](Run& run) { measureTriangulation(run, comb); });

/// Normals, texture coordinates and weights at the corners, and numbers of faces.
RowBesideCopy const attributes("triangulate attributes", kQuads, [](Run& run) {
    PolygonMesh const& mesh = made(Meshes::bentQuads, run.size());
    std::size_t const triangles = triangleCountOf(mesh), corners = mesh.faceVertex.size();
    if (run.copies(triangles * (kTriangleBytes + 3 * (12 + 8 + 8) + 4), triangles))
        return;
    auto const source = mesh.build();
    addDataProperty("normal", sFaceVertexComp, Points(corners, float3{0, 0, 1}), *source);
    addDataProperty("uv", sFaceVertexComp, Orvan::Array<float2>(corners, float2{0.5f, 0.25f}), *source);
    addDataProperty("weight", sFaceVertexComp, Orvan::Array<double>(corners, 0.5), *source);
    addDataProperty("material", sFaceComp, Orvan::Array<int>(mesh.faceCount(), 3), *source);
    timeOnCopies(run, triangles, *source, triangulateAll);
});

void measureHalfEdges(Run& run, MakeMesh make)
{
    FlatMesh const mesh(make, run.size());
    if (run.copies(mesh.faceVertex.size * sizeof(unsigned int), mesh.faceCount()))
        return;
    auto const build = [&] {
        Geometry::Mesh::HalfEdgeDataStructure const built(
            mesh.pointCount(), mesh.faceCount(), mesh.faceVertex, mesh.faceOffset);
        DoNotOptimize(built.valence(0));
    };
    timeRuns(run, mesh.faceCount(), build);
    run.reportWorkingBytes(mesh.faceCount(), memoryOf(build).peak);
}
RowBesideCopy const halfEdges("halfEdges", kHalfEdges, [](Run& run) { measureHalfEdges(run, Meshes::sphere); });
Row const shuffled("halfEdges shuffled", kHalfEdges, [](Run& run) { measureHalfEdges(run, Meshes::shuffled); });

/// Elements are the faces of the result.
template <class Refine> void measureRefinement(Run& run, MakeMesh make, Refine const& refine)
{
    auto const source = made(make, run.size()).build();
    Object const result = edited(*source, refine);
    std::size_t const faces = getElementCount(result, sFaceComp);
    measureEdit(run, faces, 0, *source, refine);
    run.report("result faces", static_cast<double>(faces));
}

RowBesideCopy const uniform("subdivide uniform", kUniform, [](Run& run) {
    std::size_t const faces = run.size() * 81;
    if (run.copies(faces * kTriangleBytes + faces * sizeof(float3) / 2, faces))
        return;
    measureRefinement(run, Meshes::icosphere, [](Object& mesh) {
        unsigned int pass = 0;
        auto const markAll = [&](auto const&, Orvan::Array<bool>& marks) {
            if (pass++ != kUniformSteps)
                Modeling::fillElements(marks.data, marks.size, true);
        };
        Geometry::Mesh::Internal::refineMesh(markAll, mesh);
    });
});

Row const adaptive("subdivide adaptive", kAdaptive, [](Run& run) {
    float const tolerance = toleranceFor(run.size());
    measureRefinement(run, Meshes::graded, [=](Object& mesh) { Geometry::Mesh::subdivide(tolerance, mesh); });
});

}
