#pragma once

#include <TessaraMathSupport/Types.h>

#include <cmath>

namespace ModelingProgram {

// Vectors in double precision, for what the program measures itself.

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

}
