#pragma once

#include <OrvanCore/Array.h>
#include <OrvanCore/String.h>
#include <TessaraMathSupport/Types.h>
#include <TessaraObject/Object.h>

#include <cstdint>

namespace Modeling::Internal {

/// Values for the new elements of one float3 property, which get these instead of its default: one value per element.
struct NewValues {
    Orvan::String property;
    Orvan::Array<Tessara::Math::float3> const& values;
};

/// Adds elements to a component, and values for them to all data and range properties that target it, as
/// `addPointsToPointCloud` says for points. A tag, which is stored unless its name is empty, always targets the points.
/// \pre     `given` has one value per new element.
/// \return  False, with nothing changed, if there is no such component or the new count exceeds 32 bits.
/// \throws  std::bad_alloc, with the object as it was.
bool extendComponent(Orvan::String const& component, std::uint64_t addCount, Orvan::String const& tag,
    NewValues const& given, Tessara::Object& object);

}
