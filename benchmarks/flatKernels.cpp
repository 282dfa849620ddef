// What operations cost at least: the same work by loops over plain arrays, without objects, checks or exceptions to rules.

#include "Inputs.h"

#include "frame/Arrays.h"
#include "frame/PointCorners.h"
#include "frame/VectorMath.h"

#include <TessaraGeometry/Names.h>

#include <algorithm>
#include <cmath>
#include <cstring>

using namespace Benchmarks;
using namespace Modeling;

namespace {

template <class Work> void forEachIndex(unsigned int count, Work const& work)
{
    parallelFor(tbb::blocked_range<unsigned int>(0, count, 1), [&](auto const& range) {
        for (unsigned int i = range.begin(); i != range.end(); ++i)
            work(i);
    });
}

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

// What any method needs: adjacency, normals and one measuring sweep.
Row const slivers("removeSlivers:flat passes", kTriangles, [](Run& run) {
    FlatMesh const mesh(Meshes::needled, run.size());
    unsigned int const* const corner = mesh.faceVertex.data;
    float3 const* const position = mesh.points.data;
    timeRuns(run, run.size(), [&] {
        PointCorners const around = cornersByPoint(mesh.pointCount(), corner, mesh.faceVertex.size);
        auto adjacency = uninitializedArray<unsigned int>(mesh.faceVertex.size);
        auto normals = uninitializedArray<float3>(mesh.faceCount());
        auto ratios = uninitializedArray<float>(mesh.faceCount());
        forEachIndex(mesh.faceCount(), [&](unsigned int face) {
            unsigned int const* const c = corner + std::size_t{3} * face;
            for (unsigned int k = 0; k != 3; ++k)
                adjacency[std::size_t{3} * face + k] = twinOf(around, corner, face, k);
            float3 const a = position[c[0]], b = position[c[1]], d = position[c[2]];
            normals[face] = cross(safeNormalize(b - a), safeNormalize(d - a));
            float const ab = length(b - a), bd = length(d - b), da = length(a - d);
            ratios[face] = std::min({ab, bd, da}) / std::max({ab, bd, da});
        });
        DoNotOptimize(adjacency.data);
        DoNotOptimize(normals.data);
        DoNotOptimize(ratios.data);
    });
});

/// The source and the added values in fresh memory, on one thread; zeros if no values are given.
template <class T> Orvan::Array<T> extended(Orvan::Array<T> const& source, std::size_t added, T const* values = nullptr)
{
    auto array = uninitializedArray<T>(source.size + added);
    std::memcpy(array.data, source.data, source.size * sizeof(T));
    if (values)
        std::memcpy(array.data + source.size, values, added * sizeof(T));
    else
        std::fill_n(array.data + source.size, added, T{});
    return array;
}

Row const adding("addPointsToPointCloud:copy and fill", kAdded, [](Run& run) {
    FlatCloud const cloud(run.size());
    std::size_t const added = run.size(1);
    Points const positions(added, float3{1, 2, 3});
    timeOnCopies(run, run.size() + added, FlatCloud(0), [&](FlatCloud& result) {
        result.positions = extended(cloud.positions, added, positions.data);
        result.normals = extended(cloud.normals, added);
        result.colors = extended(cloud.colors, added);
        result.intensities = extended(cloud.intensities, added);
        DoNotOptimize(result.positions.data);
    });
});

template <class... T> void compact(Orvan::Array<bool> const& deleted, Orvan::Array<T>&... arrays)
{
    auto const compactOne = [&](auto& array) {
        std::size_t count = 0;
        for (std::size_t i = 0; i != deleted.size; ++i)
            if (!deleted[i])
                array[count++] = array[i];
        array.resize(count);
    };
    (compactOne(arrays), ...);
}

// On one thread, as are the faces.
Row const deletingPoints("deletePointsInPointCloud:flat", kPoints, [](Run& run) {
    auto const indices = everySecondAtRandom(run.size());
    timeOnCopies(run, run.size(), FlatCloud(run.size()), [&](FlatCloud& cloud) {
        Orvan::Array<bool> deleted(cloud.positions.size);
        for (unsigned int const point : indices)
            deleted[point] = true;
        compact(deleted, cloud.positions, cloud.normals, cloud.colors, cloud.intensities);
        DoNotOptimize(cloud.positions.data);
    });
});

/// Marks, numbers and compacts.
void deleteFaces(PatchedSphere const& source, PatchedSphere& mesh)
{
    Orvan::Array<bool> unused(mesh.points.size, true);
    std::size_t corners = 0, faces = 0;
    for (std::size_t face = 0; face != source.deleted.size; ++face) {
        if (source.deleted[face])
            continue;
        for (unsigned int corner = source.faceOffset[face]; corner != source.faceOffset[face + 1]; ++corner) {
            unused[mesh.faceVertex[corner]] = false;
            mesh.faceVertex[corners] = mesh.faceVertex[corner];
            mesh.coordinates[corners++] = mesh.coordinates[corner];
        }
        mesh.materials[faces] = mesh.materials[face];
        mesh.faceOffset[++faces] = static_cast<unsigned int>(corners);
    }
    Indices remap(unused.size, Orvan::kUninitialized);
    unsigned int count = 0;
    for (std::size_t point = 0; point != unused.size; ++point)
        remap[point] = unused[point] ? count : count++;
    compact(unused, mesh.points, mesh.normals);
    for (std::size_t corner = 0; corner != corners; ++corner)
        mesh.faceVertex[corner] = remap[mesh.faceVertex[corner]];
    DoNotOptimize(mesh.points.data);
}

Row const deletingFaces("deleteFaces:flat", kFaces, [](Run& run) {
    PatchedSphere const source(run.size());
    timeOnCopies(run, source.faceCount(), source, [&](PatchedSphere& mesh) { deleteFaces(source, mesh); });
});

/// One uniform step, all on one level: twins, middles, turned edges, and the old points relaxed.
void subdivideOnce(Points& points, Indices& corners)
{
    auto const pointCount = static_cast<unsigned int>(points.size);
    auto const faceCount = static_cast<unsigned int>(corners.size / 3);
    PointCorners const around = cornersByPoint(pointCount, corners.data, corners.size);
    auto const before = [&](unsigned int i) { // the point before a corner in its face
        return corners[around.corners[i] % 3 == 0 ? around.corners[i] + 2 : around.corners[i] - 1];
    };
    auto newPoints = uninitializedArray<float3>(std::uint64_t{pointCount} + faceCount);
    auto newCorners = uninitializedArray<unsigned int>(3 * corners.size);
    forEachIndex(faceCount, [&](unsigned int face) {
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
    });
    forEachIndex(pointCount, [&](unsigned int point) {
        unsigned int const first = around.offsets[point], last = around.offsets[point + 1];
        float3 sum{0, 0, 0};
        for (unsigned int i = first; i != last; ++i)
            sum = sum + points[before(i)];
        auto const valence = static_cast<float>(last - first);
        float const weight = (4 - 2 * std::cos(6.2831855f / valence)) / 9;
        newPoints[point] = points[point] * (1 - weight) + sum * (weight / valence);
    });
    points.swap(newPoints);
    corners.swap(newCorners);
}

Row const subdivision("subdivide uniform:flat kernel", kUniform, [](Run& run) {
    FlatMesh const mesh(Meshes::icosphere, run.size());
    timeRuns(run, 81 * std::size_t{mesh.faceCount()}, [&] {
        Points points = mesh.points;
        Indices corners = mesh.faceVertex;
        for (unsigned int step = 0; step != kUniformSteps; ++step)
            subdivideOnce(points, corners);
        DoNotOptimize(points.data);
    });
});

}
