#pragma once

#include "Adjacency.h"

#include <cstddef>
#include <span>
#include <vector>

namespace ModelingProgram {

/// Closed loops of boundary sides, each of which visits a point at most once.
struct Loops {
    std::vector<unsigned int> sides; // in the direction of their faces, those of one loop after those of another
    std::vector<std::size_t> starts = {0}; // of each loop, and the end

    std::size_t count() const { return starts.size() - 1; }
    std::span<unsigned int const> sidesOf(std::size_t loop) const
    {
        return std::span(sides).subspan(starts[loop], starts[loop + 1] - starts[loop]);
    }
};

/// Finds the boundary loops. If several boundaries meet at a point, the loop turns into the side at the smallest angle,
/// across the hole; at more than 16 of them, into the side at the same fan of faces. Loops that return to a point are
/// divided there. Sides whose ends do not fit because faces have different orientations are in no loop.
/// O(n log n), on the calling thread.
Loops findLoops(MeshArrays const& mesh, Adjacency const& adjacency);

}
