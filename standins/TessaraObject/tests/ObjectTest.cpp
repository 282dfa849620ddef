#include "support/Testing.h"

using Orvan::Array, Orvan::MutablePtr, Orvan::Ptr, Orvan::String;
using Tessara::createObject, Tessara::Object, Tessara::PropertyValue;

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

// Compares with a plain list, for key counts below and above the one at which lookups start to hash.
TEST(Object, BehavesLikeAListInInsertionOrder)
{
    TestSupport::Random random(5);
    for (unsigned int const keyCount : {3u, 6u, 9u, 12u, 40u, 300u, 1500u}) {
        MutablePtr<Object> const object = createObject();
        Entries expected;
        for (int step = 0; step <= 2000; ++step) {
            std::string const key(std::to_string(random.below(keyCount)).substr(keyCount == 3)); // sometimes empty
            auto const present = std::ranges::find(expected, key, &Entries::value_type::first);
            EXPECT_EQ(object->hasProperty(key.c_str()), present != expected.end());
            EXPECT_EQ(object->getProperty(key.c_str()).empty(), present == expected.end() || present->second == -1);
            if (random.below(5) < 2) {
                object->eraseProperty(key.c_str());
                if (present != expected.end())
                    expected.erase(present);
            } else {
                int const value = step % 7 == 0 ? -1 : step;
                object->setProperty(key.c_str(), value == -1 ? PropertyValue() : PropertyValue(value));
                if (present != expected.end())
                    present->second = value;
                else
                    expected.emplace_back(key, value);
            }
            if (step == 1500) {
                object->eraseAllProperties();
                expected.clear();
            }
            ASSERT_TRUE(step % 100 != 0 || entriesOf(*object) == expected) << keyCount << " keys, step " << step;
        }
    }
}

// Listing keys reads ahead in held objects, whatever they hold and however many they are.
TEST(Object, ListsKeysOfHeldObjectsWithoutChangingThem)
{
    for (unsigned int const keyCount : {1u, 15u, 16u, 17u, 40u}) {
        Ptr<Object> const held = objectOf({{"array", Orvan::makePtr<Array<int>>(2u)}, {"no array", Ptr<Array<int>>()},
            {"no object", Ptr<Object>()}, {"text", String("text")}, {"nothing", PropertyValue()}});
        MutablePtr<Object> const object = createObject();
        for (unsigned int key = 0; key != keyCount; ++key) {
            object->setProperty(std::to_string(key).c_str(), held);
            object->setProperty(("null " + std::to_string(key)).c_str(), Ptr<Object>());
            object->setProperty(("empty " + std::to_string(key)).c_str(), Ptr<Object>(createObject()));
        }
        EXPECT_EQ(object->keys()->size, 3 * keyCount);
        EXPECT_EQ(held.useCount(), 1 + keyCount);
    }
}

TEST(Object, ClonesShallowly)
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
}

TEST(Object, ConformsToPrototypesByContent)
{
    auto const excluding = [](Array<String> keys) {
        return PropertyValue(Orvan::makePtr<Array<String>>(std::move(keys)));
    };
    Ptr<Object> const object = objectOf({{"int", 1}, {"text", String("x")}, {"empty", PropertyValue()},
        {"null", Ptr<Object>()}, {"array", Orvan::makePtr<Array<int>>(1u)}, {"inner", objectOf({{"deep", 1.5f}})}});
    struct Case {
        char const* name;
        Ptr<Object> prototype;
        bool conforms;
    };
    for (auto const& [name, prototype, conforms] : std::vector<Case>{
             {"no key", objectOf({}), true},
             {"same type, different value", objectOf({{"int", 2}}), true},
             {"different type", objectOf({{"int", 2u}}), false},
             {"missing key", objectOf({{"int", 1}, {"absent", 1}}), false},
             {"any value", objectOf({{"text", PropertyValue()}, {"empty", PropertyValue()}}), true},
             {"any value, but the key is missing", objectOf({{"absent", PropertyValue()}}), false},
             {"a type, but the value is empty", objectOf({{"empty", 1}}), false},
             {"array of that type", objectOf({{"array", Ptr<Array<int>>()}}), true},
             {"array of another type", objectOf({{"array", Ptr<Array<unsigned int>>()}}), false},
             {"inner object", objectOf({{"inner", objectOf({{"deep", 0.0f}})}}), true},
             {"inner object with other content", objectOf({{"inner", objectOf({{"deep", 0.0}})}}), false},
             {"any inner object", objectOf({{"inner", Ptr<Object>()}}), true},
             {"inner object, but the value is null", objectOf({{"null", Ptr<Object>()}}), false},
             {"inner object, but the value is a number", objectOf({{"int", Ptr<Object>()}}), false},
             {"excluded key is absent", objectOf({{Object::kExcludedKeys, excluding({"a", "b"})}}), true},
             {"excluded key is present", objectOf({{Object::kExcludedKeys, excluding({"a", "int"})}}), false},
             {"excluded value is present", objectOf({{Object::kExcludedKeys, objectOf({{"int", 0}})}}), false},
             {"excluded key has another value", objectOf({{Object::kExcludedKeys, objectOf({{"int", 0.5f}})}}), true},
         })
        EXPECT_EQ(Object::isA(*object, *prototype), conforms) << name;
}

TEST(Object, IsUnchangedWhenAnAllocationFails)
{
    for (std::size_t const keyCount : {1u, 8u, 15u, 16u, 32u}) // just before a table grows, and in between
        TestSupport::sweepFailingAllocations([&](TestSupport::Attempt const& attempt) {
            MutablePtr<Object> const object = createObject();
            Entries expected;
            for (std::size_t i = 0; i < keyCount; ++i) {
                expected.emplace_back("key" + std::to_string(i), 0);
                object->setProperty(expected.back().first.c_str(), 0);
            }
            EXPECT_TRUE(attempt([&] { object->setProperty("key0", PropertyValue()); }))
                << "replacing does not allocate";
            expected[0].second = -1;
            if (attempt([&] { object->setProperty("a new key that is too long to be stored inline", 1); }))
                expected.emplace_back("a new key that is too long to be stored inline", 1);
            EXPECT_EQ(entriesOf(*object), expected);
        });
}
