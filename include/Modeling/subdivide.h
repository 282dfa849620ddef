#pragma once

#include <Modeling/Export.h>
#include <TessaraObject/Object.h>

namespace Geometry::Mesh {

/// Refines a closed triangle mesh by adaptive √3-subdivision, until every face fits into twice `tolerance` along every
/// axis.
///
/// It is for smooth shapes that a coarse mesh stands for: characters, organic forms, reduced scans. It is not for parts with
/// sharp edges or flat sides: every edge and corner is rounded, by an amount that depends on the size of the coarse faces
/// around it, not on `tolerance`, and a box becomes an egg. There is no notion of creases.
///
/// Faces that are too large split around a new point in their middle, the edge between two split faces turns over, and
/// faces next to them split as far as it takes to keep sizes graded: levels across an edge differ by less than two. Two
/// steps divide edges by 3, one by √3. Points move: the surface is smoothed, and each point lies where its own number
/// of steps has taken it between its place in the coarse mesh and its place on the limit surface. What is measured is
/// the smoothed mesh. The run ends with a pass in which no face splits.
///
/// A face is the result of at most 31 steps, which divide edges by 25 million, and is then left as it is, even if it is
/// still too large. That takes few faces if the tolerance is out of reach in single places only, such as a point one
/// float away from the points around it, where floats are farther apart than the tolerance. `markForSubdivision` of
/// `subdivisionSteps.h` finds the faces of a result that are still too large; on a closed manifold, all of them have
/// come to this limit.
///
/// Old points keep their numbers, and new ones follow. In each pass faces that stay keep their order, and new ones
/// follow in the order of the faces that they replace. New faces keep the orientation of the old ones. Levels are not
/// kept: a second call takes the refined mesh for a coarse one.
///
/// Data that cannot follow is dropped first, also when the answer is false: all data and ranges of faces and of
/// corners, and of points what is no array of `float` or `double` or of a vector or matrix of these; with each property
/// the ones that target it. The others get the mean of the face's three points at each new point, whatever their
/// interpolation mode says, and stay as they are at old ones: they are not smoothed, and a mean of unit vectors is
/// shorter than 1.
///
/// \param tolerance  In scene units. At or below 1.1920929e-7, and where all faces fit, nothing splits, but data is
///                   dropped all the same. A step multiplies the faces by 3: a tolerance that is too small ends with
///                   the memory, or for single places at the limit of 31 steps.
/// \param object     Reads and rewrites `sPointPosition` (one float3 a point), `sFaceVertex` (one point index a corner)
///                   and `sFaceOffset` (face count + 1 entries), and the counts of `sPointComp`, `sFaceVertexComp` and
///                   `sFaceComp`. Other holders of arrays see no change.
/// \pre              A valid mesh with three corners to a face. Where faces meet otherwise than in a closed manifold
///                   with one orientation nothing breaks, but the result means little. Points without a face come out
///                   as NaN.
/// \return           False where some face has an edge without a face that passes it in the other direction; the mesh
///                   has then lost the dropped data and nothing else. Faces are taken for triangles of their first
///                   three corners there, so that mostly polygons give false too, and so does a missing standard array.
///                   If an enclosing oneTBB group is cancelled, faces that are too large are left as they are: the
///                   result is then true, with a closed but coarser mesh.
/// \throws           std::bad_alloc when memory runs out or a count no longer fits 32 bits; std::runtime_error with the
///                   text of `TSR::exceptionMessage` when the job is cancelled, which is looked at several times a
///                   pass. The mesh is then as it was but for dropped data and for data of points, which may be longer
///                   already than there are points: further values at its end.
///
/// The same result for any number of threads. Linear in the faces of each pass, so in the result when faces split
/// evenly. Takes up to about 130 bytes a face of the result at its peak, the result itself included.
///
/// Method: Kobbelt, "√3-subdivision", 2000, with points evaluated at any step in closed form.
MODELING_EXPORT bool subdivide(float tolerance, Tessara::Object& object);

}
