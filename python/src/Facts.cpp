#include "Facts.h"

#include "Cancellation.h"
#include "Errors.h"

#include "geometry/Geometry.h"
#include "geometry/MeshRequirements.h"

namespace ModelingPython {

namespace {

    constexpr char kSource[] = "the mesh"; // what messages of the program name instead of a file

}

Facts& factsOf(Handle& handle)
{
    if (!handle.facts())
        handle.setFacts(std::make_shared<Facts>());
    return *handle.facts();
}

Orvan::Ptr<Tessara::Object> validObjectOf(Handle& handle)
{
    Orvan::Ptr<Tessara::Object> object = handle.object();
    if (handle.facts() && handle.facts()->isValid)
        return object;
    auto const status = withoutLock([&] { return ModelingProgram::validate(*object); });
    if (!status)
        refuseInvalid(std::string(status.message().view()));
    if (handle.object() == object) // another thread may have replaced it in the meantime
        factsOf(handle).isValid = true;
    return object;
}

void requireClosedTriangles(char const* operation, bool acceptsIsolatedPoints, Mesh& mesh)
{
    if (Facts const& known = factsOf(mesh);
        known.isClosedTriangles && (acceptsIsolatedPoints || known.hasNoIsolatedPoints))
        return;
    Orvan::Ptr<Tessara::Object> const object = validObjectOf(mesh);
    bool const hasNoIsolatedPoints = withoutLock([&] {
        using namespace ModelingProgram;
        MeshArrays const arrays = arraysOf(*object);
        MeshTopology const topology = analyzeTopology(arrays);
        requireClosedTriangleMesh(arrays, topology,
            acceptsIsolatedPoints ? std::vector<std::string>() : faultsOfIsolatedPoints(arrays, topology), operation,
            kSource);
        return !topology.isolatedPoints;
    });
    if (!(mesh.object() == object))
        return;
    factsOf(mesh).isClosedTriangles = true;
    factsOf(mesh).hasNoIsolatedPoints = hasNoIsolatedPoints;
}

py::object makeValidHandle(Orvan::Ptr<Tessara::Object> object, Facts facts)
{
    py::object handle = makeHandle(std::move(object));
    facts.isValid = true;
    handle.cast<Handle&>().setFacts(std::make_shared<Facts>(facts));
    return handle;
}

bool isBare(Tessara::Object const& mesh)
{
    constexpr std::uint64_t kStandardKeys = 6; // of a valid mesh, which has all of them
    return mesh.keys()->size == kStandardKeys;
}

}
