#pragma once

#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Names.h>
#include <TessaraObject/Object.h>

#include <string>
#include <string_view>

namespace Tessara::Geometry::Internal {

inline constexpr char const* sElementCount = "sElementCount"; // unsigned int, in component geo properties

// The prototypes by reference: if `Ptr`s were copied, all threads would write the same reference counts.
Object const& dataPrototype();
Object const& rangePrototype();
Object const& componentPrototype();

/// A name as messages show it.
inline std::string quoted(Orvan::String const& name)
{
    return "\"" + std::string(name.view()) + "\"";
}

/// The stored value under a key, not copied; null unless it is of type `T`.
template <class T> T const* valueOf(Object const& object, std::string_view key)
{
    PropertyValue const* const value = object.findProperty(key);
    return value ? value->get<T>() : nullptr;
}

/// The stored object under a key, without another reference; null if there is none.
inline Object const* objectIn(Object const& object, std::string_view key)
{
    auto const* const held = valueOf<Orvan::Ptr<Object>>(object, key);
    return held ? held->get() : nullptr;
}

/// Another reference to the object under a key; null if there is none.
inline Orvan::Ptr<Object> objectAt(Object const& object, std::string_view key)
{
    auto const* const held = valueOf<Orvan::Ptr<Object>>(object, key);
    return held ? *held : nullptr;
}

/// The count of a component; 0 for other objects.
inline unsigned int elementCountOf(Object const& component)
{
    auto const* const count = valueOf<unsigned int>(component, sElementCount);
    return count ? *count : 0;
}

/// Sets one value inside the geo property under `key`, which must exist. Allocates only if the geo property is shared
/// with another object.
/// \throws std::bad_alloc  with the object unchanged
inline void setInGeoProp(Orvan::String const& key, Orvan::String const& inner, PropertyValue&& value, Object& object)
{
    // Puts the geo property back, even if making it mutable throws.
    struct PutBack {
        Orvan::String const& key;
        Object& object;
        Orvan::Ptr<Object> shared; // the geo property until it is mutable
        Orvan::MutablePtr<Object> changed;

        ~PutBack() { object.setProperty(key, changed ? Orvan::Ptr<Object>(std::move(changed)) : std::move(shared)); }
    } putBack{key, object, objectAt(object, key.view()), nullptr};

    // Releases the object's own reference, so that a geo property that is not shared is changed in place.
    object.setProperty(key, Orvan::Ptr<Object>());
    putBack.changed = makeMutable(std::move(putBack.shared));
    putBack.changed->setProperty(inner, std::move(value));
}

}
