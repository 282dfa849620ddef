#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>
#include <TessaraMathSupport/Loggers.h>
#include <TessaraMathSupport/Types.h>

namespace Geometry::Mesh {

/// Evens out the edges of a polygon mesh by tangential Laplacian smoothing: each point moves towards the middle of the
/// faces around it, within the plane that touches the surface at the point.
///
/// It is for rounded surfaces whose faces are small compared to their curvature, such as scans, where noise along the
/// surface and uneven edges vanish and the shape changes little. It is not for parts with sharp edges: a point at an edge
/// or a corner slides along the mean of its faces' planes, which is off all of them, so that edges fray, corners retreat,
/// and thin walls may fold over. Where the surface curves, a point leaves it by about the square of its move over twice the
/// radius. Weights of 0 hold the points that have to stay; a flat region between them stays flat.
///
/// `amount` is cut into steps of at most 0.9. In a step of the increment i every point moves by i times the way to a
/// target, without the part of it along the point's normal. The target is the mean of the centroids of the triangles
/// around the point, of this step and all steps before it. The normal is the sum of their normals, weighted by area,
/// likewise running on from step to step. Triangles count as they are, once for each of their corners at the point; of
/// other faces it is those of the two edges at the point with the mean of the corners.
///
/// Points at a boundary move like any other, so that an open mesh shrinks from its boundary; weights pin them.
///
/// \tparam Logger      `CoreGL::OrvanLogger`, `ConsoleLogger` or `NOPLogger`: where each finished step is told
/// \param amount       Without unit; at 0 and below, and where it is not a number, nothing moves.
/// \param pointCount, faceCount  Of the mesh.
/// \param faceVertex   One point index a corner.
/// \param faceOffset   Face count + 1 entries: where the corners of a face begin, and as last entry where all end.
///                     Faces of two corners count as flat, those of none not at all.
/// \param weights      One a point, by which its moves are scaled; below 0 counts as 0, above 1 as 1. Null: 1 for all.
///                     At 0 a point stays where it is.
/// \param positions    One a point; read and changed in place.
/// \pre                Arrays that fit the counts, offsets that ascend within the corners, point indices in range:
///                     undefined otherwise. Corners in front of the first face or behind the last count for nothing.
///                     Every point is of a face: others become not-a-number in the first step, whatever their weight.
/// \throws             std::bad_alloc, with the positions as they were; what the logger throws, after whole steps. Job
///                     cancellation is not looked at.
///
/// Runs in parallel over faces and points; sums are taken by ascending faces, so the result is the same for any number
/// of threads. Linear in the corners for each step (where a face visits a point m times: m times its corners). Takes
/// about 32 bytes a point, 8 a corner (12 at first) and 24 a face, and nothing more with further steps.
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
