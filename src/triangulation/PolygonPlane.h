#pragma once

#include "frame/Lanes.h"
#include "frame/VectorMath.h"

#include <TessaraMathSupport/Types.h>
#include <TessaraSpatial/SpatialQuery.h>

#include <cmath>
#include <cstddef>
#include <limits>
#include <optional>
#include <span>

namespace Modeling {

inline float squareRoot(float value)
{
    return std::sqrt(value);
}

/// Four vectors, one per lane.
struct LaneVectors {
    Lanes x, y, z;
};

/// Four points in a plane, one per lane.
struct LanePoints {
    Lanes x, y;
};

inline LaneVectors operator-(LaneVectors const& a, LaneVectors const& b)
{
    return {a.x - b.x, a.y - b.y, a.z - b.z};
}

inline Lanes dot(LaneVectors const& a, LaneVectors const& b)
{
    return (a.x * b.x + a.y * b.y) + a.z * b.z;
}

inline LaneVectors safeNormalize(LaneVectors const& v)
{
    Lanes const norm = squareRoot(dot(v, v)), inverse = 1.0f / norm;
    IntLanes const isSafe = norm > broadcast(std::numeric_limits<float>::min());
    return {isSafe ? v.x * inverse : v.x, isSafe ? v.y * inverse : v.y, isSafe ? v.z * inverse : v.z};
}

}

namespace Modeling::Internal {

// The measurements of ear clipping: the plane of a polygon, and the sharpness of a corner. They are inline because they
// are called per corner. Lanes give the same bits as scalars because both run the same operations.

using Tessara::Math::float2;

// Squared length of the normal, whose length is twice the area. Not relative to the size of the polygon: faces below it
// become fans, and existing scenes depend on it.
inline constexpr float kFlat = 1e-8f;
inline constexpr float kUpsideDown = 1e-5f; // 1 plus the z of a unit normal that is nearly -z

// What follows is for one polygon, with `Vector` a `float3`, or for four, with `LaneVectors`.

/// A coordinate: a float, or four of them in lanes.
template <class Vector> using CoordinateOf = decltype(Vector::x);

/// Its length is twice the area of the polygon.
template <class Vector> Vector newellNormal(std::span<Vector const> corners)
{
    CoordinateOf<Vector> const zero{};
    Vector normal{zero, zero, zero};
    Vector const* previous = &corners.back();
    for (std::size_t i = 0; i != corners.size(); ++i) {
        Vector const& corner = corners[i];
        Vector const& next = corners[i + 1 == corners.size() ? 0 : i + 1];
        normal.z += (next.y - previous->y) * corner.x;
        normal.x += (next.z - previous->z) * corner.y;
        normal.y += (next.x - previous->x) * corner.z;
        previous = &corner;
    }
    return normal;
}

template <class Coordinate> struct BasicQuaternion {
    Coordinate x, y, z, w;
};
using Quaternion = BasicQuaternion<float>;

/// The shortest rotation from a unit normal to +z.
template <class Vector> BasicQuaternion<CoordinateOf<Vector>> rotationToZ(Vector const& normal)
{
    using Coordinate = CoordinateOf<Vector>;
    Coordinate const zero{}, w = normal.z + 1.0f;
    Coordinate const norm = squareRoot((normal.y * normal.y + normal.x * normal.x) + w * w);
    auto const isUpsideDown = zero + kUpsideDown > w;
    // Upside down, a half-turn; not normalized: results depend on it.
    return {isUpsideDown ? normal.z : normal.y / norm, isUpsideDown ? -normal.y : -normal.x / norm,
        isUpsideDown ? normal.x : zero, isUpsideDown ? zero : w / norm};
}

/// x and y of the rotated point: the Hamilton product of q and (p, 0), and its product with the conjugate of q.
/// Products with the 0 are left out; they could change only the sign of a zero.
template <class Point, class Coordinate, class Vector>
Point rotateAndDropZ(BasicQuaternion<Coordinate> const& q, Vector const& p)
{
    Coordinate const x = (q.w * p.x + q.y * p.z) - q.z * p.y;
    Coordinate const y = (q.w * p.y + q.z * p.x) - q.x * p.z;
    Coordinate const z = (q.w * p.z + q.x * p.y) - q.y * p.x;
    Coordinate const w = (-(q.x * p.x) - q.y * p.y) - q.z * p.z;
    return {((x * q.w - w * q.x) - y * q.z) + z * q.y, ((y * q.w - w * q.y) - z * q.x) + x * q.z};
}

/// The rotation of a polygon into a plane parallel to z = 0, in which it is counter-clockwise.
/// \param squaredLength  of the normal, below which polygons are flat
template <class Vector>
BasicQuaternion<CoordinateOf<Vector>> rotationOf(Vector const& normal, CoordinateOf<Vector> squaredLength)
{
    CoordinateOf<Vector> const norm = squareRoot(squaredLength);
    return rotationToZ(Vector{normal.x / norm, normal.y / norm, normal.z / norm});
}

/// nullopt if the polygon is too small to have a plane.
inline std::optional<Quaternion> findPlane(std::span<float3 const> corners)
{
    float3 const normal = newellNormal(corners);
    float const squaredLength = dot(normal, normal);
    if (kFlat > squaredLength)
        return std::nullopt;
    return rotationOf(normal, squaredLength);
}

/// The sharpness of a corner, from the unit vectors along the edges that enter and leave it: 1 minus the cosine of the
/// inner angle in space. Less is sharper: 0 for a needle, 2 for a straight line.
template <class Vector> CoordinateOf<Vector> sharpnessBetween(Vector const& entering, Vector const& leaving)
{
    // The direction back to the previous corner is minus `entering`, to the bit.
    CoordinateOf<Vector> const zero{}, two = zero + 2.0f, sharpness = 1.0f + dot(leaving, entering);
    CoordinateOf<Vector> const atMost2 = two > sharpness ? sharpness : two; // also if it is NaN
    return atMost2 > zero ? atMost2 : zero;
}

inline constexpr float kNoEar = std::numeric_limits<float>::infinity(); // the sharpness of corners that are not ears
/// A later ear must be sharper than an earlier one by more than this to be cut first.
inline constexpr float kSharper = 0.0001f;

/// Whether the path from a via b to c makes a strict counter-clockwise turn, for which the host's answer is 1.
inline bool isCounterClockwise(float2 const& a, float2 const& b, float2 const& c)
{
    return static_cast<int>(Tessara::SpatialQuery::pointEdgeOrientation(a, b, c)) == 1;
}

}
