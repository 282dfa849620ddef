#include "MeshArrays.h"

#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Names.h>

#include <algorithm>

namespace ModelingProgram {

unsigned int MeshArrays::faceOf(unsigned int corner) const
{
    // The last face that begins at or before the corner contains it, since faces without corners end where they begin.
    unsigned int const* const after = std::upper_bound(faceOffset->begin(), faceOffset->end(), corner);
    return static_cast<unsigned int>(after - faceOffset->begin() - 1);
}

unsigned int MeshArrays::nextCorner(unsigned int corner) const
{
    unsigned int const face = faceOf(corner);
    return corner + 1 == (*faceOffset)[face + 1] ? (*faceOffset)[face] : corner + 1;
}

MeshArrays arraysOf(Tessara::Object const& mesh)
{
    using namespace Tessara::Geometry;
    return {dataOf<float3>(mesh, sPointPosition), dataOf<unsigned int>(mesh, sFaceVertex),
        dataOf<unsigned int>(mesh, sFaceOffset)};
}

}
