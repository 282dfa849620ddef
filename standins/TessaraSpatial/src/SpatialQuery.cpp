#include <TessaraSpatial/SpatialQuery.h>

namespace Tessara::SpatialQuery::Internal {

TrianglePlace placeInside(double areaA, double areaB, double areaC) noexcept
{
    return areaA == 0.0 ? kOnEdgeBC : areaB == 0.0 ? kOnEdgeCA : areaC == 0.0 ? kOnEdgeAB : kInsideTriangle;
}

TrianglePlace placeNotInside(
    Math::float2 const& p, Math::float2 const& a, Math::float2 const& b, Math::float2 const& c) noexcept
{
    return p == a ? kAtCornerA : p == b ? kAtCornerB : p == c ? kAtCornerC : kOutsideTriangle;
}

}
