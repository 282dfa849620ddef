#pragma once

#include "MergePlan.h"

namespace Modeling::Internal {

/// `Tessara::GeometryAlgorithms::copyNonGeoProperties` for the inputs of a plan. Inputs that share the layout of the
/// one before them are skipped, because they have no other keys.
void copyNonGeoProperties(MergePlan const& plan, Tessara::Object& output);

}
