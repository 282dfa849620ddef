#pragma once

#include "frame/Lanes.h"

#include <TessaraMathSupport/Types.h>

#include <cstdint>

namespace Geometry::Mesh::Internal {

/// Whether a side of the triangle's box along the axes is longer than in all lanes of `length`, at least 0. Coordinates
/// that are no numbers count as no distance.
inline bool isBoxLonger(Tessara::Math::float3 const& a, Tessara::Math::float3 const& b, Tessara::Math::float3 const& c,
    Modeling::Lanes length)
{
    using namespace Modeling;
    Lanes const p = lanesOf(a), q = lanesOf(b), r = lanesOf(c);
    IntLanes const magnitude = IntLanes{} + INT32_MAX;
    return isAny((lanesWhere(magnitude, q - p) > length) | (lanesWhere(magnitude, r - q) > length)
        | (lanesWhere(magnitude, p - r) > length));
}

}
