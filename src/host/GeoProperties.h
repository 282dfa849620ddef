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

/// The object under a key; null where there is none.
Orvan::Ptr<Tessara::Object> objectAt(Tessara::Object const& object, Orvan::String const& key);

/// The geo property under a key: null unless the key holds one with `sData`.
Orvan::Ptr<Tessara::Object> dataPropertyAt(Tessara::Object const& object, Orvan::String const& key);

/// The array of a data property, shared with the object and not copied. Null where there is none of that type.
template <class T> Orvan::Ptr<Orvan::Array<T>> readGeoPropData(Tessara::Object const& object, Orvan::String const& key)
{
    Orvan::Ptr<Tessara::Object> const property = dataPropertyAt(object, key);
    if (!property)
        return nullptr;
    Tessara::PropertyValue const data = property->getProperty(Tessara::Geometry::sData);
    auto const* const values = data.get<Orvan::Ptr<Orvan::Array<T>>>();
    return values ? *values : nullptr;
}

/// Replaces the value under `sData` of a data property: the only way in which operations change one. The geo property
/// is cloned, which copies no array, so that its other holders see no change. \return false, with nothing changed,
/// where the key holds no data property
bool writeGeoPropValue(Orvan::String const& key, Tessara::PropertyValue&& data, Tessara::Object& object);

template <class T>
bool writeGeoPropData(Orvan::String const& key, Orvan::Ptr<Orvan::Array<T>>&& data, Tessara::Object& object)
{
    return writeGeoPropValue(key, std::move(data), object);
}

/// Changes to one object that are prepared first, and then made without taking memory: all of them or, when preparing
/// fails, none. (Clones of geo properties are made when a change is added, and a component's count is made this
/// object's own by setting it to what it is. Only new keys take memory, before the first change.)
class PreparedWrites {
public:
    explicit PreparedWrites(Tessara::Object& object)
        : object_(object)
    {
    }

    /// As `setElementCount`; false, and without effect, where there is no such component.
    bool setElementCount(Orvan::String const& component, unsigned int count);

    /// As `writeGeoPropData`; without effect where the key holds no data property.
    template <class T> void writeGeoPropData(Orvan::String const& key, Orvan::Ptr<Orvan::Array<T>>&& data)
    {
        writeValue(key, std::move(data));
    }

    /// As `setProperty` of the object; without effect where the key is empty.
    void setProperty(Orvan::String const& key, Tessara::PropertyValue&& value);

    /// As `setRangeGeoPropIndices`; without effect where there is no range of that name.
    void setRangeIndices(Orvan::String const& name, Orvan::Ptr<Orvan::Array<unsigned int>>&& indices);

    /// As `eraseProperty` of the object.
    void eraseProperty(Orvan::String const& key);

    /// Makes the changes in the order in which they were added. Present keys take no memory with a host that replaces
    /// their values, and the count of a component that is not shared, and erases keys without taking any; the stand-ins
    /// do.
    /// \throws std::bad_alloc  for a key that is new to the object, with the object as it was
    void commit();

private:
    struct Write {
        enum class Kind { Count, Property, Erasure };
        Kind kind;
        Orvan::String key;
        unsigned int count; // of a component
        Tessara::PropertyValue value; // that replaces the present one
    };

    void addNewKeys();

    void writeValue(Orvan::String const& key, Tessara::PropertyValue&& data);

    Tessara::Object& object_;
    std::vector<Write> writes_;
};

/// Edits the array of a data property in place: `edit(Orvan::Array<T>&)`. It is copied only where somebody other than
/// this object holds it.
///
/// An array that is merely read from an object is shared with it, and making it mutable would copy it. So the property
/// first lets go of it, and gets it back afterwards, also when `edit` throws; the memory for that is taken beforehand.
/// \return false, with nothing called, where the key is empty or holds no data property of that type
template <class T, class Edit> bool editGeoPropData(Orvan::String const& key, Tessara::Object& object, Edit&& edit)
{
    using SharedArray = Orvan::Ptr<Orvan::Array<T>>;
    SharedArray shared = readGeoPropData<T>(object, key);
    if (!shared || key.empty())
        return false;

    // Puts the array back in whatever way this ends.
    struct PutBack {
        Orvan::String key;
        Tessara::Object& object;
        Orvan::MutablePtr<Tessara::Object> property; // a clone of the present one
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

/// A data property of element type `T` that holds no values yet and targets nothing.
template <class T> Orvan::MutablePtr<Tessara::Object> populateDataGeoProperty(T const& defaultValue)
{
    return Internal::makeDataGeoProperty(Orvan::makePtr<Orvan::Array<T>>(), defaultValue);
}

/// The geo properties of every kind whose `sTarget` is `target`, in the order of the object's keys: names, and private
/// shallow clones. The object is not changed.
std::vector<std::pair<Orvan::String, Orvan::MutablePtr<Tessara::Object>>> collectGeoPropsByTarget(
    Tessara::Object const& object, Orvan::String const& target);

}
