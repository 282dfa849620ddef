#include "GuideVolume.h"

#include "VolumeReport.h"

#include "files/VdbFile.h"
#include "geometry/LargeFaces.h"
#include "shell/Cancellation.h"
#include "shell/Failure.h"
#include "shell/MemoryLimit.h"
#include "shell/Phase.h"

#include <Modeling/subdivideByVolume.h>
#include <TessaraGeometry/Elements.h>
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

    std::string namesOf(std::vector<VdbGrid> const& grids)
    {
        std::vector<std::string> texts;
        for (VdbGrid const& grid : grids)
            texts.push_back(fmt::format("\"{}\" ({})", grid.name, grid.type));
        return listOf(texts);
    }

    std::size_t chooseGrid(GuideOptions const& options, std::vector<VdbGrid> const& grids)
    {
        auto const isFloat = [](VdbGrid const& grid) { return grid.type == "float"; };
        if (options.grid.empty()) {
            auto const only = std::find_if(grids.begin(), grids.end(), isFloat);
            if (std::count_if(grids.begin(), grids.end(), isFloat) != 1)
                refuse(fmt::format("--grid has to name one of the float grids of {}. There are: {}",
                    options.file.string(), namesOf(grids)));
            return static_cast<std::size_t>(only - grids.begin());
        }
        auto const named =
            std::find_if(grids.begin(), grids.end(), [&](VdbGrid const& grid) { return grid.name == options.grid; });
        if (named == grids.end())
            refuse(fmt::format(
                "there is no grid \"{}\" in {}. There are: {}", options.grid, options.file.string(), namesOf(grids)));
        if (!isFloat(*named))
            refuse(fmt::format("grid \"{}\" in {} is a {} grid, but a float grid is needed. There are: {}",
                options.grid, options.file.string(), named->type, namesOf(grids)));
        return static_cast<std::size_t>(named - grids.begin());
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

    struct Range {
        float least = std::numeric_limits<float>::infinity();
        float most = -std::numeric_limits<float>::infinity();
        std::optional<float> leastPositive;

        void add(float value)
        {
            least = std::min(least, value);
            most = std::max(most, value);
            if (value > 0)
                leastPositive = std::min(value, leastPositive.value_or(value));
        }
    };

    void warnOfSigns(Range const& all, std::string const& grid, Report& report)
    {
        if (all.least > 0)
            return;
        if (!all.leastPositive)
            report.warn(fmt::format("no value of grid \"{}\" is above 0, so no face is refined", grid));
        else
            report.warn(fmt::format("grid \"{}\" (or its background) has both values above 0 and others. Faces are not "
                                    "refined where the value is not above 0, and become ever finer close to there. "
                                    "--min-value avoids that.",
                grid));
    }

    void requireMemory(VdbGridSize const& size, std::filesystem::path const& file, MemoryLimit const& limit)
    {
        // In memory at once are OpenVDB's tree and the values copied from it, later these values and the library's
        // tiles. The values take at most as much as the tree; the tiles, which may be aligned differently, at most
        // twice as much.
        constexpr std::uint64_t kTreesInMemory = 3, kCodecBytes = 32'000'000;
        limit.require(kCodecBytes + kTreesInMemory * size.treeBytes,
            fmt::format("reading {} with {}", file.string(), countOf(size.activeVoxels, "single voxel")),
            "A volume with larger voxels needs less.");
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

GuideVolume::GuideVolume(GuideOptions const& options, Report& report, MemoryLimit const* limit)
{
    Phase const phase(report, &Times::reading, fmt::format("reading {}", options.file.filename().string()));
    std::size_t const grid = chooseGrid(options, listVdbGrids(options.file));
    SparseVolume volume = readVdbGrid(options.file, grid, [&](VdbGridSize const& size) {
        if (limit)
            requireMemory(size, options.file, *limit);
    });
    stopIfCancelled();
    report.document["inputs"].push_back({{"file", options.file.string()}, {"format", "OpenVDB"}, {"kind", "volume"}});
    if (options.leastValue) {
        auto const raise = [&](float& value) { value = std::max(value, *options.leastValue); };
        raise(volume.background);
        forEachActiveValue(volume, raise);
    }
    describe(volume, report);
    placeOnLattice(volume);
    build(volume, options.tileSide);
    stopIfCancelled();
}

void GuideVolume::describe(SparseVolume& volume, Report& report)
{
    bool hasNumbers = !std::isnan(volume.background);
    forEachActiveValue(volume, [&](float value) { hasNumbers = hasNumbers && !std::isnan(value); });
    if (!hasNumbers)
        refuse(fmt::format("grid \"{}\" has values that are NaN", volume.name));
    Range active;
    forEachActiveValue(volume, [&](float value) { active.add(value); });
    Range all = active;
    all.add(volume.background);
    grid_ = volume.name;
    background_ = volume.background;
    smallestPositive_ = all.leastPositive;
    reportVolume(volume, active.least, active.most, report);
    warnOfSigns(all, volume.name, report);
}

void GuideVolume::placeOnLattice(SparseVolume& volume)
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

void GuideVolume::build(SparseVolume const& volume, int tileSide)
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

float3 GuideVolume::toLattice(float3 const& point) const
{
    return {point.x - shift_.x, point.y - shift_.y, point.z - shift_.z};
}

template <class Traits>
LinearSampler<Traits> GuideVolume::samplerOf(Volume<Traits> const& volume, float background) const
{
    LinearSamplerSettings settings;
    settings.scale = scale_;
    settings.background = background;
    return {volume.container, volume.channel, volume.topology, settings};
}

template <class Visit> void GuideVolume::visitVolume(Visit const& visit) const
{
    if (auto const* const fours = std::get_if<Volume<Traits2>>(&volume_))
        visit(*fours);
    else
        visit(std::get<Volume<Traits5>>(volume_));
}

void GuideVolume::reportCoverage(MeshArrays const& mesh, Report& report) const
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
    report.document["volume"]["coveredFaces"] = covered;
    report.text += fmt::format("{} of {} are inside it\n\n", groupDigits(covered), countOf(mesh.faceCount(), "face"));
    if (covered == 0)
        report.warn(fmt::format(
            "no face is inside the volume, so all faces use the background of grid \"{}\", {}", grid_, background_));
}

std::uint64_t GuideVolume::refine(float tolerance, Tessara::Object& mesh) const
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
        addDataProperty(sPointPosition, sPointComp, positions, mesh);
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

void addGuideOptions(GuideOptions& options, Command& command)
{
    Option const file =
        command.addOption("--volume", options.file, "Scale the tolerance by a float grid of this OpenVDB file")
            .valueName("FILE");
    command.addOption("--grid", options.grid, "Name of the grid; optional if there is only one float grid")
        .valueName("NAME")
        .needs(file);
    command.addOption("--min-value", options.leastValue, "Replace smaller values of the grid by this one")
        .valueName("V")
        .needs(file);
    command.addOption("--tile-side", options.tileSide, "Voxels per side of a tile of the volume in memory")
        .valueName("N")
        .oneOf({"4", "5"})
        .showDefault()
        .needs(file);
}

}
