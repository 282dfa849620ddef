#include "Edit.h"
#include "files/WorkMeter.h"
#include "geometry/Geometry.h"
#include "geometry/MeshRequirements.h"
#include "geometry/MeshTopology.h"
#include "geometry/Shape.h"
#include "geometry/replacePositions.h"
#include "geometry/sumOverBlocks.h"
#include "shell/Cancellation.h"
#include "shell/Failure.h"

#include <Modeling/deleteFaces.h>
#include <Modeling/smooth.h>
#include <TessaraGeometry/ElementTypes.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraMathSupport/Stepper.h>

#include <fmt/format.h>

#include <algorithm>
#include <cmath>
#include <memory>
#include <optional>

namespace ModelingProgram {

namespace {

    using namespace Tessara::Geometry;
    using Tessara::Object;
    using Positions = Orvan::Array<float3>;

    struct SmoothOptions {
        float amount = 1;
        std::string weights;
        std::string pins;
        bool pinsBoundary = false;
        std::optional<float> sharpDegrees; // points at sharper edges are pinned
        bool dropsIsolated = false;
    };

    /// During its lifetime, the steps of smoothing count as work done, and a cancelled job ends after one of them.
    class StepCounter {
    public:
        explicit StepCounter(float amount)
        {
            unsigned int steps = 0;
            for (Tessara::Math::Stepper stepper(amount, kLargestStep); stepper; stepper.step(CoreGL::NOPLogger()))
                ++steps;
            workMeter.begin("steps", steps);
            CoreGL::OrvanLogger::setSink([](char const*) {
                workMeter.add(1);
                stopIfCancelled();
            });
        }
        StepCounter(StepCounter const&) = delete;
        StepCounter& operator=(StepCounter const&) = delete;
        ~StepCounter() { CoreGL::OrvanLogger::setSink({}); }

    private:
        static constexpr float kLargestStep = 0.9f; // of the library
    };

    /// How far points moved.
    struct Displacement {
        double sum = 0;
        double largest = 0;
        bool areFinite = true; // the points after the move

        void add(float3 const& before, float3 const& after)
        {
            double const moved = distance(before, after);
            *this += {moved, moved, isFinite(after)};
        }
        Displacement& operator+=(Displacement const& other)
        {
            sum += other.sum;
            largest = std::max(largest, other.largest);
            areFinite = areFinite && other.areFinite;
            return *this;
        }
    };

    class Smooth final : public Edit {
    public:
        void declareOptions(Command& command) override;
        void run(Subject& subject, Report& report) override;
        void report(Report& report) override;

    private:
        SmoothOptions options_;
        ShapeChange change_;
        double meanDisplacement_ = 0;
        double largestDisplacement_ = 0;
        Json before_, after_;
        std::vector<std::string> dropped_;
    };

    void Smooth::declareOptions(Command& command)
    {
        command.addOption("--amount", options_.amount, "Amount of smoothing").between(0, 1000, "0..1000").showDefault();
        command.addOption("--weights", options_.weights, "Scale the moves of points by this attribute")
            .valueName("ATTRIBUTE");
        command.addOption("--pin-attribute", options_.pins, "Pin the points where this attribute is not 0")
            .valueName("ATTRIBUTE");
        command.addFlag("--pin-boundary", options_.pinsBoundary, "Pin the points of boundary edges");
        command
            .addOption("--pin-sharp", options_.sharpDegrees,
                "Pin the points at edges whose faces have normals that differ by more than this many degrees")
            .valueName("DEG")
            .between(0, 180, "0..180");
        command.addFlag("--drop-isolated", options_.dropsIsolated, "Remove points that belong to no face");
    }

