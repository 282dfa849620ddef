#pragma once

#include <OrvanCore/Array.h>

namespace Modeling {

/// The face corners at each point: those of point p are entries `offsets[p]` up to `offsets[p + 1]` of `corners`, in
/// ascending order, so first the corner of the lowest face.
struct PointCorners {
    Orvan::Array<unsigned int> offsets; // point count + 1
    Orvan::Array<unsigned int> corners;
};

/// Lists the corners at each point. Linear, also around points with any number of faces; the same result for any number
/// of threads. Corners whose point is `pointCount` or above are listed nowhere.
/// \param faceVertex  the point of each corner, `cornerCount` entries; the corners fit 32 bits
PointCorners cornersByPoint(unsigned int pointCount, unsigned int const* faceVertex, std::size_t cornerCount);

}
