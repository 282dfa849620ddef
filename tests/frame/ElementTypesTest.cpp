#include "frame/ElementTypes.h"

#include "host/GeoProperties.h"

#include <TessaraGeometry/ElementTypes.h>

#include <gtest/gtest.h>

#include <typeinfo>
#include <vector>

using namespace Modeling;
using Tessara::PropertyValue;

namespace {

/// The element types for which a rule ran.
template <class List, class Form>
std::vector<std::type_info const*> matchesOf(PropertyValue const* value, bool answer = true)
{
    std::vector<std::type_info const*> matches;
    bool result = false;
    forEachElementType<List, Form>(value, &result, [&]<class Held>(Held&) {
        matches.push_back(&typeid(Held));
        return answer;
    });
    EXPECT_EQ(result, answer && !matches.empty());
    return matches;
}

template <class T> PropertyValue emptyArrayOf()
{
    return Orvan::makePtr<Orvan::Array<T>>();
}

template <class... T> std::vector<std::type_info const*> typesOf(ElementTypeList<T...>)
{
    return {&typeid(T)...};
}

}

TEST(ElementTypes, areTheHostsFortyInTheirOrder)
{
    std::vector<std::type_info const*> expected;
    Tessara::Geometry::forEachElementTypeName(
        [&]<class T>(Tessara::Geometry::ElementType<T>) { expected.push_back(&typeid(T)); });
    auto const all = typesOf(AllElementTypes{});
    auto const core = typesOf(CoreElementTypes{});
    ASSERT_EQ(all.size(), 40u);
    ASSERT_EQ(core.size(), 36u);
    for (std::size_t i = 0; i != 40; ++i) {
        EXPECT_EQ(*all[i], *expected[i]) << i;
        if (i < 36) {
            EXPECT_EQ(*core[i], *expected[i]) << i;
        }
    }
}

TEST(ElementTypes, matchExactlyOneTypeInExactlyOneForm)
{
    std::size_t number = 0;
    Tessara::Geometry::forEachElementTypeName([&]<class T>(Tessara::Geometry::ElementType<T> type) {
        SCOPED_TRACE(type.name);
        bool const isCore = number++ < 36;
        PropertyValue const array = emptyArrayOf<T>();
        PropertyValue const plain = T{};
        auto const arrayMatches = matchesOf<AllElementTypes, ArrayForm>(&array);
        ASSERT_EQ(arrayMatches.size(), 1u);
        EXPECT_EQ(*arrayMatches[0], typeid(Orvan::Ptr<Orvan::Array<T>>));
        auto const plainMatches = matchesOf<AllElementTypes, PlainForm>(&plain);
        ASSERT_EQ(plainMatches.size(), 1u);
        EXPECT_EQ(*plainMatches[0], typeid(T));
        EXPECT_EQ((matchesOf<CoreElementTypes, ArrayForm>(&array).size()), isCore ? 1u : 0u);
        EXPECT_EQ((matchesOf<CoreElementTypes, PlainForm>(&plain).size()), isCore ? 1u : 0u);
        EXPECT_TRUE((matchesOf<AllElementTypes, PlainForm>(&array).empty()));
        EXPECT_TRUE((matchesOf<AllElementTypes, ArrayForm>(&plain).empty()));
    });
}

TEST(ElementTypes, runNoRuleWithoutAListedValue)
{
    PropertyValue const nothing;
    PropertyValue const interpolation = Tessara::Geometry::Common::DataInterpolationMode::Linear;
    for (PropertyValue const* const value : {static_cast<PropertyValue const*>(nullptr), &nothing, &interpolation}) {
        EXPECT_TRUE((matchesOf<AllElementTypes, ArrayForm>(value).empty()));
        EXPECT_TRUE((matchesOf<AllElementTypes, PlainForm>(value).empty()));
    }
    PropertyValue const refused = emptyArrayOf<float>();
    EXPECT_EQ((matchesOf<AllElementTypes, ArrayForm>(&refused, false).size()), 1u);
}

TEST(ElementTypes, giveTheRuleAReferenceOfItsOwn)
{
    auto const array = Orvan::makePtr<Orvan::Array<float>>(Orvan::Array<float>{1, 2});
    PropertyValue const value = array;
    bool result = false;
    forEachElementType<AllElementTypes, ArrayForm>(&value, &result, [&]<class T>(Orvan::Ptr<Orvan::Array<T>>& shared) {
        auto own = makeMutable(std::move(shared)); // has to copy: the value holds the array as well
        own->clear();
        return true;
    });
    EXPECT_TRUE(result);
    EXPECT_EQ(array->size, 2u);
    EXPECT_EQ(value.get<Orvan::Ptr<Orvan::Array<float>>>()->get(), array.get());
}
