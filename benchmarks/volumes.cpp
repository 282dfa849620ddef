// Building, sampling and marking by volumes. The rows `:flat kernel` are what marking costs at least: the arithmetic of a
// sample at each point and of the sides of each face, without looking up any tile.

#include "Inputs.h"

#include "frame/ParallelFor.h"
#include "subdivision/faceSize.h"
#include "volume/PointRow.h"

#include <Modeling/subdivideByVolume.h>
#include <Modeling/subdivisionSteps.h>

#include <algorithm>
#include <numeric>
#include <random>

using namespace Benchmarks;
using namespace TSR::TileTree3D;

namespace {

constexpr float kTolerance = 0.01f;

template <class Traits> Volume<Traits> volumeOf(std::vector<Voxel> const& voxels, unsigned int offsetType = 7)
{
    VoxelList const list{Traits::kUnitDepth, voxels};
    return buildVolume<Traits>(
        {.background = 1, .offsetType = offsetType, .depth = Traits::kUnitDepth, .lists = {&list, 1}});
}

/// Where samples find the values across the border of a tile: in a padded channel, in a layer on the upper sides, or in one
/// all around, because values are at the centers of their voxels.
enum class Layers { padded, positive, full };

template <class Traits, Layers layers> LinearSampler<Traits> samplerWith()
{
    constexpr bool isFull = layers == Layers::full;
    static auto const volume = volumeOf<Traits>(bandOfVoxels(kRadius), isFull ? 0 : 7);
    static auto const padded = layers == Layers::padded ? makeHaloChannel(volume) : Channel<Traits, float>();
    float const offset = isFull ? 0.5f : 0;
    return {volume.container, volume.channel, volume.topology,
        {.scale = kRadius, .voxelOffset = {offset, offset, offset}, .background = volume.background},
        layers == Layers::padded ? &padded : nullptr};
}

/// Blends values of a single tile for all points, and compares the sides of all faces with them.
template <class Traits> void markByOneTile(FlatMesh const& mesh, Orvan::Array<float>& limits, Orvan::Array<bool>& marks)
{
    using namespace Internal;
    constexpr int kSide = Traits::kSide + 1;
    std::vector<float> const tile(kSide * kSide * kSide);
    tbb::blocked_range<std::size_t> const fours(0, mesh.points.size / 4, PointRow::kCapacity);
    Modeling::parallelFor(fours, [&](auto const& range) {
        PointRow row = {};
        row.values[0] = tile.data();
        for (std::size_t first = 4 * range.begin(), count; first < 4 * range.end(); first += count) {
            count = std::min(PointRow::kCapacity, 4 * range.end() - first);
            placePoints(mesh.points.data + first, count, {kRadius, Traits::kSide, 1, {0, 0, 0}}, row);
            interpolateRow<kSide, kSide, false>(count, 1, {0, Traits::kSide - 1}, row, limits.data + first);
        }
    });
    Modeling::parallelFor(tbb::blocked_range<unsigned int>(0, mesh.faceCount(), 1), [&](auto const& faces) {
        float3 const* const p = mesh.points.data;
        for (unsigned int face = faces.begin(); face != faces.end(); ++face) {
            unsigned int const* const c = mesh.faceVertex.data + mesh.faceOffset.data[face];
            if (Geometry::Mesh::Internal::isBoxLonger(
                    p[c[0]], p[c[1]], p[c[2]], Modeling::broadcast(limits.data[c[1]])))
                marks.data[face] = true;
        }
    });
}

template <class Traits, Layers layers> void measureMarking(Run& run)
{
    using Geometry::Mesh::Internal::markForSubdivision;
    auto const sampler = samplerWith<Traits, layers>();
    FlatMesh const mesh(Meshes::sphere, run.size());
    auto const& [points, faceVertex, faceOffset] = mesh;
    Orvan::Array<bool> marks(mesh.faceCount());
    Orvan::Array<float> limits(mesh.pointCount());
    timeRuns(run, mesh.faceCount(), [&] {
        if (run.variant == ":flat kernel")
            markByOneTile<Traits>(mesh, limits, marks);
        else if (run.variant == ":length")
            markForSubdivision(kTolerance, mesh.faceCount(), points, faceVertex, faceOffset, marks);
        else
            markForSubdivision(sampler, mesh.faceCount(), points, faceVertex, faceOffset, marks, kTolerance);
        DoNotOptimize(marks.data);
    });
}

/// Points along the mesh or in random order, in rows or one by one.
template <class Traits, Layers layers> void measureSampling(Run& run)
{
    std::vector<float3> points = pointsInBand(run.size(), 1);
    if (run.variant.starts_with("AtRandom"))
        std::shuffle(points.begin(), points.end(), std::mt19937(1));
    auto sampler = samplerWith<Traits, layers>();
    std::vector<float> values(points.size());
    timeRuns(run, points.size(), [&, inRows = !run.variant.ends_with(":single")] {
        if (inRows)
            sampler.sampleAll(points.data(), points.size(), Traits::kUnitDepth, kWorldSpace, values.data());
        else
            for (std::size_t n = 0; n < points.size(); ++n)
                values[n] = sampler.sample(points[n], Traits::kUnitDepth, kWorldSpace);
        DoNotOptimize(values.data());
    });
    run.reportResult(std::accumulate(values.begin(), values.end(), 0.0));
}

/// At all of these voxels.
template <class Traits> double sumOfValues(Volume<Traits> const& volume, std::vector<Voxel> const& voxels)
{
    LinearSampler<Traits> sampler(
        volume.container, volume.channel, volume.topology, {.scale = 1, .background = volume.background});
    double sum = 0;
    for (auto const& [i, j, k, value] : voxels)
        sum += static_cast<double>(sampler.sample(
            {static_cast<float>(i), static_cast<float>(j), static_cast<float>(k)}, Traits::kUnitDepth, kWorldSpace));
    return sum;
}

template <class Traits> bool addRows(std::string const& suffix, std::vector<std::string> const& variantsOfBuilding)
{
    std::vector<std::string> const marking{"", ":length", ":flat kernel"},
        sampling{"", ":single", "AtRandom", "AtRandom:single"};
    Row("markByPaddedVolume" + suffix, kSampled, marking, measureMarking<Traits, Layers::padded>);
    Row("markByVolume" + suffix, kSampled, marking, measureMarking<Traits, Layers::positive>);
    Row("samplePaddedVolume" + suffix, kSampled, sampling, measureSampling<Traits, Layers::padded>);
    Row("sampleVolume" + suffix, kSampled, sampling, measureSampling<Traits, Layers::positive>);
    Row("sampleCenteredVolume" + suffix, kSampled, sampling, measureSampling<Traits, Layers::full>);
    Row("buildVolume" + suffix, kRadii, variantsOfBuilding, [](Run& run) {
        std::vector<Voxel> const voxels = bandOfVoxels(run.size());
        if (run.copies(voxels.size() * sizeof(Voxel), voxels.size()))
            return;
        timeRuns(run, voxels.size(), [&] { DoNotOptimize(volumeOf<Traits>(voxels)); });
        run.reportResult(sumOfValues(volumeOf<Traits>(voxels), voxels));
    });
    return true;
}
[[maybe_unused]] bool const areRowsAdded = addRows<Traits2>("", kBesideCopy) && addRows<Traits5>("5", {""});

}
