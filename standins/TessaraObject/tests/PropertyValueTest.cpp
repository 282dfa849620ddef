#include "support/Testing.h"

#include <memory>

using Orvan::Array, Orvan::Ptr, Tessara::PropertyValue;

namespace {

enum class Mode : int { First, Second };

using Wide = std::pair<std::array<double, 16>, std::shared_ptr<int>>; // too large to be stored inline

struct alignas(64) Aligned {
    int number;
};

using StoredTypes = std::tuple<signed char, char, unsigned char, short, unsigned short, int, unsigned int, long,
    long long, unsigned long long, bool, float, double, Mode, Orvan::String, Wide, Aligned, Array<int>, Ptr<Array<int>>,
    Ptr<Array<unsigned int>>, Ptr<Array<Array<int>>>, Ptr<Array<Orvan::String>>, Ptr<Tessara::Object>,
    std::shared_ptr<int>>;

template <class... Types> void expectExactTypes(std::type_identity<std::tuple<Types...>>)
{
    auto const matchCount = [](PropertyValue const& value) { return (0 + ... + (value.get<Types>() != nullptr)); };
    EXPECT_EQ(matchCount(PropertyValue()), 0);
    auto const expectOnly = [&]<class T>(std::type_identity<T>) {
        PropertyValue const value = T{};
        EXPECT_TRUE(value.get<T>() && matchCount(value) == 1 && value.type() == typeid(T)) << typeid(T).name();
        EXPECT_EQ(reinterpret_cast<std::uintptr_t>(value.get<T>()) % alignof(T), 0u) << typeid(T).name();
    };
    (expectOnly(std::type_identity<Types>()), ...);
}

static_assert(!std::is_constructible_v<PropertyValue, char const*>, "a string literal is not a value");
static_assert(!std::is_constructible_v<PropertyValue, std::unique_ptr<int>>, "values are copyable");
static_assert(std::is_nothrow_move_constructible_v<PropertyValue> && std::is_nothrow_move_assignable_v<PropertyValue>);

}

TEST(PropertyValue, DistinguishesTypesExactly)
{
    expectExactTypes(std::type_identity<StoredTypes>());
    EXPECT_TRUE(PropertyValue().empty() && PropertyValue().type() == typeid(void));
    EXPECT_FALSE(PropertyValue(Ptr<Array<int>>()).empty()) << "a null Ptr is a value";
}

TEST(PropertyValue, CopiesReferencesNotArrays)
{
    Ptr<Array<int>> const array = Orvan::makePtr<Array<int>>(3u);
    PropertyValue value = array;
    PropertyValue const copy = value;
    EXPECT_EQ(*copy.get<Ptr<Array<int>>>(), array);
    PropertyValue const moved = std::move(value);
    EXPECT_TRUE(value.empty());
    EXPECT_EQ(array.useCount(), 3u);
    value = 1;
    value = copy;
    value = *&value;
    EXPECT_EQ(array.useCount(), 4u);
    value = PropertyValue();
    EXPECT_EQ(array.useCount(), 3u);
}

TEST(PropertyValue, OwnsLargeValues)
{
    auto const watched = std::make_shared<int>(0);
    {
        PropertyValue value = Wide{{1.5}, watched};
        Wide const* const address = value.get<Wide>();
        PropertyValue copy = value;
        EXPECT_NE(copy.get<Wide>(), address);
        EXPECT_EQ(copy.get<Wide>()->first[0], 1.5);
        EXPECT_EQ(watched.use_count(), 3);
        PropertyValue moved = std::move(value);
        EXPECT_EQ(moved.get<Wide>(), address) << "a large value keeps its address when moved";
        copy = 3;
        EXPECT_EQ(watched.use_count(), 2);
        moved = *moved.get<Wide>(); // assigned from its own content
        EXPECT_EQ(moved.get<Wide>()->first[0], 1.5);
    }
    EXPECT_EQ(watched.use_count(), 1);
}
