#include "Measuring.h"
#include "peers/openvdbGrid.h"

#include "support/Volumes.h"

#include <Modeling/subdivideByVolume.h>
#include <Modeling/subdivisionSteps.h>

#include <algorithm>
#include <cmath>
#include <random>

using namespace Benchmarks;
using namespace TSR::TileTree3D;

namespace {

constexpr float kRadius = 28; // voxels
constexpr float kTolerance = 0.01f;

/// A band of voxels around a sphere, up to 3 voxels from it, with values that grow along x; a tenth of the surface is left
/// out. 28 voxels of radius give 53,000 of them, a million take 122.
std::vector<Voxel> bandOfVoxels(float radius)
{
    std::vector<Voxel> voxels;
    int const reach = static_cast<int>(radius) + 4;
    TestSupport::forEachVoxel(-reach, reach + 1, [&](int i, int j, int k) {
        float const distance = std::sqrt(static_cast<float>(i * i + j * j + k * k));
        if (k >= static_cast<int>(-0.8f * radius) && std::abs(distance - radius) <= 3)
            voxels.push_back({i, j, k, 1.1f + static_cast<float>(i) / radius});
    });
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
    Volume<Traits> volume = volumeOf<Traits>(bandOfVoxels(kRadius), kIsFull ? 0 : 7);
    Channel<Traits, float> padded = layers == Layers::padded ? makeHaloChannel(volume) : Channel<Traits, float>();

    static LinearSampler<Traits> sampler()
    {
        static Guide const made;
        float const offset = kIsFull ? 0.5f : 0;
        return {made.volume.container, made.volume.channel, made.volume.topology,
            {.scale = kRadius, .voxelOffset = {offset, offset, offset}, .background = made.volume.background},
            layers == Layers::padded ? &made.padded : nullptr};
    }
};

Sizes const kFaces{{20'000}, {200'000}, {2'000'000}}, kRadii{{28}, {122}};

FlatMesh const& flatSphereOf(State const& state)
{
    return madeOnce(sizeOf(state), [](std::size_t faces) { return FlatMesh(sphereOf(faces).polygons()); });
}

template <class Mark> void measureMarking(State& state, Mark const& mark)
{
    FlatMesh const& mesh = flatSphereOf(state);
    Orvan::Array<bool> marks(mesh.faceCount());
    timeRuns(state, mesh.faceCount(), [&] {
        mark(mesh, marks);
        benchmark::DoNotOptimize(marks.data);
    });
}

template <class Traits, Layers layers> void addMarking(std::string const& name)
{
    using Geometry::Mesh::Internal::markForSubdivision;
    Row(name, kFaces, [](State& state) {
        auto const sampler = Guide<Traits, layers>::sampler();
        measureMarking(state, [&](FlatMesh const& mesh, Orvan::Array<bool>& marks) {
            markForSubdivision(
                sampler, mesh.faceCount(), mesh.points, mesh.faceVertex, mesh.faceOffset, marks, kTolerance);
        });
    });
    Row(name + ":length", kFaces, [](State& state) {
        measureMarking(state, [](FlatMesh const& mesh, Orvan::Array<bool>& marks) {
            markForSubdivision(kTolerance, mesh.faceCount(), mesh.points, mesh.faceVertex, mesh.faceOffset, marks);
        });
    });
}

/// The second corners of the faces, in order of the faces, that are in the band.
std::vector<float3> pointsInBand(State const& state, float scale)
{
    FlatMesh const& mesh = flatSphereOf(state);
    std::vector<float3> points;
    for (std::size_t corner = 1; corner < mesh.faceVertex.size; corner += 3)
        if (float3 const p = mesh.points[mesh.faceVertex[corner]]; p.z > -0.75f)
            points.push_back({p.x * scale, p.y * scale, p.z * scale});
    return points;
}

/// Points along the mesh or in random order, in rows or one by one.
template <class Traits, Layers layers> void addSampling(std::string const& name)
{
    for (bool const isShuffled : {false, true})
        for (bool const inRows : {true, false})
            Row(name + (isShuffled ? "AtRandom" : "") + (inRows ? "" : ":single"), kFaces, [=](State& state) {
                std::vector<float3> points = pointsInBand(state, 1);
                if (isShuffled)
                    std::shuffle(points.begin(), points.end(), std::mt19937(1));
                auto sampler = Guide<Traits, layers>::sampler();
                std::vector<float> values(points.size());
                timeRuns(state, points.size(), [&] {
                    if (inRows)
                        sampler.sampleAll(points.data(), points.size(), Traits::kUnitDepth, kWorldSpace, values.data());
                    else
                        for (std::size_t n = 0; n < points.size(); ++n)
                            values[n] = sampler.sample(points[n], Traits::kUnitDepth, kWorldSpace);
                    benchmark::DoNotOptimize(values.data());
                });
            });
}

template <class Traits> bool addRows(std::string const& suffix)
{
    addMarking<Traits, Layers::padded>("markByPaddedVolume" + suffix);
    addMarking<Traits, Layers::positive>("markByVolume" + suffix);
    addSampling<Traits, Layers::padded>("samplePaddedVolume" + suffix);
    addSampling<Traits, Layers::positive>("sampleVolume" + suffix);
    addSampling<Traits, Layers::full>("sampleCenteredVolume" + suffix);
    Row("buildVolume" + suffix, kRadii, [](State& state) {
        std::vector<Voxel> const voxels = bandOfVoxels(static_cast<float>(state.range(0)));
        timeRuns(state, voxels.size(), [&] { benchmark::DoNotOptimize(volumeOf<Traits>(voxels)); });
        state.counters["voxels"] = static_cast<double>(voxels.size());
    });
    return true;
}
[[maybe_unused]] bool const areRowsAdded = addRows<Traits2>("") && addRows<Traits5>("5");

CopyRow const voxelBytes("buildVolume", kRadii, [](State const& state) -> CopyRow::Input {
    return {bandOfVoxels(static_cast<float>(state.range(0))).size() * sizeof(Voxel), 0};
});

#ifdef MODELING_HAS_OPENVDB
Row samplingByOpenvdb(char const* name)
{
    return Row(name, kFaces, [](State& state) {
        std::vector<float3> const points = pointsInBand(state, kRadius);
        OpenvdbGrid const grid(bandOfVoxels(kRadius), 1);
        timeRuns(state, points.size(), [&] { benchmark::DoNotOptimize(grid.sumOfSamples(points)); });
    });
}
Row const openvdbRows[]{samplingByOpenvdb("samplePaddedVolume:openvdb"), samplingByOpenvdb("sampleVolume:openvdb"),
    {"buildVolume:openvdb", kRadii, [](State& state) {
         std::vector<Voxel> const voxels = bandOfVoxels(static_cast<float>(state.range(0)));
         timeRuns(state, voxels.size(), [&] { benchmark::DoNotOptimize(OpenvdbGrid(voxels, 1).sumOfSamples({})); });
     }}};
#endif

}
