#include "Bindings.h"
#include "Cancellation.h"
#include "Errors.h"
#include "Facts.h"
#include "GuideHandle.h"
#include "arrays.h"

#include "geometry/EdgeSides.h"
#include "geometry/Geometry.h"
#include "geometry/MeshRequirements.h"
#include "geometry/Refinement.h"
#include "geometry/Shape.h"
#include "geometry/TriangleBatch.h"
#include "geometry/Triangulation.h"
#include "geometry/replacePositions.h"
#include "shell/Cancellation.h"
#include "shell/Failure.h"
#include "shell/MemoryLimit.h"
#include "shell/Report.h"

#include <Modeling/removeSlivers.h>
#include <Modeling/smooth.h>
#include <Modeling/subdivide.h>
#include <Modeling/subdivisionSteps.h>
#include <Modeling/triangulate.h>
#include <OrvanCppOpSDK/Job.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Names.h>
#include <TessaraMathSupport/Loggers.h>

#include <pybind11/stl.h>

#include <fmt/format.h>

#include <algorithm>
#include <cmath>
#include <mutex>

namespace ModelingPython {

namespace {

    using namespace ModelingProgram;
    using namespace Tessara::Geometry;
    using Tessara::Object;
    using Positions = Orvan::Array<float3>;

    // -- Triangulation

    py::object triangulate(Mesh& mesh, std::string const& channels, bool keepsUnits)
    {
        Orvan::Ptr<Object> const object = validObjectOf(mesh);
        if (channels != "*") {
            requireChannelList(channels);
            requireMatchingChannels(channels, *object);
        }
        std::vector<std::string> outdated;
        Orvan::Ptr<Object> result = withoutLock([&] {
            Orvan::MutablePtr<Object> triangles = copyOf(object);
            if (keepsUnits)
                Geometry::Mesh::triangulate(channels.c_str(), *triangles);
            else
                *triangles = triangulatedAs(inFineUnits(*object), channels, *object);
            if (!isBare(*triangles))
                outdated = dropOutdatedProperties(*triangles);
            return triangles;
        });
        for (std::string const& name : outdated)
            warn(fmt::format("\"{}\" is dropped: values of its type cannot be copied to triangles", name));
        return makeValid<Mesh>(std::move(result));
    }

    // -- Refinement

    constexpr char kAdvice[] = "Dividing the tolerance by 3 makes about nine times as many faces.";

    enum class Extent { Brief, Medium, Large };

    /// How much a refinement may make.
    /// \return  `Brief` for few faces, `Large` if memory has to be watched
    Extent extentOf(float tolerance, std::optional<BoundingBox> const& box, GuideGrid const* guide, Object const& mesh)
    {
        constexpr float kFewFaces = 10, kManyFaces = 300; // along the diagonal
        constexpr unsigned int kFewPoints = 100;
        if (!box)
            return Extent::Medium;
        float const diagonal = std::hypot(box->max.x - box->min.x, box->max.y - box->min.y, box->max.z - box->min.z);
        // Between voxels with and without values, a guide has any value above 0.
        float const finest = guide ? tolerance * std::max(guide->range().leastOfAll, 0.0f) : tolerance;
        if (diagonal > kManyFaces * finest)
            return Extent::Large;
        bool const isBrief = diagonal <= kFewFaces * finest && getElementCount(mesh, sPointComp) < kFewPoints;
        return isBrief ? Extent::Brief : Extent::Medium;
    }

    /// Runs a refinement. If it needs more than the free memory, it ends with `Failure` before the system kills the
    /// process.
    template <class Work> void runWithinMemory(Work const& work)
    {
        static std::mutex mutex;
        std::unique_lock const lock(mutex, std::try_to_lock);
        if (!lock) { // the operation of another thread is watching already
            work();
            return;
        }
        try {
            MemoryLimit const limit(0);
            limit.run(
                [&] {
                    try {
                        work();
                    } catch (std::runtime_error const&) {
                        ModelingProgram::stopIfCancelled(); // the exception of the host
                        throw;
                    }
                },
                kAdvice);
        } catch (Failure const& failure) {
            if (failure.code == ExitCode::OutOfMemory)
                Orvan::setJobCancelled(false); // the limit had cancelled it
            throw;
        }
    }

    struct Refined {
        Orvan::Ptr<Object> object; // null if the library has refused the mesh
        std::uint64_t largeFaces = 0;
    };

