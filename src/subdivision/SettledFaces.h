#pragma once

#include "faceStates.h"

#include <Modeling/HalfEdgeDataStructure.h>

namespace Geometry::Mesh::Internal {

/// The mesh before a pass, with its faces settled.
struct SettledFaces {
    HalfEdgeDataStructure const& halfEdges;
    unsigned int const* faceVertex;
    unsigned int const* faceOffset;
    unsigned char const* states;
    std::array<unsigned int, 3> const* neighbours;
    unsigned int faceCount;
    unsigned int pointCount;
    unsigned int const* newPointOffsets; // how many of the faces before each one split around a point

    unsigned int const* corners(unsigned int face) const { return faceVertex + faceOffset[face]; }
    unsigned int newPoint(unsigned int face) const { return pointCount + newPointOffsets[face]; }
    /// The point across edge k of a face, in its neighbour there.
    unsigned int pointAcross(unsigned int face, unsigned int k) const
    {
        HalfEdge const twin = halfEdges.halfEdge(corners(face)[k], corners(face)[k == 2 ? 0 : k + 1]);
        return corners(twin.face)[(twin.corner + 1u) % twin.faceSize];
    }
};

}
