#pragma once

#include "faceStates.h"

#include <Modeling/HalfEdgeDataStructure.h>

namespace Geometry::Mesh::Internal {

/// The mesh before a pass, after it has been settled which faces split.
struct SettledFaces {
    HalfEdgeDataStructure const& halfEdges;
    unsigned int const* faceVertex;
    unsigned int const* faceOffset;
    unsigned char const* states;
    std::array<unsigned int, 3> const* neighbors;
    unsigned int faceCount;
    unsigned int pointCount;
    unsigned int const* newPointOffsets; // one per face: how many of the faces before it split around a point

    unsigned int const* corners(unsigned int face) const { return faceVertex + faceOffset[face]; }
    unsigned int newPoint(unsigned int face) const { return pointCount + newPointOffsets[face]; }
    /// The corner opposite edge k of a face, in the neighbor across that edge.
    unsigned int pointAcross(unsigned int face, unsigned int k) const
    {
        HalfEdge const twin = halfEdges.halfEdge(corners(face)[k], corners(face)[k == 2 ? 0 : k + 1]);
        return corners(twin.face)[(twin.corner + 1u) % twin.faceSize];
    }
};

}
