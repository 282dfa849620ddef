#include "Edit.h"
#include "geometry/Geometry.h"
#include "geometry/MeshRequirements.h"
#include "geometry/MeshTopology.h"
#include "geometry/Shape.h"
#include "geometry/largestDistance.h"

#include <Modeling/removeSlivers.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Names.h>

namespace ModelingProgram {

namespace {

    using Tessara::Object;

    class RemoveSlivers final : public Edit {
    public:
        void declareOptions(Command& command) override;
        void run(Subject& subject, Report& report) override;
        void report(Report& report) override;

    private:
        float ratio_ = 0.05f;
        ShapeChange change_;
        Json before_, after_;
        std::vector<std::string> dropped_;
    };

    void RemoveSlivers::declareOptions(Command& command)
    {
        command.addOption("--ratio", ratio_, "Shortest edge over longest edge below which a face is a needle")
            .between(0, 1, "0..1")
            .showDefault();
    }

    Json describeSlivers(Object const& object, ExaminedMesh const& mesh)
    {
        Json values = countsOf(object);
        addPartsAndGenus(mesh.topology, values);
        values["slivers"] = mesh.sliverCount;
        return values;
    }

    void RemoveSlivers::run(Subject& subject, Report& report)
    {
        Object& mesh = *subject.object;
        ExaminedMesh before;
        if (report.needsFacts())
            before = subject.know(ratio_);
        requireClosedTriangleMesh(arraysOf(mesh), subject.knowTopology(), {}, "remove-slivers", subject.name);

        // The operation keeps only the standard properties up to date; the others are dropped if elements were
        // renumbered.
        Object result = mesh;
        dropped_ = dropOtherProperties(result);
        runOperation(report, [&] { Geometry::Mesh::removeSlivers(ratio_, result); });
        if (countsOf(result) == countsOf(mesh)) {
            result = mesh;
            dropped_.clear();
        }

        std::optional<ExaminedMesh> after;
        if (report.needsFacts()) {
            after = examine(arraysOf(result), ratio_);
            change_ = {before.shape, after->shape, largestDistance(arraysOf(mesh), arraysOf(result))};
            before_ = describeSlivers(mesh, before);
            after_ = describeSlivers(result, *after);
            addShape(change_, before_, after_);
        }
        mesh = std::move(result);
        subject.setKnown(after);
    }

    void RemoveSlivers::report(Report& report)
    {
        warnOfShape(change_,
            "remove-slivers is not for plates and walls about as thin as the short edges of needles; a smaller "
            "--ratio collapses fewer faces.",
            report);
        report.document["ratio"] = numberOf(ratio_);
        reportOperation(before_, after_, dropped_, report);
    }

}

constinit EditKind const kRemoveSlivers = {
    .help = {"remove-slivers", "Collapse the needle-shaped faces of a closed manifold mesh of triangles",
        R"(A face is a needle if its shortest edge is shorter than the ratio times its longest edge. A
collapse removes one point and two faces; it is skipped if it would change the topology or flip a
face, so some needles may remain. Points and faces are renumbered, and properties other than
the positions are dropped, unless nothing collapses.

It is meant for needles in surfaces of larger faces. It is not meant for plates and walls thinner than
the ratio times the length of their faces: their rims consist of needles, and collapse. The table shows
volume, area, fold-overs and the distance of the old points from the new surface, and a warning says if the
shape changed much.)",
        "  modeling remove-slivers part.stl clean.stl\n"
        "  modeling remove-slivers scan.ply scan.ply --force --ratio 0.1 --json"},
    .create = createEdit<RemoveSlivers>};

void addRemoveSlivers(CommandLine& program, Invocation& invocation)
{
    addEditCommand(kRemoveSlivers, program, invocation);
}

}
