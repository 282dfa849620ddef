#pragma once

#include <OrvanCore/Array.h>

namespace Modeling {

/// The face corners at each point: those of point p are entries `offsets[p]` up to `offsets[p + 1]` of `corners`, in
/// ascending order, so the corner of the lowest face comes first.
struct PointCorners {
    Orvan::Array<unsigned int> offsets; // point count + 1
    Orvan::Array<unsigned int> corners;
};

/// Lists the corners at each point. Takes linear time whatever the valences, and gives the same result for any number
/// of threads. Corners whose point is not below `pointCount` are left out.
/// \param faceVertex  the point of each corner, `cornerCount` entries; `cornerCount` fits 32 bits
PointCorners cornersByPoint(unsigned int pointCount, unsigned int const* faceVertex, std::size_t cornerCount);

}
