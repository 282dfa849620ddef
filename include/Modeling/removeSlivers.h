#pragma once

#include <Modeling/Export.h>
#include <TessaraObject/Object.h>

namespace Geometry::Mesh {

/// Removes the needle-shaped faces of a closed triangle mesh by edge collapse: the shortest edge of each needle
/// collapses to its midpoint.
///
/// Meant for needles that sculpting and cutting leave in a surface of larger faces, where the short edge is short
/// compared to everything else nearby. Not meant for plates and walls whose thickness is below `ratio` times the length
/// of their faces: the faces of their rims are needles too, and as these collapse the plate tapers to an edge, which
/// costs 2 to 50 percent of the volume of typical parts. The change of shape is not measured: compare volumes before
/// and after if it matters.
///
/// A face is a needle if its shortest edge is shorter than `ratio` times its longest edge. Faces are visited once, in
/// ascending order, and measured as the earlier collapses have left them. A collapse is skipped if it would make the
/// surface non-manifold or reduce it to nothing (the ends of the edge must have exactly two common neighbors, and must
/// not both have valence 3), or if it would flip a face around either end: move the point to or across the opposite
/// edge, or turn the normal by 90 degrees or more from the one that this face had before the first collapse.
///
/// Each collapse removes one point and two faces: the point at the start of the edge moves to the midpoint, and the
/// point at the end is removed. Remaining points and faces are renumbered: holes are filled from the end of the arrays,
/// so the order is kept only before the first hole.
///
/// \param ratio  Fraction of the longest edge, dimensionless. Nothing collapses if it is 0, negative or NaN.
/// \param mesh   Reads and rewrites `sPointPosition` (one float3 per point, in scene units), `sFaceVertex` (one point
///               index per corner) and `sFaceOffset` (face count + 1 entries), and the counts of `sPointComp`,
///               `sFaceVertexComp` and `sFaceComp`. Other properties keep their old arrays and old lengths: the
///               operation is meant for meshes that consist of these three. Objects that share the arrays see no
///               change.
/// \pre          Closed and manifold, three corners per face, arrays that fit their counts, point indices in range. A
///               mesh with faces other than triangles is left unchanged; at boundaries and around non-manifold edges
///               and points nothing collapses. If an index is out of range, the behavior is undefined.
/// \return       Always true. A mesh in which one of the three arrays is missing or too short is left unchanged.
/// \throws       std::bad_alloc, with the mesh unchanged. Job cancellation is ignored.
///
/// Measuring and adjacency run in parallel, the collapses on the calling thread; the result is the same for any number
/// of threads. Linear in the number of faces, plus the valences of both ends for each collapse: many collapses at one
/// point with many faces take quadratic time. A refused collapse mostly costs the smaller of the two valences, because
/// the neighbors of such a point, and the faces that refused there, are remembered. Allocates about 30 bytes per face
/// in addition to the arrays that are written (40 if collapses spread beyond the neighbors of needles), and 40 to a few
/// hundred bytes per face around such points. If nothing collapses, nothing is written.
///
/// Link condition: Dey, Edelsbrunner, Guha, Nekhayev, "Topology preserving edge contraction", 1999.
MODELING_EXPORT bool removeSlivers(float ratio, Tessara::Object& mesh);

}
