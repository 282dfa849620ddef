#pragma once

#include "host/GeoProperties.h"
#include "host/OptionalFeatures.h"

#include <memory>

namespace Modeling::Internal {

/// An edit of one array of a property, prepared while the object still holds the old array.
class ArrayEdit {
public:
    virtual ~ArrayEdit() = default;
    /// Returns the edited array. To be called once the object has released the old one. Does not allocate.
    virtual Tessara::PropertyValue finish() = 0;
};

/// Takes the array out of a clone of a property, so that the clone's reference does not count as sharing.
Tessara::PropertyValue takeArray(char const* arrayKey, Tessara::Object& property);

/// Whether the array, or the property that holds it, may be shared with something outside the object, which would see
/// an edit in place.
/// \param localReferences  How many variables of the caller refer to the array.
template <class T> bool isShared(Tessara::Object const& object, Orvan::String const& key,
    Orvan::Ptr<Orvan::Array<T>> const& array, std::uint64_t localReferences)
{
    constexpr std::uint64_t kOwner = 1; // the object holds the property, and the property holds the array
    Orvan::Ptr<Tessara::Object> const property = objectAt(object, key);
    return mayBeShared(property, kOwner + 1) || mayBeShared(array, kOwner + localReferences);
}

/// Replaces a property of the object by a clone of it that has the edited array. Does not allocate, provided that the
/// host does not allocate to replace the value of a present key.
/// \param property  The clone, from which the array has been taken.
/// \param edit      Null for an empty value instead of the array.
void replaceProperty(Orvan::String const& key, char const* arrayKey, Orvan::MutablePtr<Tessara::Object>&& property,
    ArrayEdit* edit, Tessara::Object& object);

}
