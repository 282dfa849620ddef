#pragma once

#include "MergePlan.h"

namespace Modeling::Internal {

/// A data property that is being merged.
struct DataPropertyMergeEntry {
    Orvan::String name;
    Orvan::Ptr<Tessara::Object> property; // of the first input that qualifies: defines type, default and target
    Tessara::PropertyValue mergedData; // Ptr<Array<T>>; empty if the default is missing or of no listed type
};

/// An entry for a data property of an input, with nothing merged yet.
DataPropertyMergeEntry dataEntry(MergeInput const& input, Orvan::String const& name);

/// An array of `unsigned int` that holds indices into another merged component. Merging it adds entry i of
/// `baseOffsets` to the values of input i.
struct Connectivity {
    Orvan::String name; // of the property
    Offsets const& baseOffsets;
    std::optional<unsigned int> closingEntry; // appended after the last element
    Orvan::Ptr<Orvan::Array<unsigned int>> merged; // null until the property has been merged
};

/// Copies indices and adds `base` to each. Blocks of large arrays are copied in parallel.
void copyRebased(unsigned int const* source, std::size_t count, unsigned int base, unsigned int* target);

/// Builds the merged array of one data property, whose element type is that of the default of `entry.property`. An
/// input contributes its array of that name, whatever its target is: an array that is too long is trimmed; one that is
/// too short, missing or of another type is padded with the default. Leaves `entry.mergedData` empty if the default is
/// missing or of no listed type.
/// \param offsets       Where the values of each input begin, and the total.
/// \param connectivity  Null unless the values are to be rebased.
void mergeDataProperty(
    MergePlan const& plan, Offsets const& offsets, Connectivity* connectivity, DataPropertyMergeEntry& entry);

/// Appends the default to the merged array if it is of a core type. Data of the four geometry types gets none, so that
/// range indices that refer to the default lead past its end: existing scenes depend on these lengths.
void appendDefaultValue(DataPropertyMergeEntry& entry);

/// Adds to the target a data property with the merged array, without dependencies and with interpolation mode 1,
/// whatever the inputs have. Does nothing if there is no merged array or the name is empty.
void addMergedDataProperty(DataPropertyMergeEntry const& entry, Tessara::Object& target);

}
