// Adding, deleting and merging elements. The rows `:flat` and `:copy and fill` are what that costs at least: the same work
// by loops over plain arrays on one thread, without objects, checks or exceptions to rules. So are the rows `:flat copies` for
// merging, on all threads; in `:flat copies after look-ups` the host validates each input and returns each value once before.

#include "Inputs.h"

#include "frame/ParallelFor.h"

#include <Modeling/addPointsToPointCloud.h>
#include <Modeling/deleteFaces.h>
#include <Modeling/deletePointsInPointCloud.h>
#include <Modeling/mergeMeshes.h>
#include <Modeling/mergePointClouds.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Validators.h>

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

/// The first `each` elements of that array of every input, plus `base` times the index of the input if they are indices.
template <class T, class Mesh> Orvan::Array<T> concatenated(
    std::vector<PatchedSphere> const& inputs, Orvan::Array<T> Mesh::*array, std::size_t each, unsigned int base = 0)
{
    Orvan::Array<T> result(inputs.size() * each, Orvan::kUninitialized);
    Modeling::parallelFor(tbb::blocked_range<std::size_t>(0, inputs.size(), 1), [&](auto const& range) {
        for (std::size_t input = range.begin(); input != range.end(); ++input) {
            T const* const values = (inputs[input].*array).data;
            T* const target = result.data + input * each;
            if constexpr (std::is_same_v<T, unsigned int>)
                std::transform(values, values + each, target,
                    [shift = static_cast<unsigned int>(input) * base](unsigned int index) { return index + shift; });
            else
                std::copy_n(values, each, target);
        }
    });
    return result;
}

std::size_t concatenate(std::vector<PatchedSphere> const& inputs)
{
    PatchedSphere const& first = inputs[0];
    std::size_t const corners = first.faceVertex.size, faces = first.faceCount();
    auto const points = concatenated(inputs, &PatchedSphere::points, first.points.size);
    auto const normals = concatenated(inputs, &PatchedSphere::normals, first.points.size);
    auto const faceVertex = concatenated(inputs, &PatchedSphere::faceVertex, corners, first.pointCount());
    auto const coordinates = concatenated(inputs, &PatchedSphere::coordinates, corners);
    auto const offsets = concatenated(inputs, &PatchedSphere::faceOffset, faces, static_cast<unsigned int>(corners));
    auto const materials = concatenated(inputs, &PatchedSphere::materials, faces);
    DoNotOptimize(points.data[0].x + normals.data[0].x + coordinates.data[0].x);
    DoNotOptimize(faceVertex.data[0] + offsets.data[0]);
    return materials.size;
}

/// Validates each object, and looks up each value in it once.
void lookUp(std::vector<Orvan::Ptr<Object>> const& inputs)
{
    Orvan::String const data = sData, target = sTarget;
    Modeling::parallelFor(tbb::blocked_range<std::size_t>(0, inputs.size(), 1), [&](auto const& range) {
        for (std::size_t input = range.begin(); input != range.end(); ++input) {
            DoNotOptimize(bool(validateMesh(*inputs[input])));
            auto const names = inputs[input]->keys();
            for (Orvan::String const& name : *names) {
                Tessara::PropertyValue const property = inputs[input]->getProperty(name);
                if (auto const* const object = property.get<Orvan::Ptr<Object>>()) {
                    DoNotOptimize((*object)->getProperty(target).empty());
                    DoNotOptimize((*object)->getProperty(data).empty());
                }
            }
        }
    });
}

void measureFlatCopies(Run& run, PatchedSphere const& sphere)
{
    std::vector<PatchedSphere> const inputs(run.size(), sphere);
    std::vector<Orvan::Ptr<Object>> objects; // with arrays of their own, of which the validator reads the indices
    while (run.variant == ":flat copies after look-ups" && objects.size() != inputs.size())
        objects.push_back(sphere.build());
    std::size_t faces = 0;
    timeRuns(run, run.size() * sphere.faceCount(), [&] {
        lookUp(objects);
        faces = concatenate(inputs);
    });
    run.reportResult(static_cast<double>(faces));
}

std::vector<std::string> const kMergingMeshes{"", ":memcpy", ":flat copies", ":flat copies after look-ups"};
Row const mergingMeshes("mergeMeshes", kMeshes, kMergingMeshes, [](Run& run) {
    PatchedSphere const sphere(run.size(1));
    if (run.variant.starts_with(":flat"))
        return measureFlatCopies(run, sphere);
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
