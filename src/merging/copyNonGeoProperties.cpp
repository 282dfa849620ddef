#include <Modeling/copyNonGeoProperties.h>

#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Prototypes.h>

#include <utility>

namespace Tessara::GeometryAlgorithms {

using namespace Tessara::Geometry;

namespace {

    bool isGeoProperty(PropertyValue const& value)
    {
        auto const* const object = value.get<Orvan::Ptr<Object>>();
        return object && *object
            && (Object::isA(**object, *getDataGeoPropPrototype(sGenericDataGeoProp))
                || Object::isA(**object, *getComponentGeoPropPrototype())
                || Object::isA(**object, *getRangeGeoPropPrototype()));
    }

}

void copyNonGeoProperties(Orvan::Array<Orvan::Ptr<Object>> const& inputs, Object& output)
{
    for (Orvan::Ptr<Object> const& input : inputs) {
        if (!input)
            continue;
        Orvan::Ptr<Orvan::Array<Orvan::String>> const keys = input->keys();
        for (Orvan::String const& key : *keys) {
            if (key.empty() || output.hasProperty(key))
                continue;
            PropertyValue value = input->getProperty(key);
            if (!isGeoProperty(value))
                output.setProperty(key, std::move(value));
        }
    }
}

}
