#include "GeoPropertyKind.h"

#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Prototypes.h>

namespace Modeling {

using Tessara::Object;
using namespace Tessara::Geometry;

GeoPropertyClassifier::GeoPropertyClassifier()
    : component_(getComponentGeoPropPrototype())
    , data_(getDataGeoPropPrototype(sGenericDataGeoProp))
    , range_(getRangeGeoPropPrototype())
{
}

GeoPropertyKind GeoPropertyClassifier::kindOf(Object const& property) const
{
    if (Object::isA(property, *data_))
        return GeoPropertyKind::Data;
    if (Object::isA(property, *range_))
        return GeoPropertyKind::Range;
    return Object::isA(property, *component_) ? GeoPropertyKind::Component : GeoPropertyKind::None;
}

GeoPropertyKind GeoPropertyClassifier::kindOf(Tessara::PropertyValue const& value) const
{
    auto const* const object = value.get<Orvan::Ptr<Object>>();
    return object && *object ? kindOf(**object) : GeoPropertyKind::None;
}

}
