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
/// \param valences  of the points before the pass
void computeNewPoints(SettledFaces const& faces, unsigned int const* valences, RefinedPoints const& points);

/// `computePositions` of subdivisionSteps.h for valences and steps that are known.
void computePositions(unsigned int numPoints, unsigned int const* valences, unsigned char const* finestSteps,
    Orvan::Array<Tessara::Math::float3> const& basePositions, Orvan::Array<Tessara::Math::float3> const& limitPositions,
    Orvan::Array<unsigned char> const& vertexLevels, Orvan::Array<Tessara::Math::float3>& positions);

}
