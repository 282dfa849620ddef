#pragma once

#include <Modeling/Export.h>
#include <TessaraObject/Object.h>

namespace Geometry::Mesh {

/// Refines a closed triangle mesh by adaptive √3-subdivision, until every face fits into twice `tolerance` along every
/// axis.
///
/// Meant for smooth shapes that a coarse mesh approximates: characters, organic forms, reduced scans. Not meant for
/// parts with sharp edges or flat sides: every edge and corner is rounded, by an amount that depends on the size of the
/// coarse faces around it, not on `tolerance`, and a box becomes an egg. Creases are not supported.
///
/// In each pass, faces that are too large split around a new point in their middle, the edge between two split faces
/// flips, and faces next to them split as far as needed to keep the mesh graded: levels across an edge differ by less
/// than two. One step divides edge lengths by √3, and two by 3. Points move, because the surface is smoothed: each
/// point is between its position in the coarse mesh and its position on the limit surface, and its number of steps
/// decides how far. The tolerance applies to the smoothed mesh. The last pass is one in which no face splits.
///
/// No face is refined by more than 31 steps, which divide edge lengths by 25 million: it is then left as it is, even if
/// it is still too large. This adds few faces if the tolerance is out of reach in isolated places only, such as around
/// a point whose coordinates are so large that adjacent floats are farther apart than the tolerance.
/// `markForSubdivision` of `subdivisionSteps.h` finds the faces of a result that are still too large; on a closed
/// manifold, all of them have reached this limit.
///
/// Existing points keep their indices, and new ones follow. In each pass, faces that do not split keep their order, and
/// new ones follow in the order of the faces that they replace, with the same orientation. Levels are not stored: a
/// second call treats the refined mesh as a coarse one.
///
/// Data that cannot be refined is removed first, even if the result is false: all data and ranges of faces and of
/// corners; of points, everything that is not an array of `float` or `double` or of a vector or matrix of these; and
/// with each property those that target it. Point data that is kept is first trimmed, or padded with zeros, to the
/// point count. At each new point it gets the mean of the face's three points, whatever its interpolation mode. Values
/// at existing points do not change: they are not smoothed, and a mean of unit vectors is shorter than 1.
///
/// \param tolerance  In scene units. Nothing splits if it is NaN or not above 1.1920929e-7, or if all faces fit; data
///                   is removed all the same. A step multiplies the number of faces by 3: if the tolerance is too
///                   small, memory runs out, or isolated places reach the limit of 31 steps.
/// \param object     Reads and rewrites `sPointPosition` (one float3 per point), `sFaceVertex` (one point index per
///                   corner) and `sFaceOffset` (face count + 1 entries), and the counts of `sPointComp`,
///                   `sFaceVertexComp` and `sFaceComp`. Arrays that are shared with other objects are copied, not
///                   modified. To follow the progress of a run, override `setProperty` in a derived class: each pass
///                   that adds points sets every kept property of points once its array has a value for each of them.
///                   On a closed mesh, each new point adds two faces.
/// \pre              A valid mesh whose faces have three corners. If it is not a closed manifold with a consistent
///                   orientation, the behavior is defined, but the result is of little use. Points without a face
///                   become NaN.
/// \return           False if some face has an edge that no face has in the other direction; the mesh has then lost the
///                   removed data and nothing else. This test considers only the first three corners of each face, so
///                   polygon meshes mostly give false too, and so does a missing standard array. If an enclosing oneTBB
///                   task group is cancelled, faces that are too large are left as they are: the result is then true,
///                   with a closed but coarser mesh.
/// \throws           std::bad_alloc, also if a count does not fit 32 bits. std::runtime_error with the text of
///                   `TSR::exceptionMessage` if the job is cancelled, which is checked several times per pass. The mesh
///                   is then unchanged except for the removed data, and for kept point data, whose arrays may already
///                   have another length.
///
/// Runs in parallel over faces and points, with the same result for any number of threads. Each pass is linear in its
/// number of faces, so the run is linear in the size of the result if faces split evenly. Memory peaks at about 100
/// bytes per face of the result, including the result itself, or 130 if the mesh is not a closed manifold.
///
/// Method: Kobbelt, "√3-subdivision", 2000, with points evaluated at any step in closed form.
MODELING_EXPORT bool subdivide(float tolerance, Tessara::Object& object);

}
