#include "Commands.h"
#include "Operation.h"
#include "Selection.h"
#include "geometry/Geometry.h"
#include "shell/Failure.h"

#include <Modeling/deletePointsInPointCloud.h>
#include <TessaraGeometry/Names.h>

#include <fmt/format.h>

#include <memory>

namespace ModelingProgram {

namespace {

    constexpr Pickable kPoints = {Tessara::Geometry::sPointComp, "point", "points"};

    struct Options {
        std::filesystem::path in;
        Output out;
        Selection selection;
    };

    Orvan::Array<unsigned int> indicesOf(Orvan::Array<bool> const& picked)
    {
        Orvan::Array<unsigned int> indices;
        for (std::uint64_t point = 0; point != picked.size; ++point)
            if (picked[point])
                indices.append(static_cast<unsigned int>(point));
        return indices;
    }

    void deletePoints(Options const& options, Report& report)
    {
        requireWritable(options.out, GeometryType::PointCloud);
        Orvan::MutablePtr<Tessara::Object> const cloud = loadGeometry(options.in, report);
        requirePointCloud("delete-points", *cloud, options.in);
        Json const before = countsOf(*cloud);
        auto const indices = indicesOf(pickElements(options.selection, kPoints, *cloud, report));
        runOperation(report, [&] {
            requireDone("delete-points",
                before["points"] == 0
                    || Tessara::GeometryAlgorithms::deletePointsInPointCloud(indices, *cloud, nullptr));
        });
        saveGeometry(*cloud, options.out, report);
        reportOperation(before, countsOf(*cloud), {}, report);
    }

}

void addDeletePoints(CommandLine& program, Invocation& invocation)
{
    auto const options = std::make_shared<Options>();
    constexpr CommandHelp kHelp = {"delete-points", "Delete points of a point cloud",
        R"(The other points keep their order and attributes. A file of indices contains whole numbers,
separated by blanks or line breaks; # begins a comment. Points on the border of a box are in it.)",
        "  modeling delete-points scan.ply clean.ply --indices outliers.txt\n"
        "  modeling delete-points scan.ply part.ply --box -1 -1 0 1 1 2.5 --invert\n"
        "  modeling delete-points scan.ply rest.ply --attribute label"};
    Command command = addCommand(kHelp, program, invocation);
    addFile("IN", "Point cloud to read", options->in, command);
    addOutput("Point cloud to write", options->out, command);
    addSelection(kPoints, options->selection, command);
    onSelected(command, invocation, [options](Report& report) { deletePoints(*options, report); });
}

}
