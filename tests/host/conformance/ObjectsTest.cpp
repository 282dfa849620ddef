#include "HostObjects.h"
#include "NoAllocations.h"

#include <TessaraGeometry/Prototypes.h>
#include <TessaraGeometry/Validators.h>

#include <gtest/gtest.h>

#include <atomic>
#include <thread>

using namespace HostTests;

namespace {

using Names = std::multiset<std::string>;

/// Whether it is of exactly this kind.
bool isOnly(Object const& property, Ptr<Object> const& kind)
{
    int kinds = 0;
    for (Ptr<Object> const& other :
        {getComponentGeoPropPrototype(), getRangeGeoPropPrototype(), getDataGeoPropPrototype(sGenericDataGeoProp)})
        kinds += Object::isA(property, *other) ? 1 : 0;
    return kinds == 1 && Object::isA(property, *kind);
}

/// A cloud of two points with data, a range and data of the range.
Orvan::MutablePtr<Object> makeAnnotatedCloud()
{
    auto cloud = makeCloud(arrayOf<float3>({{0, 0, 0}, {1, 0, 0}}));
    addData<int>("weight", sPointComp, arrayOf({1, 2}), 7, *cloud);
    addRange("palette entry", sPointComp, arrayOf<unsigned int>({0, kInvalidIndex}), *cloud);
    addData<Text>("palette", "palette entry", arrayOf<Text>({"red"}), "none", *cloud);
    cloud->setProperty("title", Text("not geometry"));
    return cloud;
}

}

TEST(Objects, StoreValuesUnderKeys)
{
    auto const object = Tessara::createObject();
    EXPECT_TRUE(object->keys() && object->keys()->size == 0 && !object->hasProperty("a"));
    EXPECT_FALSE(object->getProperty("a").get<int>());
    object->setProperty("a", 1);
    object->setProperty("b", 2);
    object->setProperty("a", Text("one"));
    object->setProperty("empty", PropertyValue());
    EXPECT_TRUE(object->hasProperty("empty")) << "a key with an empty value is present";
    EXPECT_EQ(namesIn(*object->keys()), (Names{"a", "b", "empty"}));
    EXPECT_TRUE(*object->getProperty("a").get<Text>() == "one" && *object->getProperty("b").get<int>() == 2);
    object->eraseProperty("b");
    object->eraseProperty("absent");
    EXPECT_FALSE(object->hasProperty("b"));
    EXPECT_EQ(elementsOf(object->keys()), elementsOf(object->keys())) << "the order is that of the last call";
    object->eraseAllProperties();
    EXPECT_EQ(object->keys()->size, 0u);
}

TEST(Objects, AreClonedWithoutTheirArrays)
{
    Ptr<Object> original = Tessara::createObject();
    {
        auto changed = makeMutable(std::move(original));
        changed->setProperty("array", Orvan::makePtr<Indices>(3u));
        original = std::move(changed);
    }
    Ptr<Object> shared = original;
    auto const clone = makeMutable(std::move(shared));
    ASSERT_NE(clone.get(), original.get());
    auto const arrayIn = [](Object const& object) { return valueIn<Ptr<Indices>>(object.getProperty("array")).get(); };
    EXPECT_EQ(arrayIn(*clone), arrayIn(*original));
    clone->setProperty("array", Ptr<Indices>());
    clone->setProperty("more", 1);
    EXPECT_TRUE(arrayIn(*original) && !original->hasProperty("more"));
}

TEST(Objects, AllowArraysToBeEditedInPlace)
{
    auto const cloud = makeAnnotatedCloud();
    Ptr<Orvan::Array<int>> array = dataOf<int>(*cloud, "weight");
    Orvan::Array<int> const* const before = array.get();
    auto property = makeMutable(propertyOf(*cloud, "weight"));
    property->setProperty(sData, Ptr<Orvan::Array<int>>());
    cloud->setProperty("weight", Ptr<Object>(std::move(property)));
    EXPECT_EQ(makeMutable(std::move(array)).get(), before) << "the object has released its reference";
}

TEST(Objects, AllocateNothingToReplaceEraseOrCount)
{
    auto const cloud = makeAnnotatedCloud();
    Text const key = "weight", component = sPointComp;
    setElementCount(component, 2, *cloud); // from now on, the component belongs to this object only
    PropertyValue value = propertyOf(*cloud, "palette");
    bool isCounted = false;
    {
        NoAllocations const guard;
        cloud->setProperty(key, std::move(value));
        isCounted = setElementCount(component, 1, *cloud);
        cloud->eraseProperty(key);
    }
    EXPECT_TRUE(isCounted && getElementCount(*cloud, sPointComp) == 1 && !cloud->hasProperty("weight"));
}

