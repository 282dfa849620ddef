#include "Edit.h"
#include "geometry/Geometry.h"
#include "geometry/Shape.h"
#include "repair/repairMesh.h"
#include "shell/Failure.h"
#include "shell/Suggestion.h"

#include <fmt/format.h>

#include <algorithm>
#include <cstdint>
#include <limits>

namespace ModelingProgram {

namespace {

    using Tessara::Object;

    /// The steps in their order.
    constexpr std::pair<char const*, bool RepairSteps::*> kSteps[] = {{"weld", &RepairSteps::weld},
        {"degenerate", &RepairSteps::degenerate}, {"doubled", &RepairSteps::doubled}, {"orient", &RepairSteps::orient},
        {"fill", &RepairSteps::fill}, {"split", &RepairSteps::split}, {"unused", &RepairSteps::unused}};

    class Repair final : public Edit {
    public:
        void declareOptions(Command& command) override;
        void checkOptions() const override { static_cast<void>(chosenSteps()); }
        void run(Subject& subject, Report& report) override;
        void report(Report& report) override;

    private:
        RepairSteps chosenSteps() const;
        void warnOfRemainder(Report& report) const;
        void warnOfFilledArea(Report& report) const;

        double weldDistance_ = 0;
        std::uint64_t mostHoleEdges_ = std::numeric_limits<std::uint64_t>::max();
        std::string only_, skipped_;
        RepairCounts counts_;
        ExaminedMesh result_;
        Json before_, after_;
        std::vector<std::string> dropped_;
    };

    std::vector<std::string> stepNames()
    {
        std::vector<std::string> names;
        for (auto const& [name, step] : kSteps)
            names.emplace_back(name);
        return names;
    }

    void Repair::declareOptions(Command& command)
    {
        command
            .addOption("--weld", weldDistance_, "Merge points that are not farther apart than this; 0 for equal ones")
            .valueName("DISTANCE")
            .between(0, 1e30, "")
            .showDefault();
        command.addOption("--max-hole", mostHoleEdges_, "Leave holes with more edges than this open")
            .valueName("EDGES")
            .between(0, 4294967295.0, "");
        Option const only =
            command.addOption("--only", only_, "Run only these steps, separated by commas: " + listOf(stepNames()))
                .valueName("LIST");
        command.addOption("--skip", skipped_, "Run all steps but these").valueName("LIST").excludes(only);
    }

    /// Sets the steps of a list such as "weld,fill".
    void setSteps(char const* option, std::string const& list, bool isRun, RepairSteps& steps)
    {
        for (std::size_t start = 0; start < list.size();) {
            std::size_t const end = std::min(list.find(',', start), list.size());
            std::string const name = list.substr(start, end - start);
            auto const step = std::find_if(
                std::begin(kSteps), std::end(kSteps), [&](auto const& candidate) { return name == candidate.first; });
            if (step == std::end(kSteps))
                throw Failure(ExitCode::CommandLine,
                    fmt::format("{}: there is no step \"{}\"{}. There are: {}", option, name,
                        suggestionFor(name, stepNames()), listOf(stepNames())));
            steps.*(step->second) = isRun;
            start = end + 1;
        }
    }

    RepairSteps Repair::chosenSteps() const
    {
        RepairSteps steps;
        if (!only_.empty()) {
            steps = {false, false, false, false, false, false, false};
            setSteps("--only", only_, true, steps);
        }
        setSteps("--skip", skipped_, false, steps);
        return steps;
    }

    Json describeFaults(Object const& mesh, ExaminedMesh const& examined)
    {
        auto const& [topology, shape, slivers] = examined;
        Json values = countsOf(mesh);
        addPartsAndGenus(topology, values);
        values["openEdges"] = topology.boundaryEdges.count;
        values["nonManifoldEdges"] = topology.nonManifoldEdges.count;
        values["windingConflicts"] = topology.windingConflicts.count;
        values["pinchedPoints"] = topology.nonManifoldPoints.count;
        values["isolatedPoints"] = topology.isolatedPoints.count;
        values["volume"] = shape.volume ? numberOf(static_cast<float>(*shape.volume)) : Json();
        values["area"] = numberOf(static_cast<float>(shape.area));
        return values;
    }

    void Repair::run(Subject& subject, Report& report)
    {
        Object& mesh = *subject.object;
        if (report.needsFacts())
            before_ = describeFaults(mesh, subject.know());
        RepairOptions const options{chosenSteps(), weldDistance_, mostHoleEdges_};
        Object result = mesh;
        runOperation(report, [&] { counts_ = repairMesh(options, result); });
        dropped_ = dropOutdatedProperties(result);
        result_ = examine(arraysOf(result)); // also for the warnings
        if (report.needsFacts())
            after_ = describeFaults(result, result_);
        mesh = std::move(result);
        subject.setKnown(result_);
    }

