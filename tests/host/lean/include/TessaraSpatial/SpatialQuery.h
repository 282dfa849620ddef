#pragma once

#include <TessaraMathSupport/Types.h>

namespace Tessara::SpatialQuery {

enum PointEdgeOrientation : int {};

PointEdgeOrientation pointEdgeOrientation(Math::float2 const& a, Math::float2 const& b, Math::float2 const& c);
bool pointInTriangle(Math::float2 const& p, Math::float2 const& a, Math::float2 const& b, Math::float2 const& c,
    float& u, float& v, float& w, int* out);

}
