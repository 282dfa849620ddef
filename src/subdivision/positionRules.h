#pragma once

#include "SettledFaces.h"

#include <TessaraMathSupport/Types.h>

namespace Geometry::Mesh::Internal {

/// The arrays of points, already resized for the new ones.
struct RefinedPoints {
    Tessara::Math::float3* basePositions;
    Tessara::Math::float3* limitPositions;
    unsigned char* levels;
};

/// Fills the entries of the new points.
void computeNewPoints(SettledFaces const& faces, RefinedPoints const& points);

}
