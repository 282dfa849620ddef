#include "Compare.h"

#include <TessaraGeometry/ElementTypes.h>

#include <cstring>
#include <functional>
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

    /// Calls `visit.operator()<T>()` with every type that a property value may hold.
    template <class Visit> void forEachHeldType(Visit const& visit)
    {
        visit.template operator()<Orvan::Ptr<Object>>();
        visit.template operator()<Common::DataInterpolationMode>();
        forEachElementTypeName([&]<class T>(ElementType<T>) {
            visit.template operator()<T>();
            visit.template operator()<Orvan::Ptr<Orvan::Array<T>>>();
        });
    }

    std::string difference(PropertyValue const& actual, PropertyValue const& expected)
    {
        if (actual.type() != expected.type())
            return std::string(" has type ") + actual.type().name() + " instead of " + expected.type().name();
        std::string found;
        forEachHeldType([&]<class T>() {
            if (T const* const a = actual.get<T>())
                found = difference(*a, *expected.get<T>());
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
        auto const copyDeeply = [&]<class Held>(Orvan::Ptr<Held> const& held) {
            if constexpr (std::is_same_v<Held, Object>)
                copy->setProperty(key, held ? Orvan::Ptr<Object>(deepCopy(*held)) : held);
            else
                copy->setProperty(key, held ? Orvan::makePtr<Held>(*held) : held);
        };
        forEachHeldType([&]<class T>() {
            if constexpr (requires(T const& held) { copyDeeply(held); })
                if (T const* const held = value.get<T>())
                    copyDeeply(*held);
        });
    }
    return copy;
}

}
