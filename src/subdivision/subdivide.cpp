#include <Modeling/subdivide.h>

#include "refineMesh.h"

#include <Modeling/subdivisionSteps.h>

namespace Geometry::Mesh {

bool subdivide(float tolerance, Tessara::Object& object)
{
    auto const markLargeFaces = [=](Internal::MarkableMesh const& mesh, Orvan::Array<bool>& marks) {
        Internal::markForSubdivision(
            tolerance, mesh.faceCount, mesh.positions, mesh.faceVertex, mesh.faceOffset, marks);
    };
    return Internal::refineMesh(markLargeFaces, object);
}

}
