// Cleaning up, triangulating and refining meshes. The rows `:flat passes`, `:flat diagonals` and `:flat kernel` are what that costs
// at least: loops over plain arrays, without objects, checks or exceptions to rules.

#include "Inputs.h"

#include "frame/Arrays.h"
#include "frame/FaceAdjacency.h"
#include "frame/VectorMath.h"
#include "subdivision/refineMesh.h"

#include <Modeling/HalfEdgeDataStructure.h>
#include <Modeling/removeSlivers.h>
#include <Modeling/smooth.h>
#include <Modeling/subdivide.h>
#include <Modeling/triangulate.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>

#include <algorithm>
#include <cmath>

using namespace Benchmarks;
using namespace Modeling;
using namespace Tessara::Geometry;

namespace {

constexpr std::size_t kTriangleBytes = 4 * sizeof(unsigned int); // corners and offset

template <class Work> void forEachIndex(unsigned int count, Work const& work)
{
    parallelFor(tbb::blocked_range<unsigned int>(0, count, 1), [&](auto const& range) {
        for (unsigned int i = range.begin(); i != range.end(); ++i)
            work(i);
    });
}

/// What any method needs: adjacency, normals and one measuring sweep.
void measureFaces(FlatMesh const& mesh)
{
    float3 const* const position = mesh.points.data;
    FaceView const faces{mesh.faceVertex.data, mesh.faceOffset, mesh.faceCount()};
    FaceAdjacency const adjacency =
        buildFaceAdjacency(faces, cornersByPoint(mesh.pointCount(), mesh.faceVertex.data, mesh.faceVertex.size));
    auto normals = uninitializedArray<float3>(mesh.faceCount());
    auto ratios = uninitializedArray<float>(mesh.faceCount());
    forEachIndex(mesh.faceCount(), [&](unsigned int face) {
        unsigned int const* const c = faces.corners(face);
        float3 const a = position[c[0]], b = position[c[1]], d = position[c[2]];
        normals[face] = cross(safeNormalize(b - a), safeNormalize(d - a));
        float const ab = length(b - a), bd = length(d - b), da = length(a - d);
        ratios[face] = std::min({ab, bd, da}) / std::max({ab, bd, da});
    });
    DoNotOptimize(adjacency.data);
    DoNotOptimize(normals.data);
    DoNotOptimize(ratios.data);
}

Row const slivers("removeSlivers", with(10'000'000, kTriangles), {"", ":memcpy", ":flat passes"}, [](Run& run) {
    PolygonMesh const& needled = made(Meshes::needled, run.size());
    if (run.copies(needled.points.size() * sizeof(float3) + needled.faceCount() * kTriangleBytes, run.size()))
        return;
    if (run.variant == ":flat passes")
        timeRuns(run, run.size(), [mesh = FlatMesh(Meshes::needled, run.size())] { measureFaces(mesh); });
    else
        run.reportSimilarResult(
            getElementCount(measureEdit(run, run.size(), *needled.build(),
                                [](Object& mesh) { ::Geometry::Mesh::removeSlivers(kSliverRatio, mesh); }),
                sFaceComp));
});

/// The shortest edges of all faces end at one of two hubs.
Row const sliversAtHubs("removeSlivers at hubs", kTriangles, [](Run& run) {
    auto const source = MeshBuilder::wheel(static_cast<unsigned int>(run.size() / 2)).build();
    timeOnCopies(run, run.size(), *source, [](Object& mesh) { ::Geometry::Mesh::removeSlivers(0.5f, mesh); });
});

void measureSmoothing(Run& run, FlatMesh mesh, std::size_t elementsPerStep)
{
    float const amount = 0.9f * kSmoothingSteps - 0.1f; // rounding leaves no further step
    auto const smooth = [&] {
        ::Geometry::Mesh::smooth(amount, mesh.pointCount(), mesh.faceCount(), mesh.faceVertex, mesh.faceOffset, nullptr,
            mesh.points, CoreGL::NOPLogger());
    };
    timeRuns(run, elementsPerStep * kSmoothingSteps, smooth);
    run.reportSimilarResult(meanRadius(mesh.points));
    run.reportWorkingBytes(elementsPerStep, memoryOf(smooth).peak);
}

Row const smoothing("smooth triangles", with(10'000'000, kTriangles), kBesideCopy, [](Run& run) {
    FlatMesh const mesh(Meshes::noisy, run.size());
    if (!run.copies(mesh.points.size * sizeof(float3), mesh.faceCount())) // once per step
        measureSmoothing(run, mesh, mesh.faceCount());
});

/// Consecutive faces have no points in common.
Row const smoothingShuffled("smooth shuffled triangles", kTriangles, [](Run& run) {
    FlatMesh const mesh(Meshes::shuffled, run.size());
    measureSmoothing(run, mesh, mesh.faceCount());
});

Row const smoothingQuads("smooth quads, a corner", with(2'500'000, kTriangles), [](Run& run) {
    FlatMesh const mesh(Meshes::bentQuads, run.size());
    measureSmoothing(run, mesh, mesh.faceVertex.size);
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

void triangulateAll(Object& object)
{
    ::Geometry::Mesh::triangulate("*", object);
}

template <auto make> void measureTriangulation(Run& run)
{
    PolygonMesh const& mesh = made(make, run.size());
    std::size_t const triangles = mesh.triangleCount();
    if (run.copies(triangles * kTriangleBytes, triangles))
        return;
    Object const result = measureEdit(run, triangles, *mesh.build(), triangulateAll);
    auto const points = dataOf<float3>(result, sPointPosition);
    auto const corners = dataOf<unsigned int>(result, sFaceVertex);
    run.reportResult(getElementCount(result, sFaceComp));
    run.reportSimilarResult(areaOf(corners->size / 3, points->data, corners->data));
}

struct FlatTriangles {
    Indices faceVertex, faceOffset;
};

/// Cuts each quad along its shorter diagonal: reads and writes what triangulating does, with little arithmetic.
void cutAlongDiagonals(FlatMesh const& quads, FlatTriangles& triangles)
{
    std::size_t const count = 2 * std::size_t{quads.faceCount()};
    triangles.faceVertex = uninitializedArray<unsigned int>(3 * count);
    triangles.faceOffset = uninitializedArray<unsigned int>(count + 1);
    unsigned int* corner = triangles.faceVertex.data;
    auto const squaredDistance = [&](unsigned int a, unsigned int b) {
        float3 const &p = quads.points[a], &q = quads.points[b];
        return (p.x - q.x) * (p.x - q.x) + (p.y - q.y) * (p.y - q.y) + (p.z - q.z) * (p.z - q.z);
    };
    for (std::size_t quad = 0; quad != quads.faceCount(); ++quad) {
        unsigned int const* const v = quads.faceVertex.data + quads.faceOffset[quad];
        bool const isFirstShorter = squaredDistance(v[0], v[2]) < squaredDistance(v[1], v[3]);
        unsigned int const start = isFirstShorter ? 0 : 1; // no branch: it would be unpredictable
        for (unsigned int const i : {0u, 1u, 2u, 0u, 2u, 3u})
            *corner++ = v[(start + i) % 4];
    }
    for (std::size_t triangle = 0; triangle <= count; ++triangle)
        triangles.faceOffset[triangle] = static_cast<unsigned int>(3 * triangle);
}

Row const quads("triangulate quads", with(5'000'000, kQuads), {"", ":memcpy", ":flat diagonals"}, [](Run& run) {
    if (run.variant != ":flat diagonals")
        return measureTriangulation<Meshes::bentQuads>(run);
    FlatMesh const mesh(Meshes::bentQuads, run.size());
    auto const cut = [&](FlatTriangles& triangles) { cutAlongDiagonals(mesh, triangles); };
    timeOnCopies(run, 2 * std::size_t{mesh.faceCount()}, FlatTriangles{}, cut);
    FlatTriangles triangles;
    cut(triangles);
    run.reportResult(static_cast<double>(triangles.faceOffset.size - 1));
    run.reportSimilarResult(areaOf(triangles.faceVertex.size / 3, mesh.points.data, triangles.faceVertex.data));
});
Row const polygons(
    "triangulate polygons", with(1'600'000, kPolygons), kBesideCopy, measureTriangulation<Meshes::concave>);
Row const combs("triangulate comb", {{100}, {1'000}, {10'000}}, measureTriangulation<comb>);

/// Normals, texture coordinates and weights at the corners, and numbers of faces.
Row const attributes("triangulate attributes", with(5'000'000, kQuads), kBesideCopy, [](Run& run) {
    PolygonMesh const& mesh = made(Meshes::bentQuads, run.size());
    std::size_t const triangles = mesh.triangleCount(), corners = mesh.faceVertex.size();
    if (run.copies(triangles * (kTriangleBytes + 3 * (12 + 8 + 8) + 4), triangles))
        return;
    auto const source = mesh.build();
    addDataProperty("normal", sFaceVertexComp, Points(corners, float3{0, 0, 1}), *source);
    addDataProperty("uv", sFaceVertexComp, Orvan::Array<float2>(corners, float2{0.5f, 0.25f}), *source);
    addDataProperty("weight", sFaceVertexComp, Orvan::Array<double>(corners, 0.5), *source);
    addDataProperty("material", sFaceComp, Orvan::Array<int>(mesh.faceCount(), 3), *source);
    timeOnCopies(run, triangles, *source, triangulateAll);
});

/// The directed edges of triangles by the points at which they end, in the order of their corners: a counting sort.
void sortEdges(FlatMesh const& mesh)
{
    auto offsets = filledArray(std::uint64_t{mesh.pointCount()} + 2, 0U);
    unsigned int* const next = offsets.data + 1; // entries become the offsets while edges are written
    unsigned int const* const corner = mesh.faceVertex.data;
    for (std::size_t i = 0; i != mesh.faceVertex.size; ++i)
        ++next[corner[i] + std::size_t{1}];
    for (std::size_t point = 0; point != mesh.points.size; ++point)
        next[point + 1] += next[point];
    auto edges = uninitializedArray<std::uint64_t>(mesh.faceVertex.size);
    for (std::size_t face = 0; face != mesh.faceCount(); ++face)
        for (unsigned int k = 0; k != 3; ++k) {
            std::uint64_t const start = corner[3 * face + previousCorner(k)];
            edges[next[corner[3 * face + k]]++] = start << 32 | (3 * face + k);
        }
    DoNotOptimize(offsets.data);
    DoNotOptimize(edges.data);
}

template <auto make> void measureHalfEdges(Run& run)
{
    FlatMesh const mesh(make, run.size());
    if (run.variant == ":flat") {
        timeRuns(run, run.size(), [&] { sortEdges(mesh); });
        return;
    }
    if (run.copies(mesh.faceVertex.size * sizeof(unsigned int), mesh.faceCount()))
        return;
    measureRefinement(run, [&] {
        ::Geometry::Mesh::HalfEdgeDataStructure const built(
            mesh.pointCount(), mesh.faceCount(), mesh.faceVertex, mesh.faceOffset);
        DoNotOptimize(built.valence(0));
        return mesh.faceCount();
    });
}
Row const halfEdges("halfEdges", kHalfEdges, {"", ":memcpy", ":flat"}, measureHalfEdges<Meshes::sphere>);
Row const shuffled("halfEdges shuffled", kHalfEdges, {"", ":flat"}, measureHalfEdges<Meshes::shuffled>);

template <class Refine> void measureRefinement(Run& run, MakeMesh make, Refine const& refine)
{
    measureRefinement(run, [&, source = made(make, run.size()).build()] {
        Object mesh = *source;
        refine(mesh);
        return getElementCount(mesh, sFaceComp);
    });
}

/// One uniform step, all on one level: middles, turned edges, and the old points relaxed. Of the offsets, which are
/// multiples of 3, as many are used as there are faces.
void subdivideOnce(Points& points, Indices& corners, Indices const& offsets)
{
    auto const pointCount = static_cast<unsigned int>(points.size);
    FaceView const faces{corners.data, offsets, static_cast<unsigned int>(corners.size / 3)};
    PointCorners const around = cornersByPoint(pointCount, corners.data, corners.size);
    FaceAdjacency const adjacency = buildFaceAdjacency(faces, around);
    auto newPoints = uninitializedArray<float3>(std::uint64_t{pointCount} + faces.count);
    auto newCorners = uninitializedArray<unsigned int>(3 * corners.size);
    forEachIndex(faces.count, [&](unsigned int face) {
        unsigned int const* const c = faces.corners(face);
        newPoints[pointCount + face] = (points[c[0]] + points[c[1]] + points[c[2]]) * (1.0f / 3);
        for (unsigned int k = 0; k != 3; ++k) {
            unsigned int* const target = newCorners.data + 3 * (std::size_t{3} * face + k);
            target[0] = c[k];
            target[1] = pointCount + adjacency[face][k];
            target[2] = pointCount + face;
        }
    });
    forEachIndex(pointCount, [&](unsigned int point) {
        unsigned int const first = around.offsets[point], last = around.offsets[point + 1];
        float3 sum{0, 0, 0};
        for (unsigned int i = first; i != last; ++i)
            sum = sum + points[faces.corners(around.corners[i] / 3)[previousCorner(around.corners[i] % 3)]];
        auto const valence = static_cast<float>(last - first);
        float const weight = (4 - 2 * std::cos(6.2831855f / valence)) / 9;
        newPoints[point] = points[point] * (1 - weight) + sum * (weight / valence);
    });
    points.swap(newPoints);
    corners.swap(newCorners);
}

Row const uniform("subdivide uniform", with(327'680, kUniform), {"", ":memcpy", ":flat kernel"}, [](Run& run) {
    FlatMesh const mesh(Meshes::sphere, run.size());
    std::size_t const faces = std::size_t{81} * mesh.faceCount();
    if (run.copies(faces * kTriangleBytes + faces * sizeof(float3) / 2, faces))
        return;
    if (run.variant == ":flat kernel") {
        Indices const offsets =
            arrayOf(faces + 1, [](std::size_t face) { return static_cast<unsigned int>(3 * face); });
        timeOnCopies(run, faces, mesh, [&](FlatMesh& fine) {
            for (unsigned int step = 0; step != kUniformSteps; ++step)
                subdivideOnce(fine.points, fine.faceVertex, offsets);
            DoNotOptimize(fine.points.data);
        });
    } else
        measureRefinement(run, Meshes::sphere, [](Object& object) {
            unsigned int pass = 0;
            auto const markAll = [&](auto const&, Orvan::Array<bool>& marks) {
                if (pass++ != kUniformSteps)
                    fillElements(marks.data, marks.size, true);
            };
            ::Geometry::Mesh::Internal::refineMesh(markAll, object);
        });
});

Row const adaptive("subdivide adaptive", kAdaptive, [](Run& run) {
    measureRefinement(run, Meshes::graded,
        [tolerance = toleranceFor(run.size())](Object& mesh) { ::Geometry::Mesh::subdivide(tolerance, mesh); });
});

}
