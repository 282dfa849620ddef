#pragma once

#include "MeshArrays.h"

#include <cstdint>

namespace ModelingProgram {

/// The number of connected components of a mesh: faces that share a point are in the same one. Points that no face
/// uses do not count.
/// \param lowerInParts        for each point itself or a lower one of the same component, as far as they are already known
/// \param isolatedPointCount  the number of points that no face uses
std::uint64_t countConnectedComponents(
    MeshArrays const& mesh, Orvan::Array<unsigned int> lowerInParts, std::uint64_t isolatedPointCount);

}
