#include "Measuring.h"
#include "peers/deletions.h"

#include "frame/Arrays.h"

#include "support/Random.h"

#include <Modeling/addPointsToPointCloud.h>
#include <Modeling/deleteFaces.h>
#include <Modeling/deletePointsInPointCloud.h>
#include <TessaraGeometry/Makers.h>

#include <algorithm>
#include <numeric>

using namespace Benchmarks;
using namespace Modeling;
using namespace Tessara::Geometry;
using namespace Tessara::GeometryAlgorithms;
using Tessara::Math::float2, Tessara::Math::uchar4;
using TestSupport::Random;

namespace {

constexpr std::size_t kBytesPerPoint = 32;

struct FlatCloud {
    Orvan::Array<float3> positions, normals;
    Orvan::Array<uchar4> colors;
    Orvan::Array<float> intensities;
};

FlatCloud makeCloud(std::size_t count)
{
    FlatCloud cloud{Orvan::Array<float3>(count), Orvan::Array<float3>(count, float3{0, 0, 1}),
        Orvan::Array<uchar4>(count), Orvan::Array<float>(count, 0.5f)};
    Random random(1);
    for (std::size_t point = 0; point != count; ++point) {
        cloud.positions[point] = random.point();
        cloud.colors[point].x = static_cast<unsigned char>(point);
    }
    return cloud;
}

Orvan::MutablePtr<Object> makeObject(FlatCloud const& cloud)
{
    auto object = makePointCloud(cloud.positions);
    addDataProperty("normal", sPointComp, cloud.normals, *object);
    addDataProperty("color", sPointComp, cloud.colors, *object);
    addDataProperty("intensity", sPointComp, cloud.intensities, *object);
    return object;
}

// The arguments are the points that are there and those that are added.
Sizes const kAdded{{1'000, 1'000}, {1'000'000, 9'000'000}, {9'000'000, 1'000'000}};

Row const addsPoints("addPointsToPointCloud", kAdded, [](State& state) {
    auto const cloud = makeObject(makeCloud(sizeOf(state)));
    Orvan::Array<float3> const positions(sizeOf(state, 1), float3{1, 2, 3});
    std::size_t const count = sizeOf(state) + positions.size;
    // Unused capacity is counted, although its memory is never touched.
    measureEdit(state, count, (count + count) * kBytesPerPoint, *cloud,
        [&](Object& object) { addPointsToPointCloud(positions, {}, object, nullptr); });
});

/// The source and the added values in fresh memory, on one thread; zeros if no values are given.
template <class T>
Orvan::Array<T> flatExtended(Orvan::Array<T> const& source, std::size_t added, T const* values = nullptr)
{
    auto array = uninitializedArray<T>(source.size + added);
    std::memcpy(array.data, source.data, source.size * sizeof(T));
    if (values)
        std::memcpy(array.data + source.size, values, added * sizeof(T));
    else
        std::fill_n(array.data + source.size, added, T{});
    return array;
}

Row const copiesAndFills("addPointsToPointCloud:copy and fill", kAdded, [](State& state) {
    FlatCloud const cloud = makeCloud(sizeOf(state));
    std::size_t const added = sizeOf(state, 1);
    Orvan::Array<float3> const positions(added, float3{1, 2, 3});
    timeOnCopies(state, sizeOf(state) + added, FlatCloud(), [&](FlatCloud& result) {
        result = {flatExtended(cloud.positions, added, positions.data), flatExtended(cloud.normals, added),
            flatExtended(cloud.colors, added), flatExtended(cloud.intensities, added)};
        benchmark::DoNotOptimize(result.positions.data);
    });
});

CopyRow const addedBytes("addPointsToPointCloud", kAdded, [](State const& state) -> CopyRow::Input {
    std::size_t const count = sizeOf(state) + sizeOf(state, 1);
    return {count * kBytesPerPoint, count};
});

Sizes const kPoints{{1'000}, {100'000}, {10'000'000}};

/// Half of the points, in no order.
Indices everySecondAtRandom(std::size_t count)
{
    Indices order(count);
    std::iota(order.begin(), order.end(), 0u);
    Random random(2);
    for (std::size_t i = count; i > 1; --i)
        std::swap(order[i - 1], order[random.below(i)]);
    order.resize(count / 2);
    return order;
}

Row const deletesPoints("deletePointsInPointCloud", kPoints, [](State& state) {
    auto const cloud = makeObject(makeCloud(sizeOf(state)));
    auto const indices = everySecondAtRandom(sizeOf(state));
    measureEdit(state, sizeOf(state), (sizeOf(state) - indices.size) * kBytesPerPoint, *cloud,
        [&](Object& object) { deletePointsInPointCloud(indices, object, nullptr); });
});

/// On an object that is not shared: arrays are edited in place.
Row const deletesPointsInPlace("deletePointsInPointCloud:in place", kPoints, [](State& state) {
    auto const make = [cloud = makeCloud(sizeOf(state))] { return makeObject(cloud); };
    auto const indices = everySecondAtRandom(sizeOf(state));
    timeOnEach(state, sizeOf(state), make, [&](auto& object) { deletePointsInPointCloud(indices, *object, nullptr); });
});

template <class T> void flatCompact(Orvan::Array<bool> const& deleted, Orvan::Array<T>& array)
{
    std::size_t count = 0;
    for (std::size_t i = 0; i != deleted.size; ++i)
        if (!deleted[i])
            array[count++] = array[i];
    array.resize(count);
}

/// Flags and one loop per array over plain arrays, on one thread.
Row const deletesFlatPoints("deletePointsInPointCloud:flat", kPoints, [](State& state) {
    FlatCloud const source = makeCloud(sizeOf(state));
    auto const indices = everySecondAtRandom(sizeOf(state));
    timeOnCopies(state, sizeOf(state), source, [&](FlatCloud& cloud) {
        Orvan::Array<bool> deleted(source.positions.size);
        for (unsigned int const point : indices)
            deleted[point] = true;
        flatCompact(deleted, cloud.positions);
        flatCompact(deleted, cloud.normals);
        flatCompact(deleted, cloud.colors);
        flatCompact(deleted, cloud.intensities);
        benchmark::DoNotOptimize(cloud.positions.data);
    });
});

CopyRow const pointBytes("deletePointsInPointCloud", kPoints, [](State const& state) -> CopyRow::Input {
    return {sizeOf(state) * kBytesPerPoint, sizeOf(state)};
});

Sizes const kFaces{{1'000}, {100'000}, {1'000'000}};

/// A sphere with attributes of points, corners and faces, of which half are to be deleted in patches of a hundred.
struct PatchedSphere : FlatMesh {
    Orvan::Array<float3> normals = points;
    Orvan::Array<float2> coordinates = Orvan::Array<float2>(faceVertex.size, float2{0.5f, 0.25f}); // of corners
    Orvan::Array<int> materials = Orvan::Array<int>(faceCount(), 7); // of faces
    Orvan::Array<bool> deleted = Orvan::Array<bool>(faceCount());

