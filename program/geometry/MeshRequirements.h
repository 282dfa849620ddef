#pragma once

#include "MeshTopology.h"

#include <filesystem>
#include <string>
#include <vector>

namespace ModelingProgram {

// Why a mesh is not what an operation needs: a sentence for each fault, with how often it occurs, where it occurs
// first, and what helps. Empty where nothing is wrong. Points and faces are counted from 0.

/// What keeps a mesh from being closed and manifold.
std::vector<std::string> faultsOfClosedManifold(MeshArrays const& mesh, MeshTopology const& topology);

/// What keeps its faces from being triangles with three different points.
std::vector<std::string> faultsOfTriangles(MeshArrays const& mesh, MeshTopology const& topology);

/// Points of no face: operations that smooth have nothing to go by there.
std::vector<std::string> faultsOfIsolatedPoints(MeshArrays const& mesh, MeshTopology const& topology);

/// Refuses what is not a mesh for `command`, or has one of the faults. An object without points becomes an empty mesh.
void requireMesh(Tessara::Object& object, char const* command, std::filesystem::path const& file);
void requireClosedTriangleMesh(MeshArrays const& mesh, MeshTopology const& topology,
    std::vector<std::string> furtherFaults, char const* command, std::filesystem::path const& file);

/// One number per point, from a property of any scalar type. Refuses a mesh without this property, and names those that
/// it has.
/// \param option  which asks for the property; begins the message
std::vector<float> pointNumbers(
    char const* option, std::string const& name, Tessara::Object const& mesh, std::filesystem::path const& file);

}
