#pragma once

#include "Adjacency.h"

#include <cstddef>
#include <span>
#include <vector>

namespace ModelingProgram {

/// The edges with more than two sides.
struct NonManifoldEdges {
    std::vector<unsigned int> sides; // those of one edge after those of another
    std::vector<std::size_t> offsets = {0};

    std::size_t count() const { return offsets.size() - 1; }
    std::span<unsigned int const> sidesOf(std::size_t edge) const
    {
        return std::span(sides).subspan(offsets[edge], offsets[edge + 1] - offsets[edge]);
    }
};

/// Joins the sides of edges with two sides, whatever their directions. The sides of other edges become boundaries.
/// In parallel.
NonManifoldEdges joinTwoSided(MeshArrays const& mesh, Adjacency& adjacency);

/// Joins the sides of non-manifold edges in pairs. Around an edge, faces that enclose the inside of a solid, behind
/// their normals, belong together: in the order of their angles, each is joined with the next one in that direction that
/// faces it. So solids that meet at an edge keep their walls. What remains has the same orientation, and is joined in
/// the order of the angles, with one side left over if their number is odd. O(n log n) at an edge of n faces.
/// \param isFlipped  for each face whether its orientation is to be reversed
void joinNonManifold(MeshArrays const& mesh, NonManifoldEdges const& edges, std::vector<unsigned char> const& isFlipped,
    Adjacency& adjacency);

}