    /// Faults that a step that was run could not mend.
    void Repair::warnOfRemainder(Report& report) const
    {
        RepairSteps const steps = chosenSteps();
        MeshTopology const& topology = result_.topology;
        std::vector<std::string> faults;
        auto const addFault = [&](bool isMended, Finding const& finding, char const* singular, char const* plural) {
            if (isMended && finding)
                faults.push_back(countOf(finding.count, singular, plural));
        };
        addFault(steps.fill, topology.boundaryEdges, "open edge", "open edges");
        addFault(steps.split || steps.fill, topology.nonManifoldEdges, "non-manifold edge", "non-manifold edges");
        addFault(steps.orient, topology.windingConflicts, "winding conflict", "winding conflicts");
        addFault(steps.split, topology.nonManifoldPoints, "pinched point", "pinched points");
        addFault(steps.degenerate, topology.facesBelowThreeCorners, "face with fewer than three corners",
            "faces with fewer than three corners");
        if (faults.empty())
            return;
        std::string reasons;
        FilledHoles const& holes = counts_.holes;
        if (holes.openCount != 0)
            reasons += fmt::format(" {} more edges than --max-hole allows, up to {}.",
                countOf(holes.openCount, "hole has", "holes have"), groupDigits(holes.longestOpen));
        if (holes.looseFaces != 0)
            reasons +=
                fmt::format(" {} connected to no other face by an edge; a larger --weld may connect loose faces.",
                    countOf(holes.looseFaces, "face is", "faces are"));
        report.warn(fmt::format("the result is not a closed manifold: {}.{}", fmt::join(faults, ", "), reasons));
    }

    void Repair::warnOfFilledArea(Report& report) const
    {
        constexpr double kLargeShare = 0.05; // more than the holes that scanners leave
        double const area = result_.shape.area;
        if (area > 0 && counts_.filledArea > kLargeShare * area)
            report.warn(
                fmt::format("the filled holes make up {:.2g} % of the area; the longest has {}. --max-hole leaves "
                            "large ones open.",
                    100 * counts_.filledArea / area, countOf(counts_.holes.longestFilled, "edge")));
    }

    void Repair::report(Report& report)
    {
        FilledHoles const& holes = counts_.holes;
        std::pair<char const*, std::uint64_t> const counts[] = {{"weldedPoints", counts_.weldedPoints},
            {"degenerateFaces", counts_.degenerateFaces}, {"shortenedFaces", counts_.shortenedFaces},
            {"doubledFaces", counts_.doubledFaces}, {"flippedFaces", counts_.flippedFaces},
            {"conflictingEdges", counts_.conflictingEdges}, {"closedSlits", holes.closedSlits},
            {"filledHoles", holes.filledCount}, {"filledFaces", holes.faceCount}, {"filledPoints", holes.centerCount},
            {"longestFilledHole", holes.longestFilled}, {"remainingHoles", holes.openCount},
            {"looseFaces", holes.looseFaces}, {"splitPoints", counts_.splitPoints},
            {"unusedPoints", counts_.unusedPoints}};
        Json done, shown;
        for (auto const& [name, count] : counts) {
            done[name] = count;
            if (count != 0)
                shown[name] = count;
        }
        report.document["repairs"] = done;
        if (!counts_.lossyProperties.empty())
            report.warn(fmt::format("points that were merged had different values of {}; those of the lowest are kept",
                listOf(counts_.lossyProperties)));
        if (counts_.conflictingEdges != 0)
            report.warn(fmt::format("the surface is not orientable{} {}",
                chosenSteps().split ? ", and was cut at" : "; the step split would cut it at",
                countOf(counts_.conflictingEdges, "edge")));
        warnOfFilledArea(report);
        warnOfRemainder(report);
        report.text += shown.empty() ? "nothing to repair\n\n" : formatValues({{"", shown}}) + "\n";
        reportOperation(before_, after_, dropped_, report);
    }

}

constinit EditKind const kRepair = {
    .help = {"repair", "Make a mesh closed and manifold: weld points, drop bad faces, orient, fill holes, split sheets",
        R"(Runs these steps in this order; --only and --skip choose some of them:

  weld        merge points at equal positions, or not farther apart than --weld DISTANCE, into the
              lowest one, which keeps its position and attributes
  degenerate  drop repeated corners of faces, and faces with fewer than three points
  doubled     drop faces with the same points as a lower face. Of two back to back both are kept if
              they are walls of two solids or the sides of a sheet
  orient      orient neighboring faces as most of their sheet are, and closed sheets outward, except
              for cavities: those inside another one that are oriented inward
  fill        fill holes with triangles, which get the attributes of the faces around them. Every
              boundary counts, also the outer one of a sheet; --max-hole leaves longer ones open
  split       give each sheet its own points where sheets share points only, or an edge with more
              than two faces; new points are copies
  unused      drop points that no face uses

All attributes are carried over. Faces without area are kept if they have three points. If the result is not
closed and manifold, a warning says what remains, such as loose triangles.)",
        "  modeling repair scan.stl closed.stl\n"
        "  modeling repair scan.ply closed.ply --weld 0.001 --max-hole 100\n"
        "  modeling repair part.obj oriented.obj --only orient\n"
        "  modeling run scan.stl fine.stl --do \"repair; triangulate; subdivide --relative 0.01\""},
    .create = createEdit<Repair>};

void addRepair(CommandLine& program, Invocation& invocation)
{
    addEditCommand(kRepair, program, invocation);
}

}
