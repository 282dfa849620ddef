#include "support/FailingAllocations.h"

#include <TessaraObject/Object.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <random>
#include <string>
#include <thread>
#include <vector>

using Orvan::Array;
using Orvan::MutablePtr;
using Orvan::Ptr;
using Orvan::String;
using Tessara::createObject;
using Tessara::Object;
using Tessara::PropertyValue;

namespace {

using Entries = std::vector<std::pair<std::string, int>>; // -1 for an empty value

Entries entriesOf(Object const& object)
{
    Entries entries;
    Ptr<Array<String>> const keys = object.keys();
    for (String const& key : *keys) {
        EXPECT_TRUE(object.hasProperty(key)) << key.c_str();
        PropertyValue const value = object.getProperty(key);
        entries.emplace_back(key.c_str(), value.empty() ? -1 : *value.get<int>());
    }
    return entries;
}

Ptr<Object> objectOf(std::vector<std::pair<String, PropertyValue>> properties)
{
    MutablePtr<Object> object = createObject();
    for (auto& [key, value] : properties)
        object->setProperty(key, std::move(value));
    return object;
}

}

TEST(Object, keepsKeysInTheOrderInWhichTheyWereFirstSet)
{
    MutablePtr<Object> const object = createObject();
    for (char const* const key : {"z", "a", "m", ""})
        object->setProperty(key, 1);
    object->setProperty("a", 2); // in its place
    object->setProperty("m", PropertyValue()); // stays
    EXPECT_EQ(entriesOf(*object), (Entries{{"z", 1}, {"a", 2}, {"m", -1}, {"", 1}}));
    object->eraseProperty("a");
    object->eraseProperty("absent");
    object->setProperty("a", 3); // behind the others now
    EXPECT_EQ(entriesOf(*object), (Entries{{"z", 1}, {"m", -1}, {"", 1}, {"a", 3}}));
    EXPECT_FALSE(object->hasProperty("absent"));
    EXPECT_TRUE(object->getProperty("absent").empty());
    object->eraseAllProperties();
    EXPECT_EQ(object->keys()->size, 0u);
    object->setProperty("a", 4);
    EXPECT_EQ(entriesOf(*object), (Entries{{"a", 4}}));
}

// Against a plain list, through the number of keys at which look-ups begin to hash, up and down.
TEST(Object, behavesAsAListOfEntries)
{
    std::mt19937 random(5);
    for (unsigned int const keyCount : {6u, 9u, 12u, 40u, 300u}) {
        MutablePtr<Object> const object = createObject();
        Entries expected;
        for (int step = 0; step < 2000; ++step) {
            std::string const key = "key" + std::to_string(random() % keyCount);
            auto const present =
                std::find_if(expected.begin(), expected.end(), [&](auto& e) { return e.first == key; });
            EXPECT_EQ(object->hasProperty(key.c_str()), present != expected.end());
            if (random() % 5 < 2) {
                object->eraseProperty(key.c_str());
                if (present != expected.end())
                    expected.erase(present);
            } else {
                object->setProperty(key.c_str(), step);
                if (present != expected.end())
                    present->second = step;
                else
                    expected.emplace_back(key, step);
            }
            if (step % 100 == 0) {
                ASSERT_EQ(entriesOf(*object), expected) << keyCount << " keys, step " << step;
            }
        }
        ASSERT_EQ(entriesOf(*object), expected) << keyCount << " keys";
    }
}

TEST(Object, holdsThousandsOfKeys)
{
    constexpr int kCount = 20'000;
    MutablePtr<Object> const object = createObject();
    Entries expected;
    for (int i = 0; i < kCount; ++i) {
        expected.emplace_back("property" + std::to_string(i), i);
        object->setProperty(expected.back().first.c_str(), i);
    }
    EXPECT_EQ(entriesOf(*object), expected);
}

TEST(Object, isClonedShallowly)
{
    Ptr<Array<int>> const array = Orvan::makePtr<Array<int>>(2u);
    Ptr<Object> original = objectOf({{"array", array}, {"number", 1}});
    Ptr<Object> const holder = original;
    MutablePtr<Object> const clone = makeMutable(std::move(original));
    EXPECT_EQ(*clone->getProperty("array").get<Ptr<Array<int>>>(), array) << "still shared";
    clone->setProperty("number", 2);
    clone->eraseProperty("array");
    EXPECT_EQ(*holder->getProperty("number").get<int>(), 1);
    EXPECT_TRUE(holder->hasProperty("array"));
    EXPECT_EQ(array.useCount(), 2u);
    EXPECT_EQ(Orvan::Internal::getDefaultClass<Object>()->keys()->size, 0u);
    EXPECT_EQ(&Orvan::Internal::getDefaultClass<Object>(), &Orvan::Internal::getDefaultClass<Object>());
}

