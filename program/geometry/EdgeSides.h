#pragma once

#include "MeshArrays.h"

#include "frame/PointCorners.h"
#include "frame/grains.h"

#include <algorithm>
#include <span>
#include <vector>

namespace ModelingProgram {

/// One side of an edge (a half-edge in either direction), as seen from one of its two points.
struct Side {
    unsigned int otherPoint;
    unsigned int corner; // where it starts
    unsigned int nextCorner; // where it ends
    friend auto operator<=>(Side const&, Side const&) = default;
};

/// A corner at some point, with its neighbors in its face. All three can be at the same point.
struct CornerNeighbors {
    unsigned int corner;
    unsigned int previous;
    unsigned int next;
};

/// The sides of the edges of a mesh, by points. Faces with fewer than three corners have no sides, and neither do
/// consecutive corners at the same point. Needs 4 bytes per corner and point, and 4 more per corner if not all faces
/// have equally many. The mesh must outlive it.
class EdgeSides {
public:
    explicit EdgeSides(MeshArrays const& mesh);

    /// Calls `visit(CornerNeighbors)` for the corners at a point, in ascending order; for those of faces with at least
    /// three corners.
    template <class Visit> void forEachCornerAt(unsigned int point, Visit const& visit) const
    {
        if (cornersPerFace_ == 3) { // the usual case, in which offsets need not be read
            for (unsigned int const corner : cornersAt(point)) {
                unsigned int const k = corner % 3;
                visit(CornerNeighbors{corner, k == 0 ? corner + 2 : corner - 1, k == 2 ? corner - 2 : corner + 1});
            }
            return;
        }
        unsigned int const* const offset = mesh_.faceOffset->data;
        for (unsigned int const corner : cornersAt(point)) {
            unsigned int const face = faceOf(corner);
            unsigned int const first = offset[face];
            unsigned int const last = offset[face + 1] - 1;
            if (last - first >= 2)
                visit(
                    CornerNeighbors{corner, corner == first ? last : corner - 1, corner == last ? first : corner + 1});
        }
    }

    /// All corners at a point in ascending order, those of faces with fewer than three corners included.
    std::span<unsigned int const> cornersAt(unsigned int point) const
    {
        return {around_.corners.data + around_.offsets[point], around_.corners.data + around_.offsets[point + 1]};
    }

    unsigned int faceOf(unsigned int corner) const
    {
        if (cornersPerFace_ == 3) // dividing by a constant is faster
            return corner / 3;
        return cornersPerFace_ != 0 ? corner / cornersPerFace_ : faceOfCorner_[corner];
    }

    /// Calls `visit(lower point, sides in ascending order)` for each edge whose lower point is in a range.
    template <class Visit> void forEachEdge(std::size_t firstPoint, std::size_t endPoint, Visit const& visit) const
    {
        std::vector<Side> sides;
        for (auto point = static_cast<unsigned int>(firstPoint); point != endPoint; ++point) {
            collectSides(point, sides);
            for (auto first = sides.begin(); first != sides.end();) {
                auto const last = std::find_if(
                    first, sides.end(), [=](Side const& side) { return side.otherPoint != first->otherPoint; });
                visit(point, std::span<Side const>(first, last));
                first = last;
            }
        }
    }

    /// The points of the edges for which `isPicked(sides in ascending order)` is true, in ascending order.
    template <class IsPicked> std::vector<unsigned int> pointsOfEdges(IsPicked const& isPicked) const
    {
        std::vector<unsigned int> points;
        forEachEdge(0, mesh_.pointCount(), [&](unsigned int lower, std::span<Side const> sides) {
            if (isPicked(sides))
                points.insert(points.end(), {lower, sides[0].otherPoint});
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

private:
    /// The sides of the edges from a point to higher points, in ascending order.
    void collectSides(unsigned int point, std::vector<Side>& sides) const;

    MeshArrays const& mesh_;
    Modeling::PointCorners around_;
    unsigned int cornersPerFace_ = 0; // 0 if not all faces have equally many
    std::vector<unsigned int> faceOfCorner_; // empty if they do
};

}
