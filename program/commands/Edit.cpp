#include "Edit.h"

#include "PageOfRun.h"
#include "geometry/FaceMeasures.h"
#include "geometry/MeshRequirements.h"
#include "shell/Failure.h"
#include "shell/Phase.h"

namespace ModelingProgram {

namespace {

    /// "Mesh to read"
    std::string describeFile(GeometryType type, char const* use)
    {
        std::string const name = type == GeometryType::None ? "geometry" : nameOf(type);
        return std::string(1, static_cast<char>(name[0] - 'a' + 'A')) + name.substr(1) + " to " + use;
    }

}

std::span<EditKind const* const> editKinds()
{
    static constexpr EditKind const* kAll[] = {&kAddPoints, &kDeletePoints, &kDeleteFaces, &kMerge, &kTriangulate,
        &kSubdivide, &kSmooth, &kRemoveSlivers, &kRepair, &kStitch};
    return kAll;
}

MeshTopology const& Subject::knowTopology()
{
    if (!topology)
        topology = analyzeTopology(arraysOf(*object));
    return *topology;
}

ExaminedMesh Subject::know(float sliverRatio)
{
    MeshArrays const mesh = arraysOf(*object);
    if (topology && shape)
        return {*topology, *shape, sliverRatio > 0 ? countSlivers(mesh, {sliverRatio})[0] : 0};
    ExaminedMesh const facts = examine(mesh, sliverRatio);
    setKnown(facts);
    return facts;
}

void Subject::setKnown(std::optional<ExaminedMesh> const& facts)
{
    topology = facts ? std::optional(facts->topology) : std::nullopt;
    shape = facts ? std::optional(facts->shape) : std::nullopt;
}

Subject Edit::readSubject(std::vector<std::filesystem::path> const& files, Report& report)
{
    Subject subject{files[0].string(), loadGeometry(files[0], report)};
    Phase const phase(report, &Times::report, kReportTitle);
    requireProperties(report.requirements, *subject.object, subject.name, [&]() -> MeshTopology const& {
        if (report.needsFacts())
            subject.know();
        return subject.knowTopology();
    });
    return subject;
}

void Edit::forEachInput(Subject const& subject, VisitInput const& visit) const
{
    visit(*subject.object, subject.name, subject.topology ? &*subject.topology : nullptr);
}

void addEditCommand(EditKind const& kind, CommandLine& program, Invocation& invocation)
{
    struct Files {
        std::vector<std::filesystem::path> in{1};
        Output out;
    };
    auto const files = std::make_shared<Files>();
    std::shared_ptr<Edit> const edit = kind.create();
    Command command = addCommand(kind.help, program, invocation);
    addFile("IN", describeFile(kind.takes, "read"), files->in[0], command);
    edit->declareFiles(command);
    addOutput(describeFile(kind.gives, "write"), files->out, command, invocation);
    addPageOption(files->out, command);
    edit->declareOptions(command);
    onSelected(command, invocation,
        [&kind, edit, files](Report& report) { runOnFiles(kind, *edit, files->in, files->out, report); });
}

void runOnFiles(EditKind const& kind, Edit& edit, std::vector<std::filesystem::path> const& files, Output const& out,
    Report& report)
{
    edit.runLimited([&] {
        edit.checkOptions();
        requireWritable(out, kind.gives);
        requireAttribute(edit.newAttribute(), out);
        PageOfRun page(out, files.size(), report);
        edit.readFiles(report);
        Subject subject = edit.readSubject(files, report);
        {
            Phase const phase(report, &Times::report, kReportTitle);
            requireSubject(kind, subject);
            if (kind.gives == GeometryType::None || kind.keepsFaces)
                requireHolds(out, *subject.object);
            page.addBefore(edit, subject);
            edit.run(subject, report);
            requireHolds(out, *subject.object);
        }
        saveGeometry(*subject.object, out, report);
        page.addAfter(*subject.object, subject.topology ? &*subject.topology : nullptr);
        {
            Phase const phase(report, &Times::report, kReportTitle);
            edit.report(report);
        }
        page.finish();
    });
}

void requireAttribute(Edit::NewAttribute const& attribute, Output const& out)
{
    if (!attribute.name.empty())
        requireAttribute(out, attribute.option, attribute.name);
}

void requireSubject(EditKind const& kind, Subject& subject)
{
    if (kind.takes != GeometryType::None)
        requireType(kind.takes, *subject.object, kind.help.name, subject.name);
}

}
