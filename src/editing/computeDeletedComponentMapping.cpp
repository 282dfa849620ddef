#include <Modeling/computeDeletedComponentMapping.h>

#include "KeptElements.h"
#include "frame/Assert.h"

#include <TessaraGeometry/Names.h>

namespace Tessara::GeometryAlgorithms {

Orvan::Array<unsigned int> computeDeletedComponentMapping(Orvan::Array<bool> const& deleted)
{
    MODELING_ASSERT(deleted.size < Geometry::kDeletedElement);
    return Modeling::Internal::KeptElements(deleted).remap();
}

}
