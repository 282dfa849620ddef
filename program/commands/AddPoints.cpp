#include "Commands.h"
#include "Operation.h"
#include "geometry/Geometry.h"
#include "shell/Failure.h"

#include <Modeling/addPointsToPointCloud.h>
#include <TessaraGeometry/Makers.h>

#include <fmt/format.h>

#include <memory>

namespace ModelingProgram {

namespace {

    using namespace Tessara::Geometry;
    using Tessara::Object;

    struct Options {
        std::filesystem::path in;
        std::filesystem::path points;
        Output out;
        std::string tag;
    };

    void checkTag(std::string const& tag, Object const& cloud, Report& report)
    {
        Orvan::String const name = tag.c_str();
        if (name == sPointPosition || name == sPointComp)
            throw Failure(ExitCode::Refused, fmt::format("a tag named {} would replace the points", tag));
        if (!tag.empty() && cloud.hasProperty(name))
            report.warn(fmt::format("the tag replaces the attribute {}", tag));
    }

    void warnOfAttributes(Object const& points, std::filesystem::path const& file, Report& report)
    {
        std::vector<std::string> names;
        for (Property const& property : propertiesOf(points))
            if (!property.isStandard)
                names.push_back(property.name);
        if (!names.empty())
            report.warn(
                fmt::format("only positions are read from {}; left out: {}", file.string(), fmt::join(names, ", ")));
    }

    void addPoints(Options const& options, Report& report)
    {
        requireWritable(options.out, GeometryType::PointCloud);
        if (!options.tag.empty())
            requireAttribute(options.out, "--tag", options.tag);
        Orvan::MutablePtr<Object> const cloud = loadGeometry(options.in, report);
        requirePointCloud("add-points", *cloud, options.in);
        checkTag(options.tag, *cloud, report);
        Orvan::MutablePtr<Object> const points = loadGeometry(options.points, report);
        warnOfAttributes(*points, options.points, report);
        Json const before = countsOf(*cloud);
        auto const positions = dataOf<float3>(*points, sPointPosition);
        runOperation(report, [&] {
            requireDone("add-points",
                Tessara::GeometryAlgorithms::addPointsToPointCloud(*positions, options.tag.c_str(), *cloud, nullptr));
        });
        saveGeometry(*cloud, options.out, report);
        reportOperation(before, countsOf(*cloud), {}, report);
    }

}

void addAddPoints(CommandLine& program, Invocation& invocation)
{
    auto const options = std::make_shared<Options>();
    constexpr CommandHelp kHelp = {"add-points", "Add the points of a file to a point cloud",
        R"(The points are appended, from any kind of file; of a mesh all of its points.
Only their positions are used: in the attributes of the point cloud they get zero or the attribute's
default. A tag is a new attribute of the points that is true for the added ones.)",
        "  modeling add-points scan.ply second-scan.xyz both.ply --tag second"};
    Command command = addCommand(kHelp, program, invocation);
    addFile("IN", "Point cloud to read", options->in, command);
    addFile("POINTS", "File whose points are added", options->points, command);
    addOutput("Point cloud to write", options->out, command);
    command.addOption("--tag", options->tag, "Name of the attribute that marks the new points").valueName("NAME");
    onSelected(command, invocation, [options](Report& report) { addPoints(*options, report); });
}

}
