#include <Modeling/subdivisionSteps.h>

#include "faceSize.h"

#include "frame/Assert.h"
#include "frame/ParallelFor.h"

#include <limits>

namespace Geometry::Mesh::Internal {

using namespace Modeling;
using Tessara::Math::float3;

void markForSubdivision(float tolerance, unsigned int numFaces, Orvan::Array<float3> const& positions,
    Orvan::Array<unsigned int> const& faceVertex, Orvan::Array<unsigned int> const& faceOffset,
    Orvan::Array<bool>& marks)
{
    MODELING_ASSERT(marks.size >= numFaces);
    if (!(tolerance > std::numeric_limits<float>::epsilon()))
        return;
    float3 const* const position = positions.data;
    unsigned int const* const corner = faceVertex.data;
    unsigned int const* const offset = faceOffset.data;
    bool* const mark = marks.data;
    // Each face writes its own mark.
    parallelFor(tbb::blocked_range<unsigned int>(0, numFaces, kFaceGrain), [=](auto const& faces) {
        for (unsigned int face = faces.begin(); face != faces.end(); ++face) {
            unsigned int const* const c = corner + offset[face];
            if (isBoxLonger(position[c[0]], position[c[1]], position[c[2]], broadcast(tolerance + tolerance)))
                mark[face] = true;
        }
    });
}

}
