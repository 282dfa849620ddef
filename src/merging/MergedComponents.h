#pragma once

#include "mergeDataProperty.h"

namespace Modeling::Internal {

/// Moves a component to the output, with everything that belongs to it directly or through ranges. Erases all
/// properties of the source.
void transferComponentProperties(Orvan::String const& component, Tessara::Object& source, Tessara::Object& output);

/// Adds to the values of each region its base, entry i of `baseOffsets`: region i is the part of `values` from entry i
/// up to entry i + 1 of `regionOffsets`, clamped to the number of values. The base of the first region is 0.
void rebaseRegions(Offsets const& regionOffsets, Orvan::Array<unsigned int>& values, Offsets const& baseOffsets);

/// Ensures that the connectivity array of the output refers to the merged components. Normally it does, because it was
/// rebased while it was merged. If another property has replaced it under its name, that one is rebased here.
/// \param regionOffsets  Where the elements of each input begin in the property's component, and the total.
/// \return  False if no connectivity array of `unsigned int` was merged, or one of another type has replaced it.
bool finishConnectivity(Connectivity const& connectivity, Offsets const& regionOffsets, Tessara::Object& output);

}
