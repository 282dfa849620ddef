#pragma once

#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <OrvanCore/String.h>
#include <TessaraObject/Export.h>
#include <TessaraObject/PropertyValue.h>

#include <cstdint>
#include <string_view>
#include <vector>

namespace Tessara {

/// A dynamic property bag: values of any type under text keys, in the order in which the keys were first set.
///
/// Copying an object copies its keys and values, and a held `Ptr` is copied as one more reference: arrays and objects
/// inside stay shared until somebody makes them mutable. Objects are normally held by `Orvan::Ptr<Object>` and
/// `Orvan::MutablePtr<Object>`.
///
/// Threads: any number of threads may call the const operations of one object at once. An object is not to be written
/// while another thread reads or writes it.
/// Cost: looking a key up and replacing its value take constant time whatever the number of keys; erasing one key is
/// linear in it. Replacing the value of a key that is there, with one of up to 32 bytes, takes no memory and cannot
/// fail.
class TESSARAOBJECT_EXPORT Object {
public:
    Object() = default;
    Object(Object const&) = default;
    Object(Object&&) noexcept = default;
    /// \throws std::bad_alloc  with the object as it was
    Object& operator=(Object const& other) { return *this = Object(other); }
    Object& operator=(Object&&) noexcept = default;
    virtual ~Object() = default;

    virtual bool hasProperty(Orvan::String const& key) const;
    /// A copy of the value; empty when the key is absent.
    virtual PropertyValue getProperty(Orvan::String const& key) const;
    /// Removes the key if it is there; the keys behind it keep their order.
    virtual void eraseProperty(Orvan::String const& key);
    virtual void eraseAllProperties();
    virtual Orvan::Ptr<Orvan::Array<Orvan::String>> keys() const;
    /// Appends the key, or replaces its value in its place. An empty value is kept as one: the key stays.
    /// \throws std::bad_alloc  for a new key only; the object is then as it was.
    virtual void setProperty(Orvan::String const& key, PropertyValue&& value);

    /// Whether `object` conforms to `prototype`, which is decided by content. For every key of the prototype:
    /// - the reserved key `kExcludedKeys` lists keys that `object` must not have, or holds an object of keys and values:
    ///   `object` must have none of the keys with a value that conforms to the one here;
    /// - an empty value asks for the key with any value, empty ones included;
    /// - an object asks for an object that conforms to it in turn, a null one for any object but null;
    /// - any other value asks for a value of the same type.
    static bool isA(Object const& object, Object const& prototype);

    /// The value under a key in its place, null when the key is absent: for the host's own libraries, to which copies of
    /// values would be dear. It stays there until the object is changed.
    PropertyValue const* findProperty(std::string_view key) const;

    static constexpr char const* kExcludedKeys = "excludedKeys";

private:
    struct Entry {
        Orvan::String key;
        PropertyValue value;
    };

    Entry const* find(std::string_view key) const;
    std::size_t slotOf(std::string_view key) const;
    void rebuildSlots(std::size_t slotCount);

    std::vector<Entry> entries_;
    // Open addressing over entry numbers plus one, 0 for a free slot; at least two slots an entry. Few keys do without.
    std::vector<std::uint32_t> slots_;
};

/// A new empty object.
TESSARAOBJECT_EXPORT Orvan::MutablePtr<Object> createObject();

}

namespace Orvan::Internal {

/// The shared default instance of a class, for places where an absent `Ptr` needs a value.
template <class T> Ptr<T> const& getDefaultClass();
template <> TESSARAOBJECT_EXPORT Ptr<Tessara::Object> const& getDefaultClass<Tessara::Object>();

}
