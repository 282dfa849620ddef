#pragma once

#include <TessaraMathSupport/Types.h>

#include <algorithm>
#include <cmath>

namespace ModelingProgram {

// Vector arithmetic for all folders of the program, in double precision unless stated otherwise.

using Tessara::Math::double3;
using Tessara::Math::float3;

inline double3 inDoubles(float3 const& a)
{
    return {a.x, a.y, a.z};
}

inline double3 operator+(double3 const& a, double3 const& b)
{
    return {a.x + b.x, a.y + b.y, a.z + b.z};
}

inline double3 operator-(double3 const& a, double3 const& b)
{
    return {a.x - b.x, a.y - b.y, a.z - b.z};
}

inline double dot(double3 const& a, double3 const& b)
{
    return a.x * b.x + a.y * b.y + a.z * b.z;
}

inline double3 cross(double3 const& a, double3 const& b)
{
    return {a.y * b.z - a.z * b.y, a.z * b.x - a.x * b.z, a.x * b.y - a.y * b.x};
}

inline double length(double3 const& a)
{
    return std::sqrt(dot(a, a));
}

inline bool isFinite(float3 const& p)
{
    return std::isfinite(p.x) && std::isfinite(p.y) && std::isfinite(p.z);
}

/// The lower corner of the box around two points.
template <class Vector> Vector lowerCorner(Vector const& a, Vector const& b)
{
    return {std::min(a.x, b.x), std::min(a.y, b.y), std::min(a.z, b.z)};
}

/// The upper corner of the box around two points.
template <class Vector> Vector upperCorner(Vector const& a, Vector const& b)
{
    return {std::max(a.x, b.x), std::max(a.y, b.y), std::max(a.z, b.z)};
}

inline double distance(float3 const& a, float3 const& b)
{
    return std::hypot(double{a.x} - b.x, double{a.y} - b.y, double{a.z} - b.z);
}

/// In single precision, without intermediate overflow.
inline float distanceInFloats(float3 const& a, float3 const& b)
{
    return std::hypot(b.x - a.x, b.y - a.y, b.z - a.z);
}

/// In single precision; its square root is rounded exactly as the library rounds edge lengths.
inline float squaredEdgeLengthInFloats(float3 const& a, float3 const& b)
{
    float3 const d{b.x - a.x, b.y - a.y, b.z - a.z};
    return (d.x * d.x + d.y * d.y) + d.z * d.z;
}

}
