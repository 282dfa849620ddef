#pragma once

#include "DirectedEdges.h"

namespace Modeling::Internal {

/// Lists the directed edges by the points at which they end, and at each point in ascending order of their entries.
/// Runs in parallel; the result is the same for any number of threads.
/// \param offset   receives where the edges at each point begin, and their number: `pointCount` + 1 entries
/// \return         whether two edges have the same start and end
/// \throws         std::bad_alloc
bool listEdgesByEnd(
    EdgeFaces const& faces, unsigned int pointCount, unsigned int* offset, Orvan::Array<std::uint64_t>& entries);

}
