#include "Edit.h"
#include "GuideVolume.h"
#include "files/WorkMeter.h"
#include "geometry/Geometry.h"
#include "geometry/LargeFaces.h"
#include "geometry/MeshRequirements.h"
#include "geometry/MeshTopology.h"
#include "geometry/Shape.h"
#include "geometry/Triangulation.h"
#include "shell/Failure.h"
#include "shell/MemoryLimit.h"
#include "shell/Phase.h"
#include "shell/Progress.h"

#include <Modeling/subdivide.h>
#include <Modeling/subdivisionSteps.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Names.h>

#include <fmt/format.h>

#include <algorithm>
#include <cmath>
#include <limits>
#include <map>
#include <memory>
#include <optional>

namespace ModelingProgram {

namespace {

    using Tessara::Object;

    struct Options {
        std::optional<float> tolerance;
        std::optional<float> relative;
        std::uint64_t maxMemory = 0;
        bool triangulates = false;
        GuideOptions guide;
    };

    /// A mesh that counts its faces as work done after each pass of a refinement. The library has no progress callback,
    /// but it extends the data of points once per pass. So this class adds such a property and observes writes to it; on
    /// a closed mesh each new point adds two faces.
    class ProgressMesh : public Object {
    public:
        explicit ProgressMesh(Object const& mesh)
            : Object(mesh)
            , pointCount_(Tessara::Geometry::getElementCount(mesh, Tessara::Geometry::sPointComp))
            , faceCount_(Tessara::Geometry::getElementCount(mesh, Tessara::Geometry::sFaceComp))
        {
            using namespace Tessara::Geometry;
            addDataProperty<float>(kWatched, sPointComp, Orvan::Array<float>(pointCount_), *this);
            workMeter.begin("faces");
        }

        void setProperty(Orvan::String const& key, Tessara::PropertyValue&& value) override
        {
            Object::setProperty(key, std::move(value));
            if (key == kWatched)
                tell();
        }

        /// The mesh without the added property.
        Object mesh() const
        {
            Object mesh = *this;
            mesh.eraseProperty(kWatched);
            return mesh;
        }

    private:
        static constexpr char const* kWatched = "modeling: passes";

        void tell()
        {
            auto const watched = Tessara::Geometry::dataOf<float>(*this, kWatched);
            if (!watched || watched->size == pointCount_)
                return;
            faceCount_ += 2 * (watched->size - pointCount_);
            pointCount_ = watched->size;
            workMeter.set(faceCount_);
        }

        std::uint64_t pointCount_;
        std::uint64_t faceCount_;
    };

    /// \return how many faces are still too large
    std::uint64_t refineBy(std::optional<GuideVolume> const& guide, float tolerance, Object& object)
    {
        if (guide)
            return guide->refine(tolerance, object);
        Geometry::Mesh::subdivide(tolerance, object);
        return countLargeFaces(object, [=](MeshArrays const& refined, Orvan::Array<bool>& marks) {
            Geometry::Mesh::Internal::markForSubdivision(
                tolerance, refined.faceCount(), *refined.positions, *refined.faceVertex, *refined.faceOffset, marks);
        });
    }

    /// Does the same, and counts the faces if progress is shown.
    std::uint64_t refine(std::optional<GuideVolume> const& guide, float tolerance, Object& mesh)
    {
        if (!isProgressShown())
            return refineBy(guide, tolerance, mesh);
        ProgressMesh telling(mesh);
        std::uint64_t const largeFaces = refineBy(guide, tolerance, telling);
        mesh = telling.mesh();
        return largeFaces;
    }

    void reportLargeFaces(std::uint64_t count, bool isGuided, Report& report)
    {
        report.document["tooLargeFaces"] = count;
        if (count != 0)
            report.warn(
                fmt::format("{} still larger than the tolerance: they reached the limit of 31 steps, which divide "
                            "edges by 25 million.{}",
                    count == 1 ? "1 face is" : groupDigits(count) + " faces are",
                    isGuided ? " --min-value keeps the tolerance away from 0." : ""));
    }

    constexpr char kAdvice[] = "Dividing the tolerance by 3 makes about nine times as many faces.";

