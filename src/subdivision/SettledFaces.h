#pragma once

#include "faceStates.h"

#include <Modeling/HalfEdgeDataStructure.h>

namespace Geometry::Mesh::Internal {

/// The mesh before a pass, once it is settled which faces split.
struct SettledFaces : Modeling::FaceView {
    HalfEdgeDataStructure const& halfEdges;
    unsigned char const* states;
    std::array<unsigned int, 3> const* neighbors; // of the faces that split; other entries may be uninitialized
    unsigned int pointCount;
    unsigned int const* newPointOffsets; // one per face: how many of the faces before it split around a point

    unsigned int newPoint(unsigned int face) const { return pointCount + newPointOffsets[face]; }
    /// The point opposite edge k of a face, in the neighbor across that edge.
    unsigned int pointAcross(unsigned int face, unsigned int k) const
    {
        HalfEdge const twin = halfEdges.halfEdge(corners(face)[k], corners(face)[Modeling::nextCorner(k)]);
        return corners(twin.face)[(twin.corner + 1u) % twin.faceSize];
    }
};

}
