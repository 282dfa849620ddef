#pragma once

#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <OrvanCore/String.h>
#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Records.h>
#include <TessaraObject/Object.h>

#include <utility>
#include <vector>

namespace Modeling {

/// The object under a key; null if there is none.
Orvan::Ptr<Tessara::Object> objectAt(Tessara::Object const& object, Orvan::String const& key);

/// The data property under a key; null if the key holds no object that has `sData`.
Orvan::Ptr<Tessara::Object> dataPropertyAt(Tessara::Object const& object, Orvan::String const& key);

/// The array of a data property, shared with the object, not copied. Null if the key holds no data of that type.
template <class T> Orvan::Ptr<Orvan::Array<T>> readGeoPropData(Tessara::Object const& object, Orvan::String const& key)
{
    Orvan::Ptr<Tessara::Object> const property = dataPropertyAt(object, key);
    if (!property)
        return nullptr;
    Tessara::PropertyValue const data = property->getProperty(Tessara::Geometry::sData);
    auto const* const values = data.get<Orvan::Ptr<Orvan::Array<T>>>();
    return values ? *values : nullptr;
}

/// Replaces the value under `sData` of a data property. The property is cloned, which copies no array, so that other
/// objects that share it see no change.
/// \return false, with nothing changed, if the key holds no data property
bool writeGeoPropValue(Orvan::String const& key, Tessara::PropertyValue&& data, Tessara::Object& object);

template <class T>
bool writeGeoPropData(Orvan::String const& key, Orvan::Ptr<Orvan::Array<T>>&& data, Tessara::Object& object)
{
    return writeGeoPropValue(key, std::move(data), object);
}

/// Changes to one object of which either all are made or, if memory runs out, none: everything is allocated before the
/// first change. Adding a change clones its geo property; adding the count of a component sets it to its present value,
/// so that the object no longer shares the component; and `commit` begins by adding the keys that are new to the object.
class PreparedWrites {
public:
    explicit PreparedWrites(Tessara::Object& object)
        : object_(object)
    {
    }

    /// As `setElementCount` of the host. Returns false, with nothing added, if there is no such component.
    bool setElementCount(Orvan::String const& component, unsigned int count);

    /// As the function `writeGeoPropData`; no effect if the key holds no data property.
    template <class T> void writeGeoPropData(Orvan::String const& key, Orvan::Ptr<Orvan::Array<T>>&& data)
    {
        writeValue(key, std::move(data));
    }

    /// As `setProperty` of the object; no effect if the key is empty.
    void setProperty(Orvan::String const& key, Tessara::PropertyValue&& value);

    /// As `setRangeGeoPropIndices` of the host; no effect if there is no range of that name.
    void setRangeIndices(Orvan::String const& name, Orvan::Ptr<Orvan::Array<unsigned int>>&& indices);

    /// As `eraseProperty` of the object.
    void eraseProperty(Orvan::String const& key);

    /// Makes the changes in the order in which they were added. Relies on the host to allocate nothing when it replaces
    /// the value of a present key, sets the count of a component that is not shared, or erases a key.
    /// \throws std::bad_alloc  for a key that is new to the object, with the object unchanged
    void commit();

private:
    struct Write {
        enum class Kind { Count, Property, Erasure };
        Kind kind;
        Orvan::String key;
        unsigned int count; // if `kind` is `Count`
        Tessara::PropertyValue value; // if `kind` is `Property`
    };

    void addNewKeys();

    void writeValue(Orvan::String const& key, Tessara::PropertyValue&& data);

    Tessara::Object& object_;
    std::vector<Write> writes_;
};

/// Edits the array of a data property in place: `edit(Orvan::Array<T>&)`. The array is copied only if it is shared with
/// something other than this object.
///
/// An array that is merely read from an object is shared with it, and making it mutable would copy it. So the property
/// releases it first and gets it back afterwards, even if `edit` throws: what this needs is allocated beforehand.
/// \return false, without a call of `edit`, if the key is empty or holds no data of that type
template <class T, class Edit> bool editGeoPropData(Orvan::String const& key, Tessara::Object& object, Edit&& edit)
{
    using SharedArray = Orvan::Ptr<Orvan::Array<T>>;
    SharedArray shared = readGeoPropData<T>(object, key);
    if (!shared || key.empty())
        return false;

    // The destructor puts the array back, even if an exception is thrown.
    struct PutBack {
        Orvan::String key;
        Tessara::Object& object;
        Orvan::MutablePtr<Tessara::Object> property; // a clone of the one in the object
        SharedArray shared; // the array until it is mutable
        Orvan::MutablePtr<Orvan::Array<T>> array;

        ~PutBack()
        {
            property->setProperty(Tessara::Geometry::sData, array ? SharedArray(std::move(array)) : std::move(shared));
            object.setProperty(key, Orvan::Ptr<Tessara::Object>(std::move(property)));
        }
    } putBack{key, object, makeMutable(dataPropertyAt(object, key)), std::move(shared), nullptr};

    writeGeoPropData<T>(key, nullptr, object);
    putBack.property->setProperty(Tessara::Geometry::sData, SharedArray());
    putBack.array = makeMutable(std::move(putBack.shared));
    edit(*putBack.array);
    return true;
}

namespace Internal {

    Orvan::MutablePtr<Tessara::Object> makeDataGeoProperty(
        Tessara::PropertyValue&& data, Tessara::PropertyValue&& defaultValue);

}

/// A data property of element type `T` with no values and no target.
template <class T> Orvan::MutablePtr<Tessara::Object> populateDataGeoProperty(T const& defaultValue)
{
    return Internal::makeDataGeoProperty(Orvan::makePtr<Orvan::Array<T>>(), defaultValue);
}

/// The names and shallow clones of the geo properties of any kind whose `sTarget` is `target`, in the order of the keys
/// of the object. The object is not changed.
std::vector<std::pair<Orvan::String, Orvan::MutablePtr<Tessara::Object>>> collectGeoPropsByTarget(
    Tessara::Object const& object, Orvan::String const& target);

}
