#include "Edit.h"
#include "PageOfRun.h"
#include "files/GeometryBuilder.h"
#include "files/WorkMeter.h"
#include "geometry/Geometry.h"
#include "geometry/MeshRequirements.h"
#include "shell/Failure.h"
#include "shell/Phase.h"
#include "shell/Progress.h"

#include <Modeling/mergeMeshes.h>
#include <Modeling/mergePointClouds.h>
#include <Modeling/mergeStrands.h>
#include <TessaraGeometry/Elements.h>

#include <fmt/format.h>

#include <algorithm>
#include <map>
#include <memory>

namespace ModelingProgram {

namespace {

    using Tessara::Object;
    using Inputs = Orvan::Array<Orvan::Ptr<Object>>;

    /// The inputs to merge, and the files that they come from.
    struct Sources {
        Inputs objects;
        std::vector<std::string> files;
        GeometryType type = GeometryType::None;
    };

    /// How a property was merged: the files whose elements got the default, because they lack it or have another type.
    struct Outcome {
        Property property; // as merged
        std::vector<std::string> missingIn;
        std::vector<std::string> otherTypeIn;
    };

    class Merge final : public Edit {
    public:
        void declareOptions(Command& command) override;
        NewAttribute newAttribute() const override { return {"--source-attribute", sourceAttribute_}; }
        Subject readSubject(std::vector<std::filesystem::path> const& files, Report& report) override;
        void forEachInput(Subject const& subject, VisitInput const& visit) const override;
        void run(Subject& subject, Report& report) override;
        void report(Report& report) override;

    private:
        std::string sourceAttribute_;
        Sources sources_;
        Json before_, after_;
        std::vector<Outcome> outcomes_;
        std::vector<std::string> dropped_;
    };

    void Merge::declareOptions(Command& command)
    {
        command
            .addOption("--source-attribute", sourceAttribute_,
                "Store the number of the file, counted from 0, under this name for each face, strand, or point of a "
                "cloud")
            .valueName("NAME");
    }

    Sources readSources(std::vector<std::filesystem::path> const& files, Report& report)
    {
        Sources sources;
        report.document["skipped"] = Json::array();
        Phase const phase(report, &Times::reading, {}, WorkMeter::kBytes, bytesOf(files));
        std::size_t number = 0;
        for (std::filesystem::path const& path : files) {
            std::string const file = path.string();
            renamePhase(report.titleOf(fmt::format("reading {} of {}", ++number, countOf(files.size(), "file"))));
            Orvan::Ptr<Object> object = readGeometry(path, report);
            if (auto const status = validate(*object); !status) {
                report.warn(fmt::format("{} is skipped: {}", file, status.message().view()));
                report.document["skipped"].push_back({{"file", file}, {"reason", status.message().c_str()}});
                continue;
            }
            std::optional<MeshTopology> topology;
            requireProperties(report.requirements, *object, file,
                [&]() -> MeshTopology const& { return topology.emplace(analyzeTopology(arraysOf(*object))); });
            sources.objects.append(std::move(object));
            sources.files.push_back(file);
        }
        if (sources.objects.empty())
            throw Failure(ExitCode::Invalid, "none of the files contains valid geometry");
        return sources;
    }

    void requireOneKind(Sources& sources)
    {
        auto const isEmpty = [](auto const& object) {
            return Tessara::Geometry::getElementCount(*object, Tessara::Geometry::sPointComp) == 0;
        };
        auto const typical = std::find_if_not(sources.objects.begin(), sources.objects.end(), isEmpty);
        sources.type = typeOf(typical == sources.objects.end() ? *sources.objects[0] : **typical);
        std::vector<std::string> kinds;
        bool areAlike = true;
        for (std::size_t i = 0; i != sources.files.size(); ++i) {
            if (isEmpty(sources.objects[i])) {
                Orvan::MutablePtr<Object> empty = makeMutable(std::move(sources.objects[i]));
                makeEmpty(sources.type, *empty);
                sources.objects[i] = std::move(empty);
            }
            GeometryType const type = typeOf(*sources.objects[i]);
            areAlike = areAlike && type == sources.type;
            kinds.push_back(fmt::format("{} contains a {}", sources.files[i], nameOf(type)));
        }
        if (!areAlike)
            throw Failure(ExitCode::Refused,
                "merge joins meshes with meshes, point clouds with point clouds, or strand sets with strand sets",
                std::move(kinds));
    }

    /// Stores, for each face, strand, or point of a cloud, the number of its input.
    void numberSources(std::string const& attribute, Sources& sources)
    {
        for (std::size_t i = 0; i != sources.files.size(); ++i) {
            Orvan::MutablePtr<Object> object = makeMutable(std::move(sources.objects[i]));
            numberElements(attribute, static_cast<int>(i), sources.files[i], *object);
            sources.objects[i] = std::move(object);
        }
    }

    bool merge(Sources const& sources, Object& output)
    {
        using namespace Tessara::GeometryAlgorithms;
        switch (sources.type) {
        case GeometryType::Mesh:
            return mergeMeshes(sources.objects, output, nullptr);
        case GeometryType::PointCloud:
            return mergePointClouds(sources.objects, output, nullptr);
        case GeometryType::Strands:
            return mergeStrands(sources.objects, output, nullptr);
        case GeometryType::None:
            break;
        }
        return false;
    }

