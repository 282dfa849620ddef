#include "PropertyBag.h"

#include <TessaraGeometry/ElementTypes.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>

#include <string>
#include <type_traits>

namespace TestSupport {

using Tessara::Object;
using namespace Tessara::Geometry;

namespace {

    template <class T> T randomValue(Random& random)
    {
        T value{};
        if constexpr (std::is_same_v<T, Orvan::String>) {
            value = std::string(random.below(30), 'a').c_str(); // up to 15 characters allocate nothing
        } else if constexpr (std::is_same_v<T, Common::GeoLocation>) {
            value = {randomValue<Orvan::String>(random), randomValue<Orvan::String>(random), random.below(99), {}};
        } else if constexpr (std::is_same_v<T, bool>) {
            value = random.below(2) == 1;
        } else {
            static_assert(std::is_trivially_copyable_v<T>);
            for (auto* byte = reinterpret_cast<unsigned char*>(&value);
                 byte != reinterpret_cast<unsigned char*>(&value + 1);)
                *byte++ = static_cast<unsigned char>(random.below(256));
        }
        return value;
    }

    template <class T> Orvan::Array<T> randomValues(std::size_t length, Random& random)
    {
        Orvan::Array<T> values(length);
        for (T& value : values)
            value = randomValue<T>(random);
        return values;
    }

    template <class T> void addData(
        Orvan::String const& name, Orvan::String const& target, std::size_t length, Random& random, Object& object)
    {
        Orvan::Array<T> values = randomValues<T>(length, random);
        addDataProperty<T>(name, target, std::move(values), object, randomValue<T>(random));
    }

    void addDataOfAnyType(
        Orvan::String const& name, Orvan::String const& target, std::size_t length, Random& random, Object& object)
    {
        unsigned int type = random.below(40); // counts down
        forEachElementTypeName([&]<class T>(ElementType<T>) {
            if (type-- == 0)
                addData<T>(name, target, length, random, object);
        });
    }

    /// Usually the length itself.
    std::size_t lengthNear(std::size_t length, Random& random)
    {
        unsigned int const choice = random.below(12);
        return choice == 0 ? length + 1 + random.below(3)
            : choice == 1  ? length - std::min<std::size_t>(length, 2)
                           : length;
    }

    void addRange(Orvan::String const& name, Orvan::String const& target, Random& random, Object& object)
    {
        std::size_t const dataLength = random.below(4) == 0 ? 0 : 1 + random.below(9);
        Orvan::Array<unsigned int> indices(
            random.below(12) == 0 ? 0 : lengthNear(getElementCount(object, target), random));
        for (unsigned int& entry : indices)
            entry = dataLength == 0 || random.below(5) == 0 ? kInvalidIndex : random.below(dataLength);
        addRangeProperty(name, target, std::move(indices), object);
        if (random.below(12) == 0)
            replaceIn(name, sIndices, Orvan::Ptr<Orvan::Array<unsigned int>>(), object);
        for (unsigned int data = random.below(8) == 0 ? 2 : random.below(3) == 0 ? 0 : 1; data != 0; --data) {
            Orvan::String dataName = name;
            dataName += std::to_string(data).c_str();
            addDataOfAnyType(dataName, name, random.below(8) == 0 ? 0 : dataLength, random, object);
        }
    }

}

void replaceIn(Orvan::String const& name, char const* key, Tessara::PropertyValue value, Object& object)
{
    Object changed = **object.getProperty(name).get<Orvan::Ptr<Object>>();
    changed.setProperty(key, std::move(value));
    object.setProperty(name, Orvan::makePtr<Object>(changed));
}

void cutToElements(Orvan::String const& name, Object& object)
{
    auto values = *dataOf<Tessara::Math::float3>(object, name);
    values.resize(std::min<std::uint64_t>(values.size, getElementCount(object, sPointComp)));
    replaceIn(name, sData, Orvan::makePtr<Orvan::Array<Tessara::Math::float3>>(std::move(values)), object);
}

void addRandomProperties(Orvan::String const& component, Random& random, Object& object)
{
    std::size_t const count = getElementCount(object, component);
    for (unsigned int property = random.below(5); property != 0; --property) {
        Orvan::String name = component;
        name += std::to_string(property).c_str();
        unsigned int const kind = random.below(24);
        if (kind < 4) {
            addRange(name, component, random, object);
            continue;
        }
        addDataOfAnyType(name, component, lengthNear(count, random), random, object);
        if (kind == 4)
            replaceIn(name, sData, Orvan::Ptr<Orvan::Array<float>>(), object);
        else if (kind == 5)
            replaceIn(name, sData, {}, object);
        else if (kind == 6)
            replaceIn(name, sData, 1.5f, object); // a type that operations do not know
        else if (kind == 7)
            replaceIn(name, sDefault, {}, object);
        else if (kind == 8)
            object.setProperty("same", object.getProperty(name));
    }
}

void addAllTypes(Orvan::String const& component, Random& random, Object& object)
{
    forEachElementTypeName([&]<class T>(ElementType<T> type) {
        Orvan::String name = component;
        name += type.name;
        addDataProperty<T>(name, component, randomValues<T>(getElementCount(object, component), random), object);
    });
}

Orvan::Array<Tessara::Math::float3> randomPositions(std::size_t count, Random& random)
{
    Orvan::Array<Tessara::Math::float3> positions(count);
    for (auto& p : positions)
        p = random.point();
    return positions;
}

Object held(Holders holders, Object const& object)
{
    if (holders == Holders::Object)
        return object;
    Object holder;
    Orvan::Ptr<Orvan::Array<Orvan::String>> const keys = object.keys();
    for (Orvan::String const& key : *keys) {
        Tessara::PropertyValue const value = object.getProperty(key);
        auto const* const property = value.get<Orvan::Ptr<Object>>();
        if (holders == Holders::Properties)
            holder.setProperty(key, Tessara::PropertyValue(value));
        else if (holders == Holders::Arrays && property)
            holder.setProperty(key, (*property)->getProperty((*property)->hasProperty(sData) ? sData : sIndices));
    }
    return holder;
}

}
