#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Prototypes.h>

#include "GeoProps.h"

namespace Tessara::Geometry {

namespace {

    using Internal::objectAt;

    /// Calls `visit(name, geoProperty)` for the objects that `object` holds, in the order of its keys.
    template <class Visit> void forEachObjectIn(Object const& object, Visit const& visit)
    {
        Orvan::Ptr<Orvan::Array<Orvan::String>> const keys = object.keys();
        for (Orvan::String const& key : *keys) {
            Orvan::Ptr<Object> const held = objectAt(object, key);
            if (held)
                visit(key, held);
        }
    }

    /// Whether it belongs to a target: data and ranges do.
    bool hasTarget(Object const& geoProperty)
    {
        return Object::isA(geoProperty, Internal::dataPrototype())
            || Object::isA(geoProperty, Internal::rangePrototype());
    }

    Orvan::Ptr<Object> geoPropertyOf(Object const& object, Orvan::String const& name, Object const& prototype)
    {
        Orvan::Ptr<Object> const geoProperty = objectAt(object, name);
        return geoProperty && Object::isA(*geoProperty, prototype) ? geoProperty : nullptr;
    }

}

Orvan::Array<Orvan::String> getGeoPropNamesByPrototype(Object const& object, Object const& prototype)
{
    Orvan::Array<Orvan::String> names;
    forEachObjectIn(object, [&](Orvan::String const& name, Orvan::Ptr<Object> const& geoProperty) {
        if (Object::isA(*geoProperty, prototype))
            names.append(name);
    });
    return names;
}

Orvan::Array<Orvan::Ptr<Object>> getGeoPropsByPrototype(Object const& object, Object const& prototype)
{
    Orvan::Array<Orvan::Ptr<Object>> geoProperties;
    forEachObjectIn(object, [&](Orvan::String const&, Orvan::Ptr<Object> const& geoProperty) {
        if (Object::isA(*geoProperty, prototype))
            geoProperties.append(geoProperty);
    });
    return geoProperties;
}

Orvan::Array<Orvan::String> getGeoPropNamesByTarget(Object const& object, Orvan::String const& target)
{
    Orvan::Array<Orvan::String> names;
    forEachObjectIn(object, [&](Orvan::String const& name, Orvan::Ptr<Object> const& geoProperty) {
        if (hasTarget(*geoProperty) && Internal::valueOf<Orvan::String>(*geoProperty, sTarget) == target)
            names.append(name);
    });
    return names;
}

Orvan::String getGeoPropTargetName(Object const& object, Orvan::String const& name)
{
    Orvan::Ptr<Object> const geoProperty = objectAt(object, name);
    return geoProperty && hasTarget(*geoProperty)
        ? Internal::valueOf<Orvan::String>(*geoProperty, sTarget).value_or(Orvan::String())
        : Orvan::String();
}

Orvan::String getTargetComponent(Object const& object, Orvan::String const& name)
{
    Orvan::String target = getGeoPropTargetName(object, name);
    if (geoPropertyOf(object, target, Internal::componentPrototype()))
        return target; // mostly
    // A chain without a loop is no longer than the object has keys.
    for (std::uint64_t steps = object.keys()->size; steps != 0; --steps) {
        if (!geoPropertyOf(object, target, Internal::rangePrototype()))
            break;
        target = getGeoPropTargetName(object, target);
        if (geoPropertyOf(object, target, Internal::componentPrototype()))
            return target;
    }
    return {};
}

Orvan::Ptr<Object> getDataGeoProperty(Object const& object, Orvan::String const& name)
{
    return geoPropertyOf(object, name, Internal::dataPrototype());
}

Orvan::Ptr<Object> getRangeGeoProperty(Object const& object, Orvan::String const& name)
{
    return geoPropertyOf(object, name, Internal::rangePrototype());
}

Orvan::Ptr<Orvan::Array<unsigned int>> getRangeGeoPropIndices(Object const& range)
{
    return Internal::valueOf<Orvan::Ptr<Orvan::Array<unsigned int>>>(range, sIndices).value_or(nullptr);
}

Orvan::Ptr<Orvan::Array<unsigned int>> getRangeGeoPropIndices(Object const& object, Orvan::String const& name)
{
    Orvan::Ptr<Object> const range = getRangeGeoProperty(object, name);
    return range ? getRangeGeoPropIndices(*range) : nullptr;
}

bool setRangeGeoPropIndices(Orvan::String const& name, Orvan::Ptr<Orvan::Array<unsigned int>> indices, Object& object)
{
    if (!getRangeGeoProperty(object, name))
        return false;
    Internal::setInGeoProp(name, sIndices, std::move(indices), object);
    return true;
}

}
