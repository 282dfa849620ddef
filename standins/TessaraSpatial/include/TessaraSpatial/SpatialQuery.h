#pragma once

#include <TessaraMathSupport/Types.h>
#include <TessaraSpatial/Export.h>

#include <algorithm>
#include <cmath>
#include <limits>

namespace Tessara::SpatialQuery {

// Signed areas are computed in double precision from the single-precision coordinates. Their signs are exact as long as
// the coordinates that meet in a call are multiples of one unit of length and span at most 2^26 of it (all whole
// numbers up to 33 million, all floats in [1, 8), ...). Beyond that a turn that is almost none may come out as another
// one. To be compiled without contraction to fused multiply-adds: equal points would no longer cancel exactly.
//
// Any number of threads may call these. They are inline because they run in inner loops.

/// Which way a path turns, seen with x to the right and y up.
enum class PointEdgeOrientation : int { Clockwise = -1, Collinear = 0, CounterClockwise = 1 };

/// Where a point lies in relation to a triangle; an edge is named for the corner that it does not touch.
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

    /// Twice the signed area of o, a, b; positive when they turn counter-clockwise. Exchanging a and b gives exactly
    /// the negative value, and two equal points give exactly 0.
    inline double doubledArea(Math::float2 const& o, Math::float2 const& a, Math::float2 const& b)
    {
        double const left = (double{a.x} - o.x) * (double{b.y} - o.y);
        double const right = (double{a.y} - o.y) * (double{b.x} - o.x);
        return left - right;
    }

    /// For a point inside: strictly so, or the edge for which its area (of the part against a, b, c) is 0.
    TESSARASPATIAL_EXPORT TrianglePlace placeInside(double areaA, double areaB, double areaC) noexcept;
    /// For a point that is not inside: the corner that it equals, if any.
    TESSARASPATIAL_EXPORT TrianglePlace placeNotInside(
        Math::float2 const& p, Math::float2 const& a, Math::float2 const& b, Math::float2 const& c) noexcept;

    inline bool isBetween(float value, float a, float b, float c)
    {
        return value >= std::min({a, b, c}) && value <= std::max({a, b, c});
    }

}

/// How the path from a over b to c turns. `Collinear` also where any two of the points are equal (a path that comes
/// back to its start never counts as a turn) and where a coordinate is not a number.
inline PointEdgeOrientation pointEdgeOrientation(Math::float2 const& a, Math::float2 const& b, Math::float2 const& c)
{
    double const area = Internal::doubledArea(a, b, c);
    return area > 0.0 ? PointEdgeOrientation::CounterClockwise
        : area < 0.0  ? PointEdgeOrientation::Clockwise
                      : PointEdgeOrientation::Collinear;
}

/// Whether p lies in the triangle a, b, c, of either winding, edges included; but a point that equals a corner does
/// not. Points on an edge that two triangles share are in both of them, and no point falls between the two (where the
/// signs are exact). Nothing lies in a triangle whose corners are collinear or not all finite, and, however areas
/// round, no point outside the corners' bounding box does: callers may look at that first.
///
/// \param u, v, w  Always written: the barycentric values of p, the weights of a, b and c, also for p outside. They add
///                 up to 1 but for rounding. All 0 where nothing can lie in the triangle; without meaning where only p
///                 is not finite. A caller that ignores them does not pay for them.
/// \param out      May be null. Otherwise receives the `TrianglePlace` of p: inside or on an edge where the result is
///                 true; outside or at a corner where it is false.
inline bool pointInTriangle(Math::float2 const& p, Math::float2 const& a, Math::float2 const& b, Math::float2 const& c,
    float& u, float& v, float& w, int* out)
{
    double const area = Internal::doubledArea(a, b, c);
    double const whole = std::abs(area);
    bool const hasInside = whole > 0.0 && whole < std::numeric_limits<double>::infinity();
    double const sign = area < 0.0 ? -1.0 : 1.0;
    // All three start from p, so that the two triangles at an edge agree about the side of it on which p lies.
    double const areaA = sign * Internal::doubledArea(p, b, c);
    double const areaB = sign * Internal::doubledArea(p, c, a);
    double const areaC = sign * Internal::doubledArea(p, a, b);
    // The signs are as good as random to a branch predictor, so that the first three tests go without a branch.
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
