#include "frame/ElementTypes.h"

#include "host/GeoProperties.h"

#include <TessaraGeometry/ElementTypes.h>

#include <gtest/gtest.h>

#include <typeindex>
#include <vector>

using namespace Modeling;
using Tessara::PropertyValue;

namespace {

using Types = std::vector<std::type_index>;

/// The types for which a rule ran.
template <class List, class Form> Types matchesOf(PropertyValue const* value, bool answer = true)
{
    Types matches;
    bool result = false;
    forEachElementType<List, Form>(value, &result, [&]<class Held>(Held&) {
        matches.push_back(typeid(Held));
        return answer;
    });
    EXPECT_EQ(result, answer && !matches.empty());
    return matches;
}

template <class... T> Types typesOf(ElementTypeList<T...>)
{
    return {typeid(T)...};
}

}

TEST(ElementTypes, areTheHostsFortyAndMatchOneTypeInOneForm)
{
    struct Sample {
        PropertyValue plain, array;
        std::type_index plainType, arrayType;
    };
    std::vector<Sample> samples;
    Types expected;
    Tessara::Geometry::forEachElementTypeName([&]<class T>(Tessara::Geometry::ElementType<T>) {
        using Array = Orvan::Ptr<Orvan::Array<T>>;
        samples.push_back({T{}, Array(Orvan::makePtr<Orvan::Array<T>>()), typeid(T), typeid(Array)});
        expected.push_back(typeid(T));
    });
    EXPECT_EQ(expected.size(), 40u);
    EXPECT_EQ(typesOf(AllElementTypes{}), expected);
    EXPECT_EQ(typesOf(CoreElementTypes{}), Types(expected.begin(), expected.begin() + 36));
    for (std::size_t i = 0; i != samples.size(); ++i) {
        auto const& [plain, array, plainType, arrayType] = samples[i];
        std::size_t const inCore = i < 36 ? 1 : 0;
        EXPECT_EQ((matchesOf<AllElementTypes, ArrayForm>(&array)), Types{arrayType});
        EXPECT_EQ((matchesOf<AllElementTypes, PlainForm>(&plain)), Types{plainType});
        EXPECT_EQ((matchesOf<CoreElementTypes, ArrayForm>(&array, false).size()), inCore);
        EXPECT_EQ((matchesOf<CoreElementTypes, PlainForm>(&plain).size()), inCore);
        EXPECT_TRUE((matchesOf<AllElementTypes, PlainForm>(&array).empty()));
        EXPECT_TRUE((matchesOf<AllElementTypes, ArrayForm>(&plain).empty()));
    }
    PropertyValue const nothing;
    EXPECT_TRUE((matchesOf<AllElementTypes, ArrayForm>(nullptr).empty()));
    EXPECT_TRUE((matchesOf<AllElementTypes, PlainForm>(&nothing).empty()));
}