    /// Null if no point is weighted or pinned.
    std::unique_ptr<Orvan::Array<float>> weightsOf(
        SmoothOptions const& options, Subject const& subject, std::optional<EdgeSides> const& edges, Report& report)
    {
        if (options.weights.empty() && options.pins.empty() && !options.pinsBoundary && !options.sharpDegrees)
            return nullptr;
        Object const& mesh = *subject.object;
        MeshArrays const arrays = arraysOf(mesh);
        auto weights = std::make_unique<Orvan::Array<float>>(arrays.pointCount(), 1.0f);
        if (!options.weights.empty()) {
            std::vector<float> const numbers = pointNumbers("--weights", options.weights, mesh, subject.name);
            if (!std::all_of(numbers.begin(), numbers.end(), [](float number) { return std::isfinite(number); }))
                throw Failure(ExitCode::Refused, fmt::format("the weights \"{}\" are not all finite", options.weights));
            std::copy(numbers.begin(), numbers.end(), weights->begin());
        }
        if (!options.pins.empty()) {
            std::vector<float> const numbers = pointNumbers("--pin-attribute", options.pins, mesh, subject.name);
            for (std::size_t point = 0; point != numbers.size(); ++point)
                if (numbers[point] != 0)
                    (*weights)[point] = 0;
        }
        if (options.pinsBoundary)
            for (unsigned int const point : edges->boundaryPoints())
                (*weights)[point] = 0;
        if (options.sharpDegrees)
            for (unsigned int const point : sharpPoints(arrays, *edges, *options.sharpDegrees))
                (*weights)[point] = 0;
        report.document["pinnedPoints"] =
            std::count_if(weights->begin(), weights->end(), [](float weight) { return weight <= 0; });
        return weights;
    }

    /// Refuses points without a face, which smoothing cannot move, or removes them.
    void handleIsolatedPoints(SmoothOptions const& options, Subject& subject, Report& report)
    {
        Object& mesh = *subject.object;
        Finding const isolated =
            subject.topology ? subject.topology->isolatedPoints : findIsolatedPoints(arraysOf(mesh));
        report.document["droppedPoints"] = isolated.count;
        if (!isolated)
            return;
        if (!options.dropsIsolated)
            throw Failure(ExitCode::Refused,
                fmt::format("{} of {} in {} {} to no face, so smoothing cannot move {}; the first is point {} "
                            "(counted from 0). --drop-isolated removes such points.",
                    groupDigits(isolated.count), countOf(arraysOf(mesh).pointCount(), "point"), subject.name,
                    isolated.count == 1 ? "belongs" : "belong", isolated.count == 1 ? "it" : "them", isolated.first));
        Orvan::Array<bool> const noFace(arraysOf(mesh).faceCount());
        if (!Tessara::GeometryAlgorithms::deleteFaces(noFace, mesh))
            throw Failure(
                ExitCode::Refused, "the isolated points cannot be removed: a range of the points has several data");
        subject.setKnown();
    }

    /// Sums over the corners of all faces, of the edges that begin there.
    struct EdgeLengths {
        double sum = 0;
        double squares = 0;

        EdgeLengths& operator+=(EdgeLengths const& other)
        {
            sum += other.sum;
            squares += other.squares;
            return *this;
        }
    };

    EdgeLengths edgeLengthsOf(MeshArrays const& mesh)
    {
        float3 const* const position = mesh.positions->data;
        return sumOverBlocks<EdgeLengths>(mesh.faceCount(), [&](std::size_t begin, std::size_t end) {
            EdgeLengths block;
            for (std::size_t face = begin; face != end; ++face) {
                auto const corners = mesh.corners(static_cast<unsigned int>(face));
                EdgeLengths own;
                for (std::size_t i = 0, previous = corners.size() - 1; i < corners.size(); previous = i++) {
                    double const edge =
                        length(inDoubles(position[corners[i]]) - inDoubles(position[corners[previous]]));
                    own += {edge, edge * edge};
                }
                block += own;
            }
            return block;
        });
    }

    Json describeSurface(Object const& mesh)
    {
        MeshArrays const arrays = arraysOf(mesh);
        EdgeLengths const edges = edgeLengthsOf(arrays);
        double const count = std::max(arrays.cornerCount(), 1u), mean = edges.sum / count;
        double const variance = std::max(0.0, edges.squares / count - mean * mean);
        Json values = countsOf(mesh);
        values["meanEdgeLength"] = numberOf(static_cast<float>(mean));
        values["spreadOfEdgeLengths"] = numberOf(static_cast<float>(mean > 0 ? std::sqrt(variance) / mean : 0));
        return values;
    }

    Displacement displacementOf(Positions const& before, Positions const& after)
    {
        return sumOverBlocks<Displacement>(before.size, [&](std::size_t begin, std::size_t end) {
            Displacement block;
            for (std::size_t point = begin; point != end; ++point)
                block.add(before[point], after[point]);
            return block;
        });
    }

    /// Removes the normals of points, corners and faces, which no longer fit the surface. \return their names
    std::vector<std::string> dropNormals(Object& mesh)
    {
        std::vector<std::string> dropped;
        for (Property const& property : propertiesOf(mesh)) {
            std::string_view const name = property.name;
            if (name != "normal" && !name.ends_with(":normal")) // prefixed if several components have normals
                continue;
            mesh.eraseProperty(property.name.c_str());
            dropped.push_back(property.name);
        }
        return dropped;
    }

