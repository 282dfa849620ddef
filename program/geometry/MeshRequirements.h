#pragma once

#include "MeshTopology.h"

#include <filesystem>
#include <string>
#include <vector>

namespace ModelingProgram {

// Why an operation cannot handle a mesh: one sentence per fault, with the number of occurrences, the first one, and how
// to fix it. Empty if there is no fault. Points and faces are counted from 0.

/// Faults that keep a mesh from being closed and manifold.
std::vector<std::string> faultsOfClosedManifold(MeshArrays const& mesh, MeshTopology const& topology);

/// Faults that keep its faces from being triangles with three distinct points.
std::vector<std::string> faultsOfTriangles(MeshArrays const& mesh, MeshTopology const& topology);

/// Isolated points, which smoothing operations cannot handle.
std::vector<std::string> faultsOfIsolatedPoints(MeshArrays const& mesh, MeshTopology const& topology);

/// Refuses an object that is not a mesh, or a mesh with faults, on behalf of `command`. An object without points
/// becomes an empty mesh.
void requireMesh(Tessara::Object& object, char const* command, std::filesystem::path const& file);
void requireClosedTriangleMesh(MeshArrays const& mesh, MeshTopology const& topology,
    std::vector<std::string> furtherFaults, char const* command, std::filesystem::path const& file);

/// One number per point, from a property of any scalar type. Refuses a mesh without this property, and lists those that
/// it has.
/// \param option  the command line option that names the property; start of the message
std::vector<float> pointNumbers(
    char const* option, std::string const& name, Tessara::Object const& mesh, std::filesystem::path const& file);

}