TEST(Objects, CanBeReadOnAllThreads)
{
    Ptr<Object> const cloud = makeAnnotatedCloud();
    std::atomic<int> failures = 0;
    auto const read = [&] {
        for (int i = 0; i < 500; ++i) {
            bool const isRight = cloud->hasProperty("weight") && namesIn(*cloud->keys()).contains("palette")
                && dataOf<int>(*cloud, "weight")->size == 2 && getElementCount(*cloud, sPointComp) == 2
                && getDataGeoProperty(*cloud, "palette") && getRangeGeoProperty(*cloud, "palette entry")
                && getRangeGeoPropIndices(*cloud, "palette entry")->size == 2
                && getTargetComponent(*cloud, "palette") == sPointComp
                && getGeoPropTargetName(*cloud, "weight") == sPointComp && PointCloudValidator().validate(*cloud);
            failures += isRight ? 0 : 1;
        }
    };
    std::vector<std::thread> threads;
    for (int thread = 0; thread < 4; ++thread)
        threads.emplace_back(read);
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_EQ(failures, 0);
}

TEST(Objects, HaveASharedDefault)
{
    auto const& instance = Orvan::Internal::getDefaultClass<Object>();
    EXPECT_TRUE(instance && &instance == &Orvan::Internal::getDefaultClass<Object>());
}

TEST(Names, AreDistinctAndSentinelsAreNoIndices)
{
    Names const names{
        sPointComp, sFaceComp, sFaceVertexComp, sStrandComp, sPointPosition, sFaceVertex, sFaceOffset, sStrandOffset};
    EXPECT_EQ(std::set<std::string>(names.begin(), names.end()).size(), 8u);
    Names const inner{sData, sTarget, sDefault, sInterp, sDependsOn, sIndices};
    EXPECT_EQ(std::set<std::string>(inner.begin(), inner.end()).size(), 6u);
    EXPECT_TRUE(kInvalidIndex != kDeletedElement && kInvalidIndex >= 0xFFFFFF00 && kDeletedElement >= 0xFFFFFF00);
}

TEST(Geometry, IsPopulatedWithComponentsAndStandardData)
{
    struct Case {
        void (*populate)(Object&);
        Names components, data;
    };
    for (Case const& kind :
        {Case{populateMesh, {sPointComp, sFaceComp, sFaceVertexComp}, {sPointPosition, sFaceVertex, sFaceOffset}},
            Case{populatePointCloud, {sPointComp}, {sPointPosition}},
            Case{populateStrand, {sPointComp, sStrandComp}, {sPointPosition, sStrandOffset}}}) {
        auto const object = Tessara::createObject();
        kind.populate(*object);
        EXPECT_EQ(namesIn(getGeoPropNamesByPrototype(*object, *getComponentGeoPropPrototype())), kind.components);
        EXPECT_EQ(
            namesIn(getGeoPropNamesByPrototype(*object, *getDataGeoPropPrototype(sGenericDataGeoProp))), kind.data);
        for (std::string const& component : kind.components) {
            EXPECT_EQ(getElementCount(*object, component.c_str()), 0u);
            EXPECT_TRUE(isOnly(*propertyOf(*object, component.c_str()), getComponentGeoPropPrototype()));
        }
        for (std::string const& name : kind.data) {
            EXPECT_TRUE(kind.components.contains(getGeoPropTargetName(*object, name.c_str()).c_str()));
            Ptr<Object> const property = propertyOf(*object, name.c_str());
            bool const isPosition = name == sPointPosition;
            EXPECT_TRUE(isPosition ? bool(dataOf<float3>(*object, name.c_str()))
                                   : bool(dataOf<unsigned int>(*object, name.c_str())));
            PropertyValue const value = property->getProperty(sDefault);
            EXPECT_TRUE(isPosition ? value.get<float3>() != nullptr : value.get<unsigned int>() != nullptr);
        }
    }
}

TEST(Geometry, ConformsToItsPrototypes)
{
    auto const mesh = makeOctahedron();
    Ptr<Object> const cloud = makeAnnotatedCloud();
    EXPECT_TRUE(Object::isA(*mesh, *getMeshPrototype()) && !Object::isA(*cloud, *getMeshPrototype()));
    EXPECT_TRUE(Object::isA(*cloud, *getPointCloudPrototype()));
    EXPECT_FALSE(Object::isA(*Tessara::createObject(), *getPointCloudPrototype()));
    EXPECT_TRUE(isOnly(*propertyOf(*cloud, sPointComp), getComponentGeoPropPrototype()));
    EXPECT_TRUE(isOnly(*propertyOf(*cloud, "palette entry"), getRangeGeoPropPrototype()));
    for (char const* const name : {"weight", "palette", sPointPosition})
        EXPECT_TRUE(isOnly(*propertyOf(*cloud, name), getDataGeoPropPrototype(sGenericDataGeoProp))) << name;
}

