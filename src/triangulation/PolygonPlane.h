#pragma once

#include "frame/VectorMath.h"

#include <TessaraMathSupport/Types.h>
#include <TessaraSpatial/SpatialQuery.h>

#include <cmath>
#include <cstddef>
#include <limits>
#include <optional>
#include <span>

namespace Modeling::Internal {

// The measurements of ear clipping: the plane of a polygon, and the sharpness of a corner. They are inline because they
// are called per corner.

using Tessara::Math::float2;

// Squared length of the normal, whose length is twice the area. Not relative to the size of the polygon: faces below it
// become fans, and existing scenes depend on it.
inline constexpr float kFlat = 1e-8f;
inline constexpr float kUpsideDown = 1e-5f; // 1 plus the z of a unit normal that is nearly -z

/// Its length is twice the area of the polygon.
inline float3 newellNormal(std::span<float3 const> corners)
{
    float3 normal{0, 0, 0};
    float3 const* previous = &corners.back();
    for (std::size_t i = 0; i != corners.size(); ++i) {
        float3 const& corner = corners[i];
        float3 const& next = corners[i + 1 == corners.size() ? 0 : i + 1];
        normal.z += (next.y - previous->y) * corner.x;
        normal.x += (next.z - previous->z) * corner.y;
        normal.y += (next.x - previous->x) * corner.z;
        previous = &corner;
    }
    return normal;
}

struct Quaternion {
    float x, y, z, w;
};

/// The shortest rotation from a unit normal to +z.
inline Quaternion rotationToZ(float3 const& normal)
{
    float const w = normal.z + 1;
    if (kUpsideDown > w)
        return {normal.z, -normal.y, normal.x, 0}; // a half-turn; not normalized: results depend on it
    float const norm = std::sqrt((normal.y * normal.y + normal.x * normal.x) + w * w);
    return {normal.y / norm, -normal.x / norm, 0, w / norm};
}

/// x and y of the rotated point: the Hamilton product of q and (p, 0), and its product with the conjugate of q.
/// Products with the 0 are left out; they could change only the sign of a zero.
inline float2 rotateAndDropZ(Quaternion const& q, float3 const& p)
{
    float const x = (q.w * p.x + q.y * p.z) - q.z * p.y;
    float const y = (q.w * p.y + q.z * p.x) - q.x * p.z;
    float const z = (q.w * p.z + q.x * p.y) - q.y * p.x;
    float const w = (-(q.x * p.x) - q.y * p.y) - q.z * p.z;
    return {((x * q.w - w * q.x) - y * q.z) + z * q.y, ((y * q.w - w * q.y) - z * q.x) + x * q.z};
}

/// The rotation of the polygon into a plane parallel to z = 0, in which it is counter-clockwise; nullopt if the polygon
/// is too small to have a plane.
inline std::optional<Quaternion> findPlane(std::span<float3 const> corners)
{
    float3 const normal = newellNormal(corners);
    float const squaredLength = dot(normal, normal);
    if (kFlat > squaredLength)
        return std::nullopt;
    float const norm = std::sqrt(squaredLength);
    return rotationToZ({normal.x / norm, normal.y / norm, normal.z / norm});
}

/// The sharpness of a corner, from the unit vectors along the edges that enter and leave it: 1 minus the cosine of the
/// inner angle in space. Less is sharper: 0 for a needle, 2 for a straight line.
inline float sharpnessBetween(float3 const& entering, float3 const& leaving)
{
    // The direction back to the previous corner is minus `entering`, to the bit.
    float const sharpness = 1 + dot(leaving, entering);
    float const atMost2 = 2.0f > sharpness ? sharpness : 2.0f; // also if it is NaN
    return atMost2 > 0.0f ? atMost2 : 0.0f;
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
