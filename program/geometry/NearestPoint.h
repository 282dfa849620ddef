#pragma once

#include "Vectors.h"

#include <array>

namespace ModelingProgram {

/// A corner of a triangle, and a number that is interpolated over the triangle.
struct Corner {
    double3 position;
    double number;
};
using Triangle = std::array<Corner, 3>;

inline Corner blend(Corner const& a, Corner const& b, double t)
{
    auto const between = [t](double from, double to) { return from + t * (to - from); };
    return {
        {between(a.position.x, b.position.x), between(a.position.y, b.position.y), between(a.position.z, b.position.z)},
        between(a.number, b.number)};
}

/// The point of a triangle nearest to `p`. Ericson, "Real-Time Collision Detection", 2005, section 5.1.5.
inline Corner nearestOf(Triangle const& triangle, double3 const& p)
{
    auto const& [a, b, c] = triangle;
    double3 const ab = b.position - a.position, ac = c.position - a.position;
    double3 const ap = p - a.position, bp = p - b.position, cp = p - c.position;
    double const abA = dot(ab, ap), acA = dot(ac, ap);
    if (abA <= 0 && acA <= 0)
        return a;
    double const abB = dot(ab, bp), acB = dot(ac, bp);
    if (abB >= 0 && acB <= abB)
        return b;
    double const areaC = abA * acB - abB * acA;
    if (areaC <= 0 && abA >= 0 && abB <= 0)
        return blend(a, b, abA / (abA - abB));
    double const abC = dot(ab, cp), acC = dot(ac, cp);
    if (acC >= 0 && abC <= acC)
        return c;
    double const areaB = abC * acA - abA * acC;
    if (areaB <= 0 && acA >= 0 && acC <= 0)
        return blend(a, c, acA / (acA - acC));
    double const areaA = abB * acC - abC * acB;
    double const beyondB = acB - abB, beyondC = abC - acC;
    if (areaA <= 0 && beyondB >= 0 && beyondC >= 0)
        return blend(b, c, beyondB / (beyondB + beyondC));
    double const area = areaA + areaB + areaC, v = areaB / area, w = areaC / area;
    return {
        {a.position.x + ab.x * v + ac.x * w, a.position.y + ab.y * v + ac.y * w, a.position.z + ab.z * v + ac.z * w},
        a.number + (b.number - a.number) * v + (c.number - a.number) * w};
}

}
