#include "PropertyBag.h"

#include <TessaraGeometry/ElementTypes.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Validators.h>

#include <cstring>
#include <map>
#include <span>
#include <string>
#include <type_traits>

namespace TestSupport {

using Tessara::Object;
using Tessara::PropertyValue;
using namespace Tessara::Geometry;

namespace {

    template <class T> bool sameBits(T const& a, T const& b)
    {
        if constexpr (std::is_trivially_copyable_v<T>)
            return std::memcmp(&a, &b, sizeof(T)) == 0;
        else
            return a == b;
    }

    template <class T> std::string difference(Orvan::Array<T> const& actual, Orvan::Array<T> const& expected)
    {
        if (actual.size != expected.size)
            return " has " + std::to_string(actual.size) + " entries instead of " + std::to_string(expected.size);
        for (std::uint64_t i = 0; i != actual.size; ++i)
            if (!sameBits(actual[i], expected[i]))
                return "[" + std::to_string(i) + "] differs: " + testing::PrintToString(actual[i]) + " instead of "
                    + testing::PrintToString(expected[i]);
        return {};
    }

    std::string difference(Object const& actual, Object const& expected);

    /// Compares what two values of one type point to; null is equal to null only.
    template <class T> std::string difference(Orvan::Ptr<T> const& actual, Orvan::Ptr<T> const& expected)
    {
        if (!actual || !expected)
            return !actual == !expected ? "" : actual ? " is not null" : " is null";
        return actual == expected ? "" : difference(*actual, *expected);
    }

    template <class T> std::string difference(T const& actual, T const& expected)
    {
        return sameBits(actual, expected) ? "" : " differs";
    }

    std::string difference(PropertyValue const& actual, PropertyValue const& expected)
    {
        if (actual.type() != expected.type())
            return std::string(" has type ") + actual.type().name() + " instead of " + expected.type().name();
        std::string found;
        auto const compare = [&]<class T>(T const* held) {
            if (held)
                found = difference(*held, *expected.get<T>());
        };
        compare(actual.get<Orvan::Ptr<Object>>());
        compare(actual.get<Common::DataInterpolationMode>());
        forEachElementTypeName([&]<class T>(ElementType<T>) {
            compare(actual.get<T>());
            compare(actual.get<Orvan::Ptr<Orvan::Array<T>>>());
        });
        return found;
    }

    std::string difference(Object const& actual, Object const& expected)
    {
        if (auto const found = difference(*actual.keys(), *expected.keys()); !found.empty())
            return " keys" + found;
        Orvan::Ptr<Orvan::Array<Orvan::String>> const keys = expected.keys();
        for (Orvan::String const& key : *keys)
            if (auto const found = difference(actual.getProperty(key), expected.getProperty(key)); !found.empty())
                return std::string(" ") + key.c_str() + found;
        return {};
    }

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

    template <class T> void addData(Orvan::String const& name, Orvan::String const& target, std::size_t length,
        bool withDefault, Random& random, Object& object)
    {
        Orvan::Array<T> values(length);
        for (T& value : values)
            value = randomValue<T>(random);
        addDataProperty<T>(name, target, std::move(values), object, withDefault ? randomValue<T>(random) : T{});
    }

    void addDataOfAnyType(
        Orvan::String const& name, Orvan::String const& target, std::size_t length, Random& random, Object& object)
    {
        unsigned int type = random.below(40); // counts down
        forEachElementTypeName([&]<class T>(ElementType<T>) {
            if (type-- == 0)
                addData<T>(name, target, length, true, random, object);
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
            if (random.below(12) == 0)
                replaceIn(dataName, sData, Orvan::Ptr<Orvan::Array<float>>(), object);
        }
        if (random.below(12) == 0) {
            Orvan::String rangeName = name;
            rangeName += "range";
            addRangeProperty(rangeName, name, {0}, object); // a range of a range
        }
    }

}

testing::AssertionResult sameContents(Object const& actual, Object const& expected)
{
    std::string const found = difference(actual, expected);
    return found.empty() ? testing::AssertionSuccess() : testing::AssertionFailure() << "in" << found;
}

Orvan::MutablePtr<Object> deepCopy(Object const& object)
{
    Orvan::MutablePtr<Object> copy = Tessara::createObject();
    Orvan::Ptr<Orvan::Array<Orvan::String>> const keys = object.keys();
    for (Orvan::String const& key : *keys) {
        PropertyValue const value = object.getProperty(key);
        copy->setProperty(key, PropertyValue(value));
        if (auto const* const held = value.get<Orvan::Ptr<Object>>(); held && *held)
            copy->setProperty(key, Orvan::Ptr<Object>(deepCopy(**held)));
        visitArray(value, [&]<class T>(Orvan::Array<T> const& array, auto) {
            copy->setProperty(key, Orvan::makePtr<Orvan::Array<T>>(array));
        });
    }
    return copy;
}

void replaceIn(Orvan::String const& name, char const* key, PropertyValue value, Object& object)
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
        PropertyValue const odd[] = {
            Orvan::Ptr<Orvan::Array<float>>(), {}, 1.5f}; // operations do not know the last type
        if (kind < 7)
            replaceIn(name, sData, odd[kind - 4], object);
        else if (kind == 7)
            replaceIn(name, sDefault, {}, object);
        else if (kind == 8)
            object.setProperty("same", object.getProperty(name));
    }
}

