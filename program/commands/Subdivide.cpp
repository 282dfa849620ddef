#include "Commands.h"
#include "GuideVolume.h"
#include "Operation.h"
#include "geometry/Geometry.h"
#include "geometry/LargeFaces.h"
#include "geometry/MeshRequirements.h"
#include "geometry/MeshTopology.h"
#include "geometry/Shape.h"
#include "geometry/Triangulation.h"
#include "shell/Failure.h"
#include "shell/MemoryLimit.h"

#include <Modeling/subdivide.h>
#include <Modeling/subdivisionSteps.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Names.h>

#include <fmt/format.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <limits>
#include <map>
#include <memory>
#include <optional>

#include <unistd.h>

namespace ModelingProgram {

namespace {

    using Tessara::Object;

    struct Options {
        std::filesystem::path in;
        Output out;
        std::optional<float> tolerance;
        std::optional<float> relative;
        std::uint64_t maxMemory = 0;
        bool triangulates = false;
        GuideOptions guide;
    };

    /// A mesh that tells on standard error how many faces it has, whenever a pass has made more. It sees that from data
    /// of its points, which follows each pass: on a closed mesh a new point brings two faces.
    class TellingMesh : public Object {
    public:
        explicit TellingMesh(Object const& mesh)
            : Object(mesh)
            , pointCount_(Tessara::Geometry::getElementCount(mesh, Tessara::Geometry::sPointComp))
            , faceCount_(Tessara::Geometry::getElementCount(mesh, Tessara::Geometry::sFaceComp))
        {
            using namespace Tessara::Geometry;
            addDataProperty<float>(kWatched, sPointComp, Orvan::Array<float>(pointCount_), *this);
        }

        void setProperty(Orvan::String const& key, Tessara::PropertyValue&& value) override
        {
            Object::setProperty(key, std::move(value));
            if (key == kWatched)
                tell();
        }

        /// The mesh without what this has added.
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
            std::fprintf(stderr, "modeling: pass %u: %s\n", ++pass_, countOf(faceCount_, "face").c_str());
        }

        std::uint64_t pointCount_;
        std::uint64_t faceCount_;
        unsigned int pass_ = 0;
    };

    /// \return  How many faces are still too large.
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

    /// The same. On a terminal the count of faces is printed after each pass.
    std::uint64_t refine(std::optional<GuideVolume> const& guide, float tolerance, Object& mesh)
    {
        if (!::isatty(STDERR_FILENO))
            return refineBy(guide, tolerance, mesh);
        TellingMesh telling(mesh);
        std::uint64_t const largeFaces = refineBy(guide, tolerance, telling);
        mesh = telling.mesh();
        return largeFaces;
    }

    void reportLargeFaces(std::uint64_t count, bool isGuided, Report& report)
    {
        report.document["tooLargeFaces"] = count;
        if (count != 0)
            report.warn(
                fmt::format("{} still larger than the tolerance: they come from 31 steps, which divide edges by "
                            "25 million, and refinement ends there.{}",
                    count == 1 ? "1 face is" : groupDigits(count) + " faces are",
                    isGuided ? " --min-value keeps the tolerance away from 0." : ""));
    }

    constexpr char kAdvice[] = "Dividing the tolerance by 3 makes about nine times as many faces.";

    /// Below, the library refines nothing; and where points are as far from one another as numbers are, all faces stay
    /// large for ever.
    bool isTooFine(float tolerance, float farthest)
    {
        constexpr float kFinest = std::numeric_limits<float>::epsilon();
        return !(tolerance > 4 * kFinest * farthest);
    }

