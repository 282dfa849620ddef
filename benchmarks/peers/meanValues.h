#pragma once

#include <OrvanCore/Array.h>
#include <TessaraMathSupport/Types.h>

#include <functional>
#include <vector>

namespace Benchmarks {

/// Polygons in the plane, each with points inside it.
struct DrawnPolygon {
    Orvan::Array<Tessara::Math::float3> corners;
    Orvan::Array<Tessara::Math::float3> points;
};

/// Computes the mean value coordinates of all points, with storage that it keeps from run to run.
std::function<void()> cgalMeanValuesInFloat(std::vector<DrawnPolygon> const& polygons);
std::function<void()> cgalMeanValuesInDouble(std::vector<DrawnPolygon> const& polygons);

}
