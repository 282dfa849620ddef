#pragma once

#include "faceStates.h"

#include <Modeling/HalfEdgeDataStructure.h>
#include <TessaraMathSupport/Types.h>

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
    unsigned int pointAcross(unsigned int face, unsigned int k) const;
};

/// The arrays of points, with room for the new ones.
struct RefinedPoints {
    Tessara::Math::float3* basePositions;
    Tessara::Math::float3* limitPositions;
    unsigned char* levels;
};

/// Fills the entries of the points in the middle of faces.
void computeNewPoints(SettledFaces const& faces, RefinedPoints const& points);

}