TEST(Object, conformsToAPrototypeByContent)
{
    auto const excluding = [](Array<String> keys) {
        return PropertyValue(Orvan::makePtr<Array<String>>(std::move(keys)));
    };
    Ptr<Object> const object = objectOf({{"int", 1}, {"text", String("x")}, {"empty", PropertyValue()},
        {"null", Ptr<Object>()}, {"array", Orvan::makePtr<Array<int>>(1u)}, {"inner", objectOf({{"deep", 1.5f}})}});
    MutablePtr<Object> withoutNull = makeMutable(Ptr<Object>(object));
    withoutNull->eraseProperty("null");
    Ptr<Object> const objectWithoutNull = std::move(withoutNull);
    struct Case {
        char const* name;
        Ptr<Object> prototype;
        bool conforms;
    };
    for (auto const& [name, prototype, conforms] : std::vector<Case>{
             {"no key", objectOf({}), true},
             {"itself, but for the null", objectWithoutNull, true},
             {"same type, other value", objectOf({{"int", 2}}), true},
             {"other type", objectOf({{"int", 2u}}), false},
             {"missing key", objectOf({{"int", 1}, {"absent", 1}}), false},
             {"any value", objectOf({{"text", PropertyValue()}, {"empty", PropertyValue()}}), true},
             {"any value of a missing key", objectOf({{"absent", PropertyValue()}}), false},
             {"a type where the value is empty", objectOf({{"empty", 1}}), false},
             {"array of that type", objectOf({{"array", Ptr<Array<int>>()}}), true},
             {"array of another type", objectOf({{"array", Ptr<Array<unsigned int>>()}}), false},
             {"inner object", objectOf({{"inner", objectOf({{"deep", 0.0f}})}}), true},
             {"inner object of other content", objectOf({{"inner", objectOf({{"deep", 0.0}})}}), false},
             {"any inner object", objectOf({{"inner", Ptr<Object>()}}), true},
             {"inner object where there is null", objectOf({{"null", Ptr<Object>()}}), false},
             {"inner object where there is a number", objectOf({{"int", Ptr<Object>()}}), false},
             {"excluded key is absent", objectOf({{Object::kExcludedKeys, excluding({"a", "b"})}}), true},
             {"excluded key is there", objectOf({{Object::kExcludedKeys, excluding({"a", "int"})}}), false},
         })
        EXPECT_EQ(Object::isA(*object, *prototype), conforms) << name;
}

TEST(Object, isAsItWasWhenAllocationFails)
{
    for (std::size_t const keyCount : {0u, 8u, 15u, 16u, 32u}) // before the steps at which tables grow, and in between
        TestSupport::sweepFailingAllocations([&](TestSupport::Attempt const& attempt) {
            MutablePtr<Object> const object = createObject();
            Entries expected;
            for (std::size_t i = 0; i < keyCount; ++i) {
                expected.emplace_back("key" + std::to_string(i), 0);
                object->setProperty(expected.back().first.c_str(), 0);
            }
            if (attempt([&] { object->setProperty("a new key that is too long for the text itself", 1); }))
                expected.emplace_back("a new key that is too long for the text itself", 1);
            EXPECT_EQ(entriesOf(*object), expected);
        });
    TestSupport::sweepFailingAllocations([](TestSupport::Attempt const& attempt) {
        MutablePtr<Object> const object = createObject();
        object->setProperty("key", 1);
        EXPECT_TRUE(attempt([&] { object->setProperty("key", String("short")); })) << "replacing takes no memory";
        EXPECT_TRUE(object->getProperty("key").get<String>());
    });
}

TEST(Object, isReadByManyThreadsAtOnce)
{
    std::vector<std::pair<String, PropertyValue>> properties;
    for (int i = 0; i < 50; ++i)
        properties.emplace_back(("key" + std::to_string(i)).c_str(), Orvan::makePtr<Array<int>>(Array<int>{i}));
    Ptr<Object> const object = objectOf(std::move(properties));
    std::vector<std::thread> threads;
    for (int thread = 0; thread < 4; ++thread)
        threads.emplace_back([object] {
            for (int i = 0; i < 50; ++i) {
                PropertyValue const value = object->getProperty(("key" + std::to_string(i)).c_str());
                EXPECT_EQ((**value.get<Ptr<Array<int>>>())[0], i);
                EXPECT_TRUE(Object::isA(*object, *object));
                MutablePtr<Object> const copy = makeMutable(Ptr<Object>(object));
                copy->eraseProperty("key0");
                EXPECT_EQ(object->keys()->size, 50u);
            }
        });
    for (std::thread& thread : threads)
        thread.join();
}