    Json totalsOf(Sources const& sources)
    {
        Json totals = Json::object();
        for (auto const& object : sources.objects) {
            Json const counts = countsOf(*object);
            for (auto const& [key, count] : counts.items())
                totals[key] = totals.value(key, std::uint64_t{0}) + count.get<std::uint64_t>();
        }
        return totals;
    }

    std::vector<Outcome> outcomesOf(Sources const& sources, Object const& merged)
    {
        std::vector<Outcome> outcomes;
        for (Property& property : propertiesOf(merged))
            if (!property.isStandard && !property.component.empty())
                outcomes.push_back({std::move(property), {}, {}});
        for (std::size_t i = 0; i != sources.files.size(); ++i) {
            std::map<std::string, std::string> types;
            for (Property const& property : propertiesOf(*sources.objects[i]))
                types.emplace(property.name, property.type);
            for (Outcome& outcome : outcomes) {
                auto const present = types.find(outcome.property.name);
                if (present == types.end())
                    outcome.missingIn.push_back(sources.files[i]);
                else if (present->second != outcome.property.type)
                    outcome.otherTypeIn.push_back(fmt::format("{} ({})", sources.files[i], present->second));
            }
        }
        return outcomes;
    }

    std::vector<std::string> droppedIn(Sources const& sources, Object const& merged)
    {
        std::vector<std::string> dropped;
        for (auto const& object : sources.objects)
            for (std::string& name : namesMissingIn(merged, *object))
                if (std::find(dropped.begin(), dropped.end(), name) == dropped.end())
                    dropped.push_back(std::move(name));
        return dropped;
    }

    void reportOutcomes(std::vector<Outcome> const& outcomes, Report& report)
    {
        report.document["properties"] = Json::array();
        std::vector<std::vector<std::string>> rows;
        auto const filesIn = [](std::vector<std::string> const& files) {
            constexpr std::size_t kNamed = 3;
            std::string const named = fmt::format("{}",
                fmt::join(
                    files.begin(), files.begin() + static_cast<std::ptrdiff_t>(std::min(kNamed, files.size())), ", "));
            return files.empty()         ? "-"
                : files.size() <= kNamed ? named
                                         : fmt::format("{} and {} more", named, groupDigits(files.size() - kNamed));
        };
        for (Outcome const& outcome : outcomes) {
            Property const& property = outcome.property;
            report.document["properties"].push_back({{"name", property.name}, {"type", property.type},
                {"component", elementNames(property.component.c_str())}, {"missingIn", outcome.missingIn},
                {"otherTypeIn", outcome.otherTypeIn}});
            rows.push_back({property.name, property.type, elementNames(property.component.c_str()),
                filesIn(outcome.missingIn), filesIn(outcome.otherTypeIn)});
        }
        if (!rows.empty())
            report.text +=
                formatTable({{"property"}, {"type"}, {"of"}, {"default, missing in"}, {"default, other type in"}}, rows)
                + "\n";
    }

    /// The first of the inputs stands for all of them, because they have the same type.
    Subject Merge::readSubject(std::vector<std::filesystem::path> const& files, Report& report)
    {
        sources_ = readSources(files, report);
        requireOneKind(sources_);
        return {sources_.files[0], makeMutable(Orvan::Ptr<Object>(sources_.objects[0]))};
    }

    void Merge::forEachInput(Subject const&, VisitInput const& visit) const
    {
        for (std::size_t i = 0; i != sources_.files.size(); ++i)
            visit(*sources_.objects[i], sources_.files[i], nullptr);
    }

    void Merge::run(Subject& subject, Report& report)
    {
        if (!sourceAttribute_.empty())
            numberSources(sourceAttribute_, sources_);
        auto merged = Tessara::createObject();
        bool isDone = false;
        runOperation(report, [&] { isDone = merge(sources_, *merged); });
        if (!isDone)
            throw Failure(ExitCode::Refused, "there would be more than 4,294,967,295 elements of one kind");
        outcomes_ = outcomesOf(sources_, *merged);
        before_ = totalsOf(sources_);
        after_ = countsOf(*merged);
        dropped_ = droppedIn(sources_, *merged);
        sources_ = {};
        subject.object = std::move(merged);
    }

    void Merge::report(Report& report)
    {
        reportOutcomes(outcomes_, report);
        reportOperation(before_, after_, dropped_, report);
    }

}

constinit EditKind const kMerge = {
    .help = {"merge", "Join meshes, point clouds or strand sets into one, with all attributes",
        R"(The files may have different formats, but must contain the same kind of geometry. A file with invalid
geometry is skipped with a warning. The type of each attribute is that of the first file that has it;
elements of files without it, or with another type, get the default.

Without -o the last name is the output, which must not exist yet (unless --force).)",
        "  modeling merge a.obj b.ply c.off all.ply\n"
        "  modeling merge scan-*.ply -o all.ply --source-attribute scan"},
    .create = createEdit<Merge>,
    .takes = GeometryType::None,
    .gives = GeometryType::None,
    .takesManyFiles = true};

void addMerge(CommandLine& program, Invocation& invocation)
{
    auto const files = std::make_shared<FileList>();
    std::shared_ptr<Edit> const edit = kMerge.create();
    Command command = addCommand(kMerge.help, program, invocation);
    addFiles(*files, command, invocation);
    addPageOption(files->out, command);
    edit->declareOptions(command);
    onSelected(command, invocation, [files, edit](Report& report) {
        chooseOutput("merge", *files);
        runOnFiles(kMerge, *edit, files->in, files->out, report);
    });
}

}
