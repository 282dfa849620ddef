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
#include <random>
#include <string>
#include <vector>

using namespace Benchmarks;
using namespace TSR::TileTree3D;
using TestSupport::float3;

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

template <class Traits> Volume<Traits> volumeOf(std::vector<Voxel> const& voxels, unsigned int offsetType = 7)
{
    VoxelList const list{Traits::kUnitDepth, voxels};
    return buildVolume<Traits>(
        {.background = 1, .offsetType = offsetType, .depth = Traits::kUnitDepth, .lists = {&list, 1}});
}

/// Where samples find the values across the border of a tile: in a padded channel, in a layer on the upper sides, or in one
/// all around, because values are at the centers of their voxels.
enum class Layers { padded, positive, full };

template <class Traits, Layers layers> struct Guide {
    static constexpr bool kIsFull = layers == Layers::full;
    Volume<Traits> volume;
    Channel<Traits, float> padded;

    static Guide const& get()
    {
        static Guide const guide = [] {
            std::vector<Voxel> const voxels = bandOfVoxels(kRadius);
            Guide made{volumeOf<Traits>(voxels, kIsFull ? 0 : 7), Channel<Traits, float>()};
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

/// The unit sphere with a few faces more than that.
FlatMesh const& sphereOf(std::size_t faces)
{
    return madeOnce(faces, [](std::size_t count) {
        auto const sphere = TestSupport::MeshBuilder::sphereWithFaces(count).polygons();
        return FlatMesh{Orvan::Array<float3>(sphere.points), Orvan::Array<unsigned int>(sphere.faceVertex),
            Orvan::Array<unsigned int>(sphere.faceOffset), static_cast<unsigned int>(sphere.faceCount())};
    });
}

template <class Mark> void measureMarking(benchmark::State& state, Mark const& mark)
{
    FlatMesh const& mesh = sphereOf(sizeOf(state));
    Orvan::Array<bool> marks(mesh.faces);
    for (auto _ : state) {
        mark(mesh, marks);
        benchmark::DoNotOptimize(marks.data);
    }
    countElements(state, mesh.faces);
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

/// The second corners of the faces, in order of the faces, that are in the band.
std::vector<float3> pointsInBand(std::size_t faces, float scale)
{
    FlatMesh const& mesh = sphereOf(faces);
    std::vector<float3> points;
    for (unsigned int face = 0; face < mesh.faces; ++face)
        if (float3 const p = mesh.points[mesh.corners[3 * face + 1]]; p.z > -0.75f)
            points.push_back({p.x * scale, p.y * scale, p.z * scale});
    return points;
}

enum class Order { alongMesh, random };

template <class Traits, Layers layers, Order order, bool inRows> void sampleVolume(benchmark::State& state)
{
    std::vector<float3> points = pointsInBand(sizeOf(state), 1);
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
    countElements(state, points.size());
}

template <class Traits> void build(benchmark::State& state)
{
    std::vector<Voxel> const voxels = bandOfVoxels(static_cast<float>(state.range(0)));
    for (auto _ : state)
        benchmark::DoNotOptimize(volumeOf<Traits>(voxels));
    state.counters["voxels"] = static_cast<double>(voxels.size());
    countElements(state, voxels.size());
}

Sizes const& faceCounts()
{
    static Sizes const counts{{20'000}, {200'000}, {2'000'000}};
    return counts;
}

template <class Traits, Layers layers> void addMarking(std::string const& name)
{
    addRow(name.c_str(), faceCounts(), markByVolume<Traits, layers>);
    addRow((name + ":length").c_str(), faceCounts(), markByLength);
}

/// Rows of points, and beside them the same points one by one.
template <class Traits, Layers layers> void addSampling(std::string const& name)
{
    addRow(name.c_str(), faceCounts(), sampleVolume<Traits, layers, Order::alongMesh, true>);
    addRow((name + ":single").c_str(), faceCounts(), sampleVolume<Traits, layers, Order::alongMesh, false>);
    addRow((name + "AtRandom").c_str(), faceCounts(), sampleVolume<Traits, layers, Order::random, true>);
    addRow((name + "AtRandom:single").c_str(), faceCounts(), sampleVolume<Traits, layers, Order::random, false>);
}

[[maybe_unused]] bool const areRowsAdded = [] {
    addMarking<Traits2, Layers::padded>("markByPaddedVolume");
    addMarking<Traits2, Layers::positive>("markByVolume");
    addMarking<Traits5, Layers::padded>("markByPaddedVolume5");
    addMarking<Traits5, Layers::positive>("markByVolume5");
    addSampling<Traits2, Layers::padded>("samplePaddedVolume");
    addSampling<Traits2, Layers::positive>("sampleVolume");
    addSampling<Traits2, Layers::full>("sampleCenteredVolume");
    addSampling<Traits5, Layers::padded>("samplePaddedVolume5");
    addSampling<Traits5, Layers::positive>("sampleVolume5");
    addSampling<Traits5, Layers::full>("sampleCenteredVolume5");
    Sizes const radii{{28}, {122}};
    addRow("buildVolume", radii, build<Traits2>);
    addRow("buildVolume5", radii, build<Traits5>);
    addRow("buildVolume:memcpy", radii, [](benchmark::State& state) {
        copyBytes(state, bandOfVoxels(static_cast<float>(state.range(0))).size() * sizeof(Voxel), 0);
    });
#ifdef MODELING_HAS_OPENVDB
    auto const sample = [](benchmark::State& state) {
        std::vector<float3> const points = pointsInBand(sizeOf(state), kRadius);
        OpenvdbGrid const grid(bandOfVoxels(kRadius), 1);
        for (auto _ : state)
            benchmark::DoNotOptimize(grid.sumOfSamples(points));
        countElements(state, points.size());
    };
    addRow("samplePaddedVolume:openvdb", faceCounts(), sample);
    addRow("sampleVolume:openvdb", faceCounts(), sample);
    addRow("buildVolume:openvdb", radii, [](benchmark::State& state) {
        std::vector<Voxel> const voxels = bandOfVoxels(static_cast<float>(state.range(0)));
        for (auto _ : state)
            benchmark::DoNotOptimize(OpenvdbGrid(voxels, 1).sumOfSamples({}));
        countElements(state, voxels.size());
    });
#endif
    return true;
}();

}
