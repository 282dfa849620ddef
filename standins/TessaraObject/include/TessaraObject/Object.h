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

/// A dynamic property bag: values of any type under string keys, in the order in which the keys were first set.
///
/// Copying an object copies its keys and values, and a held `Ptr` is copied as one more reference: arrays and objects
/// inside remain shared until they are made mutable. Objects are normally held by `Orvan::Ptr<Object>` and
/// `Orvan::MutablePtr<Object>`.
///
/// Threads: any number of threads may call the const operations of one object at once. An object must not be written
/// while another thread reads or writes it.
/// Cost: looking up a key and replacing its value take constant time; erasing one is linear in the number of keys.
/// Replacing the value of a present key with one of up to 32 bytes does not allocate and cannot fail.
class TESSARAOBJECT_EXPORT Object {
public:
    Object() = default;
    Object(Object const&) = default;
    Object(Object&&) noexcept = default;
    /// \throws std::bad_alloc  with the object unchanged
    Object& operator=(Object const& other) { return *this = Object(other); }
    Object& operator=(Object&&) noexcept = default;
    virtual ~Object() = default;

    virtual bool hasProperty(Orvan::String const& key) const;
    /// A copy of the value; empty if the key is absent.
    virtual PropertyValue getProperty(Orvan::String const& key) const;
    /// Removes the key if it is present; the other keys keep their order.
    virtual void eraseProperty(Orvan::String const& key);
    virtual void eraseAllProperties();
    /// Also starts loading what look-ups under the keys are going to read: in objects that are scattered in memory, each
    /// look-up would otherwise wait for several cache misses, one after the other.
    virtual Orvan::Ptr<Orvan::Array<Orvan::String>> keys() const;
    /// Appends a new key, or replaces the value of a present one without changing the order. A key with an empty value
    /// is present.
    /// \throws std::bad_alloc  for a new key only, with the object unchanged
    virtual void setProperty(Orvan::String const& key, PropertyValue&& value);

    /// Whether `object` conforms to `prototype`, decided by content. For every key of the prototype:
    /// - the reserved key `kExcludedKeys` holds an array of keys that `object` must not have, or an object: then
    ///   `object` must not have any of its keys with a conforming value;
    /// - an empty value requires the key with any value, empty ones included;
    /// - an object requires an object that conforms to it in turn, a null object any object but null;
    /// - any other value requires a value of the same type.
    static bool isA(Object const& object, Object const& prototype);

    /// The stored value under a key; null if the key is absent. Valid until the object is changed. Meant for the host's
    /// own libraries, where copying the value would cost too much.
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
    void prefetchHeldObjects() const;

    std::vector<Entry> entries_;
    // Hash table with open addressing: entry indices plus one, 0 for a free slot; at least two slots per entry. Empty
    // while there are only a few keys.
    std::vector<std::uint32_t> slots_;
};

/// A new empty object.
TESSARAOBJECT_EXPORT Orvan::MutablePtr<Object> createObject();

}

namespace Orvan::Internal {

/// The shared default instance of a class, which takes the place of a null `Ptr`.
template <class T> Ptr<T> const& getDefaultClass();
template <> TESSARAOBJECT_EXPORT Ptr<Tessara::Object> const& getDefaultClass<Tessara::Object>();

}
