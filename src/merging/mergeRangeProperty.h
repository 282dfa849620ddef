#pragma once

#include "MergeRecords.h"

namespace Modeling::Internal {

/// Merges the indices of one range and the data that targets it.
///
/// The data of the inputs comes one behind the other, and the indices of an input are raised by where its data begins;
/// so are `kInvalidIndex` and indices behind the end of the data, which then mean something else. (Wanted.) The data of
/// an input is as long as the shortest of its arrays. Elements of an input that has no such range, or nothing that
/// targets it, get an index to a default behind all data.
///
/// \param elementOffsets  where the elements of each input begin in the range's component
/// \throws std::bad_alloc  also where the data would be longer than 32 bits can tell
void mergeRangeProperty(MergePlan const& plan, Offsets const& elementOffsets, RangePropertyMergeEntry& entry);

/// Gives the target a new range property with the merged indices, which targets the component itself.
/// \return false, with nothing changed, where the host takes no such indices
bool addMergedRangeProperty(Orvan::String const& name, Orvan::Ptr<Orvan::Array<unsigned int>> const& mergedIndices,
    Orvan::String const& component, Tessara::Object& target);

}