TEST(Geometry, CountsElements)
{
    Ptr<Object> const original = makeAnnotatedCloud();
    Ptr<Object> shared = original;
    auto const cloud = makeMutable(std::move(shared));
    EXPECT_TRUE(setElementCount(sPointComp, 9, *cloud));
    EXPECT_EQ(getElementCount(*cloud, sPointComp), 9u);
    EXPECT_EQ(getElementCount(*original, sPointComp), 2u) << "another object that has the component too";
    EXPECT_EQ(dataOf<int>(*cloud, "weight")->size, 2u) << "arrays keep their lengths";
    EXPECT_FALSE(setElementCount(sFaceComp, 9, *cloud));
    EXPECT_EQ(getElementCount(*cloud, sFaceComp), 0u);
}

TEST(Geometry, IsLookedUpByNameTargetAndKind)
{
    auto const cloud = makeAnnotatedCloud();
    EXPECT_EQ(namesIn(getGeoPropNamesByTarget(*cloud, sPointComp)), (Names{"palette entry", "weight", sPointPosition}));
    EXPECT_EQ(namesIn(getGeoPropNamesByTarget(*cloud, "palette entry")), Names{"palette"});
    EXPECT_EQ(getGeoPropsByPrototype(*cloud, *getRangeGeoPropPrototype()).size, 1u);
    EXPECT_TRUE(getGeoPropTargetName(*cloud, "palette") == "palette entry");
    for (char const* const name : {"weight", "palette entry", "palette"})
        EXPECT_TRUE(getTargetComponent(*cloud, name) == sPointComp) << name;
    EXPECT_TRUE(getTargetComponent(*cloud, "title").empty() && getTargetComponent(*cloud, "absent").empty());
    EXPECT_TRUE(getDataGeoProperty(*cloud, "weight") && !getDataGeoProperty(*cloud, "palette entry"));
    EXPECT_TRUE(getRangeGeoProperty(*cloud, "palette entry") && !getRangeGeoProperty(*cloud, "weight"));
    EXPECT_FALSE(getDataGeoProperty(*cloud, "absent") || getRangeGeoProperty(*cloud, "title"));
}

TEST(Geometry, HasRangesAndTags)
{
    auto const cloud = makeAnnotatedCloud();
    auto const before = getRangeGeoPropIndices(*cloud, "palette entry");
    EXPECT_EQ(elementsOf(before), (std::vector<unsigned int>{0, kInvalidIndex}));
    EXPECT_EQ(getRangeGeoPropIndices(*propertyOf(*cloud, "palette entry")).get(), before.get());
    EXPECT_TRUE(setRangeGeoPropIndices("palette entry", Orvan::makePtr<Indices>(5u), *cloud));
    EXPECT_TRUE(getRangeGeoPropIndices(*cloud, "palette entry")->size == 5 && before->size == 2);
    EXPECT_FALSE(setRangeGeoPropIndices("weight", Orvan::makePtr<Indices>(5u), *cloud));
    EXPECT_FALSE(getRangeGeoPropIndices(*cloud, "weight") || getRangeGeoPropIndices(*cloud, "absent"));

    auto const tag = Tessara::createObject();
    auto const values = Orvan::makePtr<Orvan::Array<bool>>(2u);
    populateTag(sPointComp, values, *tag);
    EXPECT_TRUE(isOnly(*tag, getDataGeoPropPrototype(sGenericDataGeoProp)));
    EXPECT_EQ(valueIn<Ptr<Orvan::Array<bool>>>(tag->getProperty(sData)).get(), values.get());
    EXPECT_TRUE(valueIn<Text>(tag->getProperty(sTarget)) == sPointComp);
}

TEST(Geometry, IsValidated)
{
    auto const points = arrayOf<float3>({{0, 0, 0}, {1, 0, 0}, {2, 0, 0}});
    auto const nothing = Tessara::createObject();
    PointCloudValidator clouds;
    StrandValidator strands;
    EXPECT_TRUE(bool(validateMesh(*makeOctahedron())) && !validateMesh(*nothing));
    EXPECT_TRUE(bool(clouds.validate(*makeCloud(points))) && !clouds.validate(*nothing));
    EXPECT_TRUE(bool(strands.validate(*makeStrands(points, arrayOf<unsigned int>({0, 2, 3})))));
    EXPECT_FALSE(bool(strands.validate(*nothing)));
}
