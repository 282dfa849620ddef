#pragma once

#include <TessaraMathSupport/Types.h>

#include <cmath>

namespace Geometry::Mesh::Internal {

/// The longest side of the triangle's box along the axes. Coordinates that are no numbers count as no distance.
inline float longestBoxSide(
    Tessara::Math::float3 const& a, Tessara::Math::float3 const& b, Tessara::Math::float3 const& c)
{
    float longest = 0;
    for (float const side :
        {b.x - a.x, b.y - a.y, b.z - a.z, c.x - b.x, c.y - b.y, c.z - b.z, a.x - c.x, a.y - c.y, a.z - c.z})
        longest = std::abs(side) > longest ? std::abs(side) : longest;
    return longest;
}

}
