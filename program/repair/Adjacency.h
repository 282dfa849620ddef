#pragma once

#include "geometry/MeshArrays.h"

#include <TessaraGeometry/Names.h>

#include <vector>

namespace ModelingProgram {

/// Which sides of faces are joined: each side at most with one other. A side is named by the corner at which it starts.
/// Unlike in an edge table, faces that meet at an edge need not be neighbors, so that sheets can be told apart
/// before they have points of their own. Needs 4 bytes per corner, and 4 more if not all faces are triangles.
class Adjacency {
public:
    static constexpr unsigned int kBoundary = Tessara::Geometry::kInvalidIndex; // joined with nothing
    /// Not a side of an edge: it starts and ends at the same point, or its face has fewer than three corners.
    static constexpr unsigned int kNoEdge = Tessara::Geometry::kDeletedElement;

    /// All sides are `kNoEdge`.
    /// \param mesh  must outlive this; if its faces change, `reverse` and `extend` have to be called
    explicit Adjacency(MeshArrays const& mesh);

    unsigned int across(unsigned int side) const { return across_[side]; }
    bool isBoundary(unsigned int side) const { return across_[side] == kBoundary; }
    bool isJoined(unsigned int side) const { return across_[side] < kNoEdge; }

    void join(unsigned int side, unsigned int other)
    {
        across_[side] = other;
        across_[other] = side;
    }
    void markBoundary(unsigned int side) { across_[side] = kBoundary; }
    /// Makes a side and the one that it is joined with boundaries.
    void cut(unsigned int side)
    {
        if (isJoined(side))
            across_[across_[side]] = kBoundary;
        across_[side] = kBoundary;
    }

    unsigned int faceOf(unsigned int corner) const { return areTriangles_ ? corner / 3 : faceOfCorner_[corner]; }
    unsigned int next(unsigned int corner) const
    {
        if (areTriangles_)
            return corner % 3 == 2 ? corner - 2 : corner + 1;
        unsigned int const* const offset = mesh_.faceOffset->data + faceOfCorner_[corner];
        return corner + 1 == offset[1] ? offset[0] : corner + 1;
    }
    unsigned int previous(unsigned int corner) const
    {
        if (areTriangles_)
            return corner % 3 == 0 ? corner + 2 : corner - 1;
        unsigned int const* const offset = mesh_.faceOffset->data + faceOfCorner_[corner];
        return corner == offset[0] ? offset[1] - 1 : corner - 1;
    }

    unsigned int startOf(unsigned int side) const { return (*mesh_.faceVertex)[side]; }
    unsigned int endOf(unsigned int side) const { return (*mesh_.faceVertex)[next(side)]; }
    /// Whether two joined sides lead in opposite directions, as those of faces with the same orientation do.
    bool areOpposite(unsigned int side, unsigned int other) const { return startOf(side) != startOf(other); }

    /// To be called after the corners of some faces were reversed, all but the first.
    void reverse(std::vector<unsigned char> const& isReversed);
    /// To be called after triangles were appended to the mesh. Their sides are boundaries.
    void extend();

private:
    MeshArrays const& mesh_;
    bool areTriangles_;
    std::vector<unsigned int> faceOfCorner_; // empty if all faces are triangles
    std::vector<unsigned int> across_;
};

}
