#include "Commands.h"
#include "Operation.h"
#include "VolumeReport.h"
#include "files/Streams.h"
#include "files/VdbFile.h"
#include "geometry/Geometry.h"
#include "geometry/MeshRequirements.h"
#include "geometry/MeshTopology.h"
#include "geometry/SurfaceBand.h"
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

    struct Options {
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

    constexpr char kAdvice[] = "Doubling the voxel size makes a quarter as many voxels; a narrower --band helps too.";

    void requireVdb(Output const& out)
    {
        if (out.file.extension() != ".vdb" && !isStream(out.file))
            throw Failure(
                ExitCode::File, fmt::format("{} cannot be written: its name has to end in .vdb", out.file.string()));
        requirePlace(out);
    }

    void requireFiniteSurface(MeshArrays const& mesh, std::filesystem::path const& file)
    {
        if (!std::all_of(mesh.positions->begin(), mesh.positions->end(), [](float3 const& p) { return isFinite(p); }))
            throw Failure(ExitCode::Refused, fmt::format("a coordinate in {} is not finite", file.string()));
    }

    SurfaceValue surfaceValueOf(Options const& options, Object const& mesh)
    {
        SurfaceValue value;
        if (!options.distanceTo.empty()) {
            value.distanceTo = {options.distanceTo[0], options.distanceTo[1], options.distanceTo[2]};
            return value;
        }
        value.pointNumbers = pointNumbers("--attribute", options.attribute, mesh, options.in);
        if (!std::all_of(
                value.pointNumbers.begin(), value.pointNumbers.end(), [](float n) { return std::isfinite(n); }))
            throw Failure(ExitCode::Refused, fmt::format("the values of \"{}\" are not all finite", options.attribute));
        return value;
    }

    double voxelSizeOf(Options const& options, Object const& mesh)
    {
        if (options.voxelSize)
            return *options.voxelSize;
        auto const box = boundingBoxOf(mesh);
        if (!box)
            return 1; // any size, since there are no voxels
        double const longest = std::max(
            {double{box->max.x} - box->min.x, double{box->max.y} - box->min.y, double{box->max.z} - box->min.z});
        if (!(longest > 0))
            throw Failure(ExitCode::Refused,
                fmt::format(
                    "all points of {} are at the same position, so --voxel-size is required", options.in.string()));
        return longest / options.voxels;
    }

    using Range = std::pair<float, float>;

    Range rangeOf(std::vector<TSR::TileTree3D::Voxel> const& voxels)
    {
        auto const [least, most] = std::minmax_element(
            voxels.begin(), voxels.end(), [](auto const& a, auto const& b) { return a.value < b.value; });
        return least == voxels.end() ? Range() : Range(least->value, most->value);
    }

    /// Maps the values linearly, so that the smallest one becomes `from` and the largest one `to`.
    void mapValues(float from, float to, std::vector<TSR::TileTree3D::Voxel>& voxels)
    {
        auto const [least, most] = rangeOf(voxels);
        double const width = double{most} - least;
        for (auto& voxel : voxels) {
            double const t = width > 0 ? (double{voxel.value} - least) / width : 0;
            voxel.value = static_cast<float>((1 - t) * from + t * to);
        }
    }

    void requireFiniteValues(SparseVolume const& volume)
    {
        if (!std::all_of(volume.voxels.begin(), volume.voxels.end(),
                [](TSR::TileTree3D::Voxel const& voxel) { return std::isfinite(voxel.value); }))
            throw Failure(ExitCode::Refused, "the values of the volume are too large for single precision");
    }

    void requireMemory(BandSize const& size, double voxelSize, MemoryLimit const& limit)
    {
        // Larger sizes, which may not fit 64 bits, exceed any limit.
        constexpr double kMost = 1e18;
        limit.require(static_cast<std::uint64_t>(std::min(size.bytes, kMost)),
            fmt::format("a band of about {} of size {:.4g}",
                countOf(static_cast<std::uint64_t>(std::min(size.voxels, kMost)), "voxel"), voxelSize),
            kAdvice);
    }

    void makeVolume(Options const& options, MemoryLimit const& limit, Report& report)
    {
        requireVdb(options.out);
        Orvan::MutablePtr<Object> const mesh = loadInput(options.in, report).object;
        requireType(GeometryType::Mesh, *mesh, "make-volume", options.in);
        MeshArrays const arrays = arraysOf(*mesh);
        requireFiniteSurface(arrays, options.in);
        SurfaceValue const value = surfaceValueOf(options, *mesh);

        std::optional<Phase> phase(std::in_place, report, &Times::report, kReportTitle);
        SparseVolume volume;
        volume.name = options.grid;
        volume.voxelSize = voxelSizeOf(options, *mesh);
        volume.background = options.background;
        requireMemory(estimateBand(arrays, volume.voxelSize, options.halfWidth), volume.voxelSize, limit);
        runOperation(report, [&] {
            volume.voxels = voxelsAround(arrays, value, volume.voxelSize, options.halfWidth);
            if (options.from)
                mapValues(*options.from, *options.to, volume.voxels);
            requireFiniteValues(volume);
        });
        auto const [least, most] = rangeOf(volume.voxels);
        reportVolume(volume, least, most, report);
        stopIfCancelled();
        phase.emplace(report, &Times::writing, fmt::format("writing {}", options.out.file.filename().string()));
        writeVdbFile(volume, options.out.file, options.out.existing());
        phase.reset();
        report.document["output"] = options.out.file.string();
        reportRun(report);
    }

    void addValueOptions(Options& options, Command& command)
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
    auto const options = std::make_shared<Options>();
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
        limit.run([&] { makeVolume(*options, limit, report); }, kAdvice);
    });
}

}
