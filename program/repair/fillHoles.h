#pragma once

#include "Adjacency.h"
#include "MeshWithSources.h"

namespace ModelingProgram {

struct FilledHoles {
    unsigned int filledCount = 0; // loops
    unsigned int faceCount = 0; // triangles added
    unsigned int centerCount = 0; // points added
    std::size_t longestFilled = 0; // edges
    unsigned int closedSlits = 0; // loops of two edges, whose faces were joined
    unsigned int openCount = 0; // loops with more edges than allowed
    std::size_t longestOpen = 0;
    unsigned int looseFaces = 0; // faces that are joined with no other face
};

/// Fills boundary loops with triangles, which have the orientation of the faces around them. Each loop is triangulated on
/// its own, as the library triangulates a polygon (`triangulate.h`): by ear clipping in the plane of the loop. So a loop
/// around an island in a hole covers it. If a diagonal is an edge of the mesh already, or of a hole that was filled
/// before, the surface would be non-manifold there: then a loop of four edges gets the other diagonal, and any other one
/// a fan around a new point at the mean of its points.
///
/// Loops around a face that is joined with no other one are no holes, and the sides of loops of two edges are joined.
///
/// A triangle gets the properties of the face at the boundary side that starts at its first corner, its corners those
/// of the corners that such sides start from, and a new point those of the first point of the loop.
///
/// O(n log n) for the n edges of all loops, and up to quadratic in those of one of them, plus one parallel pass over all
/// corners.
/// \param mostEdges  longer loops remain open
FilledHoles fillHoles(std::size_t mostEdges, MeshWithSources& mesh, Adjacency& adjacency);

}
