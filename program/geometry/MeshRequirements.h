#pragma once

#include "Geometry.h"
#include "MeshTopology.h"

#include <functional>
#include <string>
#include <vector>

namespace ModelingProgram {

// Why an operation cannot handle a mesh: one sentence per kind of fault, with the number of occurrences, the first of
// them, and how to fix it. Empty if there is no fault. Points and faces are counted from 0.

/// Faults that keep a mesh from being closed and manifold.
std::vector<std::string> faultsOfClosedManifold(MeshArrays const& mesh, MeshTopology const& topology);

/// Faults that keep its faces from being triangles with three distinct points.
std::vector<std::string> faultsOfTriangles(MeshArrays const& mesh, MeshTopology const& topology);

/// Isolated points, which smoothing operations cannot handle.
std::vector<std::string> faultsOfIsolatedPoints(MeshArrays const& mesh, MeshTopology const& topology);

/// What the user can require of geometry: types, and properties of meshes.
std::vector<std::string> requirementNames();
/// Splits a list such as "closed,triangles".
/// \throws Failure  if a name is unknown
std::vector<std::string> parseRequirements(std::string const& list);
/// Refuses geometry that does not meet all of these. Without points it meets any.
/// \param findTopology  called at most once, if a requirement needs the topology of a mesh
void requireProperties(std::vector<std::string> const& requirements, Tessara::Object const& object,
    std::string const& source, std::function<MeshTopology const&()> const& findTopology);

/// Refuses an object of another type, on behalf of `command`. An object without points becomes an empty one of this type.
/// \param source  where the object comes from, here and below: a file in most cases
void requireType(GeometryType type, Tessara::Object& object, char const* command, std::string const& source);
/// Refuses a mesh that is not a closed manifold of triangles or has `furtherFaults`, and lists all faults.
void requireClosedTriangleMesh(MeshArrays const& mesh, MeshTopology const& topology,
    std::vector<std::string> furtherFaults, char const* command, std::string const& source);

/// One number per point, from a property of any scalar type. Refuses a mesh without this property, and lists the
/// properties that would do. Empty if the mesh has no points.
/// \param option  the command line option that names the property; start of the message
std::vector<float> pointNumbers(
    char const* option, std::string const& name, Tessara::Object const& mesh, std::string const& source);

}
