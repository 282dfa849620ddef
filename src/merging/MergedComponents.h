#pragma once

#include "MergeRecords.h"
#include "mergeDataProperty.h"

namespace Modeling::Internal {

/// Moves a component with all that belongs to it, directly or through ranges, to the output. Everything else in the
/// source is dropped.
void transferComponentProperties(Orvan::String const& component, Tessara::Object& source, Tessara::Object& output);

/// Raises the values of each region by its base: region i is the part of `values` from entry i up to entry i + 1 of
/// `regionOffsets`, as far as there are values. The base of the first one is 0.
void rebaseRegions(Offsets const& regionOffsets, Orvan::Array<unsigned int>& values, Offsets const& baseOffsets);

/// Sees to it that the output's connectivity array means places in the merged components. Mostly it does already,
/// raised while it was merged; but another property of that name may have taken its place.
/// \param regionOffsets  where the elements of each input begin
/// \return false where no such array of `unsigned int` was merged
bool finishConnectivity(Connectivity const& connectivity, Offsets const& regionOffsets, Tessara::Object& output);

}
