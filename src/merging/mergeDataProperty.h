#pragma once

#include "MergeRecords.h"

namespace Modeling::Internal {

/// An array of `unsigned int` that means places in another component: what the elements of input i say is raised by
/// entry i of `baseOffsets` while it is copied.
struct Connectivity {
    Orvan::String name; // of the property
    Offsets const& baseOffsets;
    std::optional<unsigned int> closingEntry; // comes behind the last element
    Orvan::Ptr<Orvan::Array<unsigned int>> merged; // once that is done
};

/// Copies numbers, each raised by `base`, with several threads where that pays.
void copyRaised(unsigned int const* source, std::size_t count, unsigned int base, unsigned int* target);

/// Builds the merged array of one data property: its element type is that of the default of `entry.property`. An input
/// gives its array of that name, whatever it targets: cut off where it is too long, filled up with the default where it
/// is too short, missing or of another type. Leaves `entry.mergedData` empty where there is no default of a listed
/// type.
/// \param offsets       where each input's values begin, and as last entry how many there are
/// \param connectivity  where the property is to be raised; or null
void mergeDataProperty(
    MergePlan const& plan, Offsets const& offsets, Connectivity* connectivity, DataPropertyMergeEntry& entry);

/// Appends the default to the merged array, if that is of a core type: data of the four geometry types gets none, and
/// indices of its range that point at the default point behind its end. (Wanted.)
void appendDefaultValue(DataPropertyMergeEntry& entry);

/// Gives the target a new data property with the merged array: no dependencies, and the interpolation mode 1, whatever
/// the inputs said. Does nothing where there is no merged array.
void addMergedDataProperty(DataPropertyMergeEntry const& entry, Tessara::Object& target);

}
