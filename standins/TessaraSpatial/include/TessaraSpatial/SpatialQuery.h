#pragma once

#include <TessaraMathSupport/Types.h>
#include <TessaraSpatial/Export.h>

#include <algorithm>
#include <cmath>
#include <limits>

namespace Tessara::SpatialQuery {

// Signed areas are computed in double precision from single-precision coordinates. Their signs are exact if the
// coordinates of a call are multiples of a common unit and span at most 2^26 of it (all integers up to 33 million, all
// floats in [1, 8), ...). Otherwise nearly collinear points may be classified wrongly. Must be compiled without
// contraction to fused multiply-adds: equal points would no longer cancel exactly.
//
// Any number of threads may call these functions. They are inline because they run in inner loops.

/// The direction in which a path turns, seen with x to the right and y up.
enum class PointEdgeOrientation : int { Clockwise = -1, Collinear = 0, CounterClockwise = 1 };

/// Where a point is in relation to a triangle.
enum TrianglePlace : int {
    kOutsideTriangle = -1,
    kInsideTriangle = 0,
    kOnEdgeBC = 1,
    kOnEdgeCA = 2,
    kOnEdgeAB = 3,
    kAtCornerA = 4,
    kAtCornerB = 5,
    kAtCornerC = 6
};

namespace Internal {

    /// Twice the signed area of the triangle o, a, b; positive if it is counter-clockwise. Exchanging a and b gives
    /// exactly the negative value, and two equal points give exactly 0.
    inline double doubledArea(Math::float2 const& o, Math::float2 const& a, Math::float2 const& b)
    {
        double const left = (double{a.x} - o.x) * (double{b.y} - o.y);
        double const right = (double{a.y} - o.y) * (double{b.x} - o.x);
        return left - right;
    }

    /// Classifies a point inside: on an edge if it spans area 0 with that edge, otherwise in the interior. `areaA`
    /// belongs to the edge opposite a, and so on.
    TESSARASPATIAL_EXPORT TrianglePlace placeInside(double areaA, double areaB, double areaC) noexcept;
    /// Classifies a point that is not inside: at the corner that it equals, otherwise outside.
    TESSARASPATIAL_EXPORT TrianglePlace placeNotInside(
        Math::float2 const& p, Math::float2 const& a, Math::float2 const& b, Math::float2 const& c) noexcept;

    inline bool isBetween(float value, float a, float b, float c)
    {
        return value >= std::min({a, b, c}) && value <= std::max({a, b, c});
    }

}

/// How the path from a via b to c turns. `Collinear` also if any two of the points are equal (a path that returns to
/// its start does not turn) or a coordinate is NaN.
inline PointEdgeOrientation pointEdgeOrientation(Math::float2 const& a, Math::float2 const& b, Math::float2 const& c)
{
    double const area = Internal::doubledArea(a, b, c);
    return area > 0.0 ? PointEdgeOrientation::CounterClockwise
        : area < 0.0  ? PointEdgeOrientation::Clockwise
                      : PointEdgeOrientation::Collinear;
}

/// Whether p is in the triangle a, b, c, of either winding, including its edges but excluding its corners. A point on
/// an edge that two triangles share is in both of them, and if signs are exact, there is no gap along that edge. A
/// triangle whose corners are collinear or not all finite contains no point. A point outside the corners' bounding box
/// is never inside, even if areas are rounded, so callers may test the box first.
///
/// \param u, v, w  Always written: the barycentric coordinates of p, the weights of a, b and c, even if p is outside.
///                 Their sum is 1, up to rounding. All 0 if no point can be in the triangle; unspecified if only p is
///                 not finite. If a caller ignores them, the compiler eliminates their computation.
/// \param out      May be null. Otherwise receives the `TrianglePlace` of p: inside or on an edge if the result is
///                 true; outside or at a corner if it is false.
inline bool pointInTriangle(Math::float2 const& p, Math::float2 const& a, Math::float2 const& b, Math::float2 const& c,
    float& u, float& v, float& w, int* out)
{
    double const area = Internal::doubledArea(a, b, c);
    double const whole = std::abs(area);
    bool const hasInside = whole > 0.0 && whole < std::numeric_limits<double>::infinity();
    double const sign = area < 0.0 ? -1.0 : 1.0;
    // All three start from p, so that the two triangles at an edge agree on which side of it p is.
    double const areaA = sign * Internal::doubledArea(p, b, c);
    double const areaB = sign * Internal::doubledArea(p, c, a);
    double const areaC = sign * Internal::doubledArea(p, a, b);
    // The signs are unpredictable, so the first three tests use no branches.
    bool const notOutside = (areaA >= 0.0) & (areaB >= 0.0) & (areaC >= 0.0);
    bool const inside = notOutside && hasInside && p != a && p != b && p != c && Internal::isBetween(p.x, a.x, b.x, c.x)
        && Internal::isBetween(p.y, a.y, b.y, c.y);

    u = hasInside ? static_cast<float>(areaA / whole) : 0.0f;
    v = hasInside ? static_cast<float>(areaB / whole) : 0.0f;
    w = hasInside ? static_cast<float>(areaC / whole) : 0.0f;
    if (out)
        *out = inside ? Internal::placeInside(areaA, areaB, areaC) : Internal::placeNotInside(p, a, b, c);
    return inside;
}

}
