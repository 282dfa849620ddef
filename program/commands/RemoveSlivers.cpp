#include "Commands.h"
#include "Operation.h"
#include "geometry/Geometry.h"
#include "geometry/MeshRequirements.h"
#include "geometry/MeshTopology.h"
#include "geometry/Shape.h"

#include <Modeling/removeSlivers.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Names.h>

#include <memory>

namespace ModelingProgram {

namespace {

    using Tessara::Object;

    struct Options {
        std::filesystem::path in;
        Output out;
        float ratio = 0.05f;
    };

    Json describeMesh(Object const& object, MeshTopology const& topology, float ratio)
    {
        Json values = countsOf(object);
        addPartsAndGenus(topology, values);
        values["slivers"] = countSlivers(arraysOf(object), ratio);
        return values;
    }

    void removeSlivers(Options const& options, Report& report)
    {
        requireWritable(options.out, GeometryType::Mesh);
        Orvan::MutablePtr<Object> const mesh = loadGeometry(options.in, report);
        requireMesh(*mesh, "remove-slivers", options.in);
        auto const [topology, shape] = examine(arraysOf(*mesh));
        requireClosedTriangleMesh(arraysOf(*mesh), topology, {}, "remove-slivers", options.in);
        Json before = describeMesh(*mesh, topology, options.ratio);

        // The operation keeps only the standard properties up to date; the others are dropped if elements were
        // renumbered.
        Object result = *mesh;
        std::vector<std::string> dropped = dropOtherProperties(result);
        runOperation(report, [&] { Geometry::Mesh::removeSlivers(options.ratio, result); });
        if (countsOf(result) == countsOf(*mesh)) {
            result = *mesh;
            dropped.clear();
        }

        auto const [topologyAfter, shapeAfter] = examine(arraysOf(result));
        ShapeChange const change{shape, shapeAfter, largestDistance(arraysOf(*mesh), arraysOf(result))};
        Json after = describeMesh(result, topologyAfter, options.ratio);
        addShape(change, before, after);
        saveGeometry(result, options.out, report);
        warnOfShape(change,
            "remove-slivers is not for plates and walls about as thin as the short edges of needles; a smaller "
            "--ratio collapses fewer faces.",
            report);
        report.document["ratio"] = numberOf(options.ratio);
        reportOperation(before, after, dropped, report);
    }

}

void addRemoveSlivers(CommandLine& program, Invocation& invocation)
{
    auto const options = std::make_shared<Options>();
    constexpr CommandHelp kHelp = {"remove-slivers",
        "Collapse the needle-shaped faces of a closed manifold mesh of triangles",
        R"(A face is a needle if its shortest edge is shorter than the ratio times its longest edge. A
collapse removes one point and two faces; it is skipped if it would change the topology or flip a
face, so some needles may remain. Points and faces are renumbered, and properties other than
the positions are dropped, unless nothing collapses.

It is meant for needles in surfaces of larger faces. It is not meant for plates and walls thinner than
the ratio times the length of their faces: their rims consist of needles, and collapse. The table shows
volume, area, fold-overs and the distance of the old points from the new surface, and a warning says if the
shape changed much.)",
        "  modeling remove-slivers part.stl clean.stl\n"
        "  modeling remove-slivers scan.ply scan.ply --force --ratio 0.1 --json"};
    Command command = addCommand(kHelp, program, invocation);
    addFile("IN", "Mesh to read", options->in, command);
    addOutput("Mesh to write", options->out, command);
    command.addOption("--ratio", options->ratio, "Shortest edge over longest edge below which a face is a needle")
        .between(0, 1, "0..1")
        .showDefault();
    onSelected(command, invocation, [options](Report& report) { removeSlivers(*options, report); });
}

}
