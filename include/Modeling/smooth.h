#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>
#include <TessaraMathSupport/Loggers.h>
#include <TessaraMathSupport/Types.h>

namespace Geometry::Mesh {

/// Evens out the edge lengths of a polygon mesh by tangential Laplacian smoothing: each point moves toward the mean of
/// the centroids of the faces around it, within the tangent plane of the surface at the point.
///
/// Meant for rounded surfaces whose faces are small compared to the radius of curvature, such as scans: noise along the
/// surface and uneven edge lengths vanish, and the shape changes little. Not meant for parts with sharp edges: a point
/// on an edge or at a corner slides along the mean of the planes of its faces, which is none of them, so that edges
/// fray, corners retreat, and thin walls may fold over. Where the surface curves, a point leaves it by about the square
/// of its move divided by twice the radius of curvature. Points with weight 0 stay in place, and a flat region between
/// them stays flat.
///
/// `amount` is divided into steps of at most 0.9. In a step of increment i, each point moves by i times the vector to
/// its target, without the component along the point's normal. The target is the mean of the centroids of the triangles
/// around the point, and the normal is the area-weighted sum of their normals; both accumulate over all steps so far.
/// A triangle counts once for each of its corners at the point. Any other face counts as a fan of triangles around the
/// mean of its corners, of which those at the two edges of the point are used.
///
/// Boundary points move like all others, so that an open mesh shrinks from its boundary; pin them with weights.
///
/// \tparam Logger      `CoreGL::OrvanLogger`, `ConsoleLogger` or `NOPLogger`, to which each finished step is reported
/// \param amount       Dimensionless. Nothing moves if it is 0, negative or NaN.
/// \param pointCount, faceCount  Number of points and faces of the mesh.
/// \param faceVertex   One point index per corner.
/// \param faceOffset   Face count + 1 entries: the first corner of each face, and the end of the last one. Faces with
///                     one or two corners count as degenerate polygons; faces without corners are ignored.
/// \param weights      One factor per point for its moves, clamped to [0, 1]; points with 0 stay in place, points
///                     with NaN become NaN. Null means 1 for all.
/// \param positions    One per point, in any unit; modified in place.
/// \pre                Arrays that fit the counts, non-decreasing offsets within the corners, and point indices in
///                     range; otherwise the behavior is undefined. Corners before the first face or after the last one
///                     are ignored. Each point belongs to a face: other points become NaN in the first step, whatever
///                     their weight.
/// \throws             std::bad_alloc, with the positions unchanged unless oneTBB itself runs out of memory during a
///                     step; what the logger throws, after a whole step. Job cancellation is ignored.
///
/// Runs in parallel over parts of the points: ranges of consecutive indices, several per thread. Sums are taken over
/// ascending faces, so the result is the same for any number of threads. Each step is linear in the number of corners,
/// times the number of parts in which a face has points: 1 for most faces if neighboring points have similar indices,
/// up to 3 for triangles otherwise. A face that visits a point m times costs m times its corners more. Allocates about
/// 40 bytes per point and 4 per face and part, and 1 per corner if there are faces other than triangles, whatever the
/// number of steps.
///
/// Tangential smoothing: Botsch, Kobbelt, "A remeshing approach to multiresolution modeling", 2004.
template <class Logger> void smooth(float amount, unsigned int pointCount, unsigned int faceCount,
    Orvan::Array<unsigned int> const& faceVertex, Orvan::Array<unsigned int> const& faceOffset,
    Orvan::Array<float> const* weights, Orvan::Array<Tessara::Math::float3>& positions, Logger const& logger);

extern template MODELING_EXPORT void smooth(float, unsigned int, unsigned int, Orvan::Array<unsigned int> const&,
    Orvan::Array<unsigned int> const&, Orvan::Array<float> const*, Orvan::Array<Tessara::Math::float3>&,
    CoreGL::OrvanLogger const&);
extern template MODELING_EXPORT void smooth(float, unsigned int, unsigned int, Orvan::Array<unsigned int> const&,
    Orvan::Array<unsigned int> const&, Orvan::Array<float> const*, Orvan::Array<Tessara::Math::float3>&,
    CoreGL::ConsoleLogger const&);
extern template MODELING_EXPORT void smooth(float, unsigned int, unsigned int, Orvan::Array<unsigned int> const&,
    Orvan::Array<unsigned int> const&, Orvan::Array<float> const*, Orvan::Array<Tessara::Math::float3>&,
    CoreGL::NOPLogger const&);

}
