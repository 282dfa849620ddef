#include "GuideGrid.h"

#include "LargeFaces.h"
#include "replacePositions.h"
#include "shell/Failure.h"

#include <Modeling/subdivideByVolume.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Names.h>

#include <fmt/format.h>

#include <algorithm>
#include <cmath>
#include <limits>

namespace ModelingProgram {

using namespace TSR::TileTree3D;
using Tessara::Math::float3;

namespace {

    [[noreturn]] void refuse(std::string const& sentence)
    {
        throw Failure(ExitCode::Refused, sentence);
    }

    template <class Visit> void forEachActiveValue(SparseVolume& volume, Visit const& visit)
    {
        for (Voxel& voxel : volume.voxels)
            visit(voxel.value);
        for (float& value : volume.cubeValues)
            visit(value);
        for (ConstantBox& box : volume.boxes)
            visit(box.value);
    }

    /// \throws Failure  if a value is NaN
    ValueRange rangeOf(SparseVolume& volume)
    {
        bool hasNumbers = !std::isnan(volume.background);
        ValueRange range;
        range.least = std::numeric_limits<float>::infinity();
        range.most = -range.least;
        auto const addPositive = [&](float value) {
            if (value > 0)
                range.leastPositive = std::min(value, range.leastPositive.value_or(value));
        };
        forEachActiveValue(volume, [&](float value) {
            hasNumbers = hasNumbers && !std::isnan(value);
            range.least = std::min(range.least, value);
            range.most = std::max(range.most, value);
            addPositive(value);
        });
        if (!hasNumbers)
            refuse(fmt::format("grid \"{}\" has values that are NaN", volume.name));
        addPositive(volume.background);
        range.leastOfAll = std::min(range.least, volume.background);
        return range;
    }

