#include "Commands.h"
#include "Operation.h"
#include "VolumeReport.h"
#include "files/Streams.h"
#include "files/VdbFile.h"
#include "geometry/Geometry.h"
#include "geometry/MeshRequirements.h"
#include "geometry/MeshTopology.h"
#include "geometry/SurfaceVolume.h"
#include "shell/Cancellation.h"
#include "shell/Failure.h"
#include "shell/MemoryLimit.h"
#include "shell/Phase.h"

#include <fmt/format.h>

#include <algorithm>
#include <cmath>
#include <memory>
#include <optional>

namespace ModelingProgram {

namespace {

    using Tessara::Object;

    struct MakeVolumeOptions {
        std::filesystem::path in;
        Output out;
        std::string attribute;
        std::vector<double> distanceTo; // three coordinates
        std::optional<float> from;
        std::optional<float> to;
        std::optional<double> voxelSize;
        unsigned int voxels = 100; // along the longest side of the mesh
        double halfWidth = 3; // voxels
        float background = 1;
        std::string grid = "scale";
        std::uint64_t maxMemory = 0;
    };

    constexpr char kVoxelAdvice[] =
        "Doubling the voxel size makes a quarter as many voxels; a narrower --band helps too.";

    void requireVdb(Output const& out)
    {
        if (out.file.extension() != ".vdb" && !isStream(out.file))
            throw Failure(
                ExitCode::File, fmt::format("{} cannot be written: its name has to end in .vdb", out.file.string()));
        requirePlace(out);
    }

    SurfaceValue surfaceValueOf(MakeVolumeOptions const& options, Object const& mesh)
    {
        SurfaceValue value;
        if (!options.distanceTo.empty()) {
            value.distanceTo = {options.distanceTo[0], options.distanceTo[1], options.distanceTo[2]};
            return value;
        }
        value.pointNumbers = pointNumbers("--attribute", options.attribute, mesh, options.in);
        requireFiniteNumbers(value.pointNumbers, fmt::format("values of \"{}\"", options.attribute));
        return value;
    }

    void requireMemory(BandSize const& size, double voxelSize, MemoryLimit const& limit)
    {
        // Larger sizes, which may not fit 64 bits, exceed any limit.
        constexpr double kMost = 1e18;
        limit.require(static_cast<std::uint64_t>(std::min(size.bytes, kMost)),
            fmt::format("a band of about {} of size {:.4g}",
                countOf(static_cast<std::uint64_t>(std::min(size.voxels, kMost)), "voxel"), voxelSize),
            kVoxelAdvice);
    }

    void makeVolume(MakeVolumeOptions const& options, MemoryLimit const& limit, Report& report)
    {
        requireVdb(options.out);
        Orvan::MutablePtr<Object> const mesh = loadInput(options.in, report).object;
        requireType(GeometryType::Mesh, *mesh, "make-volume", options.in);
        MeshArrays const arrays = arraysOf(*mesh);
        requireFiniteSurface(arrays, options.in.string());
        SurfaceValue const value = surfaceValueOf(options, *mesh);

        std::optional<Phase> phase(std::in_place, report, &Times::report, kReportTitle);
        SparseVolume volume;
        volume.name = options.grid;
        volume.voxelSize =
            options.voxelSize ? *options.voxelSize : voxelSizeFor(options.voxels, *mesh, options.in.string());
        volume.background = options.background;
        requireMemory(estimateBand(arrays, volume.voxelSize, options.halfWidth), volume.voxelSize, limit);
        runOperation(report, [&] {
            fillBand(arrays, value, options.halfWidth,
                options.from ? std::optional(std::pair(*options.from, *options.to)) : std::nullopt, volume);
        });
        auto const [least, most] = valueRange(volume.voxels);
        reportVolume(volume, least, most, report);
        stopIfCancelled();
        phase.emplace(report, &Times::writing, fmt::format("writing {}", options.out.file.filename().string()));
        writeVdbFile(volume, options.out.file, options.out.existing());
        phase.reset();
        report.document["output"] = options.out.file.string();
        reportRun(report);
    }

    void addValueOptions(MakeVolumeOptions& options, Command& command)
    {
        Command value = command.addChoice("Values", "one of these is required");
        value.addOption("--attribute", options.attribute, "A number per point, interpolated over faces")
            .valueName("NAME");
        value.addOption("--distance-to", options.distanceTo, "The distance to the point X Y Z")
            .valueName("NUMBER")
            .values(3);
        Option from =
            command.addOption("--from", options.from, "What the smallest of these values becomes").valueName("V");
        Option to = command.addOption("--to", options.to, "What the largest becomes; others are mapped linearly")
                        .valueName("V");
        from.needs(to);
        to.needs(from);
        command.addOption("--background", options.background, "The value everywhere else").valueName("V").showDefault();
    }

}

void addMakeVolume(CommandLine& program, Invocation& invocation)
{
    auto const options = std::make_shared<MakeVolumeOptions>();
    constexpr CommandHelp kHelp = {"make-volume", "Make a volume around a mesh that controls its refinement",
        R"(The volume is a float grid in an OpenVDB file, with voxels in a band around the surface. Each voxel
gets the value at the nearest point of the surface: an attribute of the points, interpolated over the
face, or the distance to a given point. Faces may have any number of corners.

"modeling subdivide --volume" multiplies its tolerance by these values: small values make fine faces.)",
        "  modeling make-volume head.obj guide.vdb --distance-to 0 1.7 0.1 --from 0.25 --to 2\n"
        "  modeling make-volume scan.ply guide.vdb --attribute quality --voxels 200 --band 5"};
    Command command = addCommand(kHelp, program, invocation);
    addFile("MESH", "Mesh to read", options->in, command);
    addOutput("OpenVDB file to write", options->out, command, invocation);
    addValueOptions(*options, command);
    Option const voxelSize = command.addOption("--voxel-size", options->voxelSize, "Side of a voxel in model units")
                                 .valueName("S")
                                 .between(1e-30, 1e30, "> 0");
    command
        .addOption("--voxels", options->voxels, "Voxels along the longest side of the bounding box, instead of a size")
        .valueName("N")
        .between(1, 1000000)
        .showDefault()
        .excludes(voxelSize);
    command.addOption("--band", options->halfWidth, "Distance from the surface up to which there are voxels, in voxels")
        .valueName("N")
        .between(1, 1000, "1..1000")
        .showDefault();
    command.addOption("--grid", options->grid, "Name of the grid").valueName("NAME").showDefault();
    addMemoryLimit(options->maxMemory, command);
    onSelected(command, invocation, [options](Report& report) {
        MemoryLimit const limit(options->maxMemory);
        limit.run([&] { makeVolume(*options, limit, report); }, kVoxelAdvice);
    });
}

}
