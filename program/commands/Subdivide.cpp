#include "Edit.h"
#include "GuideVolume.h"
#include "files/WorkMeter.h"
#include "geometry/Geometry.h"
#include "geometry/MeshRequirements.h"
#include "geometry/MeshTopology.h"
#include "geometry/Refinement.h"
#include "geometry/Shape.h"
#include "geometry/Triangulation.h"
#include "shell/Failure.h"
#include "shell/MemoryLimit.h"
#include "shell/Phase.h"
#include "shell/Progress.h"

#include <Modeling/subdivide.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Names.h>

#include <fmt/format.h>

#include <memory>
#include <optional>

namespace ModelingProgram {

namespace {

    using Tessara::Object;

    struct SubdivideOptions {
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
    std::uint64_t refineBy(std::optional<GuideGrid> const& guide, float tolerance, Object& object)
    {
        if (guide)
            return guide->refine(tolerance, object);
        Geometry::Mesh::subdivide(tolerance, object);
        return countFacesAbove(tolerance, object);
    }

    /// Does the same, and counts the faces if progress is shown.
    std::uint64_t refine(std::optional<GuideGrid> const& guide, float tolerance, Object& mesh)
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
            report.warn(warningOfLargeFaces(count) + (isGuided ? " --min-value keeps the tolerance away from 0." : ""));
    }

    constexpr char kToleranceAdvice[] = "Dividing the tolerance by 3 makes about nine times as many faces.";

    /// Warns of the properties that were dropped, and why. \return their names
    std::vector<std::string> explainDropped(Object const& before, Object const& after, Report& report)
    {
        for (DroppedByRefinement const& dropped : droppedByRefinement(before, after))
            report.warn(dropped.sentence());
        return namesMissingIn(after, before);
    }

    class Subdivide final : public Edit {
    public:
        void declareOptions(Command& command) override;
        void runLimited(std::function<void()> const& work) override;
        void run(Subject& subject, Report& report) override;
        void report(Report& report) override;

    private:
        std::optional<GuideGrid> readGuide(Object const& mesh, Report& report) const;

        SubdivideOptions options_;
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
        limit.run(work, kToleranceAdvice);
    }

    std::optional<GuideGrid> Subdivide::readGuide(Object const& mesh, Report& report) const
    {
        std::optional<GuideGrid> guide;
        if (!options_.guide.file.empty())
            reportCoverage(
                guide.emplace(ModelingProgram::readGuide(options_.guide, report, limit_)), arraysOf(mesh), report);
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

        std::optional<GuideGrid> const guide = readGuide(mesh, report);
        tolerance_ =
            refinementTolerance(options_.tolerance, options_.relative, boundingBoxOf(mesh), guide ? &*guide : nullptr);
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
