#pragma once

#include "frame/Lanes.h"

#include <TessaraMathSupport/Types.h>

namespace Geometry::Mesh::Internal {

/// Whether some side of the triangle's axis-aligned box is longer than `length`, a value >= 0 in all lanes. A difference
/// that is NaN counts as 0.
inline bool isBoxLonger(Tessara::Math::float3 const& a, Tessara::Math::float3 const& b, Tessara::Math::float3 const& c,
    Modeling::Lanes length)
{
    using namespace Modeling;
    Lanes const p = load(a), q = load(b), r = load(c);
    return any((Modeling::abs(q - p) > length) | (Modeling::abs(r - q) > length) | (Modeling::abs(p - r) > length));
}

}
