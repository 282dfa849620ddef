#pragma once

#include <OrvanCore/Array.h>
#include <OrvanCore/String.h>
#include <TessaraMathSupport/Types.h>
#include <TessaraObject/Object.h>

#include <cstdint>

namespace Modeling::Internal {

/// Values that the new elements of one float3 property get instead of its default.
struct NewValues {
    Orvan::String property;
    Orvan::Array<Tessara::Math::float3> const& values; // one per new element
};

/// Adds elements to a component, and values for them to all data and range properties that target it, as
/// `addPointsToPointCloud` documents for points. The tag is stored unless its name is empty; it always targets the
/// points.
/// \pre     `given` has one value per new element.
/// \return  False, with the object unchanged, if there is no such component or the new count exceeds 32 bits.
/// \throws  std::bad_alloc, with the object unchanged.
bool extendComponent(Orvan::String const& component, std::uint64_t addCount, Orvan::String const& tag,
    NewValues const& given, Tessara::Object& object);

}
