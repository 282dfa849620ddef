#include "Commands.h"
#include "Operation.h"
#include "Selection.h"
#include "geometry/Geometry.h"
#include "geometry/MeshArrays.h"
#include "geometry/MeshRequirements.h"
#include "geometry/Shape.h"
#include "shell/Failure.h"

#include <Modeling/deleteFaces.h>
#include <TessaraGeometry/Names.h>

#include <fmt/format.h>

#include <memory>

namespace ModelingProgram {

namespace {

    constexpr Pickable kFaces = {Tessara::Geometry::sFaceComp, "face", "faces"};

    struct Options {
        std::filesystem::path in;
        Output out;
        Selection selection;
    };

    void requireFacesWithCorners(Tessara::Object const& object, std::filesystem::path const& file)
    {
        MeshArrays const mesh = arraysOf(object);
        for (unsigned int face = 0; face != mesh.faceCount(); ++face)
            if (mesh.corners(face).empty())
                throw Failure(ExitCode::Refused,
                    fmt::format("delete-faces needs faces with corners, but face {} of {} has none (counted from 0)",
                        face, file.string()));
    }

    void deleteFaces(Options const& options, Report& report)
    {
        requireWritable(options.out, GeometryType::Mesh);
        Orvan::MutablePtr<Tessara::Object> const mesh = loadGeometry(options.in, report);
        requireMesh(*mesh, "delete-faces", options.in);
        requireFacesWithCorners(*mesh, options.in);
        requireWritableFaces(options.out, *mesh);
        Json const before = countsAndShape(*mesh);
        Orvan::Array<bool> const picked = pickElements(options.selection, kFaces, *mesh, report);
        runOperation(report, [&] {
            requireDone("delete-faces", picked.empty() || Tessara::GeometryAlgorithms::deleteFaces(picked, *mesh));
        });
        saveGeometry(*mesh, options.out, report);
        reportOperation(before, countsAndShape(*mesh), {}, report);
    }

}

void addDeleteFaces(CommandLine& program, Invocation& invocation)
{
    auto const options = std::make_shared<Options>();
    constexpr CommandHelp kHelp = {"delete-faces", "Delete faces of a mesh, and the points that no remaining face uses",
        R"(All other elements keep their order and attributes; points that were isolated before are deleted too.
A face is in a box if all of its corners are; corners on the border are in it. A file of indices
contains whole numbers, separated by blanks or line breaks; # begins a comment.)",
        "  modeling delete-faces bunny.obj half.obj --box -1 -1 -1 0 1 1\n"
        "  modeling delete-faces part.ply part.ply --indices bad-faces.txt --force\n"
        "  modeling delete-faces scan.ply kept.ply --attribute material --invert"};
    Command command = addCommand(kHelp, program, invocation);
    addFile("IN", "Mesh to read", options->in, command);
    addOutput("Mesh to write", options->out, command);
    addSelection(kFaces, options->selection, command);
    onSelected(command, invocation, [options](Report& report) { deleteFaces(*options, report); });
}

}
