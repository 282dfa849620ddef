#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Prototypes.h>

#include "GeoProps.h"

namespace Tessara::Geometry {

namespace {

    using Internal::objectIn;

    /// Visits the objects that `object` holds, in the order of its keys: `visit(name, geoProperty)`.
    template <class Visit> void forEachObjectIn(Object const& object, Visit const& visit)
    {
        Orvan::Ptr<Orvan::Array<Orvan::String>> const keys = object.keys();
        for (Orvan::String const& key : *keys) {
            auto const* const held = Internal::valueOf<Orvan::Ptr<Object>>(object, key.view());
            if (held && *held)
                visit(key, *held);
        }
    }

    /// Whether it has a target, as data and ranges do but components do not.
    bool hasTarget(Object const& geoProperty)
    {
        return Object::isA(geoProperty, Internal::dataPrototype())
            || Object::isA(geoProperty, Internal::rangePrototype());
    }

    bool targets(Object const& geoProperty, Orvan::String const& target)
    {
        auto const* const name = Internal::valueOf<Orvan::String>(geoProperty, sTarget);
        return name && *name == target;
    }

    /// Whether the object under a name is of a kind.
    bool holds(Object const& object, Orvan::String const& name, Object const& prototype)
    {
        Object const* const geoProperty = objectIn(object, name.view());
        return geoProperty && Object::isA(*geoProperty, prototype);
    }

    Orvan::Ptr<Object> geoPropertyOf(Object const& object, Orvan::String const& name, Object const& prototype)
    {
        auto const* const held = Internal::valueOf<Orvan::Ptr<Object>>(object, name.view());
        return held && *held && Object::isA(**held, prototype) ? *held : nullptr;
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
        if (hasTarget(*geoProperty) && targets(*geoProperty, target))
            names.append(name);
    });
    return names;
}

Orvan::String getGeoPropTargetName(Object const& object, Orvan::String const& name)
{
    Object const* const geoProperty = objectIn(object, name.view());
    bool const isTargeted = geoProperty && hasTarget(*geoProperty);
    auto const* const target = isTargeted ? Internal::valueOf<Orvan::String>(*geoProperty, sTarget) : nullptr;
    return target ? *target : Orvan::String();
}

Orvan::String getTargetComponent(Object const& object, Orvan::String const& name)
{
    Orvan::String target = getGeoPropTargetName(object, name);
    if (holds(object, target, Internal::componentPrototype()))
        return target; // the usual case
    // An acyclic chain has at most as many steps as the object has keys.
    for (std::uint64_t steps = object.keys()->size; steps != 0; --steps) {
        if (!holds(object, target, Internal::rangePrototype()))
            break;
        target = getGeoPropTargetName(object, target);
        if (holds(object, target, Internal::componentPrototype()))
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
    auto const* const indices = Internal::valueOf<Orvan::Ptr<Orvan::Array<unsigned int>>>(range, sIndices);
    return indices ? *indices : nullptr;
}

Orvan::Ptr<Orvan::Array<unsigned int>> getRangeGeoPropIndices(Object const& object, Orvan::String const& name)
{
    Orvan::Ptr<Object> const range = getRangeGeoProperty(object, name);
    return range ? getRangeGeoPropIndices(*range) : nullptr;
}

bool setRangeGeoPropIndices(Orvan::String const& name, Orvan::Ptr<Orvan::Array<unsigned int>> indices, Object& object)
{
    if (!holds(object, name, Internal::rangePrototype()))
        return false;
    Internal::setInGeoProp(name, sIndices, std::move(indices), object);
    return true;
}

}
