#include "Edit.h"
#include "geometry/Geometry.h"
#include "shell/Failure.h"

#include <Modeling/addPointsToPointCloud.h>
#include <TessaraGeometry/Makers.h>

#include <fmt/format.h>

namespace ModelingProgram {

namespace {

    using namespace Tessara::Geometry;
    using Tessara::Object;

    class AddPoints final : public Edit {
    public:
        void declareFiles(Command& command) override;
        void declareOptions(Command& command) override;
        NewAttribute newAttribute() const override { return {"--tag", tag_}; }
        void run(Subject& subject, Report& report) override;
        void report(Report& report) override { reportOperation(before_, after_, {}, report); }

    private:
        std::filesystem::path points_;
        std::string tag_;
        Json before_, after_;
    };

    void AddPoints::declareFiles(Command& command)
    {
        addFile("POINTS", "File whose points are added", points_, command);
    }

    void AddPoints::declareOptions(Command& command)
    {
        command.addOption("--tag", tag_, "Name of the attribute that marks the new points").valueName("NAME");
    }

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
            report.warnOfInput(
                fmt::format("only positions are read from {}; left out: {}", file.string(), fmt::join(names, ", ")));
    }

    void AddPoints::run(Subject& subject, Report& report)
    {
        Object& cloud = *subject.object;
        checkTag(tag_, cloud, report);
        Orvan::MutablePtr<Object> const points = loadGeometry(points_, report);
        warnOfAttributes(*points, points_, report);
        before_ = countsOf(cloud);
        auto const positions = dataOf<float3>(*points, sPointPosition);
        runOperation(report, [&] {
            requireDone("add-points",
                Tessara::GeometryAlgorithms::addPointsToPointCloud(*positions, tag_.c_str(), cloud, nullptr));
        });
        after_ = countsOf(cloud);
    }

}

constinit EditKind const kAddPoints = {
    .help = {"add-points", "Add the points of a file to a point cloud",
        R"(The points are appended, from any kind of file; of a mesh all of its points.
Only their positions are used: in the attributes of the point cloud they get zero or the attribute's
default. A tag is a new attribute of the points that is true for the added ones.)",
        "  modeling add-points scan.ply second-scan.xyz both.ply --tag second"},
    .create = createEdit<AddPoints>,
    .takes = GeometryType::PointCloud,
    .gives = GeometryType::PointCloud};

void addAddPoints(CommandLine& program, Invocation& invocation)
{
    addEditCommand(kAddPoints, program, invocation);
}

}
