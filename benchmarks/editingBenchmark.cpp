#include "Measuring.h"

#include "peers/deletions.h"

#include "frame/Arrays.h"

#include "support/MeshBuilder.h"
#include "support/Random.h"

#include <Modeling/addPointsToPointCloud.h>
#include <Modeling/deleteFaces.h>
#include <Modeling/deletePointsInPointCloud.h>
#include <TessaraGeometry/Makers.h>

#include <algorithm>

using namespace Benchmarks;
using namespace Modeling;
using namespace Tessara::Geometry;
namespace Algorithms = Tessara::GeometryAlgorithms;
using Tessara::Object;
using Tessara::Math::float2;
using Tessara::Math::float3;
using Tessara::Math::uchar4;
using TestSupport::MeshBuilder;
using TestSupport::Random;

namespace {

/// Times edits of shared copies, and counts what memory they take beyond the bytes of the result.
template <class Edit> void measureEdit(
    benchmark::State& state, Object const& source, std::size_t elements, std::size_t resultBytes, Edit const& edit)
{
    timeOnCopies(state, source, edit);
    countElements(state, elements);
    Object object = source;
    countWorkingBytes(state, elements, resultBytes, [&] { edit(object); });
}

/// The attributes of a cloud, 32 bytes per point.
struct FlatCloud {
    Orvan::Array<float3> positions;
    Orvan::Array<float3> normals;
    Orvan::Array<uchar4> colors;
    Orvan::Array<float> intensities;

    static constexpr std::size_t kBytesPerPoint = 32;
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
void addPoints(benchmark::State& state)
{
    auto const cloud = makeObject(makeCloud(sizeOf(state)));
    Orvan::Array<float3> const positions(sizeOf(state, 1), float3{1, 2, 3});
    std::size_t const count = sizeOf(state) + positions.size;
    // Unused capacity is counted, although its memory is never touched.
    measureEdit(state, *cloud, count, (count + count) * FlatCloud::kBytesPerPoint,
        [&](Object& object) { Algorithms::addPointsToPointCloud(positions, {}, object, nullptr); });
}

template <class T> Orvan::Array<T> flatExtended(Orvan::Array<T> const& source, std::size_t added)
{
    auto array = uninitializedArray<T>(source.size + added);
    std::memcpy(array.data, source.data, source.size * sizeof(T));
    std::fill(array.data + source.size, array.data + array.size, T{});
    return array;
}

/// The same bytes into fresh memory, on one thread: copied if they are known, filled if not.
void copyAndFill(benchmark::State& state)
{
    FlatCloud const cloud = makeCloud(sizeOf(state));
    std::size_t const added = sizeOf(state, 1);
    Orvan::Array<float3> const positions(added, float3{1, 2, 3});
    timeOnEach(
        state, [] { return FlatCloud(); },
        [&](FlatCloud& result) {
            auto extended = uninitializedArray<float3>(cloud.positions.size + added);
            std::memcpy(extended.data, cloud.positions.data, cloud.positions.size * sizeof(float3));
            std::memcpy(extended.data + cloud.positions.size, positions.data, added * sizeof(float3));
            result = {std::move(extended), flatExtended(cloud.normals, added), flatExtended(cloud.colors, added),
                flatExtended(cloud.intensities, added)};
            benchmark::DoNotOptimize(result.positions.data);
        });
    countElements(state, sizeOf(state) + added);
}

/// Half of the points, in no order.
Orvan::Array<unsigned int> everySecondAtRandom(std::size_t count)
{
    Orvan::Array<unsigned int> order(count);
    for (std::size_t i = 0; i != count; ++i)
        order[i] = static_cast<unsigned int>(i);
    Random random(2);
    for (std::size_t i = count; i > 1; --i)
        std::swap(order[i - 1], order[random.below(i)]);
    order.resize(count / 2);
    return order;
}

void deletePoints(benchmark::State& state)
{
    auto const cloud = makeObject(makeCloud(sizeOf(state)));
    auto const indices = everySecondAtRandom(sizeOf(state));
    measureEdit(state, *cloud, sizeOf(state), (sizeOf(state) - indices.size) * FlatCloud::kBytesPerPoint,
        [&](Object& object) { Algorithms::deletePointsInPointCloud(indices, object, nullptr); });
}

/// On an object that is not shared: arrays are edited in place.
void deletePointsInPlace(benchmark::State& state)
{
    FlatCloud const cloud = makeCloud(sizeOf(state));
    auto const indices = everySecondAtRandom(sizeOf(state));
    timeOnEach(
        state, [&] { return makeObject(cloud); },
        [&](auto& object) { Algorithms::deletePointsInPointCloud(indices, *object, nullptr); });
    countElements(state, sizeOf(state));
}

template <class T> void flatCompact(Orvan::Array<bool> const& deleted, Orvan::Array<T>& array)
{
    std::size_t count = 0;
    for (std::size_t i = 0; i != deleted.size; ++i)
        if (!deleted[i])
            array[count++] = array[i];
    array.resize(count);
}

/// Flags and one loop per array over plain arrays, on one thread.
void flatDeletePoints(benchmark::State& state)
{
    FlatCloud const source = makeCloud(sizeOf(state));
    auto const indices = everySecondAtRandom(sizeOf(state));
    timeOnEach(
        state, [&] { return FlatCloud(source); },
        [&](FlatCloud& cloud) {
            Orvan::Array<bool> deleted(source.positions.size);
            for (unsigned int const point : indices)
                deleted[point] = true;
            flatCompact(deleted, cloud.positions);
            flatCompact(deleted, cloud.normals);
            flatCompact(deleted, cloud.colors);
            flatCompact(deleted, cloud.intensities);
            benchmark::DoNotOptimize(cloud.positions.data);
        });
    countElements(state, sizeOf(state));
}

/// A sphere with attributes of points, corners and faces.
struct FlatMesh {
    Orvan::Array<float3> positions;
    Orvan::Array<float3> normals; // of points
    Orvan::Array<unsigned int> faceVertex;
    Orvan::Array<float2> coordinates; // of corners
    Orvan::Array<unsigned int> faceOffset;
    Orvan::Array<int> materials; // of faces

