#include "Edit.h"
#include "Selection.h"
#include "geometry/MeshArrays.h"
#include "geometry/Shape.h"
#include "shell/Failure.h"

#include <Modeling/deleteFaces.h>
#include <TessaraGeometry/Names.h>

#include <fmt/format.h>

namespace ModelingProgram {

namespace {

    constexpr Pickable kFaces = {Tessara::Geometry::sFaceComp, "face", "faces"};

    class DeleteFaces final : public Edit {
    public:
        void declareOptions(Command& command) override { addSelection(kFaces, selection_, command); }
        void run(Subject& subject, Report& report) override;
        void report(Report& report) override { reportOperation(before_, after_, {}, report); }

    private:
        Selection selection_;
        Json before_, after_;
    };

    void requireFacesWithCorners(Subject const& subject)
    {
        MeshArrays const mesh = arraysOf(*subject.object);
        for (unsigned int face = 0; face != mesh.faceCount(); ++face)
            if (mesh.corners(face).empty())
                throw Failure(ExitCode::Refused,
                    fmt::format("delete-faces needs faces with corners, but face {} of {} has none (counted from 0)",
                        face, subject.name));
    }

    void DeleteFaces::run(Subject& subject, Report& report)
    {
        requireFacesWithCorners(subject);
        Tessara::Object& mesh = *subject.object;
        if (report.needsFacts())
            before_ = countsAndShape(mesh, subject.know().shape);
        Orvan::Array<bool> const picked = pickElements(selection_, kFaces, mesh, report);
        runOperation(report, [&] {
            requireDone("delete-faces", picked.empty() || Tessara::GeometryAlgorithms::deleteFaces(picked, mesh));
        });
        subject.setKnown();
        if (report.needsFacts())
            after_ = countsAndShape(mesh, subject.know().shape);
    }

}

constinit EditKind const kDeleteFaces = {
    .help = {"delete-faces", "Delete faces of a mesh, and the points that no remaining face uses",
        R"(All other elements keep their order and attributes; points that were isolated before are deleted too.
A face is in a box if all of its corners are; corners on the border are in it. A file of indices
contains whole numbers, separated by blanks or line breaks; # begins a comment.)",
        "  modeling delete-faces bunny.obj half.obj --box -1 -1 -1 0 1 1\n"
        "  modeling delete-faces part.ply part.ply --indices bad-faces.txt --force\n"
        "  modeling delete-faces scan.ply kept.ply --attribute material --invert"},
    .create = createEdit<DeleteFaces>,
    .keepsFaces = true};

void addDeleteFaces(CommandLine& program, Invocation& invocation)
{
    addEditCommand(kDeleteFaces, program, invocation);
}

}