    void Smooth::run(Subject& subject, Report& report)
    {
        Object& mesh = *subject.object;
        handleIsolatedPoints(options_, subject, report);
        MeshArrays const arrays = arraysOf(mesh);
        std::optional<EdgeSides> edges;
        if (options_.pinsBoundary || options_.sharpDegrees)
            edges.emplace(arrays);
        auto const weights = weightsOf(options_, subject, edges, report);
        Positions positions = *arrays.positions;
        runOperation(report, [&] {
            StepCounter const counter(options_.amount);
            Geometry::Mesh::smooth(options_.amount, arrays.pointCount(), arrays.faceCount(), *arrays.faceVertex,
                *arrays.faceOffset, weights.get(), positions, CoreGL::OrvanLogger());
        });

        Displacement const displacement = displacementOf(*arrays.positions, positions);
        if (!displacement.areFinite)
            throw Failure(ExitCode::Refused, "the coordinates are too large to be smoothed in single precision");
        meanDisplacement_ = displacement.sum / static_cast<double>(std::max<std::uint64_t>(positions.size, 1));
        largestDisplacement_ = displacement.largest;
        dropped_ = displacement.largest != 0 ? dropNormals(mesh) : std::vector<std::string>();
        if (report.needsFacts())
            before_ = describeSurface(mesh);
        replacePositions(std::move(positions), mesh);
        if (!report.needsFacts()) {
            subject.shape.reset(); // the topology stays
            return;
        }
        MeshArrays const moved = arraysOf(mesh);
        if (subject.topology && subject.shape) {
            change_ = {*subject.shape, examine(moved).shape, displacement.largest};
        } else {
            ExaminedMove const facts = examineMove(arrays, moved);
            subject.topology = facts.topology;
            change_ = {facts.before, facts.after, displacement.largest};
        }
        subject.shape = change_.after;
        after_ = describeSurface(mesh);
        addShape(change_, before_, after_);
    }

    void Smooth::report(Report& report)
    {
        warnOfShape(change_,
            options_.sharpDegrees
                ? "Smoothing is for noise on rounded surfaces. A smaller --pin-sharp pins more edges, and a smaller "
                  "--amount moves points less."
                : "Smoothing is for noise on rounded surfaces. --pin-sharp 30 keeps sharp edges, and a smaller "
                  "--amount moves points less.",
            report);
        report.document["amount"] = numberOf(options_.amount);
        reportOperation(before_, after_, dropped_, report);
        report.document["meanDisplacement"] = numberOf(static_cast<float>(meanDisplacement_));
        report.document["largestDisplacement"] = numberOf(static_cast<float>(largestDisplacement_));
        report.text += fmt::format(
            "\nPoints moved by {:.4g} on average, by {:.4g} at most.\n", meanDisplacement_, largestDisplacement_);
    }

}

constinit EditKind const kSmooth = {
    .help = {"smooth", "Even out the edges of a mesh with a rounded surface",
        R"(Tangential Laplacian smoothing: each point moves within its tangent plane towards the center of its
one-ring. The amount is divided into steps of at most 0.9: an amount of 1 takes two steps and removes most
of the unevenness that noise causes on a sphere; 9 takes ten or eleven and converges. Normals would no
longer fit the surface, so they are dropped and listed.

It is meant for scans and other rounded surfaces with small faces. On parts with sharp edges it moves
corners, frays edges and bends thin walls, unless --pin-sharp pins the points there. The table shows volume,
area, fold-overs and the largest move, and a warning says if the shape changed much.

Points at a boundary move too, unless they are pinned. Attributes with a number per point can
scale the moves (from 0, which pins, to 1) or pin the points where they are not 0.)",
        "  modeling smooth scan.ply smooth.ply --amount 3\n"
        "  modeling smooth cloth.obj smooth.obj --amount 1 --pin-boundary\n"
        "  modeling smooth part.stl held.stl --pin-sharp 30\n"
        "  modeling smooth face.ply face.ply --force --weights quality --pin-attribute locked"},
    .create = createEdit<Smooth>,
    .keepsFaces = true};

void addSmooth(CommandLine& program, Invocation& invocation)
{
    addEditCommand(kSmooth, program, invocation);
}

}