    Refined refine(float tolerance, GuideGrid const* guide, Orvan::Ptr<Object> const& object)
    {
        Orvan::MutablePtr<Object> mesh = copyOf(object);
        std::uint64_t largeFaces = 0;
        if (guide)
            largeFaces = guide->refine(tolerance, *mesh);
        else if (!Geometry::Mesh::subdivide(tolerance, *mesh))
            return {};
        else if (getElementCount(*mesh, sPointComp) != getElementCount(*object, sPointComp)) // otherwise all are small
            largeFaces = countFacesAbove(tolerance, *mesh);
        return {std::move(mesh), largeFaces};
    }

    py::object subdivide(
        Mesh& given, std::optional<float> tolerance, std::optional<float> relative, Guide const* guide, bool checks)
    {
        Mesh mesh = snapshotOf(given);
        Orvan::Ptr<Object> const object = validObjectOf(mesh);
        char const* const operation = guide ? "subdivide_by_volume" : "subdivide";
        if (checks)
            requireClosedTriangles(operation, false, mesh);
        GuideGrid const* const grid = guide ? &guide->grid() : nullptr;
        auto const box = boundingBoxOf(*object);
        float const size = refinementTolerance(tolerance, relative, box, grid);
        Extent const extent = extentOf(size, box, grid, *object);
        Refined refined = runCancellable(
            [&] {
                Refined made;
                auto const work = [&] { made = refine(size, grid, object); };
                if (extent == Extent::Large)
                    runWithinMemory(work);
                else
                    work();
                return made;
            },
            extent == Extent::Brief);
        if (!refined.object) {
            requireClosedTriangles(operation, false, mesh);
            refuse(fmt::format("{} failed: the mesh does not meet the requirements of the operation", operation));
        }
        if (!isBare(mesh))
            for (DroppedByRefinement const& dropped : droppedByRefinement(*object, *refined.object))
                warn(dropped.sentence());
        if (refined.largeFaces != 0)
            warn(warningOfLargeFaces(refined.largeFaces));
        return makeValid<Mesh>(std::move(refined.object));
    }

    void requireTriangles(Mesh& mesh, Object const& object)
    {
        if (factsOf(mesh).hasOnlyTriangles)
            return;
        withoutLock([arrays = arraysOf(object)] {
            if (!areTriangles(arrays, 0, arrays.faceCount()))
                refuse("large_faces needs a mesh of triangles:", faultsOfTriangles(arrays, analyzeTopology(arrays)));
        });
        factsOf(mesh).hasOnlyTriangles = true;
    }

    py::array_t<bool> largeFaces(Mesh& given, float tolerance)
    {
        Mesh mesh = snapshotOf(given);
        Orvan::Ptr<Object> const object = validObjectOf(mesh);
        requireTriangles(mesh, *object);
        return numbersOf<bool>(withoutLock([&] {
            MeshArrays const arrays = arraysOf(*object);
            Orvan::Array<bool> marks(arrays.faceCount());
            Geometry::Mesh::Internal::markForSubdivision(
                tolerance, arrays.faceCount(), *arrays.positions, *arrays.faceVertex, *arrays.faceOffset, marks);
            return marks;
        }));
    }

    // -- Smoothing

    /// Lets a cancelled job end after a step of smoothing. There is one sink of steps per process.
    void stopBetweenSteps()
    {
        CoreGL::OrvanLogger::setSink([](char const*) { ModelingPython::stopIfCancelled(); });
    }

    void requireNoIsolatedPoints(Mesh& mesh, Object const& object)
    {
        if (factsOf(mesh).hasNoIsolatedPoints)
            return;
        MeshArrays const arrays = arraysOf(object);
        Finding const isolated = withoutLock([&] { return findIsolatedPoints(arrays); });
        if (isolated)
            refuse(fmt::format("{} of {} in the mesh {} to no face, so smoothing cannot move {}; the first is point {} "
                               "(counted from 0). delete_faces removes such points, also if it deletes no face.",
                groupDigits(isolated.count), countOf(arrays.pointCount(), "point"),
                isolated.count == 1 ? "belongs" : "belong", isolated.count == 1 ? "it" : "them", isolated.first));
        factsOf(mesh).hasNoIsolatedPoints = true;
    }

    struct Pins {
        bool boundary = false;
        std::optional<double> sharpDegrees;
    };

    void pin(Pins const& pins, MeshArrays const& mesh, Orvan::Array<float>& weights)
    {
        EdgeSides const edges(mesh);
        if (pins.boundary)
            for (unsigned int const point : edges.boundaryPoints())
                weights[point] = 0;
        if (pins.sharpDegrees)
            for (unsigned int const point : sharpPoints(mesh, edges, *pins.sharpDegrees))
                weights[point] = 0;
    }

