#include "Measuring.h"
#ifdef MODELING_HAS_OPENVDB
#include "peers/openvdbGrid.h"
#endif

#include "support/MeshBuilder.h"

#include <Modeling/subdivideByVolume.h>
#include <Modeling/subdivisionSteps.h>
#include <TessaraGeometryVolume/VolumeBuilder.h>

#include <algorithm>
#include <cmath>
#include <map>
#include <random>
#include <string>
#include <vector>

using namespace TSR::TileTree3D;
using TestSupport::float3;
using TestSupport::MeshBuilder;

namespace {

constexpr float kRadius = 28; // voxels
constexpr float kTolerance = 0.01f;

/// A band of voxels around a sphere, up to 3 voxels from it, with values that grow along x; a tenth of the surface is left
/// out. 28 voxels of radius give 53,000 of them, a million take 122.
std::vector<Voxel> bandOfVoxels(float radius)
{
    std::vector<Voxel> voxels;
    int const reach = static_cast<int>(radius) + 4;
    for (int k = static_cast<int>(-0.8f * radius); k <= reach; ++k)
        for (int j = -reach; j <= reach; ++j)
            for (int i = -reach; i <= reach; ++i)
                if (std::abs(std::sqrt(static_cast<float>(i * i + j * j + k * k)) - radius) <= 3)
                    voxels.push_back({i, j, k, 1.1f + static_cast<float>(i) / radius});
    return voxels;
}

/// How samples come by the values across the border of a tile: from a padded channel, from a layer on the upper sides, or
/// from one all around, since values are in the middle of their voxels.
enum class Layers { padded, positive, full };

template <class Traits, Layers layers> struct Guide {
    static constexpr bool kIsFull = layers == Layers::full;
    Volume<Traits> volume;
    Channel<Traits, float> padded;

    static Guide const& get()
    {
        static Guide const guide = [] {
            std::vector<Voxel> const voxels = bandOfVoxels(kRadius);
            VoxelList const list{Traits::kUnitDepth, voxels};
            VolumeSource source;
            source.background = 1;
            source.offsetType = kIsFull ? 0 : 7;
            source.depth = Traits::kUnitDepth;
            source.lists = {&list, 1};
            Guide made{buildVolume<Traits>(source), Channel<Traits, float>()};
            if (layers == Layers::padded)
                made.padded = makeHaloChannel(made.volume);
            return made;
        }();
        return guide;
    }

    LinearSampler<Traits> sampler() const
    {
        float const offset = kIsFull ? 0.5f : 0;
        return {volume.container, volume.channel, volume.topology,
            {.scale = kRadius, .voxelOffset = {offset, offset, offset}, .background = volume.background},
            layers == Layers::padded ? &padded : nullptr};
    }
};

struct FlatMesh {
    Orvan::Array<float3> points;
    Orvan::Array<unsigned int> corners, offsets;
    unsigned int faces;
};

/// The unit sphere with a few faces more than asked for.
FlatMesh const& sphereOf(std::size_t faces)
{
    static std::map<std::size_t, FlatMesh> made;
    auto const [entry, isNew] = made.try_emplace(faces);
    if (isNew) {
        MeshBuilder const sphere = MeshBuilder::sphereWithFaces(faces);
        FlatMesh& mesh = entry->second;
        mesh.points = Orvan::Array<float3>(sphere.points);
        mesh.offsets.append(0);
        for (auto const& face : sphere.faces) {
            for (unsigned int const point : face)
                mesh.corners.append(point);
            mesh.offsets.append(static_cast<unsigned int>(mesh.corners.size));
        }
        mesh.faces = static_cast<unsigned int>(sphere.faces.size());
    }
    return entry->second;
}

template <class Mark> void measureMarking(benchmark::State& state, Mark const& mark)
{
    FlatMesh const& mesh = sphereOf(static_cast<std::size_t>(state.range(0)));
    Orvan::Array<bool> marks(mesh.faces);
    for (auto _ : state) {
        mark(mesh, marks);
        benchmark::DoNotOptimize(marks.data);
    }
    Benchmarks::countElements(state, mesh.faces);
}

template <class Traits, Layers layers> void markByVolume(benchmark::State& state)
{
    auto const sampler = Guide<Traits, layers>::get().sampler();
    measureMarking(state, [&](FlatMesh const& mesh, Orvan::Array<bool>& marks) {
        Geometry::Mesh::Internal::markForSubdivision(
            sampler, mesh.faces, mesh.points, mesh.corners, mesh.offsets, marks, kTolerance);
    });
}

void markByLength(benchmark::State& state)
{
    measureMarking(state, [](FlatMesh const& mesh, Orvan::Array<bool>& marks) {
        Geometry::Mesh::Internal::markForSubdivision(
            kTolerance, mesh.faces, mesh.points, mesh.corners, mesh.offsets, marks);
    });
}

/// The second corners of the faces, in their order, that lie in the band.
std::vector<float3> pointsInBand(std::size_t faces, float scale)
{
    FlatMesh const& mesh = sphereOf(faces);
    std::vector<float3> points;
    for (unsigned int face = 0; face < mesh.faces; ++face)
        if (float3 const p = mesh.points[mesh.corners[3 * face + 1]]; p.z > -0.75f)
            points.push_back({p.x * scale, p.y * scale, p.z * scale});
    return points;
}

void allFaceCounts(benchmark::internal::Benchmark* benchmark)
{
    for (std::int64_t const faces : {20'000, 200'000, 2'000'000})
        benchmark->Arg(faces);
    benchmark->UseRealTime();
}

enum class Order { alongMesh, random };

template <class Traits, Layers layers, Order order, bool inRows> void sampleVolume(benchmark::State& state)
{
    std::vector<float3> points = pointsInBand(static_cast<std::size_t>(state.range(0)), 1);
    if (order == Order::random)
        std::shuffle(points.begin(), points.end(), std::mt19937(1));
    auto sampler = Guide<Traits, layers>::get().sampler();
    std::vector<float> values(points.size());
    for (auto _ : state) {
        if (inRows)
            sampler.sampleAll(points.data(), points.size(), Traits::kUnitDepth, kWorldSpace, values.data());
        else
            for (std::size_t n = 0; n < points.size(); ++n)
                values[n] = sampler.sample(points[n], Traits::kUnitDepth, kWorldSpace);
        benchmark::DoNotOptimize(values.data());
        benchmark::ClobberMemory();
    }
    Benchmarks::countElements(state, points.size());
}

/// Rows of points, and beside them the same points one by one.
template <class Traits, Layers layers> void registerSampling(std::string const& name)
{
    auto const add = [](std::string const& full, void (*run)(benchmark::State&)) {
        benchmark::RegisterBenchmark(full.c_str(), run)->Apply(allFaceCounts);
    };
    add(name, sampleVolume<Traits, layers, Order::alongMesh, true>);
    add(name + ":single", sampleVolume<Traits, layers, Order::alongMesh, false>);
    add(name + "AtRandom", sampleVolume<Traits, layers, Order::random, true>);
    add(name + "AtRandom:single", sampleVolume<Traits, layers, Order::random, false>);
}

#ifdef MODELING_HAS_OPENVDB
void sampleOpenvdb(benchmark::State& state)
{
    std::vector<float3> const points = pointsInBand(static_cast<std::size_t>(state.range(0)), kRadius);
    Benchmarks::OpenvdbGrid const grid(bandOfVoxels(kRadius), 1);
    for (auto _ : state)
        benchmark::DoNotOptimize(grid.sumOfSamples(points));
    Benchmarks::countElements(state, points.size());
}

void buildOpenvdb(benchmark::State& state)
{
    std::vector<Voxel> const voxels = bandOfVoxels(static_cast<float>(state.range(0)));
    for (auto _ : state)
        benchmark::DoNotOptimize(Benchmarks::OpenvdbGrid(voxels, 1).sumOfSamples({}));
    Benchmarks::countElements(state, voxels.size());
}
#endif

template <class Traits> void build(benchmark::State& state)
{
    std::vector<Voxel> const voxels = bandOfVoxels(static_cast<float>(state.range(0)));
    VoxelList const list{Traits::kUnitDepth, voxels};
    VolumeSource source;
    source.background = 1;
    source.depth = Traits::kUnitDepth;
    source.lists = {&list, 1};
    for (auto _ : state)
        benchmark::DoNotOptimize(buildVolume<Traits>(source));
    state.counters["voxels"] = static_cast<double>(voxels.size());
    Benchmarks::countElements(state, voxels.size());
}

void copyVoxels(benchmark::State& state)
{
    Benchmarks::copyBytes(state, bandOfVoxels(static_cast<float>(state.range(0))).size() * sizeof(Voxel));
}

void allRadii(benchmark::internal::Benchmark* benchmark)
{
    for (std::int64_t const voxels : {28, 122})
        benchmark->Arg(voxels);
    benchmark->UseRealTime();
}

}

