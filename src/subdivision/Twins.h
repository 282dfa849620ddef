#pragma once

#include "frame/FaceAdjacency.h"

#include <Modeling/HalfEdgeDataStructure.h>
#include <OrvanCore/Array.h>

namespace Geometry::Mesh::Internal {

/// The twin of each edge of a triangle: the edge in the opposite direction, as 3 * face + edge, or `kInvalidIndex` if
/// there is none. This number is also that of the corner at which the twin starts.
using Twins = std::array<unsigned int, 3>;

constexpr unsigned int faceOfTwin(unsigned int twin)
{
    return twin / 3;
}
constexpr unsigned int edgeOfTwin(unsigned int twin)
{
    return twin % 3;
}

/// Looks up the twins of the edges of a triangle. If one belongs to a polygon, only its face is meaningful.
Twins findTwins(HalfEdgeDataStructure const& halfEdges, unsigned int const* corners);

/// The twins of the edges of faces: all known, or looked up for each face when they are first needed, because a pass may
/// need those of few faces.
class TwinTable {
public:
    TwinTable(Modeling::FaceView const& faces, Orvan::Array<Twins> const& known)
        : faces_(faces)
        , twins_(known.data)
    {
    }
    /// Of polygons, the triangles of the first three corners are considered.
    TwinTable(HalfEdgeDataStructure const& halfEdges, Modeling::FaceView const& faces);

    /// Two threads must not ask for the same face at a time.
    Twins const& of(unsigned int face)
    {
        if (halfEdges_ && !isFound_[face])
            find(face);
        return twins_[face];
    }
    /// One entry per face; if they are looked up, that of a face nobody asked for is uninitialized.
    Twins const* data() const { return twins_; }

    [[maybe_unused]] bool knows(unsigned int face) const { return !halfEdges_ || isFound_[face]; }

private:
    void find(unsigned int face);

    HalfEdgeDataStructure const* halfEdges_ = nullptr; // null if all are known
    Modeling::FaceView faces_;
    Orvan::Array<unsigned char> isFound_;
    Orvan::Array<Twins> found_;
    Twins const* twins_;
};

}