void addAllTypes(Orvan::String const& component, Random& random, Object& object, bool withDefaults)
{
    forEachElementTypeName([&]<class T>(ElementType<T> type) {
        Orvan::String name = component;
        name += type.name;
        addData<T>(name, component, getElementCount(object, component), withDefaults, random, object);
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
        PropertyValue value = object.getProperty(key);
        auto const property = value.get<Orvan::Ptr<Object>>() ? *value.get<Orvan::Ptr<Object>>() : nullptr;
        if (holders == Holders::Properties)
            holder.setProperty(key, std::move(value));
        else if (holders == Holders::Arrays && property)
            holder.setProperty(key, property->getProperty(property->hasProperty(sData) ? sData : sIndices));
    }
    return holder;
}

Counts countsOf(Object const& mesh)
{
    return {
        getElementCount(mesh, sPointComp), getElementCount(mesh, sFaceVertexComp), getElementCount(mesh, sFaceComp)};
}

testing::AssertionResult isClosedManifold(Object const& mesh)
{
    if (auto const valid = isValid(mesh); !valid)
        return valid;
    auto const corners = dataOf<unsigned int>(mesh, sFaceVertex), offsets = dataOf<unsigned int>(mesh, sFaceOffset);
    // For each directed edge the point before it in its face: around the start of the edge, each face leads from one
    // neighbor to the next.
    std::map<std::pair<unsigned int, unsigned int>, unsigned int> before;
    std::map<unsigned int, unsigned int> valences;
    for (std::size_t face = 0; face + 1 < offsets->size; ++face) {
        std::span const points(corners->data + (*offsets)[face], corners->data + (*offsets)[face + 1]);
        for (std::size_t k = 0; k != points.size(); ++k) {
            unsigned int const start = points[k], end = points[(k + 1) % points.size()];
            if (start == end
                || !before.try_emplace({start, end}, points[(k + points.size() - 1) % points.size()]).second)
                return testing::AssertionFailure() << "twice or without length: edge " << start << " to " << end;
            ++valences[start];
        }
    }
    for (auto const& [edge, previous] : before)
        if (!before.contains({edge.second, edge.first}))
            return testing::AssertionFailure() << "boundary from point " << edge.first << " to " << edge.second;
    for (auto const& [point, valence] : valences) {
        auto const first = before.lower_bound({point, 0});
        unsigned int steps = 1;
        for (unsigned int neighbor = first->second; neighbor != first->first.second; ++steps)
            neighbor = before.at({point, neighbor});
        if (steps != valence)
            return testing::AssertionFailure() << "more than one fan of faces around point " << point;
    }
    return testing::AssertionSuccess();
}

testing::AssertionResult isValid(Object const& geometry)
{
    GeoValidator::Status const status = geometry.hasProperty(sFaceComp) ? validateMesh(geometry)
        : geometry.hasProperty(sStrandComp)                             ? StrandValidator().validate(geometry)
                                                                        : PointCloudValidator().validate(geometry);
    if (status)
        return testing::AssertionSuccess();
    return testing::AssertionFailure() << status.message().c_str();
}

std::uint64_t fingerprint(Object const& geometry)
{
    std::uint64_t hash = 0xCBF29CE484222325u;
    for (char const* const name : {sPointPosition, sFaceVertex, sFaceOffset})
        if (auto const property = getDataGeoProperty(geometry, name))
            visitArray(property->getProperty(sData), [&](auto const& array, auto) {
                auto const* const bytes = reinterpret_cast<unsigned char const*>(array.data);
                for (std::size_t i = 0; i != array.size * sizeof(array[0]); ++i)
                    hash = (hash ^ bytes[i]) * 0x100000001B3u; // FNV-1a
            });
    return hash;
}

}
