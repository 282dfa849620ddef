#include "Edit.h"
#include "Selection.h"
#include "geometry/Geometry.h"

#include <Modeling/deletePointsInPointCloud.h>
#include <TessaraGeometry/Names.h>

namespace ModelingProgram {

namespace {

    constexpr Pickable kPoints = {Tessara::Geometry::sPointComp, "point", "points"};

    class DeletePoints final : public Edit {
    public:
        void declareOptions(Command& command) override { addSelection(kPoints, selection_, command); }
        void run(Subject& subject, Report& report) override;
        void report(Report& report) override { reportOperation(before_, after_, {}, report); }

    private:
        Selection selection_;
        Json before_, after_;
    };

    Orvan::Array<unsigned int> indicesOf(Orvan::Array<bool> const& picked)
    {
        Orvan::Array<unsigned int> indices;
        for (std::uint64_t point = 0; point != picked.size; ++point)
            if (picked[point])
                indices.append(static_cast<unsigned int>(point));
        return indices;
    }

    void DeletePoints::run(Subject& subject, Report& report)
    {
        Tessara::Object& cloud = *subject.object;
        before_ = countsOf(cloud);
        auto const indices = indicesOf(pickElements(selection_, kPoints, cloud, report));
        runOperation(report, [&] {
            requireDone("delete-points",
                before_["points"] == 0
                    || Tessara::GeometryAlgorithms::deletePointsInPointCloud(indices, cloud, nullptr));
        });
        after_ = countsOf(cloud);
    }

}

constinit EditKind const kDeletePoints = {
    .help = {"delete-points", "Delete points of a point cloud",
        R"(The other points keep their order and attributes. A file of indices contains whole numbers,
separated by blanks or line breaks; # begins a comment. Points on the border of a box are in it.)",
        "  modeling delete-points scan.ply clean.ply --indices outliers.txt\n"
        "  modeling delete-points scan.ply part.ply --box -1 -1 0 1 1 2.5 --invert\n"
        "  modeling delete-points scan.ply rest.ply --attribute label"},
    .create = createEdit<DeletePoints>,
    .takes = GeometryType::PointCloud,
    .gives = GeometryType::PointCloud};

void addDeletePoints(CommandLine& program, Invocation& invocation)
{
    addEditCommand(kDeletePoints, program, invocation);
}

}