BENCHMARK(markByVolume<Traits2, Layers::padded>)->Name("markByPaddedVolume")->Apply(allFaceCounts);
BENCHMARK(markByLength)->Name("markByPaddedVolume:length")->Apply(allFaceCounts);
BENCHMARK(markByVolume<Traits2, Layers::positive>)->Name("markByVolume")->Apply(allFaceCounts);
BENCHMARK(markByLength)->Name("markByVolume:length")->Apply(allFaceCounts);
BENCHMARK(markByVolume<Traits5, Layers::padded>)->Name("markByPaddedVolume5")->Apply(allFaceCounts);
BENCHMARK(markByLength)->Name("markByPaddedVolume5:length")->Apply(allFaceCounts);
BENCHMARK(markByVolume<Traits5, Layers::positive>)->Name("markByVolume5")->Apply(allFaceCounts);
BENCHMARK(markByLength)->Name("markByVolume5:length")->Apply(allFaceCounts);

[[maybe_unused]] bool const areSamplesRegistered = [] {
    registerSampling<Traits2, Layers::padded>("samplePaddedVolume");
    registerSampling<Traits2, Layers::positive>("sampleVolume");
    registerSampling<Traits2, Layers::full>("sampleCenteredVolume");
    registerSampling<Traits5, Layers::padded>("samplePaddedVolume5");
    registerSampling<Traits5, Layers::positive>("sampleVolume5");
    registerSampling<Traits5, Layers::full>("sampleCenteredVolume5");
    return true;
}();

BENCHMARK(build<Traits2>)->Name("buildVolume")->Apply(allRadii);
BENCHMARK(build<Traits5>)->Name("buildVolume5")->Apply(allRadii);
BENCHMARK(copyVoxels)->Name("buildVolume:memcpy")->Apply(allRadii);

#ifdef MODELING_HAS_OPENVDB
BENCHMARK(sampleOpenvdb)->Name("samplePaddedVolume:openvdb")->Apply(allFaceCounts);
BENCHMARK(sampleOpenvdb)->Name("sampleVolume:openvdb")->Apply(allFaceCounts);
BENCHMARK(buildOpenvdb)->Name("buildVolume:openvdb")->Apply(allRadii);
#endif
