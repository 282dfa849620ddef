#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/String.h>
#include <TessaraObject/Object.h>

namespace Geometry::Mesh {

/// Replaces every face of a mesh by triangles, and transfers the properties of its faces and corners.
///
/// A face with n corners becomes n - 2 triangles between its own corners: no point is added, moved or removed. Faces
/// are cut by ear clipping, sharpest ear first, in the plane of the face normal. Faces may be concave, have collinear
/// corners, or have holes connected by bridges; triangles are kept as they are. A face is cut into a fan from its
/// first corner if its area is below 5e-5 square scene units, whatever its shape, or if ear clipping runs out of ears,
/// as in faces that intersect themselves or have two equal consecutive corners. The triangles have the winding of their
/// face and come in the order of the faces. Faces with two corners or fewer are removed.
///
/// \param channels  Which properties of faces and corners to keep: names and patterns, separated by blanks or commas,
///                  with `*` for any characters and `?` for one; a leading `^` or `-` excludes, and the last entry that
///                  matches a name decides. "*" keeps all. Other properties are removed together with the properties
///                  that target them (the data of a range). Malformed entries are ignored. Properties of points are
///                  kept.
/// \param mesh      Reads `sPointPosition` (one float3 per point, in scene units); rewrites `sFaceVertex` (one point
///                  index per corner), `sFaceOffset` (face count + 1 entries) and the counts of `sFaceVertexComp` and
///                  `sFaceComp`. Each triangle receives a copy of the value of its face, and each corner of a triangle
///                  the value of the face corner that it comes from. This holds for data of the 36 scalar, vector,
///                  matrix and string types, and for the indices of ranges. Data of `GeometryType`, `GeoLocation`,
///                  `FaceEdge` and `GraphTransforms` that is kept remains as it is, with its old length. Values beyond
///                  the end of an array that is too short count as zero. Objects that share the arrays see no change.
/// \pre             Non-decreasing offsets within the corners; a face whose offsets violate this counts as one without
///                  corners. Point indices in range; otherwise the behavior is undefined. A mesh that lacks one of the
///                  three arrays, or has one that is too short for its count, is left unchanged.
/// \throws          std::bad_alloc, also if there would be more than 2^32 - 1 corners, with the mesh unchanged. Job
///                  cancellation is ignored.
///
/// Runs in parallel over faces, with the same result for any number of threads. Linear in the number of corners for
/// faces of ordinary size, and quadratic in the number of corners of a single face in the worst case. In addition to
/// the new arrays it allocates one index per face and one per new corner.
///
/// Ear clipping: Meisters, "Polygons have ears", 1975.
MODELING_EXPORT void triangulate(Orvan::String const& channels, Tessara::Object& mesh);

}
