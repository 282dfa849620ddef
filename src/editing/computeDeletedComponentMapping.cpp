#include <Modeling/computeDeletedComponentMapping.h>

#include "frame/Arrays.h"
#include "frame/Assert.h"

#include <TessaraGeometry/Names.h>

namespace Tessara::GeometryAlgorithms {

Orvan::Array<unsigned int> computeDeletedComponentMapping(Orvan::Array<bool> const& deleted)
{
    MODELING_ASSERT(deleted.size < Geometry::kDeletedElement);
    Orvan::Array<unsigned int> remap = Modeling::uninitializedArray<unsigned int>(deleted.size);
    unsigned int next = 0;
    for (std::uint64_t element = 0; element != deleted.size; ++element) {
        bool const isDeleted = deleted[element];
        remap[element] = isDeleted ? Geometry::kDeletedElement : next;
        next += isDeleted ? 0 : 1;
    }
    return remap;
}

}
