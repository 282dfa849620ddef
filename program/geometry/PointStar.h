#pragma once

#include "Creases.h"
#include "MeshTopology.h"
#include "PointBlocks.h"

#include <span>
#include <vector>

namespace ModelingProgram {

/// The sides at one point of any kind: which edges they form, and how these connect the corners of the faces to fans.
/// Can be used for one point after the other, which saves allocations.
class PointStar {
public:
    /// Adds what is found at a point: edges to higher points, and whether the point is isolated or non-manifold.
    /// Also triangles with repeated points: at one of these points, at which they have two consecutive corners.
    /// \param around  all corners at the point
    void examine(MeshArrays const& mesh, std::span<CornerAtPoint const> around, unsigned int point,
        std::span<CreasesWithNormals const> creases, MeshTopology& topology);

private:
    /// One end of a side, as seen from the point at that end.
    struct SideEnd {
        unsigned int otherPoint;
        unsigned int startCorner; // of the side
        unsigned int index; // of the corner at the point
        friend auto operator<=>(SideEnd const&, SideEnd const&) = default;
    };

    void collect(
        MeshArrays const& mesh, std::span<CornerAtPoint const> around, unsigned int point, MeshTopology& topology);
    static void examineEdge(std::span<SideEnd const> sides, std::span<CornerAtPoint const> around,
        std::span<CreasesWithNormals const> creases, MeshTopology& topology);
    void join(unsigned int index, unsigned int otherIndex);

    std::vector<SideEnd> ends_;
    std::vector<unsigned int> parents_; // of the indices of corners, in sets of joined ones
    std::size_t fanCount_ = 0; // the number of these sets
};

}
