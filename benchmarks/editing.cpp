// Adding, deleting and merging elements. The rows `:flat` and `:copy and fill` are what that costs at least: the same work
// by loops over plain arrays on one thread, without objects, checks or exceptions to rules.

#include "Inputs.h"

#include <Modeling/addPointsToPointCloud.h>
#include <Modeling/deleteFaces.h>
#include <Modeling/deletePointsInPointCloud.h>
#include <Modeling/mergeMeshes.h>
#include <Modeling/mergePointClouds.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>

#include <algorithm>

using namespace Benchmarks;
using namespace Tessara::Geometry;
using namespace Tessara::GeometryAlgorithms;

namespace {

constexpr std::size_t kPointBytes = 32; // in the clouds that are edited and merged

void reportCount(Run& run, char const* component, Object const& result)
{
    run.reportResult(getElementCount(result, component));
}

/// The source and an added value, repeated, in fresh memory.
template <class T> Orvan::Array<T> extended(Orvan::Array<T> const& source, std::size_t added, T const& value = {})
{
    Orvan::Array<T> array(source.size + added, Orvan::kUninitialized);
    std::fill_n(std::copy(source.begin(), source.end(), array.data), added, value);
    return array;
}

Row const adding("addPointsToPointCloud", kAdded, {"", ":memcpy", ":copy and fill"}, [](Run& run) {
    std::size_t const added = run.size(1), count = run.size() + added;
    if (run.copies(count * kPointBytes, count))
        return;
    FlatCloud const cloud{run.size()};
    Points const positions(added, float3{1, 2, 3});
    if (run.variant == ":copy and fill")
        timeOnCopies(run, count, FlatCloud{0}, [&](FlatCloud& result) {
            result.positions = extended(cloud.positions, added, positions[0]);
            result.normals = extended(cloud.normals, added);
            result.colors = extended(cloud.colors, added);
            result.intensities = extended(cloud.intensities, added);
            DoNotOptimize(result.positions.data);
        });
    else
        reportCount(run, sPointComp, measureEdit(run, count, *cloud.build(), [&](Object& object) {
            addPointsToPointCloud(positions, {}, object, nullptr);
        }));
});

/// To a cloud that is not shared and has room; its arrays have doubled before.
Row const addingInPlace("addPointsToPointCloudInPlace", kAddedInPlace, kBesideCopy, [](Run& run) {
    std::size_t const added = run.size(1);
    if (run.copies(added * kPointBytes, added))
        return;
    FlatCloud const source{run.size()};
    Points const positions(added, float3{1, 2, 3});
    auto const makeRoomy = [&] {
        auto cloud = source.build();
        addPointsToPointCloud(Points(1), {}, *cloud, nullptr);
        return cloud;
    };
    timeOnEach(
        run, added, makeRoomy, [&](auto const& cloud) { addPointsToPointCloud(positions, {}, *cloud, nullptr); });
});

/// A thousand points at a time.
Row const addingRepeatedly("addPointsToPointCloudRepeatedly", {{1'000'000, 100}}, [](Run& run) {
    FlatCloud const source{run.size()};
    Points const positions(1000, float3{1, 2, 3});
    timeOnEach(
        run, run.size(1) * positions.size, [&] { return source.build(); },
        [&](auto const& cloud) {
            for (std::size_t call = 0; call != run.size(1); ++call)
                addPointsToPointCloud(positions, {}, *cloud, nullptr);
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

Row const deletingPoints("deletePointsInPointCloud", kPoints, {"", ":memcpy", ":in place", ":flat"}, [](Run& run) {
    std::size_t const points = run.size();
    if (run.copies(points * kPointBytes, points))
        return;
    FlatCloud const source{points};
    auto const indices = everySecondAtRandom(points);
    auto const edit = [&](Object& object) { deletePointsInPointCloud(indices, object, nullptr); };
    if (run.variant == ":in place") // on an object that is not shared
        timeOnEach(
            run, points, [&] { return source.build(); }, [&](auto const& object) { edit(*object); });
    else if (run.variant == ":flat")
        timeOnCopies(run, points, source, [&](FlatCloud& cloud) {
            Orvan::Array<bool> deleted(points);
            for (unsigned int const point : indices)
                deleted[point] = true;
            compact(deleted, cloud.positions, cloud.normals, cloud.colors, cloud.intensities);
            DoNotOptimize(cloud.positions.data);
        });
    else
        reportCount(run, sPointComp, measureEdit(run, points, *source.build(), edit));
});

/// Marks, numbers and compacts.
void deleteFlat(PatchedSphere const& source, PatchedSphere& mesh)
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

Row const deletingFaces("deleteFaces", with(10'000'000, kFaces), {"", ":memcpy", ":in place", ":flat"}, [](Run& run) {
    PatchedSphere const sphere(run.size());
    if (run.copies(sphere.bytes(), sphere.faceCount()))
        return;
    auto const edit = [&](Object& object) { deleteFaces(sphere.deleted, object); };
    if (run.variant == ":in place") // on an object that is not shared
        timeOnEach(
            run, sphere.faceCount(), [&] { return sphere.build(); }, [&](auto const& object) { edit(*object); });
    else if (run.variant == ":flat")
        timeOnCopies(run, sphere.faceCount(), sphere, [&](PatchedSphere& mesh) { deleteFlat(sphere, mesh); });
    else
        reportCount(run, sFaceComp, measureEdit(run, sphere.faceCount(), *sphere.build(), edit));
});

/// `elements` and `bytes` are those of each input, which is made of that component.
void measureMerging(Run& run, char const* component, std::size_t elements, std::size_t bytes,
    decltype(&mergeMeshes) merge, std::function<Orvan::MutablePtr<Object>()> const& makeInput)
{
    if (run.copies(run.size() * bytes, run.size() * elements))
        return;
    Orvan::Array<Orvan::Ptr<Object>> inputs;
    while (inputs.size != run.size())
        inputs.append(makeInput());
    auto const mergeInto = [&](Object& output) { merge(inputs, output, nullptr); };
    reportCount(run, component, measureEdit(run, run.size() * elements, Object(), mergeInto));
}

Row const mergingMeshes("mergeMeshes", kMeshes, kBesideCopy, [](Run& run) {
    PatchedSphere const sphere(run.size(1));
    std::size_t const bytes = sphere.bytes() - sizeof(unsigned int); // the offset behind the last face
    measureMerging(run, sFaceComp, sphere.faceCount(), bytes, mergeMeshes, [&] { return sphere.build(); });
});

Row const mergingClouds("mergePointClouds", kClouds, kBesideCopy, [](Run& run) {
    std::size_t const points = run.size(1);
    measureMerging(run, sPointComp, points, points * kPointBytes, mergePointClouds, [=] {
        auto cloud = makePointCloud(Points(points, float3{1, 2, 3}));
        addDataProperty("color", sPointComp, Orvan::Array<int>(points, 1), *cloud);
        addDataProperty("weight", sPointComp, Orvan::Array<double>(points, 0.5), *cloud);
        addDataProperty("id", sPointComp, Orvan::Array<unsigned int>(points, 3u), *cloud);
        addDataProperty("radius", sPointComp, Orvan::Array<float>(points, 1.0f), *cloud);
        return cloud;
    });
});

}
