#pragma once

#include "MeshArrays.h"

#include <algorithm>
#include <span>
#include <vector>

namespace ModelingProgram {

/// One side of an edge (a half-edge in either direction), listed at the lower of its two points.
struct Side {
    unsigned int higherPoint;
    unsigned int corner; // where it starts
    unsigned int nextCorner; // where it ends
    friend auto operator<=>(Side const&, Side const&) = default;
};

/// The edges of a mesh, by their lower points. Needs 12 bytes per corner and 4 per point.
class EdgeSides {
public:
    explicit EdgeSides(MeshArrays const& mesh);

    /// The points of the edges for which `isPicked(sides in ascending order)` is true, in ascending order.
    template <class IsPicked> std::vector<unsigned int> pointsOfEdges(IsPicked const& isPicked) const
    {
        std::vector<unsigned int> points;
        forEachEdge(0, offsets_.size() - 1, [&](unsigned int lower, std::span<Side const> sides) {
            if (isPicked(sides))
                points.insert(points.end(), {lower, sides[0].higherPoint});
        });
        std::sort(points.begin(), points.end());
        points.erase(std::unique(points.begin(), points.end()), points.end());
        return points;
    }

    /// The points of boundary edges.
    std::vector<unsigned int> boundaryPoints() const
    {
        return pointsOfEdges([](std::span<Side const> sides) { return sides.size() == 1; });
    }

    /// Calls `visit(lower point, sides in ascending order)` for each edge whose lower point is in a range.
    template <class Visit> void forEachEdge(std::size_t firstPoint, std::size_t endPoint, Visit const& visit) const
    {
        for (std::size_t point = firstPoint; point != endPoint; ++point) {
            Side const* const end = sides_.data() + offsets_[point + 1];
            for (Side const* first = sides_.data() + offsets_[point]; first != end;) {
                unsigned int const higherPoint = first->higherPoint;
                Side const* const last =
                    std::find_if(first, end, [=](Side const& side) { return side.higherPoint != higherPoint; });
                visit(static_cast<unsigned int>(point), std::span<Side const>(first, last));
                first = last;
            }
        }
    }

private:
    // The sides at point p begin at `offsets_[p]`; those of one edge are adjacent.
    std::vector<unsigned int> offsets_;
    std::vector<Side> sides_;
};

/// Calls `visit(corner, next corner)` for each side of each face with at least three corners.
template <class Visit> void forEachSide(MeshArrays const& mesh, Visit const& visit)
{
    unsigned int const* const offset = mesh.faceOffset->data;
    for (unsigned int face = 0; face != mesh.faceCount(); ++face) {
        if (offset[face + 1] - offset[face] < 3)
            continue;
        unsigned int const last = offset[face + 1] - 1;
        for (unsigned int corner = offset[face]; corner != last; ++corner)
            visit(corner, corner + 1);
        visit(last, offset[face]);
    }
}

}
