#pragma once

#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Names.h>
#include <TessaraObject/Object.h>

#include <string_view>

namespace Tessara::Geometry::Internal {

inline constexpr char const* sElementCount = "sElementCount"; // unsigned int, in component geo properties

// The prototypes without a reference each: of those, all threads would write the one count.
Object const& dataPrototype();
Object const& rangePrototype();
Object const& componentPrototype();

/// The value that an object holds under a key, in its place; null unless it is of type `T`.
template <class T> T const* valueOf(Object const& object, std::string_view key)
{
    PropertyValue const* const value = object.findProperty(key);
    return value ? value->get<T>() : nullptr;
}

/// The object that an object holds under a key, in its place; null where there is none.
inline Object const* objectIn(Object const& object, std::string_view key)
{
    auto const* const held = valueOf<Orvan::Ptr<Object>>(object, key);
    return held ? held->get() : nullptr;
}

/// The same as a further reference.
inline Orvan::Ptr<Object> objectAt(Object const& object, std::string_view key)
{
    auto const* const held = valueOf<Orvan::Ptr<Object>>(object, key);
    return held ? *held : nullptr;
}

/// The count of a component; 0 for what is none.
inline unsigned int elementCountOf(Object const& component)
{
    auto const* const count = valueOf<unsigned int>(component, sElementCount);
    return count ? *count : 0;
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
    } putBack{key, object, objectAt(object, key.view()), nullptr};

    // Without the object's own reference the geo property is free to be changed in place.
    object.setProperty(key, Orvan::Ptr<Object>());
    putBack.changed = makeMutable(std::move(putBack.shared));
    putBack.changed->setProperty(inner, std::move(value));
}

}
