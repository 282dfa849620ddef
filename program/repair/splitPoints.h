#pragma once

#include "Adjacency.h"
#include "MeshWithSources.h"

namespace ModelingProgram {

/// Gives each fan of faces at a point a point of its own, with the same position and properties: the faces at a point
/// form one fan if joined sides connect them. The fan of the lowest corner keeps the point; new points are appended in
/// the order of the lowest corners of their fans. The mesh then has no non-manifold points. Edges with more than two
/// sides may remain if the fans at both of their points are connected elsewhere. Linear, on the calling thread.
/// \return the number of new points
unsigned int splitPoints(MeshWithSources& mesh, Adjacency const& adjacency);

/// Separates all sides of the edges that still have more than two. If points are split again, none has more than two.
/// In parallel.
/// \return the number of such edges
unsigned int cutCrowdedEdges(MeshWithSources const& mesh, Adjacency& adjacency);

}
