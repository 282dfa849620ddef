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
#include <array>
#include <memory>
#include <unordered_map>

using namespace Modeling;
using namespace Tessara::Geometry;
using Tessara::Object;
using Tessara::Math::float2;
using Tessara::Math::float3;
using Tessara::Math::uchar4;
using TestSupport::MeshBuilder;
using TestSupport::Random;

namespace {

std::size_t sizeOf(benchmark::State const& state)
{
    return static_cast<std::size_t>(state.range(0));
}

/// Times `edit(object)` on objects that share their arrays with `source`, as those of a host's document do, and reports
/// what memory it took beyond the bytes of the result.
template <class Edit> void measureEdit(
    benchmark::State& state, Object const& source, std::size_t elements, std::size_t resultBytes, Edit edit)
{
    for (auto _ : state) {
        state.PauseTiming();
        auto object = Tessara::createObject();
        *object = source;
        state.ResumeTiming();
        edit(*object);
        state.PauseTiming();
        object = nullptr;
        state.ResumeTiming();
    }
    Benchmarks::countElements(state, elements);
    Object object = source;
    auto const peak = static_cast<double>(Benchmarks::peakBytesOf([&] { edit(object); }));
    state.counters["working bytes/element"] = (peak - static_cast<double>(resultBytes)) / static_cast<double>(elements);
}

/// The attributes of a cloud, 32 bytes a point.
struct FlatCloud {
    Orvan::Array<float3> positions;
    Orvan::Array<float3> normals;
    Orvan::Array<uchar4> colours;
    Orvan::Array<float> intensities;