    explicit PatchedSphere(State const& state)
        : FlatMesh(sphereOf(sizeOf(state)).polygons())
    {
        for (std::size_t face = 0; face != deleted.size; ++face)
            deleted[face] = face / 100 % 2 == 1;
    }
    std::size_t bytes() const { return points.size * 24 + faceVertex.size * 12 + materials.size * 8 + 4; }
};

Row const deletesFaces("deleteFaces", kFaces, [](State& state) {
    PatchedSphere const sphere(state);
    auto const mesh = makeMesh(sphere.points, sphere.faceVertex, sphere.faceOffset);
    addDataProperty("normal", sPointComp, sphere.normals, *mesh);
    addDataProperty("uv", sFaceVertexComp, sphere.coordinates, *mesh);
    addDataProperty("material", sFaceComp, sphere.materials, *mesh);
    measureEdit(state, sphere.faceCount(), sphere.bytes() / 2, *mesh,
        [&](Object& object) { deleteFaces(sphere.deleted, object); });
});

/// Marks, numbers and compacts plain arrays, on one thread.
void deleteFlatFaces(PatchedSphere const& source, PatchedSphere& mesh)
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
    flatCompact(unused, mesh.points);
    flatCompact(unused, mesh.normals);
    for (std::size_t corner = 0; corner != corners; ++corner)
        mesh.faceVertex[corner] = remap[mesh.faceVertex[corner]];
    benchmark::DoNotOptimize(mesh.points.data);
}

Row const deletesFlatFaces("deleteFaces:flat", kFaces, [](State& state) {
    PatchedSphere const source(state);
    timeOnCopies(state, source.faceCount(), source, [&](PatchedSphere& mesh) { deleteFlatFaces(source, mesh); });
});

CopyRow const faceBytes("deleteFaces", kFaces, [](State const& state) -> CopyRow::Input {
    PatchedSphere const sphere(state);
    return {sphere.bytes(), sphere.faceCount()};
});

/// A row for a peer, which `make(state)` returns with the number of elements.
template <class Make> [[maybe_unused]] Row deletion(char const* name, Sizes const& sizes, Make const& make)
{
    return Row(name, sizes, [=](State& state) {
        auto const [peer, elements] = make(state);
        auto const prepare = [&peer = peer] { return peer.prepare(), 0; };
        timeOnEach(state, elements, prepare, [&peer = peer](int) { peer.run(); });
        state.counters["remaining"] = static_cast<double>(peer.remaining());
    });
}

template <auto makePeer> std::pair<PeerDeletion, std::size_t> pointDeletion(State const& state)
{
    return {makePeer(sizeOf(state), everySecondAtRandom(sizeOf(state))), sizeOf(state)};
}

template <auto makePeer> std::pair<PeerDeletion, std::size_t> faceDeletion(State const& state)
{
    PatchedSphere const sphere(state);
    return {makePeer({sphere.points, sphere.faceVertex, sphere.deleted}), sphere.faceCount()};
}

#ifdef MODELING_HAS_PCL
Row const pclPoints = deletion("deletePointsInPointCloud:PCL", kPoints, pointDeletion<pclDeletion>);
#endif
#ifdef MODELING_HAS_VTK
Row const vtkPoints = deletion("deletePointsInPointCloud:VTK", kPoints, pointDeletion<vtkPointDeletion>);
Row const vtkFaces = deletion("deleteFaces:VTK", kFaces, faceDeletion<vtkFaceDeletion>);
#endif
#ifdef MODELING_HAS_CGAL
Row const cgalFaces = deletion("deleteFaces:CGAL", kFaces, faceDeletion<cgalFaceDeletion>);
#endif

}
