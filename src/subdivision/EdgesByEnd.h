#pragma once

#include "DirectedEdges.h"

#include <optional>

namespace Modeling::Internal {

/// Lists the directed edges by the points at which they end, and at each point in ascending order of their entries.
/// Runs in parallel; the result is the same for any number of threads.
/// \param offset   receives where the edges at each point begin, and their number: `pointCount` + 1 entries
/// \return         whether two edges have the same start and end
/// \throws         std::bad_alloc
bool listEdgesByEnd(
    EdgeFaces const& faces, unsigned int pointCount, unsigned int* offset, Orvan::Array<std::uint64_t>& entries);

/// The same for meshes in which faces that are stored close together have points that are, as those of most files and
/// generators have; nullopt, and unspecified offsets, if the mesh is none of them. Faster, because no edge is moved
/// twice.
std::optional<bool> listOrderedEdgesByEnd(
    EdgeFaces const& faces, unsigned int pointCount, unsigned int* offset, Orvan::Array<std::uint64_t>& entries);

}