    /// The library refines nothing below its own limit; and if points are only as far apart as adjacent floats, faces
    /// never become small enough.
    bool isTooFine(float tolerance, float farthest)
    {
        constexpr float kFinest = std::numeric_limits<float>::epsilon();
        return !(tolerance > 4 * kFinest * farthest);
    }

    float toleranceOf(Options const& options, Object const& mesh, std::optional<GuideVolume> const& guide)
    {
        if (!boundingBoxOf(mesh))
            return options.tolerance.value_or(0); // not used for an empty mesh
        BoundingBox const box = *boundingBoxOf(mesh);
        float3 const size{box.max.x - box.min.x, box.max.y - box.min.y, box.max.z - box.min.z};
        float const tolerance =
            options.tolerance ? *options.tolerance : *options.relative * std::hypot(size.x, size.y, size.z);

        constexpr float kNear = 0.25f; // closer to the origin, the library's own limit is the coarser one
        float farthest = kNear;
        for (float const coordinate : {box.min.x, box.min.y, box.min.z, box.max.x, box.max.y, box.max.z})
            farthest = std::max(farthest, std::abs(coordinate));
        if (isTooFine(tolerance, farthest) && farthest == kNear)
            throw Failure(ExitCode::Refused,
                fmt::format(
                    "a tolerance of {} is too fine: below {} nothing is refined. Use a larger one, or scale the mesh "
                    "up.",
                    tolerance, kNear * 4 * std::numeric_limits<float>::epsilon()));
        if (isTooFine(tolerance, farthest))
            throw Failure(ExitCode::Refused,
                fmt::format(
                    "a tolerance of {} is finer than single precision can distinguish at coordinates of up to {}. "
                    "Use a larger one, or move the mesh to the origin.",
                    tolerance, farthest));
        float const scale = guide ? guide->smallestPositiveValue().value_or(1) : 1;
        if (isTooFine(tolerance * scale, farthest))
            throw Failure(ExitCode::Refused,
                fmt::format(
                    "a tolerance of {} times the smallest positive value of grid \"{}\", {}, is finer than single "
                    "precision can distinguish there. Use a larger tolerance or --min-value.",
                    tolerance, guide->grid(), scale));
        return tolerance;
    }

    /// Warns of the properties that were dropped, and why. \return their names
    std::vector<std::string> explainDropped(Object const& before, Object const& after, Report& report)
    {
        std::vector<std::string> dropped;
        std::map<std::string, std::vector<std::string>> namesByReason;
        for (Property const& property : propertiesOf(before)) {
            if (after.hasProperty(property.name.c_str()))
                continue;
            dropped.push_back(property.name);
            std::string reason = "refinement replaces faces and corners";
            if (property.component == Tessara::Geometry::sPointComp)
                reason = property.range.empty() && property.type != "range"
                    ? fmt::format("values of type {} cannot be interpolated for new points", property.type)
                    : "ranges cannot be interpolated for new points";
            namesByReason[reason].push_back(property.name);
        }
        for (auto const& [reason, names] : namesByReason)
            report.warn(fmt::format("dropped {}: {}", fmt::join(names, ", "), reason));
        return dropped;
    }

    class Subdivide final : public Edit {
    public:
        void declareOptions(Command& command) override;
        void runLimited(std::function<void()> const& work) override;
        void run(Subject& subject, Report& report) override;
        void report(Report& report) override;

    private:
        std::optional<GuideVolume> readGuide(Object const& mesh, Report& report) const;

        Options options_;
        MemoryLimit const* limit_ = nullptr; // while it applies
        float tolerance_ = 0;
        ShapeChange change_;
        Json before_, after_;
        std::vector<std::string> dropped_;
    };

    void Subdivide::declareOptions(Command& command)
    {
        Command size = command.addChoice("Size of faces", "one of these is required");
        size.addOption("--tolerance", options_.tolerance, "Half the size of the largest face to keep, in model units")
            .positive();
        size.addOption("--relative", options_.relative, "The same, as a fraction of the diagonal of the bounding box")
            .positive();
        command.addFlag(
            "--triangulate", options_.triangulates, "Cut faces with more than three corners into triangles first");
        addGuideOptions(options_.guide, command);
        addMemoryLimit(options_.maxMemory, command);
    }

