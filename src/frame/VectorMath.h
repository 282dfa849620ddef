#pragma once

#include <TessaraMathSupport/Types.h>

#include <cmath>
#include <limits>

namespace Modeling {

// Single-precision vector arithmetic. The results depend on the order of the operations: keep it.

using Tessara::Math::float3;

inline float3 operator+(float3 const& a, float3 const& b)
{
    return {a.x + b.x, a.y + b.y, a.z + b.z};
}

inline float3 operator-(float3 const& a, float3 const& b)
{
    return {a.x - b.x, a.y - b.y, a.z - b.z};
}

inline float3 operator*(float3 const& v, float factor)
{
    return {v.x * factor, v.y * factor, v.z * factor};
}

inline float dot(float3 const& a, float3 const& b)
{
    return (a.x * b.x + a.y * b.y) + a.z * b.z;
}

inline float3 cross(float3 const& a, float3 const& b)
{
    return {a.y * b.z - a.z * b.y, a.z * b.x - a.x * b.z, a.x * b.y - a.y * b.x};
}

inline float length(float3 const& v)
{
    return std::sqrt(dot(v, v));
}

/// The vector scaled to length 1; unchanged if its length is NaN or not above the smallest normal float.
inline float3 safeNormalize(float3 const& v)
{
    float const norm = length(v);
    return norm > std::numeric_limits<float>::min() ? v * (1.0f / norm) : v;
}

}