    void shiftIndex(int& index, double by, SparseVolume const& volume)
    {
        double const shifted = index + by;
        if (!(shifted > std::numeric_limits<int>::min() && shifted < std::numeric_limits<int>::max()))
            refuse(fmt::format("grid \"{}\" is {} voxels away from the origin, which is more than 32 bits can count",
                volume.name, by));
        index = static_cast<int>(shifted);
    }

}

GuideGrid::GuideGrid(SparseVolume& volume, std::optional<float> leastValue, int tileSide)
    : grid_(volume.name)
{
    if (leastValue) {
        auto const raise = [&](float& value) { value = std::max(value, *leastValue); };
        raise(volume.background);
        forEachActiveValue(volume, raise);
    }
    background_ = volume.background;
    range_ = rangeOf(volume);
    placeOnLattice(volume);
    build(volume, tileSide);
}

void GuideGrid::placeOnLattice(SparseVolume& volume)
{
    scale_ = static_cast<float>(1 / volume.voxelSize);
    if (!std::isnormal(scale_) || !std::isnormal(static_cast<float>(volume.voxelSize)))
        refuse(fmt::format("the voxels of grid \"{}\" have a size of {}, which single precision cannot hold",
            volume.name, volume.voxelSize));
    double whole[3];
    float* const shifts[3] = {&shift_.x, &shift_.y, &shift_.z};
    for (std::size_t axis = 0; axis != 3; ++axis) {
        whole[axis] = std::round(volume.translation[axis] / volume.voxelSize);
        *shifts[axis] = static_cast<float>(volume.translation[axis] - whole[axis] * volume.voxelSize);
    }
    auto const move = [&](int& i, int& j, int& k) {
        shiftIndex(i, whole[0], volume);
        shiftIndex(j, whole[1], volume);
        shiftIndex(k, whole[2], volume);
    };
    for (Voxel& voxel : volume.voxels)
        move(voxel.i, voxel.j, voxel.k);
    for (VoxelCube& cube : volume.cubes) {
        IJK last{cube.first.i + 7, cube.first.j + 7, cube.first.k + 7};
        move(cube.first.i, cube.first.j, cube.first.k);
        move(last.i, last.j, last.k);
    }
    for (ConstantBox& box : volume.boxes) {
        move(box.first.i, box.first.j, box.first.k);
        move(box.end.i, box.end.j, box.end.k);
    }
}

void GuideGrid::build(SparseVolume const& volume, int tileSide)
{
    auto const buildAs = [&]<class Traits>(Traits) {
        VoxelList const voxels{Traits::kUnitDepth, volume.voxels};
        VolumeSource source;
        source.background = volume.background;
        source.depth = Traits::kUnitDepth;
        source.boxes = volume.boxes;
        source.lists = {&voxels, 1};
        source.cubes = volume.cubes;
        source.cubeValues = volume.cubeValues;
        volume_ = buildVolume<Traits>(source);
    };
    if (tileSide == Traits5::kSide)
        buildAs(Traits5());
    else
        buildAs(Traits2());
}

float3 GuideGrid::toLattice(float3 const& point) const
{
    return {point.x - shift_.x, point.y - shift_.y, point.z - shift_.z};
}

template <class Traits> LinearSampler<Traits> GuideGrid::samplerOf(Volume<Traits> const& volume, float background) const
{
    LinearSamplerSettings settings;
    settings.scale = scale_;
    settings.background = background;
    return {volume.container, volume.channel, volume.topology, settings};
}

template <class Visit> void GuideGrid::visitVolume(Visit const& visit) const
{
    if (auto const* const fours = std::get_if<Volume<Traits2>>(&volume_))
        visit(*fours);
    else
        visit(std::get<Volume<Traits5>>(volume_));
}

std::uint64_t GuideGrid::countCovered(MeshArrays const& mesh) const
{
    std::uint64_t covered = 0;
    visitVolume([&]<class Traits>(Volume<Traits> const& volume) {
        // NaN marks points outside all tiles.
        LinearSampler<Traits> sampler = samplerOf(volume, std::numeric_limits<float>::quiet_NaN());
        for (unsigned int face = 0; face != mesh.faceCount(); ++face) {
            float3 const& decisive = (*mesh.positions)[mesh.corners(face)[1]];
            covered += std::isnan(sampler.sample(toLattice(decisive), Traits::kDeepest, kWorldSpace)) ? 0u : 1u;
        }
    });
    return covered;
}

void GuideGrid::sample(std::span<float3 const> points, std::span<float> values) const
{
    visitVolume([&]<class Traits>(Volume<Traits> const& volume) {
        LinearSampler<Traits> sampler = samplerOf(volume, background_);
        for (std::size_t i = 0; i != points.size(); ++i)
            values[i] = sampler.sample(toLattice(points[i]), Traits::kDeepest, kWorldSpace);
    });
}

std::uint64_t GuideGrid::refine(float tolerance, Tessara::Object& mesh) const
{
    using namespace Tessara::Geometry;
    // The mesh is translated by at most half a voxel, and back afterwards. An offset in the sampler would make it read
    // beyond the neighbors of a tile.
    auto const movePoints = [&](float sign) {
        if (shift_.x == 0 && shift_.y == 0 && shift_.z == 0)
            return;
        Orvan::Array<float3> positions = *dataOf<float3>(mesh, sPointPosition);
        for (float3& p : positions)
            p = {p.x + sign * shift_.x, p.y + sign * shift_.y, p.z + sign * shift_.z};
        replacePositions(std::move(positions), mesh);
    };
    std::uint64_t largeFaces = 0;
    movePoints(-1);
    visitVolume([&](auto const& volume) {
        auto const sampler = samplerOf(volume, background_);
        Geometry::Mesh::subdivide(sampler, mesh, tolerance);
        // Before the points are moved back, because rounding may then collapse the smallest faces.
        largeFaces = countLargeFaces(mesh, [&](MeshArrays const& refined, Orvan::Array<bool>& marks) {
            Geometry::Mesh::Internal::markForSubdivision(sampler, refined.faceCount(), *refined.positions,
                *refined.faceVertex, *refined.faceOffset, marks, tolerance);
        });
    });
    movePoints(1);
    return largeFaces;
}

}
