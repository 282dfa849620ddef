#include "HostObjects.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <thread>
#include <type_traits>
#include <utility>

using namespace HostTests;

namespace {

/// Runs `work` on four threads at once.
template <class Work> void onFourThreads(Work const& work)
{
    std::vector<std::thread> threads;
    for (int thread = 0; thread < 4; ++thread)
        threads.emplace_back(work);
    for (std::thread& thread : threads)
        thread.join();
}

template <class... T> struct Types {
};
using ElementTypes = Types<signed char, short, int, long long, unsigned char, unsigned short, unsigned int,
    unsigned long long, bool, Text, float, double, Tessara::Math::int2, Tessara::Math::int2x2, Tessara::Math::int2x3,
    Tessara::Math::int3, Tessara::Math::float2, Tessara::Math::float4, Tessara::Math::float3, Tessara::Math::float2x2,
    Tessara::Math::float2x3, Tessara::Math::float3x3, Tessara::Math::float4x4, Tessara::Math::double2,
    Tessara::Math::double3, Tessara::Math::double4, Tessara::Math::double2x2, Tessara::Math::double2x3,
    Tessara::Math::double3x3, Tessara::Math::double4x4, Tessara::Math::short2, Tessara::Math::short2x2,
    Tessara::Math::short2x3, Tessara::Math::short3, Tessara::Math::uchar3, Tessara::Math::uchar4, Common::GeometryType,
    Common::GeoLocation, Mesh::FaceEdge, Transform::GraphTransforms>;

template <class... T, class Visit> void forEachType(Types<T...>, Visit const& visit)
{
    (visit.template operator()<T>(), ...);
}

/// In how many of the types, in both forms, a value can be read.
int typesThatRead(PropertyValue const& value)
{
    int count = 0;
    forEachType(ElementTypes(),
        [&]<class T>() { count += (value.get<T>() ? 1 : 0) + (value.get<Ptr<Orvan::Array<T>>>() ? 1 : 0); });
    return count + (value.get<Ptr<Object>>() ? 1 : 0) + (value.get<Common::DataInterpolationMode>() ? 1 : 0);
}

template <class T> void expectOnlyIn(T const& stored)
{
    PropertyValue const value{T(stored)};
    EXPECT_TRUE(value.get<T>());
    EXPECT_EQ(typesThatRead(value), 1);
}

}

TEST(Strings, AreValues)
{
    Text text("edge");
    Text const copy = text;
    text += "s";
    EXPECT_STREQ(text.c_str(), "edges");
    EXPECT_TRUE(copy == Text("edge") && copy != text && copy == "edge" && !(copy == "edges"));
    text = "corner";
    Text const moved = std::move(text);
    EXPECT_TRUE(moved == "corner" && Text().empty() && Text() == "" && !moved.empty());
}

TEST(Arrays, HaveFourFieldsInThisOrder)
{
    Orvan::Array<float3> array;
    auto const offsetOf = [&](void const* field) {
        return static_cast<char const*>(field) - reinterpret_cast<char const*>(&array);
    };
    EXPECT_EQ(offsetOf(&array.data), 0);
    EXPECT_EQ(offsetOf(&array.size), 8);
    EXPECT_EQ(offsetOf(&array.capacity), 16);
    EXPECT_EQ(offsetOf(&array.rep), 24);
    EXPECT_EQ(sizeof(array.rep), 8u);
    EXPECT_EQ(array.rep.elementSize, 12u);
    EXPECT_EQ(array.rep.elementAlignment, 4u);
    static_assert(
        std::is_same_v<decltype(array.size), std::uint64_t> && std::is_same_v<decltype(array.capacity), std::uint64_t>);
    static_assert(sizeof(Orvan::Array<bool>().data[0]) == 1);
}

TEST(Arrays, GrowByTheRuleAndNeverShrinkTheirMemory)
{
    Indices array;
    std::vector<std::uint64_t> capacities;
    for (unsigned int i = 0; i < 5; ++i) {
        array.append(i);
        capacities.push_back(array.capacity);
    }
    EXPECT_EQ(capacities, (std::vector<std::uint64_t>{1, 2, 4, 4, 8}));
    array.resize(20); // 15 more, and only 3 fit
    EXPECT_EQ(array.capacity, 8u + 15u);
    EXPECT_EQ(array.data[4], 4u);
    EXPECT_EQ(array.data[19], 0u);
    unsigned int const* const data = array.data;
    array.resize(2);
    EXPECT_TRUE(array.data == data && array.size == 2 && array.capacity == 23);
    array.resize(3);
    EXPECT_EQ(array.data[2], 0u) << "new elements are zero, whatever was there before";
}

