#pragma once

#include "frame/Lanes.h"

#include <TessaraMathSupport/Types.h>

namespace Geometry::Mesh::Internal {

/// Whether some side of the triangle's axis-aligned bounding box is longer than `length`, which is the same in all
/// lanes and not negative. A difference of coordinates that is NaN counts as 0.
inline bool isBoxLonger(Tessara::Math::float3 const& a, Tessara::Math::float3 const& b, Tessara::Math::float3 const& c,
    Modeling::Lanes length)
{
    using namespace Modeling;
    Lanes const p = load(a), q = load(b), r = load(c);
    return any((Modeling::abs(q - p) > length) | (Modeling::abs(r - q) > length) | (Modeling::abs(p - r) > length));
}

}