    bool areFinite(Positions const& positions)
    {
        float const* const number = positions.empty() ? nullptr : &positions.data->x;
        float sum = 0; // NaN as soon as a number is not finite
        for (std::uint64_t i = 0; i != 3 * positions.size; ++i)
            sum += number[i] * 0.0f;
        return sum == 0;
    }

    /// Whether all steps together take milliseconds.
    bool isBrief(float amount, MeshArrays const& mesh)
    {
        constexpr double kFewCorners = 100'000; // in all steps
        return (1.0 + static_cast<double>(amount)) * static_cast<double>(mesh.cornerCount()) < kFewCorners;
    }

    Positions smoothed(float amount, MeshArrays const& mesh, Orvan::Array<float> const* weights)
    {
        Positions positions = *mesh.positions;
        auto const run = [&](auto const& logger) {
            Geometry::Mesh::smooth(amount, mesh.pointCount(), mesh.faceCount(), *mesh.faceVertex, *mesh.faceOffset,
                weights, positions, logger);
        };
        if (isBrief(amount, mesh))
            run(CoreGL::NOPLogger());
        else {
            stopBetweenSteps();
            run(CoreGL::OrvanLogger());
        }
        return positions;
    }

    /// Removes the normals of points, corners and faces, which no longer fit the surface.
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

    py::object smooth(Mesh& given, float amount, std::optional<Values<float>> const& factors, bool pinsBoundary,
        std::optional<double> sharpDegrees)
    {
        Mesh mesh = snapshotOf(given);
        Orvan::Ptr<Object> const object = validObjectOf(mesh);
        requireNoIsolatedPoints(mesh, *object);
        MeshArrays const arrays = arraysOf(*object);
        std::optional<Orvan::Array<float>> weights;
        if (factors)
            weights = arrayOf<float>(*factors);
        if (weights && weights->size != arrays.pointCount())
            throw py::value_error(fmt::format(
                "weights has {} entries, but there are {}", weights->size, countOf(arrays.pointCount(), "point")));
        if (weights && !std::all_of(weights->begin(), weights->end(), [](float w) { return std::isfinite(w); }))
            refuse("the weights are not all finite");
        std::vector<std::string> dropped;
        auto const work = [&] {
            auto factor = weights;
            if (pinsBoundary || sharpDegrees) {
                if (!factor)
                    factor.emplace(arrays.pointCount(), 1.0f);
                pin({pinsBoundary, sharpDegrees}, arrays, *factor);
            }
            Positions positions = smoothed(amount, arrays, factor ? &*factor : nullptr);
            if (!areFinite(positions))
                refuse("the coordinates are too large to be smoothed in single precision");
            Orvan::MutablePtr<Object> copy = copyOf(object);
            dropped.clear();
            if (!(positions == *arrays.positions)) {
                if (!isBare(*copy))
                    dropped = dropNormals(*copy);
                replacePositions(std::move(positions), *copy);
            }
            return Orvan::Ptr<Object>(std::move(copy));
        };
        Orvan::Ptr<Object> result = runCancellable(work, isBrief(amount, arrays));
        for (std::string const& name : dropped)
            warn(fmt::format("dropped {}: normals no longer fit the surface", name));
        return makeValid<Mesh>(std::move(result), factsOf(mesh));
    }

    // -- Slivers

    py::object removeSlivers(Mesh& given, float ratio, bool checks)
    {
        Mesh mesh = snapshotOf(given);
        Orvan::Ptr<Object> const object = validObjectOf(mesh);
        if (checks)
            requireClosedTriangles("remove_slivers", true, mesh);
        std::vector<std::string> dropped;
        Orvan::Ptr<Object> result = withoutLock([&] {
            // The operation keeps only the standard properties up to date.
            Orvan::MutablePtr<Object> copy = copyOf(object);
            if (!isBare(*copy))
                dropped = dropOtherProperties(*copy);
            Geometry::Mesh::removeSlivers(ratio, *copy);
            if (getElementCount(*copy, sPointComp) != getElementCount(*object, sPointComp))
                return Orvan::Ptr<Object>(std::move(copy));
            dropped.clear();
            return object;
        });
        if (!dropped.empty())
            warn(fmt::format("dropped {}: collapses renumber points and faces", fmt::join(dropped, ", ")));
        bool const isSame = result == object;
        return makeValid<Mesh>(std::move(result), isSame ? factsOf(mesh) : Facts{});
    }

}

void bindSurfaces(py::module_& module)
{
    module.def("triangulate", &triangulate);
    module.def("subdivide", &subdivide);
    module.def("large_faces", &largeFaces);
    module.def("smooth", &smooth);
    module.def("remove_slivers", &removeSlivers);
}

}
