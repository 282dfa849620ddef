#pragma once

#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Names.h>
#include <TessaraObject/Object.h>

#include <optional>

namespace Tessara::Geometry::Internal {

inline constexpr char const* sElementCount = "sElementCount"; // unsigned int, in component geo properties

/// The value that an object holds under a key, if it is of type `T`.
template <class T> std::optional<T> valueOf(Object const& object, Orvan::String const& key)
{
    PropertyValue const value = object.getProperty(key);
    T const* const held = value.get<T>();
    return held ? std::optional<T>(*held) : std::nullopt;
}

/// The object that an object holds under a key; null where there is none.
inline Orvan::Ptr<Object> objectAt(Object const& object, Orvan::String const& key)
{
    return valueOf<Orvan::Ptr<Object>>(object, key).value_or(nullptr);
}

/// Sets one value inside the geo property under `key`, which must be there. Takes memory only where the geo property is
/// shared with another object; when that fails the object is as it was.
inline void setInGeoProp(Orvan::String const& key, Orvan::String const& inner, PropertyValue&& value, Object& object)
{
    // Without our own reference in the object the geo property is free to be changed in place.
    Orvan::Ptr<Object> geoProperty = objectAt(object, key);
    object.setProperty(key, Orvan::Ptr<Object>());
    try {
        Orvan::MutablePtr<Object> changed = makeMutable(std::move(geoProperty));
        geoProperty = nullptr;
        try {
            changed->setProperty(inner, std::move(value));
        } catch (...) {
            geoProperty = std::move(changed);
            throw;
        }
        geoProperty = std::move(changed);
    } catch (...) {
        object.setProperty(key, std::move(geoProperty));
        throw;
    }
    object.setProperty(key, std::move(geoProperty));
}

}
