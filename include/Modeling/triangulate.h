#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/String.h>
#include <TessaraObject/Object.h>

namespace Geometry::Mesh {

/// Replaces every face of a mesh by triangles, and takes the properties of its faces and corners along.
///
/// A face with n corners becomes n - 2 triangles between its own corners: no point is added, moved or removed. It is
/// cut by clipping ears, the sharpest first, in the plane of its normal; concave faces, collinear corners and holes on
/// bridges are welcome, and triangles come out as they were. The triangles are the fan from the first corner where a
/// face covers less than 5e-5 square units (whatever its shape), and where the ears run out before the end: faces that
/// intersect themselves, or have two equal corners in a row. The triangles keep the winding of their face and stand in
/// the order of the faces. A face with two corners or fewer vanishes.
///
/// \param channels  Which properties of faces and corners to keep: names and patterns, separated by blanks or commas,
///                  `*` for any characters, `?` for one; a leading `^` or `-` excludes, and the last entry that matches
///                  a name decides. "*" keeps all. What is not kept is removed, together with the properties that
///                  target it (the data of a range). A malformed entry counts as not there. Properties of points stay.
/// \param mesh      Reads `sPointPosition` (one float3 a point, in scene units); rewrites `sFaceVertex` (one point
///                  index a corner), `sFaceOffset` (face count + 1 entries) and the counts of `sFaceVertexComp` and
///                  `sFaceComp`. Each triangle gets a copy of its face's value, each corner that of the corner it was:
///                  of data of the 36 core element types, and of the indices of ranges. Data of `GeometryType`,
///                  `GeoLocation`, `FaceEdge` and `GraphTransforms` that is kept stays as it is, with its old length.
///                  What is missing in an array that is too short counts as zero. Other holders of the arrays see no
///                  change.
/// \pre             Offsets that ascend within the corners; a face whose offsets do not counts as one without corners.
///                  Point indices in range; others are undefined. A mesh that lacks one of the three arrays, or has one
///                  that is too short for its count, is left as it was.
/// \throws          std::bad_alloc, also where there would be more than 2^32 - 1 corners, with the mesh as it was. Job
///                  cancellation is not looked at.
///
/// Runs in parallel over faces, with the same result for any number of threads. Linear in the corners of faces of
/// ordinary size; quadratic in the corners of one face at worst. Beside the new arrays it takes one index a face and
/// one a new corner.
///
/// Ear clipping: Meisters, "Polygons have ears", 1975.
MODELING_EXPORT void triangulate(Orvan::String const& channels, Tessara::Object& mesh);

}
