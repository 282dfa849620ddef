#pragma once

#include "Twins.h"
#include "faceStates.h"

#include <Modeling/HalfEdgeDataStructure.h>

namespace Geometry::Mesh::Internal {

/// What a face that splits around its new point emits at one of its edges.
enum class EdgeFate : unsigned char {
    nothing, // at a boundary or next to a coarser face
    third, // the neighbor does not split: a third, whose gate is the edge
    flip, // the neighbor splits around a point too: one side of the flipped edge, and the neighbor emits the other
    gateFlip, // the neighbor is a third: both sides of the flipped gate
};

constexpr unsigned int emittedCount(EdgeFate fate)
{
    return (static_cast<unsigned int>(fate) + 1) / 2;
}

/// The fates of the three edges of a face, in a byte.
struct EdgeFates {
    unsigned char bits;

    constexpr EdgeFate at(unsigned int edge) const { return static_cast<EdgeFate>(bits >> 2 * edge & 3); }
    constexpr void set(unsigned int edge, EdgeFate fate)
    {
        bits = static_cast<unsigned char>(bits | static_cast<unsigned int>(fate) << 2 * edge);
    }
    /// The number of triangles that are emitted at the edges before this one.
    constexpr unsigned int emittedBefore(unsigned int edge) const
    {
        unsigned int count = 0;
        for (unsigned int before = 0; before != edge; ++before)
            count += emittedCount(at(before));
        return count;
    }
    constexpr unsigned int emitted() const { return emittedBefore(3); }
};

/// The mesh before a pass, once it is settled which faces split, and the numbers that faces and points get in it. Faces
/// that are kept come first, then those that split faces emit, face by face and edge by edge.
struct SettledFaces : Modeling::FaceView {
    HalfEdgeDataStructure const* halfEdges; // null if all faces are triangles
    unsigned char const* states;
    Twins const* twins; // of the faces that split; other entries may be uninitialized
    unsigned int pointCount;

    unsigned int keptFaceCount = 0;
    unsigned int keptCornerCount = 0;
    unsigned int emittedCount = 0; // triangles
    Modeling::IndexArray numbers = {}; // of a kept face, its new number; of one that splits around a point, its rank
    Modeling::IndexArray keptCorners = {}; // where the corners of each kept face begin; empty if all are triangles
    Orvan::Array<EdgeFates> fates = {}; // of the faces that split around a point
    Modeling::IndexArray splitFaces = {}; // by rank: the faces that split around a point, ascending
    Modeling::IndexArray emittedOffsets = {}; // by rank: the number of triangles that faces of lower rank emit

    unsigned int newPointCount() const { return static_cast<unsigned int>(splitFaces.size); }
    unsigned int newPoint(unsigned int face) const { return pointCount + numbers[face]; }
    unsigned int keptCorner(unsigned int face) const
    {
        return keptCorners.empty() ? 3 * numbers[face] : keptCorners[face];
    }
    /// The number of the first triangle that a split face emits at an edge.
    unsigned int firstEmitted(unsigned int face, unsigned int edge) const
    {
        return keptFaceCount + emittedOffsets[numbers[face]] + fates[face].emittedBefore(edge);
    }
    /// The point opposite edge k of a face, in the neighbor across that edge.
    unsigned int pointAcross(unsigned int face, unsigned int k) const
    {
        unsigned int const twin = twins[face][k];
        unsigned int const* const across = corners(faceOfTwin(twin));
        if (!halfEdges || size(faceOfTwin(twin)) == 3)
            return across[Modeling::previousCorner(edgeOfTwin(twin))];
        HalfEdge const found = halfEdges->halfEdge(corners(face)[k], corners(face)[Modeling::nextCorner(k)]);
        return across[(found.corner + 1u) % found.faceSize];
    }
};

/// Numbers faces and points.
/// \param faces  all but the numbers is set
/// \throws std::bad_alloc  also if a count does not fit 32 bits
void numberFaces(SettledFaces& faces);

}
