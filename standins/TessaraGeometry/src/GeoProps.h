#pragma once

#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Names.h>
#include <TessaraObject/Object.h>

#include <optional>

namespace Tessara::Geometry::Internal {

inline constexpr char const* sElementCount = "sElementCount"; // unsigned int, in component geo properties

// The prototypes without a reference each: of those, all threads would write the one count.
Object const& dataPrototype();
Object const& rangePrototype();
Object const& componentPrototype();

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
    // Puts the geo property back in whatever way this ends.
    struct PutBack {
        Orvan::String const& key;
        Object& object;
        Orvan::Ptr<Object> shared; // the geo property until it is mutable
        Orvan::MutablePtr<Object> changed;

        ~PutBack() { object.setProperty(key, changed ? Orvan::Ptr<Object>(std::move(changed)) : std::move(shared)); }
    } putBack{key, object, objectAt(object, key), nullptr};

    // Without the object's own reference the geo property is free to be changed in place.
    object.setProperty(key, Orvan::Ptr<Object>());
    putBack.changed = makeMutable(std::move(putBack.shared));
    putBack.changed->setProperty(inner, std::move(value));
}

}