    static constexpr std::size_t kBytesAPoint = 32;
};

FlatCloud makeCloud(std::size_t count)
{
    FlatCloud cloud{Orvan::Array<float3>(count), Orvan::Array<float3>(count, float3{0, 0, 1}),
        Orvan::Array<uchar4>(count), Orvan::Array<float>(count, 0.5f)};
    Random random(1);
    for (std::size_t point = 0; point != count; ++point) {
        cloud.positions[point] = {random.coordinate(), random.coordinate(), random.coordinate()};
        cloud.colours[point].x = static_cast<unsigned char>(point);
    }
    return cloud;
}

Orvan::MutablePtr<Object> makeObject(FlatCloud const& cloud)
{
    auto object = makePointCloud(cloud.positions);
    addDataProperty("normal", sPointComp, cloud.normals, *object);
    addDataProperty("color", sPointComp, cloud.colours, *object);
    addDataProperty("intensity", sPointComp, cloud.intensities, *object);
    return object;
}

// The arguments are the points that are there and those that are added.

void addPoints(benchmark::State& state)
{
    auto const added = static_cast<std::size_t>(state.range(1));
    auto const cloud = makeObject(makeCloud(sizeOf(state)));
    Orvan::Array<float3> const positions(added, float3{1, 2, 3});
    std::size_t const count = sizeOf(state) + added;
    // Unused capacity is no memory that is touched, but it is counted.
    measureEdit(state, *cloud, count, (count + count) * FlatCloud::kBytesAPoint,
        [&](Object& object) { Tessara::GeometryAlgorithms::addPointsToPointCloud(positions, {}, object, nullptr); });
}

template <class T> Orvan::Array<T> flatExtended(Orvan::Array<T> const& source, std::size_t added)
{
    auto array = uninitializedArray<T>(source.size + added);
    std::memcpy(array.data, source.data, source.size * sizeof(T));
    std::fill(array.data + source.size, array.data + array.size, T{});
    return array;
}

/// The same bytes into fresh memory, on one thread: copied where they are known, filled where they are not.
void copyAndFill(benchmark::State& state)
{
    auto const added = static_cast<std::size_t>(state.range(1));
    FlatCloud const cloud = makeCloud(sizeOf(state));
    Orvan::Array<float3> const positions(added, float3{1, 2, 3});
    for (auto _ : state) {
        auto extended = uninitializedArray<float3>(cloud.positions.size + added);
        std::memcpy(extended.data, cloud.positions.data, cloud.positions.size * sizeof(float3));
        std::memcpy(extended.data + cloud.positions.size, positions.data, added * sizeof(float3));
        FlatCloud result{std::move(extended), flatExtended(cloud.normals, added), flatExtended(cloud.colours, added),
            flatExtended(cloud.intensities, added)};
        benchmark::DoNotOptimize(result.positions.data);
        benchmark::ClobberMemory();
        state.PauseTiming();
        result = FlatCloud();
        state.ResumeTiming();
    }
    Benchmarks::countElements(state, sizeOf(state) + added);
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
    std::size_t const resultBytes = (sizeOf(state) - indices.size) * FlatCloud::kBytesAPoint;
    measureEdit(state, *cloud, sizeOf(state), resultBytes,
        [&](Object& object) { Tessara::GeometryAlgorithms::deletePointsInPointCloud(indices, object, nullptr); });
}

/// The same on an object that nobody else shares: arrays are edited in place.
void deletePointsOfOwnCloud(benchmark::State& state)
{
    FlatCloud const cloud = makeCloud(sizeOf(state));
    auto const indices = everySecondAtRandom(sizeOf(state));
    for (auto _ : state) {
        state.PauseTiming();
        auto object = makeObject(cloud);
        state.ResumeTiming();
        Tessara::GeometryAlgorithms::deletePointsInPointCloud(indices, *object, nullptr);
        state.PauseTiming();
        object = nullptr;
        state.ResumeTiming();
    }
    Benchmarks::countElements(state, sizeOf(state));
}

template <class T> void flatCompact(Orvan::Array<bool> const& deleted, Orvan::Array<T>& array)
{
    std::size_t count = 0;
    for (std::size_t i = 0; i != deleted.size; ++i)
        if (!deleted[i])
            array[count++] = array[i];
    array.resize(count);
}

/// Flags and one loop an array over arrays of its own, on one thread.
void flatDeletePoints(benchmark::State& state)
{
    FlatCloud const source = makeCloud(sizeOf(state));
    auto const indices = everySecondAtRandom(sizeOf(state));
    for (auto _ : state) {
        state.PauseTiming();
        FlatCloud cloud = source;
        state.ResumeTiming();
        Orvan::Array<bool> deleted(source.positions.size);
        for (unsigned int const point : indices)
            deleted[point] = true;
        flatCompact(deleted, cloud.positions);
        flatCompact(deleted, cloud.normals);
        flatCompact(deleted, cloud.colours);
        flatCompact(deleted, cloud.intensities);
        benchmark::DoNotOptimize(cloud.positions.data);
        benchmark::ClobberMemory();
        state.PauseTiming();
        cloud = FlatCloud();
        state.ResumeTiming();
    }
    Benchmarks::countElements(state, sizeOf(state));
}

void copyCloud(benchmark::State& state)
{
    Benchmarks::copyBytes(state, sizeOf(state) * FlatCloud::kBytesAPoint);
    Benchmarks::countElements(state, sizeOf(state));
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
    static std::unordered_map<std::size_t, MeshBuilder> made; // takes longer than what is measured
    auto const [entry, isNew] = made.try_emplace(faces);
    if (isNew)
        entry->second = MeshBuilder::sphereWithFaces(faces);
    auto const mesh = entry->second.build();
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
        [&](Object& object) { Tessara::GeometryAlgorithms::deleteFaces(deleted, object); });
}

/// Marks, numbers and compacts arrays of its own, on one thread.
void flatDeleteFaces(benchmark::State& state)
{
    FlatMesh const source = makeFlatMesh(sizeOf(state));
    auto const deleted = everySecondPatch(source.materials.size);
    for (auto _ : state) {
        state.PauseTiming();
        FlatMesh mesh = source;
        state.ResumeTiming();
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
        benchmark::ClobberMemory();
        state.PauseTiming();
        mesh = FlatMesh();
        state.ResumeTiming();
    }
    Benchmarks::countElements(state, deleted.size);
}

void copyMesh(benchmark::State& state)
{
    FlatMesh const flat = makeFlatMesh(sizeOf(state));
    Benchmarks::copyBytes(state, flat.bytes());
    Benchmarks::countElements(state, flat.materials.size);
}

