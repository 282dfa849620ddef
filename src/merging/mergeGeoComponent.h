#pragma once

#include "MergeRecords.h"
#include "mergeDataProperty.h"

namespace Modeling::Internal {

/// Merges one component: gives the target the component's count, a merged data property for each data property that
/// targets it in any input, and a merged range property for each range on it, with the data of the range.
///
/// The names of all inputs decide what there is. Of each name the first input that qualifies decides type, default and
/// target: for data that is the first one in which it targets the component, for a range the first one in which it
/// belongs to the component and has data. Every other input contributes its array, if that has the type.
///
/// Keys of the target that are not written stay. Of data and dependents of one name the dependents win.
///
/// \param elementOffsets  where the elements of each input begin
/// \param connectivity    of one data property of the component; or null
void mergeGeoComponent(MergePlan const& plan, Orvan::String const& component, Offsets const& elementOffsets,
    Connectivity* connectivity, Tessara::Object& target);

}
