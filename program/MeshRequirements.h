#pragma once

#include "MeshTopology.h"

#include <string>
#include <vector>

namespace ModelingProgram {

// Why a mesh is not what an operation needs: a sentence for each fault, with how often it occurs, where it occurs
// first, and what helps. Empty where nothing is wrong. Points and faces are counted from 0.

/// What keeps a mesh from being closed and manifold.
std::vector<std::string> faultsOfClosedManifold(MeshArrays const& mesh, MeshTopology const& topology);

/// What keeps its faces from being triangles with three different points.
std::vector<std::string> faultsOfTriangles(MeshArrays const& mesh, MeshTopology const& topology);

}
