#pragma once

#include <TessaraGeometry/Export.h>
#include <TessaraObject/Object.h>

namespace Tessara::Geometry {

/// The number of elements of a component; 0 where the object has no such component.
TESSARAGEOMETRY_EXPORT unsigned int getElementCount(Object const& object, Orvan::String const& component);

/// Changes the count of a component and nothing else: arrays keep their lengths. False, with nothing changed, when the
/// object has no such component. Takes memory only where the component is shared with another object; when that fails
/// the object is as it was.
TESSARAGEOMETRY_EXPORT bool setElementCount(Orvan::String const& component, unsigned int count, Object& object);

}