void copyExtendedCloud(benchmark::State& state)
{
    auto const count = sizeOf(state) + static_cast<std::size_t>(state.range(1));
    Benchmarks::copyBytes(state, count * FlatCloud::kBytesAPoint);
    Benchmarks::countElements(state, count);
}

void measurePeer(benchmark::State& state, std::size_t elements, Benchmarks::PeerDeletion const& peer)
{
    for (auto _ : state) {
        state.PauseTiming();
        peer.prepare();
        state.ResumeTiming();
        peer.run();
    }
    Benchmarks::countElements(state, elements);
    state.counters["remaining"] = static_cast<double>(peer.remaining());
}

using MakePointPeer = Benchmarks::PeerDeletion (*)(std::size_t, Orvan::Array<unsigned int> const&);
[[maybe_unused]] void deletePointsWithPeer(benchmark::State& state, MakePointPeer makePeer)
{
    measurePeer(state, sizeOf(state), makePeer(sizeOf(state), everySecondAtRandom(sizeOf(state))));
}

using MakeFacePeer = Benchmarks::PeerDeletion (*)(Benchmarks::PeerMesh const&);
[[maybe_unused]] void deleteFacesWithPeer(benchmark::State& state, MakeFacePeer makePeer)
{
    FlatMesh const flat = makeFlatMesh(sizeOf(state));
    auto const deleted = everySecondPatch(flat.materials.size);
    measurePeer(state, deleted.size, makePeer({flat.positions, flat.faceVertex, deleted}));
}

#define MODELING_ADDED Args({1'000, 1'000})->Args({1'000'000, 9'000'000})->Args({9'000'000, 1'000'000})->UseRealTime()
BENCHMARK(addPoints)->Name("addPointsToPointCloud")->MODELING_ADDED;
BENCHMARK(copyAndFill)->Name("addPointsToPointCloud:copy and fill")->MODELING_ADDED;
BENCHMARK(copyExtendedCloud)->Name("addPointsToPointCloud:memcpy")->MODELING_ADDED;

#define MODELING_POINTS Arg(1'000)->Arg(100'000)->Arg(10'000'000)->UseRealTime()
BENCHMARK(deletePoints)->Name("deletePointsInPointCloud")->MODELING_POINTS;
BENCHMARK(deletePointsOfOwnCloud)->Name("deletePointsInPointCloud:in place")->MODELING_POINTS;
BENCHMARK(flatDeletePoints)->Name("deletePointsInPointCloud:flat")->MODELING_POINTS;
BENCHMARK(copyCloud)->Name("deletePointsInPointCloud:memcpy")->MODELING_POINTS;
#ifdef MODELING_HAS_PCL
BENCHMARK_CAPTURE(deletePointsWithPeer, PCL, Benchmarks::pclDeletion)
    ->Name("deletePointsInPointCloud:PCL")
    ->MODELING_POINTS;
#endif
#ifdef MODELING_HAS_VTK
BENCHMARK_CAPTURE(deletePointsWithPeer, VTK, Benchmarks::vtkPointDeletion)
    ->Name("deletePointsInPointCloud:VTK")
    ->MODELING_POINTS;
#endif

#define MODELING_FACES Arg(1'000)->Arg(100'000)->Arg(1'000'000)->UseRealTime()
BENCHMARK(deleteFaces)->MODELING_FACES;
BENCHMARK(flatDeleteFaces)->Name("deleteFaces:flat")->MODELING_FACES;
BENCHMARK(copyMesh)->Name("deleteFaces:memcpy")->MODELING_FACES;
#ifdef MODELING_HAS_CGAL
BENCHMARK_CAPTURE(deleteFacesWithPeer, CGAL, Benchmarks::cgalFaceDeletion)->Name("deleteFaces:CGAL")->MODELING_FACES;
#endif
#ifdef MODELING_HAS_VTK
BENCHMARK_CAPTURE(deleteFacesWithPeer, VTK, Benchmarks::vtkFaceDeletion)->Name("deleteFaces:VTK")->MODELING_FACES;
#endif

}
