#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>

namespace Tessara::GeometryAlgorithms {

/// Computes the remap of a deletion: the new index of each element of a component after some of them are deleted. The
/// others keep their order and are renumbered without gaps.
///
/// \param deleted  One entry per element of a component; true deletes the element.
/// \pre            Fewer than 4,294,967,294 entries, so that indices differ from the sentinels.
/// \return         One entry per element: its new index, which counts up from 0 over the kept elements, or
///                 `kDeletedElement`. A new index is never greater than the old one. `deleteComponents` takes such
///                 a remap.
/// \throws         std::bad_alloc.
///
/// Linear in the number of entries, blocks of which are counted and then numbered in parallel. Allocates a fifth of a byte
/// per element besides the result.
MODELING_EXPORT Orvan::Array<unsigned int> computeDeletedComponentMapping(Orvan::Array<bool> const& deleted);

}
