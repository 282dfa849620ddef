#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Prototypes.h>

#include "GeoProps.h"

namespace Tessara::Geometry {

unsigned int getElementCount(Object const& object, Orvan::String const& component)
{
    Orvan::Ptr<Object> const geoProperty = Internal::objectAt(object, component);
    return geoProperty ? Internal::valueOf<unsigned int>(*geoProperty, Internal::sElementCount).value_or(0) : 0;
}

bool setElementCount(Orvan::String const& component, unsigned int count, Object& object)
{
    {
        Orvan::Ptr<Object> const geoProperty = Internal::objectAt(object, component);
        if (!geoProperty || !Internal::valueOf<unsigned int>(*geoProperty, Internal::sElementCount))
            return false;
    }
    Internal::setInGeoProp(component, Internal::sElementCount, count, object);
    return true;
}

}