    void Subdivide::runLimited(std::function<void()> const& work)
    {
        MemoryLimit const limit(options_.maxMemory);
        limit_ = &limit;
        limit.run(work, kAdvice);
    }

    std::optional<GuideVolume> Subdivide::readGuide(Object const& mesh, Report& report) const
    {
        std::optional<GuideVolume> guide;
        if (!options_.guide.file.empty())
            guide.emplace(options_.guide, report, limit_).reportCoverage(arraysOf(mesh), report);
        return guide;
    }

    void Subdivide::run(Subject& subject, Report& report)
    {
        Object& mesh = *subject.object;
        if (options_.triangulates) {
            Phase const phase(report, &Times::operation, "triangulating");
            mesh = triangulatedAs(inFineUnits(mesh), "*", mesh);
            subject.setKnown();
        }
        if (report.needsFacts())
            subject.know(); // topology and shape are faster to compute together
        MeshTopology const topology = subject.knowTopology();
        requireClosedTriangleMesh(
            arraysOf(mesh), topology, faultsOfIsolatedPoints(arraysOf(mesh), topology), "subdivide", subject.name);

        std::optional<GuideVolume> const guide = readGuide(mesh, report);
        tolerance_ = toleranceOf(options_, mesh, guide);
        Object result = mesh;
        std::uint64_t largeFaces = 0;
        runOperation(report, [&] { largeFaces = refine(guide, tolerance_, result); });

        reportLargeFaces(largeFaces, guide.has_value(), report);
        dropped_ = explainDropped(mesh, result, report);
        before_ = countsOf(mesh);
        after_ = countsOf(result);
        std::optional<ExaminedMesh> after;
        if (report.needsFacts()) {
            after = examine(arraysOf(result));
            change_ = {subject.know().shape, after->shape, largestMove(arraysOf(mesh), arraysOf(result))};
            addPartsAndGenus(topology, before_);
            addPartsAndGenus(after->topology, after_);
            addShape(change_, before_, after_);
        }
        mesh = std::move(result);
        subject.setKnown(after);
    }

    void Subdivide::report(Report& report)
    {
        warnOfShape(change_,
            "Subdivision rounds every edge and corner; it is meant for coarse meshes of smooth shapes.", report);
        report.document["tolerance"] = numberOf(tolerance_);
        reportOperation(before_, after_, dropped_, report);
    }

}

constinit EditKind const kSubdivide = {
    .help = {"subdivide", "Refine and smooth a closed manifold mesh of triangles where its faces are large",
        R"(Adaptive sqrt(3)-subdivision: faces are split until each fits into a box of twice the tolerance along
every axis. Small faces are kept, except next to large ones. Floating-point values on points (normals too)
are interpolated; all other properties are dropped, with a warning that says why.

It is meant for coarse meshes of smooth shapes. It rounds every edge and corner, so it is not meant for parts
with sharp edges. The table shows volume, area, fold-overs and the largest move of the old points, and a
warning says if the shape changed much.

Levels: one level divides edge lengths by 1.73 and makes 3 times as many faces, two levels divide them by 3.
If all faces have the size s (the longest side of their box), a tolerance of s/2 keeps them, s/3.46
gives one level, s/6 two, s/10.4 three and s/18 four.

A volume controls where the mesh becomes fine: the tolerance of a face is multiplied by the value of the grid
at the face's second corner. Faces are not refined where that is not above 0. "modeling make-volume" makes
such files.

A face is split in at most 31 successive steps. If it is still too large, a warning says so: that
happens where the values of a volume fall to 0 at a single point.)",
        "  modeling subdivide coarse.obj fine.ply --relative 0.01\n"
        "  modeling subdivide part.stl fine.stl --tolerance 0.25 --max-memory 4GB\n"
        "  modeling subdivide head.obj fine.obj --relative 0.01 --volume guide.vdb --grid scale"},
    .create = createEdit<Subdivide>};

void addSubdivide(CommandLine& program, Invocation& invocation)
{
    addEditCommand(kSubdivide, program, invocation);
}

}
