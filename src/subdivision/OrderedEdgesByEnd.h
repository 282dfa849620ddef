#pragma once

#include "DirectedEdges.h"

#include <optional>

namespace Modeling::Internal {

/// As `listEdgesByEnd`, but faster, because no edge is moved twice. For meshes in which faces that are stored close
/// together have points that are, as those of most files and generators have.
/// \return  nullopt, and unspecified offsets, if the mesh is none of them
std::optional<bool> listOrderedEdgesByEnd(
    EdgeFaces const& faces, unsigned int pointCount, unsigned int* offset, Orvan::Array<std::uint64_t>& entries);

}
