#pragma once

#include "SettledFaces.h"

#include <TessaraMathSupport/Types.h>

namespace Geometry::Mesh::Internal {

/// The arrays of points, with room for the new ones.
struct RefinedPoints {
    Tessara::Math::float3* basePositions;
    Tessara::Math::float3* limitPositions;
    unsigned char* levels;
};

/// Fills the entries of the points in the middle of faces.
void computeNewPoints(SettledFaces const& faces, RefinedPoints const& points);

}
