#pragma once

#include "ClosedAdjacency.h"

#include <Modeling/subdivisionSteps.h>

namespace Geometry::Mesh::Internal {

/// The arrays of a mesh in refinement; include/Modeling/subdivisionSteps.h describes them.
struct RefinedArrays {
    unsigned int& numPoints;
    unsigned int& numFaceVertices;
    unsigned int& numFaces;
    Orvan::Array<Tessara::Math::float3>& basePositions;
    Orvan::Array<Tessara::Math::float3>& limitPositions;
    Orvan::Array<unsigned char>& vertexLevels;
    Orvan::Array<unsigned int>& faceVertex;
    Orvan::Array<unsigned int>& faceOffset;
    Orvan::Array<unsigned char>& faceStates;
};

/// One pass on a mesh whose adjacency is known and is brought up to date; `subdivide` of subdivisionSteps.h describes the
/// rest, including exceptions.
void subdivide(
    Orvan::Array<bool> const& marks, ClosedAdjacency& adjacency, RefinedArrays const& mesh, Tessara::Object& object);

}
