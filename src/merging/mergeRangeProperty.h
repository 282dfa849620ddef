#pragma once

#include "mergeDataProperty.h"

namespace Modeling::Internal {

/// A range property that is being merged.
struct RangePropertyMergeEntry {
    Orvan::String name;
    Orvan::Ptr<Orvan::Array<unsigned int>> mergedIndices;
    std::vector<DataPropertyMergeEntry> dependents; // the data that targets the range in the first input that has both
};

/// The data properties that target a range in one input, in the order of its keys.
std::vector<DataPropertyMergeEntry> collectDependentDataProperties(
    MergeInput const& input, Orvan::String const& rangeName);

/// Merges the indices of one range and the data that targets it.
///
/// The data of the inputs is concatenated, and the indices of each input are rebased to where its data begins. This
/// includes `kInvalidIndex` and indices past the end of the data, which then refer to other values: existing scenes
/// depend on it. The data of an input is as long as the shortest of its arrays. Elements of an input without such a
/// range, or without data that targets it, get the index of a default after all data.
///
/// \param elementOffsets  Where the elements of each input begin in the range's component, and the total.
/// \throws std::bad_alloc  also if the length of the data does not fit 32 bits
void mergeRangeProperty(MergePlan const& plan, Offsets const& elementOffsets, RangePropertyMergeEntry& entry);

/// Adds to the target a range property with the merged indices, which targets the component directly.
/// \return  False, with nothing changed, if the host refuses the indices.
bool addMergedRangeProperty(Orvan::String const& name, Orvan::Ptr<Orvan::Array<unsigned int>> const& mergedIndices,
    Orvan::String const& component, Tessara::Object& target);

}
