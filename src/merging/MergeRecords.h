#pragma once

#include "MergePlan.h"

namespace Modeling::Internal {

/// What the parts of a merge hand to one another. All of it lives for one merge.

using Offsets = Orvan::Array<unsigned int>;

/// A data property that is being merged. `property` is that of the first input that qualifies: its default and target
/// are those of the merged one.
struct DataPropertyMergeEntry {
    Orvan::String name;
    Orvan::Ptr<Tessara::Object> property;
    Tessara::PropertyValue mergedData; // Ptr<Array<T>>; stays empty where the default has no listed type
};

/// A range property that is being merged, with the data of the first qualifying input that targets it.
struct RangePropertyMergeEntry {
    Orvan::String name;
    Orvan::Ptr<Orvan::Array<unsigned int>> mergedIndices;
    std::vector<DataPropertyMergeEntry> dependents;
};

/// An entry for a data property of an input.
DataPropertyMergeEntry dataEntry(MergeInput const& input, Orvan::String const& name);

/// Where the elements of each input begin in a merged component, and as last entry how many there are. Nothing where
/// that does not fit 32 bits.
/// \param component  place among the components of the plan
std::optional<Offsets> computeElementOffsets(MergePlan const& plan, std::size_t component);

/// The data properties that target a range in one input, in the order of its keys.
std::vector<DataPropertyMergeEntry> collectDependentDataProperties(
    MergeInput const& input, Orvan::String const& rangeName);

/// Gives an object what the inputs hold beside geometry: of each key the value of the first input that has it, unless
/// the object has the key. (`copyNonGeoProperties`, for inputs whose properties have been looked up.)
void copyOtherProperties(MergePlan const& plan, Tessara::Object& object);

/// A shallow copy to build a result in, and the way back: the output gets all of it or, if memory runs out, nothing.
Orvan::MutablePtr<Tessara::Object> stagedCopy(Tessara::Object const& output);
void publish(Tessara::Object const& staged, Tessara::Object& output);

}
