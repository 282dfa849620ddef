#include "Commands.h"
#include "Operation.h"
#include "files/GeometryBuilder.h"
#include "geometry/Facts.h"
#include "shell/Failure.h"
#include "shell/Phase.h"
#include "shell/Progress.h"

#include <fmt/format.h>

#include <memory>

namespace ModelingProgram {

namespace {

    std::string formatBox(std::optional<BoundingBox> const& box)
    {
        if (!box)
            return "empty";
        return fmt::format(
            "({}, {}, {}) to ({}, {}, {})", box->min.x, box->min.y, box->min.z, box->max.x, box->max.y, box->max.z);
    }

    std::string formatProperties(std::vector<Property> const& properties)
    {
        std::vector<std::vector<std::string>> rows;
        for (Property const& property : properties)
            rows.push_back({property.name, property.type,
                elementNames(property.component.c_str()) + (property.range.empty() ? "" : " through " + property.range),
                groupDigits(property.length)});
        return formatTable({{"property"}, {"type"}, {"of"}, {"length", true}}, rows);
    }

    /// What the text needs besides the document.
    struct Description {
        Json counts;
        std::optional<BoundingBox> box;
        std::vector<Property> properties;
    };

    Description countAndDescribe(Input const& input, Report& report)
    {
        Phase const phase(report, &Times::report, kReportTitle);
        Tessara::Object const& object = *input.object;
        Description description{countsOf(object), boundingBoxOf(object), propertiesOf(object)};
        report.document["counts"] = description.counts;
        report.document["boundingBox"] = describeBox(description.box);
        if (typeOf(object) == GeometryType::Mesh && report.needsFacts()) {
            MeshArrays const mesh = arraysOf(object);
            report.document["topology"] =
                describeTopology(mesh, input.topology ? *input.topology : analyzeTopology(mesh));
        }
        report.document["properties"] = describeProperties(description.properties);
        return description;
    }

    void describeFile(std::filesystem::path const& file, Report& report)
    {
        Input const loaded = loadInput(file, report);
        Description const description = countAndDescribe(loaded, report);
        Json const& input = report.document["inputs"][0];
        report.text = fmt::format("{}: {}, {}\n\n{}bounding box {}\n", printable(file.string()),
            input["kind"].get<std::string>(), input["format"].get<std::string>(),
            formatValues({{"", description.counts}}), formatBox(description.box));
        if (report.document.contains("topology"))
            report.text += "\n" + formatValues({{"", report.document["topology"]}});
        report.text += "\n" + formatProperties(description.properties);
    }

    /// What is most important, in one line.
    std::string lineOf(std::filesystem::path const& file, Json const& document)
    {
        Json const& input = document["inputs"][0];
        std::string line = fmt::format("{}: {}, {}", printable(file.string()), input["kind"].get<std::string>(),
            input["format"].get<std::string>());
        for (auto const& [name, count] : document["counts"].items())
            line += ", " + countOf(count.get<std::uint64_t>(), name.substr(0, name.size() - 1));
        if (document.contains("topology"))
            line +=
                document["topology"]["closedManifold"].get<bool>() ? ", closed manifold" : ", not a closed manifold";
        return line + "\n";
    }

    void addFailure(ExitCode code, std::string const& message, std::vector<std::string> const& reasons, Report& report)
    {
        printMessage("modeling: " + message);
        report.document["error"] = {{"message", message}, {"reasons", reasons}};
        report.exitCode = static_cast<int>(code);
    }

    Report describeAlone(std::filesystem::path const& file, Report const& all)
    {
        Report report("info");
        report.reading = all.reading;
        report.requirements = all.requirements;
        report.isJson = all.isJson;
        report.isQuiet = all.isQuiet;
        report.isStrict = all.isStrict;
        try {
            countAndDescribe(loadInput(file, report), report);
            report.text = lineOf(file, report.document);
        } catch (FileError const& error) {
            addFailure(ExitCode::File, error.what(), {}, report);
        } catch (Failure const& failure) {
            if (failure.code != ExitCode::Invalid && failure.code != ExitCode::Refused)
                throw;
            addFailure(failure.code, failure.what(), failure.reasons, report);
        }
        report.document["exitCode"] = report.exitCode;
        return report;
    }

    /// One line per file. A file that cannot be described does not end the command, but its exit code is that of the first one.
    void describeFiles(std::vector<std::filesystem::path> const& files, Report& report)
    {
        for (std::filesystem::path const& file : files) {
            Report const own = describeAlone(file, report);
            report.reading = own.reading;
            report.hasWarned = report.hasWarned || own.hasWarned;
            report.exitCode = report.exitCode == 0 ? own.exitCode : report.exitCode;
            report.text += own.text;
            report.lines.push_back(own.document);
        }
    }

}

void addInfo(CommandLine& program, Invocation& invocation)
{
    auto const files = std::make_shared<std::vector<std::filesystem::path>>();
    constexpr CommandHelp kHelp = {"info", "Show what a file contains, and how the faces of a mesh are connected",
        R"(Open edges are boundary edges, with one face; non-manifold edges have more than two. A winding
conflict is an edge that two faces traverse in the same direction. Pinched points are non-manifold
vertices: their faces are not all connected by edges there. Parts are connected components. The genus
is shown for closed manifolds, summed over the parts. A sliver below 0.1 is a face whose shortest edge
is shorter than 0.1 times its longest edge.

Several files get one line each, with --json one document per line. A file that cannot be read does not end the
command, but decides its exit code.)",
        "  modeling info bunny.obj\n"
        "  modeling info *.ply --json | jq -c '[.inputs[0].file, .topology.closedManifold]'\n"
        "  modeling info bunny.obj --json | jq .topology.openEdges"};
    Command command = addCommand(kHelp, program, invocation);
    command.addOption("FILES", *files, "Files to read").required().synopsis("FILE...");
    onSelected(command, invocation, [files](Report& report) {
        files->size() == 1 ? describeFile(files->front(), report) : describeFiles(*files, report);
    });
}

}
