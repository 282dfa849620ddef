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
    Facts& facts = factsOf(mesh);
    facts.isClosedTriangles = true;
    facts.hasOnlyTriangles = true;
    facts.hasNoIsolatedPoints = hasNoIsolatedPoints;
}

py::object makeValidHandle(ModelingProgram::GeometryType type, Orvan::Ptr<Tessara::Object> object)
{
    using ModelingProgram::GeometryType;
    switch (type) {
    case GeometryType::Mesh:
        return makeValid<Mesh>(std::move(object));
    case GeometryType::PointCloud:
        return makeValid<PointCloud>(std::move(object));
    default:
        return makeValid<StrandSet>(std::move(object));
    }
}

bool isBare(Tessara::Object const& mesh)
{
    constexpr std::uint64_t kStandardKeys = 6; // of a valid mesh, which has all of them
    return mesh.keys()->size == kStandardKeys;
}

bool isBare(Mesh& mesh)
{
    Facts& facts = factsOf(mesh);
    if (!facts.isBare)
        facts.isBare = isBare(*mesh.object());
    return *facts.isBare;
}

ModelingProgram::GeometryType typeOf(Handle& handle)
{
    Facts& facts = factsOf(handle);
    if (!facts.type)
        facts.type = ModelingProgram::typeOf(*handle.object());
    return *facts.type;
}

}
