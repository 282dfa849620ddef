#include "Commands.h"
#include "Operation.h"
#include "files/GeometryBuilder.h"
#include "geometry/Geometry.h"
#include "geometry/MeshTopology.h"

#include <fmt/format.h>

namespace ModelingProgram {

namespace {

    Json describeTopology(MeshArrays const& mesh)
    {
        MeshTopology const topology = analyzeTopology(mesh);
        Json values;
        values["triangles"] = topology.triangleCount;
        values["quads"] = topology.quads.count;
        values["polygons"] = topology.polygons.count;
        values["facesBelowThreeCorners"] = topology.facesBelowThreeCorners.count;
        values["facesWithRepeatedPoints"] = topology.facesWithRepeatedPoints.count;
        values["edges"] = topology.edgeCount;
        values["parts"] = topology.partCount;
        values["openEdges"] = topology.boundaryEdges.count;
        values["nonManifoldEdges"] = topology.nonManifoldEdges.count;
        values["windingConflicts"] = topology.windingConflicts.count;
        values["pinchedPoints"] = topology.nonManifoldPoints.count;
        values["isolatedPoints"] = topology.isolatedPoints.count;
        values["closedManifold"] = topology.isClosedManifold();
        values["genus"] = topology.genus ? Json(static_cast<std::uint64_t>(*topology.genus)) : Json();
        values["sliversBelow0.1"] = countSlivers(mesh, 0.1f);
        values["sliversBelow0.05"] = countSlivers(mesh, 0.05f);
        values["sliversBelow0.01"] = countSlivers(mesh, 0.01f);
        return values;
    }

    Json describeBox(std::optional<BoundingBox> const& box)
    {
        if (!box)
            return {};
        auto const numbersOf = [](float3 const& p) { return Json{numberOf(p.x), numberOf(p.y), numberOf(p.z)}; };
        return {{"min", numbersOf(box->min)}, {"max", numbersOf(box->max)}};
    }

    std::string formatBox(std::optional<BoundingBox> const& box)
    {
        if (!box)
            return "empty";
        return fmt::format(
            "({}, {}, {}) to ({}, {}, {})", box->min.x, box->min.y, box->min.z, box->max.x, box->max.y, box->max.z);
    }

    Json describeProperties(std::vector<Property> const& properties)
    {
        Json list = Json::array();
        for (Property const& property : properties)
            list.push_back({{"name", property.name}, {"type", property.type},
                {"component", elementNames(property.component.c_str())},
                {"range", property.range.empty() ? Json() : Json(property.range)}, {"length", property.length},
                {"standard", property.isStandard}});
        return list;
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

    void describeFile(std::filesystem::path const& file, Report& report)
    {
        Orvan::MutablePtr<Tessara::Object> const object = loadGeometry(file, report);
        Json const counts = countsOf(*object);
        auto const box = boundingBoxOf(*object);
        std::vector<Property> const properties = propertiesOf(*object);
        Json const& input = report.document["inputs"][0];

        report.text = fmt::format("{}: {}, {}\n\n{}bounding box {}\n", file.string(), input["kind"].get<std::string>(),
            input["format"].get<std::string>(), formatValues({{"", counts}}), formatBox(box));
        report.document["counts"] = counts;
        report.document["boundingBox"] = describeBox(box);
        if (typeOf(*object) == GeometryType::Mesh) {
            Json const topology = describeTopology(arraysOf(*object));
            report.document["topology"] = topology;
            report.text += "\n" + formatValues({{"", topology}});
        }
        report.document["properties"] = describeProperties(properties);
        report.text += "\n" + formatProperties(properties);
    }

}

void addInfo(CommandLine& program, Invocation& invocation)
{
    auto const file = std::make_shared<std::filesystem::path>();
    constexpr CommandHelp kHelp = {"info", "Show what a file contains, and how the faces of a mesh are connected",
        R"(Open edges are boundary edges, with one face; non-manifold edges have more than two. A winding
conflict is an edge that two faces traverse in the same direction. Pinched points are non-manifold
vertices: their faces are not all connected by edges there. Parts are connected components. The genus
is shown for closed manifolds, summed over the parts. A sliver below 0.1 is a face whose shortest edge
is shorter than 0.1 times its longest edge.)",
        "  modeling info bunny.obj\n"
        "  modeling info bunny.obj --json | jq .topology.openEdges"};
    Command command = addCommand(kHelp, program, invocation);
    addFile("FILE", "File to read", *file, command);
    onSelected(command, invocation, [file](Report& report) { describeFile(*file, report); });
}

}