    float toleranceOf(Options const& options, Object const& mesh, std::optional<GuideVolume> const& guide)
    {
        if (!boundingBoxOf(mesh))
            return options.tolerance.value_or(0); // any will do for an empty mesh
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
                    "a tolerance of {} is too fine: below {} nothing is refined. Take a larger one, or scale the "
                    "mesh up.",
                    tolerance, kNear * 4 * std::numeric_limits<float>::epsilon()));
        if (isTooFine(tolerance, farthest))
            throw Failure(ExitCode::Refused,
                fmt::format(
                    "a tolerance of {} is finer than single precision can distinguish at coordinates of up to {}. "
                    "Take a larger one, or move the mesh to the origin.",
                    tolerance, farthest));
        float const scale = guide ? guide->smallestPositiveValue().value_or(1) : 1;
        if (isTooFine(tolerance * scale, farthest))
            throw Failure(ExitCode::Refused,
                fmt::format(
                    "a tolerance of {} times the smallest positive value of grid \"{}\", {}, is finer than single "
                    "precision can distinguish there. Take a larger tolerance or --min-value.",
                    tolerance, guide->grid(), scale));
        return tolerance;
    }

    /// Warns of the properties that are no longer there, and why. \return their names
    std::vector<std::string> explainDropped(Object const& before, Object const& after, Report& report)
    {
        std::vector<std::string> dropped;
        std::map<std::string, std::vector<std::string>> namesByReason;
        for (Property const& property : propertiesOf(before)) {
            if (after.hasProperty(property.name.c_str()))
                continue;
            dropped.push_back(property.name);
            std::string reason = "it belongs to faces or corners, and these are made anew";
            if (property.component == Tessara::Geometry::sPointComp)
                reason = property.range.empty() && property.type != "range"
                    ? fmt::format("values of type {} have no mean for a new point", property.type)
                    : "what points refer to has no mean for a new point";
            namesByReason[reason].push_back(property.name);
        }
        for (auto const& [reason, names] : namesByReason)
            report.warn(fmt::format("dropped {}: {}", fmt::join(names, ", "), reason));
        return dropped;
    }

    void subdivide(Options const& options, MemoryLimit const& limit, Report& report)
    {
        requireWritable(options.out, GeometryType::Mesh);
        Orvan::MutablePtr<Object> const mesh = loadGeometry(options.in, report);
        requireMesh(*mesh, "subdivide", options.in);
        if (options.triangulates)
            *mesh = triangulatedAs(inFineUnits(*mesh), "*", *mesh);
        auto const [topology, shape] = examine(arraysOf(*mesh));
        requireClosedTriangleMesh(
            arraysOf(*mesh), topology, faultsOfIsolatedPoints(arraysOf(*mesh), topology), "subdivide", options.in);

        std::optional<GuideVolume> guide;
        if (!options.guide.file.empty())
            guide.emplace(options.guide, report, &limit).tellCoverage(arraysOf(*mesh), report);
        float const tolerance = toleranceOf(options, *mesh, guide);
        Object result = *mesh;
        std::uint64_t largeFaces = 0;
        runOperation(report, [&] { largeFaces = refine(guide, tolerance, result); });

        reportLargeFaces(largeFaces, guide.has_value(), report);
        std::vector<std::string> const dropped = explainDropped(*mesh, result, report);
        auto const [topologyAfter, shapeAfter] = examine(arraysOf(result));
        ShapeChange const change{shape, shapeAfter, largestMove(arraysOf(*mesh), arraysOf(result))};
        Json before = countsOf(*mesh), after = countsOf(result);
        addPartsAndGenus(topology, before);
        addPartsAndGenus(topologyAfter, after);
        addShape(change, before, after);
        saveGeometry(result, options.out, report);
        warnOfShape(
            change, "Subdivision rounds every edge and corner: it is for smooth shapes in coarse meshes.", report);
        report.document["tolerance"] = numberOf(tolerance);
        reportOperation(before, after, dropped, report);
    }

}

void addSubdivide(CommandLine& program, Invocation& invocation)
{
    auto const options = std::make_shared<Options>();
    constexpr CommandHelp kHelp = {"subdivide",
        "Refine a closed manifold mesh of triangles where its faces are large, and smooth it",
        R"(Faces split until each fits into twice the tolerance along every axis. Small faces stay as they are,
but for those next to large ones. Floating point values on points (normals too) are carried along as means;
all other properties are dropped, with a warning that says why.

It is for smooth shapes in coarse meshes. It rounds every edge and corner, so that it is not for parts with
sharp edges. The table tells volume, area, folds and the largest move of the old points, and a warning
says when the shape changed much.

Levels: one level divides edges by 1.73 and makes 3 times as many faces, two levels divide edges by 3.
Where all faces are of the size s (the longest side of their box), a tolerance of s/2 leaves them, s/3.46
gives one level, s/6 two, s/10.4 three and s/18 four.

A volume paints where the mesh gets fine: the tolerance of a face is multiplied by the value of the grid
at the face's second corner. Faces are left alone where that is not above 0. "modeling make-volume" makes
such files.

A face splits in at most 31 steps one after the other. If it is still too large then, a warning says so: that
happens where the values of a volume fall to 0 at a single place.)",
        "  modeling subdivide coarse.obj fine.ply --relative 0.01\n"
        "  modeling subdivide part.stl fine.stl --tolerance 0.25 --max-memory 4GB\n"
        "  modeling subdivide head.obj fine.obj --relative 0.01 --volume guide.vdb --grid scale"};
    Command command = addCommand(kHelp, program, invocation);
    addFile("IN", "Mesh to read", options->in, command);
    addOutput("Mesh to write", options->out, command);
    Command size = command.addChoice("Size of faces", "one of these is required");
    size.addOption("--tolerance", options->tolerance, "Half the size of the largest face that stays, in model units")
        .positive();
    size.addOption("--relative", options->relative, "The same, as a fraction of the diagonal of the bounding box")
        .positive();
    command.addFlag("--triangulate", options->triangulates, "Cut faces with more corners into triangles first");
    addGuideOptions(options->guide, command);
    addMemoryLimit(options->maxMemory, command);
    onSelected(command, invocation, [options](Report& report) {
        MemoryLimit const limit(options->maxMemory);
        limit.run([&] { subdivide(*options, limit, report); }, kAdvice);
    });
}

}
