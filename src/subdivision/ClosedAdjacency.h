#pragma once

#include "SettledFaces.h"

#include <optional>

namespace Geometry::Mesh::Internal {

/// The adjacency of a closed triangle mesh in which each directed edge belongs to one face, no face has the same point
/// twice, and no two faces share more than one edge. It follows from that of the mesh before a pass, which takes much
/// less time than to find it again.
///
/// A pass preserves all three. Two faces that share two edges share all three, so they would be a closed part of the mesh
/// that only such a pair can turn into. A new edge ends at the new point of a face. Its other end is a corner of the face,
/// or is across one of its edges: the new point of a neighbor, or the point of a third, whose gate was an edge of the
/// face that the third is left of. If two of these were the same, two faces would have shared two edges.
struct ClosedAdjacency {
    Orvan::Array<Twins> twins; // one entry per face
    Orvan::Array<unsigned int> valences; // one per point
    Orvan::Array<unsigned char> finestSteps; // one per point: the step of the finest face around it
};

/// nullopt if the mesh is not like that. All faces are at step 0.
std::optional<ClosedAdjacency> findClosedAdjacency(
    HalfEdgeDataStructure const& halfEdges, Modeling::FaceView const& faces, unsigned int pointCount);

/// Brings the adjacency up to date with what a pass makes of the faces.
void refineAdjacency(SettledFaces const& faces, ClosedAdjacency& adjacency);

}
