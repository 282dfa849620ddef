#pragma once

#include "mergeDataProperty.h"

namespace Modeling::Internal {

/// Merges one component into the target: sets its count, and adds a merged data property for each data property that
/// targets it in any input, and a merged range property for each range that belongs to it, with the data of the range.
///
/// The result has the union of the inputs' property names. The first input that qualifies for a name defines default,
/// element type (that of the default) and target: for data, the first in which it targets the component; for a range,
/// the first in which it belongs to the component and has data. Every input contributes its array if that has the type.
///
/// Other keys of the target are kept. If data of the component and data of a range share a name, the data of the range
/// is kept.
///
/// \param elementOffsets  Where the elements of each input begin in the component, and the total.
/// \param connectivity    The data property of the component that is rebased; may be null.
void mergeGeoComponent(MergePlan const& plan, Orvan::String const& component, Offsets const& elementOffsets,
    Connectivity* connectivity, Tessara::Object& target);

}
