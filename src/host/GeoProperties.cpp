#include "GeoProperties.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>

namespace Modeling {

using Tessara::Object;
using Tessara::PropertyValue;
using namespace Tessara::Geometry;

Orvan::Ptr<Object> objectAt(Object const& object, Orvan::String const& key)
{
    PropertyValue const value = object.getProperty(key);
    auto const* const held = value.get<Orvan::Ptr<Object>>();
    return held ? *held : nullptr;
}

Orvan::Ptr<Object> dataPropertyAt(Object const& object, Orvan::String const& key)
{
    Orvan::Ptr<Object> property = objectAt(object, key);
    return property && property->hasProperty(sData) ? property : nullptr;
}

bool writeGeoPropValue(Orvan::String const& key, PropertyValue&& data, Object& object)
{
    Orvan::Ptr<Object> property = dataPropertyAt(object, key);
    if (!property)
        return false;
    Orvan::MutablePtr<Object> changed = makeMutable(std::move(property));
    changed->setProperty(sData, std::move(data));
    if (!key.empty())
        object.setProperty(key, Orvan::Ptr<Object>(std::move(changed)));
    return true;
}

bool PreparedWrites::setElementCount(Orvan::String const& component, unsigned int count)
{
    if (!Tessara::Geometry::setElementCount(component, getElementCount(object_, component), object_))
        return false;
    writes_.push_back({Write::Kind::Count, component, count, {}});
    return true;
}

void PreparedWrites::setProperty(Orvan::String const& key, PropertyValue&& value)
{
    if (!key.empty())
        writes_.push_back({Write::Kind::Property, key, 0, std::move(value)});
}

void PreparedWrites::writeValue(Orvan::String const& key, PropertyValue&& data)
{
    Orvan::Ptr<Object> property = dataPropertyAt(object_, key);
    if (!property)
        return;
    Orvan::MutablePtr<Object> changed = makeMutable(std::move(property));
    changed->setProperty(sData, std::move(data));
    setProperty(key, Orvan::Ptr<Object>(std::move(changed)));
}

void PreparedWrites::setRangeIndices(Orvan::String const& name, Orvan::Ptr<Orvan::Array<unsigned int>>&& indices)
{
    // The host sets the indices, in an object that holds only the range.
    Orvan::MutablePtr<Object> const onlyRange = Tessara::createObject();
    onlyRange->setProperty(name, object_.getProperty(name));
    if (setRangeGeoPropIndices(name, std::move(indices), *onlyRange))
        setProperty(name, objectAt(*onlyRange, name));
}

void PreparedWrites::eraseProperty(Orvan::String const& key)
{
    writes_.push_back({Write::Kind::Erasure, key, 0, {}});
}

void PreparedWrites::addNewKeys()
{
    std::vector<Orvan::String> added;
    try {
        for (Write const& write : writes_) {
            if (write.kind != Write::Kind::Property || object_.hasProperty(write.key))
                continue;
            added.push_back(write.key);
            object_.setProperty(write.key, PropertyValue());
        }
    } catch (...) {
        for (Orvan::String const& key : added)
            object_.eraseProperty(key);
        throw;
    }
}

void PreparedWrites::commit()
{
    addNewKeys();
    for (Write& write : writes_) {
        switch (write.kind) {
        case Write::Kind::Count:
            Tessara::Geometry::setElementCount(write.key, write.count, object_);
            break;
        case Write::Kind::Property:
            object_.setProperty(write.key, std::move(write.value));
            break;
        case Write::Kind::Erasure:
            object_.eraseProperty(write.key);
            break;
        }
    }
    writes_.clear();
}

Orvan::MutablePtr<Object> Internal::makeDataGeoProperty(PropertyValue&& data, PropertyValue&& defaultValue)
{
    Orvan::MutablePtr<Object> property = Tessara::createObject();
    property->setProperty(sData, std::move(data));
    property->setProperty(sTarget, Orvan::String(sNullString));
    property->setProperty(sDependsOn, Orvan::makePtr<Orvan::Array<Orvan::String>>());
    property->setProperty(sDefault, std::move(defaultValue));
    property->setProperty(sInterp, static_cast<Common::DataInterpolationMode>(1));
    return property;
}

std::vector<std::pair<Orvan::String, Orvan::MutablePtr<Object>>> collectGeoPropsByTarget(
    Object const& object, Orvan::String const& target)
{
    std::vector<std::pair<Orvan::String, Orvan::MutablePtr<Object>>> collected;
    Orvan::Ptr<Orvan::Array<Orvan::String>> const keys = object.keys();
    for (Orvan::String const& key : *keys) {
        Orvan::Ptr<Object> property = objectAt(object, key);
        if (!property)
            continue;
        PropertyValue const propertyTarget = property->getProperty(sTarget);
        auto const* const name = propertyTarget.get<Orvan::String>();
        if (name && *name == target)
            collected.emplace_back(key, makeMutable(std::move(property)));
    }
    return collected;
}

}
