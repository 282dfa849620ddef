#pragma once

#include "EdgeSides.h"

#include <cstdint>

namespace ModelingProgram {

/// The number of connected components of a mesh: faces that share a point are in the same one. Points that no face
/// uses do not count.
/// \param edges  those of the mesh
std::uint64_t countConnectedComponents(MeshArrays const& mesh, EdgeSides const& edges);

}
