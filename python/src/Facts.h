#pragma once

#include "Handles.h"

#include "geometry/Geometry.h"
#include "geometry/MeshTopology.h"

#include <optional>
#include <string>

namespace ModelingPython {

/// What is known about the object of a handle. It is checked when an operation first needs it: objects do not change.
struct Facts {
    bool isValid = false;
    // For meshes. Known facts survive operations that keep the faces.
    bool isClosedTriangles = false; // closed, manifold, consistently oriented, triangles only
    bool hasOnlyTriangles = false;
    bool hasNoIsolatedPoints = false;
    std::optional<ModelingProgram::GeometryType> type = {};
    std::optional<bool> isBare =
        {}; // whether a mesh has nothing but its three components and three standard properties
};

/// The facts of a handle, which is given empty ones if it has none.
Facts& factsOf(Handle& handle);

/// The geometry as it is now: Python code that runs during an operation may give the handle another object. Both share what
/// becomes known of the object.
template <class Kind> Kind snapshotOf(Kind& handle)
{
    factsOf(handle);
    return handle;
}

/// The object. Operations may read and write outside arrays if it is invalid, so all take it from here.
/// \throws  `InvalidGeometry` with the sentence of the validator
Orvan::Ptr<Tessara::Object> validObjectOf(Handle& handle);

/// Refuses a mesh that `requireClosedTriangleMesh` refuses, or that has isolated points unless they are accepted.
/// \param operation  start of the message: "subdivide"
/// \param topology   of the mesh, if it is known
void requireClosedTriangles(char const* operation, bool acceptsIsolatedPoints, Mesh& mesh);

/// A new handle for the result of an operation. Its kind is given, because finding it takes as long as an operation on a few
/// faces.
template <class Kind> py::object makeValid(Orvan::Ptr<Tessara::Object> object, Facts facts = {})
{
    facts.isValid = true;
    Kind handle(std::move(object));
    handle.setFacts(std::make_shared<Facts>(facts));
    return py::cast(std::move(handle));
}
py::object makeValidHandle(ModelingProgram::GeometryType type, Orvan::Ptr<Tessara::Object> object);

/// Finding it takes as long as an operation on a few faces.
ModelingProgram::GeometryType typeOf(Handle& handle);

/// Whether a mesh has nothing but its three components and three standard properties.
bool isBare(Tessara::Object const& mesh);
bool isBare(Mesh& mesh);

/// A copy of the object, which shares its arrays: what an operation edits.
inline Orvan::MutablePtr<Tessara::Object> copyOf(Orvan::Ptr<Tessara::Object> const& object)
{
    return Orvan::MutablePtr<Tessara::Object>::make(*object);
}

}
