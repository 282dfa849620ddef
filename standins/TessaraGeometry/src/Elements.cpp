#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Prototypes.h>

#include "GeoProps.h"

namespace Tessara::Geometry {

unsigned int getElementCount(Object const& object, Orvan::String const& component)
{
    Object const* const geoProperty = Internal::objectIn(object, component.view());
    return geoProperty ? Internal::elementCountOf(*geoProperty) : 0;
}

bool setElementCount(Orvan::String const& component, unsigned int count, Object& object)
{
    Object const* const geoProperty = Internal::objectIn(object, component.view());
    if (!geoProperty || !Internal::valueOf<unsigned int>(*geoProperty, Internal::sElementCount))
        return false;
    Internal::setInGeoProp(component, Internal::sElementCount, count, object);
    return true;
}

}
