#include "Edit.h"
#include "geometry/Geometry.h"
#include "geometry/MeshRequirements.h"
#include "geometry/Shape.h"
#include "geometry/Triangulation.h"

#include <fmt/format.h>

#include <optional>

namespace ModelingProgram {

namespace {

    using Tessara::Object;

    class Triangulate final : public Edit {
    public:
        void declareOptions(Command& command) override;
        void checkOptions() const override;
        void run(Subject& subject, Report& report) override;
        void report(Report& report) override;

    private:
        std::string channels_ = "*";
        bool keepsUnits_ = false;
        bool checksAreas_ = false;
        ShapeChange change_;
        Json before_, after_;
        std::vector<std::string> dropped_;
        std::vector<CutFaces> check_;
    };

    void Triangulate::declareOptions(Command& command)
    {
        command.addOption("--channels", channels_, "Which properties of faces and corners to keep")
            .valueName("LIST")
            .showDefault();
        command.addFlag("--keep-units", keepsUnits_, "Measure faces in the units of the file");
        command.addFlag(
            "--check", checksAreas_, "Compare the area of each face with that of its triangles, and count the fans");
    }

    void Triangulate::checkOptions() const
    {
        requireChannelList(channels_);
    }

    Json describeFaces(Object const& mesh, MeshTopology const& topology)
    {
        Json values = countsOf(mesh);
        values["triangles"] = topology.triangleCount;
        values["quads"] = topology.quads.count;
        values["polygons"] = topology.polygons.count;
        values["openEdges"] = topology.boundaryEdges.count;
        return values;
    }

    std::vector<std::string> namesOfOtherProperties(Object const& mesh)
    {
        std::vector<std::string> names;
        for (Property const& property : propertiesOf(mesh))
            if (!property.isStandard && !property.component.empty())
                names.push_back(property.name);
        return names;
    }

    void reportCheck(std::vector<CutFaces> const& kinds, Report& report)
    {
        report.document["check"] = Json::array();
        std::vector<std::vector<std::string>> rows;
        for (CutFaces const& kind : kinds) {
            auto const firstOf = [](Finding const& finding) { return finding ? Json(finding.first) : Json(); };
            report.document["check"].push_back({{"corners", kind.corners}, {"faces", kind.faceCount},
                {"fans", kind.fans.count}, {"firstFan", firstOf(kind.fans)}, {"lossy", kind.lossy.count},
                {"firstLossy", firstOf(kind.lossy)}, {"worstDifference", kind.worstDifference}});
            auto const cellOf = [](Finding const& finding) {
                return finding ? fmt::format("{} (first: face {})", groupDigits(finding.count), finding.first) : "0";
            };
            rows.push_back({kind.corners, groupDigits(kind.faceCount), cellOf(kind.fans), cellOf(kind.lossy),
                fmt::format("{:.1e}", kind.worstDifference)});
        }
        report.text += "\n"
            + formatTable({{"corners"}, {"faces", true}, {"cut as a fan", true}, {"area lost", true},
                              {"largest difference of a face", true}},
                rows);
    }

    void Triangulate::run(Subject& subject, Report& report)
    {
        Object& mesh = *subject.object;
        requireMatchingChannels(channels_, mesh);
        std::optional<Object> measured(keepsUnits_ ? mesh : inFineUnits(mesh));
        Object result;
        runOperation(report, [&] { result = triangulatedAs(*measured, channels_, mesh); });
        if (!checksAreas_)
            measured.reset();

        dropped_ = namesMissingIn(result, mesh);
        for (std::string const& name : dropOutdatedProperties(result)) {
            report.warn(fmt::format("\"{}\" is dropped: values of its type cannot be copied to triangles", name));
            dropped_.push_back(name);
        }
        report.document["keptProperties"] = namesOfOtherProperties(result);
        report.document["channels"] = channels_;
        std::optional<ExaminedMesh> after;
        if (report.needsFacts()) {
            MeshArrays const arrays = arraysOf(mesh), triangles = arraysOf(result);
            ExaminedMesh const before = subject.know();
            after = areIdentical(arrays, triangles) ? before : examine(triangles); // triangles stay as they are
            change_ = {before.shape, after->shape, largestMove(arrays, triangles)};
            before_ = describeFaces(mesh, before.topology);
            after_ = describeFaces(result, after->topology);
            addShape(change_, before_, after_);
            if (checksAreas_)
                check_ = checkTriangulation(arraysOf(*measured), triangles);
        }
        mesh = std::move(result);
        subject.setKnown(after);
    }

    void Triangulate::report(Report& report)
    {
        warnOfShape(change_, "--check shows which faces are not covered by their triangles.", report);
        reportOperation(before_, after_, dropped_, report);
        if (checksAreas_)
            reportCheck(check_, report);
    }

}

constinit EditKind const kTriangulate = {
    .help = {"triangulate", "Cut the faces of a mesh into triangles",
        R"(Each face with n corners becomes n - 2 triangles between its own corners; faces may be concave.
No point is added, moved or removed. Faces that intersect themselves, have two equal consecutive
corners or almost no area become a fan from their first corner. The limit for the area is 5e-5 square
units, with the mesh scaled to about a million units; --keep-units uses the units of the file.

--channels selects the properties of faces and corners that triangles inherit from their face; the
others are dropped, with the data of ranges. It is a list of names and patterns, separated by blanks or
commas: * stands for any characters, ? for one, and a leading ^ or - excludes. The last entry that
matches a name decides. "*" keeps all, "^*" none, "* ^tmp*" all except those that begin with tmp, "uv N"
these two. Names and including patterns must match a property. Properties of points are kept.)",
        "  modeling triangulate quads.obj triangles.ply\n"
        "  modeling triangulate cad.obj cad.stl --channels \"^*\" --check"},
    .create = createEdit<Triangulate>};

void addTriangulate(CommandLine& program, Invocation& invocation)
{
    addEditCommand(kTriangulate, program, invocation);
}

}
