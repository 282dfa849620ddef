#include "GuideVolume.h"

#include "VolumeReport.h"

#include "shell/Cancellation.h"
#include "shell/Failure.h"
#include "shell/MemoryLimit.h"
#include "shell/Phase.h"

#include <fmt/format.h>

#include <algorithm>

namespace ModelingProgram {

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

    void warnOfSigns(GuideGrid const& guide, Report& report)
    {
        if (guide.range().leastOfAll > 0)
            return;
        if (!guide.range().leastPositive)
            report.warn(fmt::format("no value of grid \"{}\" is above 0, so no face is refined", guide.grid()));
        else
            report.warn(fmt::format("grid \"{}\" (or its background) has both values above 0 and others. Faces are not "
                                    "refined where the value is not above 0, and become ever finer close to there. "
                                    "--min-value avoids that.",
                guide.grid()));
    }

}

std::size_t chooseGrid(GuideOptions const& options, std::vector<VdbGrid> const& grids)
{
    auto const isFloat = [](VdbGrid const& grid) { return grid.type == "float"; };
    if (options.grid.empty()) {
        auto const only = std::find_if(grids.begin(), grids.end(), isFloat);
        if (std::count_if(grids.begin(), grids.end(), isFloat) != 1)
            refuse(fmt::format("--grid has to name one of the float grids of {}. There are: {}", options.file.string(),
                namesOf(grids)));
        return static_cast<std::size_t>(only - grids.begin());
    }
    auto const named =
        std::find_if(grids.begin(), grids.end(), [&](VdbGrid const& grid) { return grid.name == options.grid; });
    if (named == grids.end())
        refuse(fmt::format(
            "there is no grid \"{}\" in {}. There are: {}", options.grid, options.file.string(), namesOf(grids)));
    if (!isFloat(*named))
        refuse(fmt::format("grid \"{}\" in {} is a {} grid, but a float grid is needed. There are: {}", options.grid,
            options.file.string(), named->type, namesOf(grids)));
    return static_cast<std::size_t>(named - grids.begin());
}

GuideGrid readGuide(GuideOptions const& options, Report& report, MemoryLimit const* limit)
{
    Phase const phase(report, &Times::reading, fmt::format("reading {}", options.file.filename().string()));
    std::size_t const grid = chooseGrid(options, listVdbGrids(options.file));
    SparseVolume volume = readVdbGrid(options.file, grid, [&](VdbGridSize const& size) {
        if (limit)
            requireMemory(size, options.file, *limit);
    });
    stopIfCancelled();
    report.document["inputs"].push_back({{"file", options.file.string()}, {"format", "OpenVDB"}, {"kind", "volume"}});
    GuideGrid guide(volume, options.leastValue, options.tileSide);
    reportVolume(volume, guide.range().least, guide.range().most, report);
    warnOfSigns(guide, report);
    stopIfCancelled();
    return guide;
}

void reportCoverage(GuideGrid const& guide, MeshArrays const& mesh, Report& report)
{
    std::uint64_t const covered = guide.countCovered(mesh);
    report.document["volume"]["coveredFaces"] = covered;
    report.text += fmt::format("{} of {} are inside it\n\n", groupDigits(covered), countOf(mesh.faceCount(), "face"));
    if (covered == 0)
        report.warn(fmt::format("no face is inside the volume, so all faces use the background of grid \"{}\", {}",
            guide.grid(), guide.background()));
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
