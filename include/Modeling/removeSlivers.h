#pragma once

#include <Modeling/Export.h>
#include <TessaraObject/Object.h>

namespace Geometry::Mesh {

/// Collapses the needle-shaped faces of a closed triangle mesh, each along its shortest edge, to that edge's midpoint.
///
/// It is for needles that sculpting and cutting leave in a surface of larger faces, where the short edge is short compared
/// to everything else nearby. It is not for plates and walls whose thickness is below `ratio` times the length of their
/// faces: the faces of their rims are needles too, and as these collapse the plate tapers to an edge, which takes 2 to 50
/// percent of the volume of typical parts. The shape is not measured: compare volumes before and after if it matters.
///
/// A face is a needle when its shortest edge is shorter than `ratio` times its longest one. Faces are visited once, in
/// ascending order, each measured as the collapses before it have left it. A collapse is skipped where it would pinch
/// the surface or close it to nothing (the ends of the edge must have exactly two neighbours in common, and may not
/// both have valence 3), and where it would turn a face around either end over, judged against that face's normal from
/// before the first collapse.
///
/// Each collapse takes one point and two faces. The point at the start of the edge moves to the midpoint, the other one
/// goes. The points and faces that remain are renumbered: holes are filled from the end of the arrays, so order is kept
/// only in front of the first hole.
///
/// \param ratio  Fraction of the longest edge, without unit. At 0 nothing collapses.
/// \param mesh   Reads and rewrites `sPointPosition` (one float3 a point, in scene units), `sFaceVertex` (one point
///               index a corner) and `sFaceOffset` (face count + 1 entries), and the counts of `sPointComp`,
///               `sFaceVertexComp` and `sFaceComp`. Other properties keep their old arrays and old lengths: the
///               operation is meant for meshes that consist of these three. Other holders of the arrays see no change.
/// \pre          Closed and manifold, three corners to a face, arrays that fit their counts, point indices in range.
///               A mesh with other faces than triangles is left as it was; around boundaries and non-manifold edges and
///               points nothing collapses. Indices out of range are undefined.
/// \return       Always true. A mesh that lacks one of the three arrays is left as it was.
/// \throws       std::bad_alloc, with the mesh as it was. Job cancellation is not looked at.
///
/// Measuring and adjacency run in parallel, the collapses on the calling thread; the result is the same for any number
/// of threads. Linear in the number of faces, plus for each collapse the valences of both ends: many collapses at one
/// point of many faces take quadratic time. A collapse that is refused mostly costs the smaller of the two valences,
/// because the points around a hub, and the faces that refused there, are remembered. Allocates about 30 bytes per face
/// beside the arrays that are written, and 40 to some hundred more per face around a hub; if nothing collapses, nothing
/// is written.
///
/// Link condition: Dey, Edelsbrunner, Guha, Nekhayev, "Topology preserving edge contraction", 1999.
MODELING_EXPORT bool removeSlivers(float ratio, Tessara::Object& mesh);

}