TEST(Arrays, CopyDeeplyAndMoveTheirMemory)
{
    Orvan::Array<Text> names = arrayOf<Text>({"a", "a name that is too long to be stored in the string itself"});
    Orvan::Array<Text> copy = names;
    copy.data[0] = "b";
    EXPECT_TRUE(names.data[0] == "a" && copy.data[1] == names.data[1]);
    Text const* const data = names.data;
    Orvan::Array<Text> const moved = std::move(names);
    EXPECT_TRUE(moved.data == data && moved.size == 2);
    EXPECT_EQ(Orvan::Array<float>(3).data[2], 0);
    EXPECT_EQ(Orvan::Array<float>(3, Orvan::kUninitialized).size, 3u);
}

TEST(Arrays, AreAlignedAndRefuseImpossibleSizes)
{
    auto const rep = Orvan::Array<double>().rep;
    void* const block = rep.allocate(1000);
    EXPECT_EQ(reinterpret_cast<std::uintptr_t>(block) % alignof(double), 0u);
    static_cast<double*>(block)[999] = 1; // the count is in elements, not bytes
    rep.deallocate(block, 1000);
    rep.deallocate(nullptr, 0);
    EXPECT_THROW(static_cast<void>(rep.allocate(std::uint64_t{1} << 61)), std::bad_alloc);
    Indices array = arrayOf<unsigned int>({1, 2});
    EXPECT_THROW(array.resize(std::uint64_t{1} << 62), std::bad_alloc);
    EXPECT_TRUE(array.size == 2 && array.data[1] == 2) << "a failure changes nothing";
}

TEST(Pointers, CopyOnWrite)
{
    EXPECT_FALSE(makeMutable(Ptr<Indices>()));
    Ptr<Indices> only = Orvan::makePtr<Indices>(arrayOf<unsigned int>({1, 2}));
    Indices const* const value = only.get();
    Orvan::MutablePtr<Indices> own = makeMutable(std::move(only));
    EXPECT_FALSE(only);
    EXPECT_EQ(own.get(), value) << "the only reference is not copied";
    Ptr<Indices> shared = std::move(own);
    EXPECT_FALSE(own);
    Ptr<Indices> const other = shared;
    EXPECT_EQ(other.get(), value);
    Orvan::MutablePtr<Indices> copy = makeMutable(std::move(shared));
    EXPECT_NE(copy.get(), value);
    copy->data[0] = 7;
    EXPECT_TRUE(other->data[0] == 1 && copy->data[1] == 2);
    Ptr<Indices> last = other;
    EXPECT_EQ(last->size, 2u);
}

TEST(Pointers, CountOnAllThreads)
{
    auto shared = Orvan::makePtr<Indices>(arrayOf<unsigned int>({1, 2}));
    Indices const* const value = shared.get();
    onFourThreads([&] {
        for (int i = 0; i < 20'000; ++i)
            Ptr<Indices> const copy = shared;
    });
    EXPECT_EQ(makeMutable(std::move(shared)).get(), value);
}

TEST(PropertyValues, HoldOneValueOfExactlyOneType)
{
    EXPECT_EQ(typesThatRead(PropertyValue()), 0);
    forEachType(ElementTypes(), []<class T>() {
        expectOnlyIn(T{});
        expectOnlyIn(Orvan::makePtr<Orvan::Array<T>>());
        expectOnlyIn(Ptr<Orvan::Array<T>>());
    });
    expectOnlyIn(static_cast<Common::DataInterpolationMode>(1));
    expectOnlyIn(Ptr<Object>());
}

TEST(PropertyValues, ShareWhatAPointerHolds)
{
    PropertyValue value = Orvan::makePtr<Indices>(arrayOf<unsigned int>({1, 2}));
    Indices const* const array = value.get<Ptr<Indices>>()->get();
    PropertyValue copy = value;
    EXPECT_EQ(copy.get<Ptr<Indices>>()->get(), array);
    PropertyValue const moved = std::move(copy);
    EXPECT_EQ(moved.get<Ptr<Indices>>()->get(), array);
    value = Text("replaced");
    EXPECT_TRUE(!value.get<Ptr<Indices>>() && *value.get<Text>() == "replaced");
    EXPECT_EQ(moved.get<Ptr<Indices>>()->get()->size, 2u);
}