    std::size_t bytes() const { return positions.size * 24 + faceVertex.size * 12 + materials.size * 8 + 4; }
};

FlatMesh makeFlatMesh(std::size_t faces)
{
    auto const mesh = madeOnce(faces, [](std::size_t count) { return MeshBuilder::sphereWithFaces(count); }).build();
    FlatMesh flat{*dataOf<float3>(*mesh, sPointPosition), {}, *dataOf<unsigned int>(*mesh, sFaceVertex), {},
        *dataOf<unsigned int>(*mesh, sFaceOffset), {}};
    flat.normals = flat.positions;
    flat.coordinates = Orvan::Array<float2>(flat.faceVertex.size, float2{0.5f, 0.25f});
    flat.materials = Orvan::Array<int>(flat.faceOffset.size - 1, 7);
    return flat;
}

Orvan::MutablePtr<Object> makeObject(FlatMesh const& flat)
{
    auto mesh = makeMesh(flat.positions, flat.faceVertex, flat.faceOffset);
    addDataProperty("normal", sPointComp, flat.normals, *mesh);
    addDataProperty("uv", sFaceVertexComp, flat.coordinates, *mesh);
    addDataProperty("material", sFaceComp, flat.materials, *mesh);
    return mesh;
}

/// Half of the faces, in patches of a hundred.
Orvan::Array<bool> everySecondPatch(std::size_t faceCount)
{
    Orvan::Array<bool> deleted(faceCount);
    for (std::size_t face = 0; face != faceCount; ++face)
        deleted[face] = face / 100 % 2 == 1;
    return deleted;
}

void deleteFaces(benchmark::State& state)
{
    FlatMesh const flat = makeFlatMesh(sizeOf(state));
    auto const mesh = makeObject(flat);
    auto const deleted = everySecondPatch(flat.materials.size);
    measureEdit(state, *mesh, deleted.size, flat.bytes() / 2,
        [&](Object& object) { Algorithms::deleteFaces(deleted, object); });
}

/// Marks, numbers and compacts plain arrays, on one thread.
void flatDeleteFaces(benchmark::State& state)
{
    FlatMesh const source = makeFlatMesh(sizeOf(state));
    auto const deleted = everySecondPatch(source.materials.size);
    timeOnEach(
        state, [&] { return FlatMesh(source); },
        [&](FlatMesh& mesh) {
            Orvan::Array<bool> unused(mesh.positions.size, true);
            std::size_t corners = 0, faces = 0;
            for (std::size_t face = 0; face != deleted.size; ++face) {
                if (deleted[face])
                    continue;
                for (unsigned int corner = source.faceOffset[face]; corner != source.faceOffset[face + 1]; ++corner) {
                    unused[mesh.faceVertex[corner]] = false;
                    mesh.faceVertex[corners] = mesh.faceVertex[corner];
                    mesh.coordinates[corners++] = mesh.coordinates[corner];
                }
                mesh.materials[faces] = mesh.materials[face];
                mesh.faceOffset[++faces] = static_cast<unsigned int>(corners);
            }
            Orvan::Array<unsigned int> remap(unused.size, Orvan::kUninitialized);
            unsigned int count = 0;
            for (std::size_t point = 0; point != unused.size; ++point) {
                remap[point] = count;
                if (!unused[point])
                    ++count;
            }
            flatCompact(unused, mesh.positions);
            flatCompact(unused, mesh.normals);
            for (std::size_t corner = 0; corner != corners; ++corner)
                mesh.faceVertex[corner] = remap[mesh.faceVertex[corner]];
            benchmark::DoNotOptimize(mesh.positions.data);
        });
    countElements(state, deleted.size);
}

[[maybe_unused]] void deleteWithPeer(benchmark::State& state, std::size_t elements, PeerDeletion const& peer)
{
    auto const prepare = [&] {
        peer.prepare();
        return 0;
    };
    timeOnEach(state, prepare, [&](int) { peer.run(); });
    countElements(state, elements);
    state.counters["remaining"] = static_cast<double>(peer.remaining());
}

using MakePointPeer = PeerDeletion (*)(std::size_t, Orvan::Array<unsigned int> const&);
[[maybe_unused]] void addPointPeer(char const* name, Sizes const& sizes, MakePointPeer makePeer)
{
    addRow(name, sizes, [=](benchmark::State& state) {
        deleteWithPeer(state, sizeOf(state), makePeer(sizeOf(state), everySecondAtRandom(sizeOf(state))));
    });
}

using MakeFacePeer = PeerDeletion (*)(PeerMesh const&);
[[maybe_unused]] void addFacePeer(char const* name, Sizes const& sizes, MakeFacePeer makePeer)
{
    addRow(name, sizes, [=](benchmark::State& state) {
        FlatMesh const flat = makeFlatMesh(sizeOf(state));
        auto const deleted = everySecondPatch(flat.materials.size);
        deleteWithPeer(state, deleted.size, makePeer({flat.positions, flat.faceVertex, deleted}));
    });
}

[[maybe_unused]] bool const areRowsAdded = [] {
    Sizes const added{{1'000, 1'000}, {1'000'000, 9'000'000}, {9'000'000, 1'000'000}};
    addRow("addPointsToPointCloud", added, addPoints);
    addRow("addPointsToPointCloud:copy and fill", added, copyAndFill);
    addRow("addPointsToPointCloud:memcpy", added, [](benchmark::State& state) {
        std::size_t const count = sizeOf(state) + sizeOf(state, 1);
        copyBytes(state, count * FlatCloud::kBytesPerPoint, count);
    });

    Sizes const points{{1'000}, {100'000}, {10'000'000}};
    addRow("deletePointsInPointCloud", points, deletePoints);
    addRow("deletePointsInPointCloud:in place", points, deletePointsInPlace);
    addRow("deletePointsInPointCloud:flat", points, flatDeletePoints);
    addRow("deletePointsInPointCloud:memcpy", points,
        [](benchmark::State& state) { copyBytes(state, sizeOf(state) * FlatCloud::kBytesPerPoint, sizeOf(state)); });

    Sizes const faces{{1'000}, {100'000}, {1'000'000}};
    addRow("deleteFaces", faces, deleteFaces);
    addRow("deleteFaces:flat", faces, flatDeleteFaces);
    addRow("deleteFaces:memcpy", faces, [](benchmark::State& state) {
        FlatMesh const flat = makeFlatMesh(sizeOf(state));
        copyBytes(state, flat.bytes(), flat.materials.size);
    });
#ifdef MODELING_HAS_PCL
    addPointPeer("deletePointsInPointCloud:PCL", points, pclDeletion);
#endif
#ifdef MODELING_HAS_VTK
    addPointPeer("deletePointsInPointCloud:VTK", points, vtkPointDeletion);
    addFacePeer("deleteFaces:VTK", faces, vtkFaceDeletion);
#endif
#ifdef MODELING_HAS_CGAL
    addFacePeer("deleteFaces:CGAL", faces, cgalFaceDeletion);
#endif
    return true;
}();

}
