#pragma once

#include <TessaraGeometry/Export.h>
#include <TessaraObject/Object.h>

namespace Tessara::Geometry {

/// The number of elements of a component; 0 if the object has no such component.
TESSARAGEOMETRY_EXPORT unsigned int getElementCount(Object const& object, Orvan::String const& component);

/// Changes the count of a component and nothing else: arrays keep their lengths. Returns false, with nothing changed,
/// if the object has no such component. Allocates only if the component is shared with another object.
/// \throws std::bad_alloc  with the object unchanged
TESSARAGEOMETRY_EXPORT bool setElementCount(Orvan::String const& component, unsigned int count, Object& object);

}
