#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>

namespace Tessara::GeometryAlgorithms {

/// Numbers the elements that stay when some are deleted: their order stays, and the gaps close.
///
/// \param deleted  One entry an element of a component; true means that the element goes.
/// \pre            Fewer than 4,294,967,294 entries, so that indices stay clear of the sentinels.
/// \return         One entry an element: its new index, which counts up from 0 over those that stay, or
///                 `kDeletedElement`. So a new index is never above the old one. Such an array is what
///                 `deleteComponents` takes.
/// \throws         std::bad_alloc.
///
/// One pass on the calling thread, 4 bytes an element.
MODELING_EXPORT Orvan::Array<unsigned int> computeDeletedComponentMapping(Orvan::Array<bool> const& deleted);

}
