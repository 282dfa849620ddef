#include "host/GeoProperties.h"
#include "host/IndexArray.h"

#include "support/Testing.h"

using namespace Modeling;
using namespace TestSupport;
using IndexList = IndexArray;

namespace {

Orvan::MutablePtr<Object> makeCloud()
{
    auto cloud = makePointCloud({{0, 0, 0}, {1, 0, 0}, {2, 0, 0}});
    addDataProperty<unsigned int>("values", sPointComp, {7, 8, 9}, *cloud);
    cloud->setProperty("text", Orvan::String(sPointComp));
    cloud->setProperty("null", Orvan::Ptr<Object>());
    return cloud;
}

}

TEST(GeoProperties, AreReadAndWrittenOnlyIfTheyHoldTheType)
{
    auto const cloud = makeCloud();
    auto const before = deepCopy(*cloud);
    EXPECT_EQ(readGeoPropData<unsigned int>(*cloud, "values"), dataOf<unsigned int>(*cloud, "values")) << "not copied";
    EXPECT_FALSE(readGeoPropData<int>(*cloud, "values"));
    for (char const* const key : {"absent", "text", "null", sPointComp}) {
        EXPECT_FALSE(readGeoPropData<unsigned int>(*cloud, key)) << key;
        EXPECT_FALSE(writeGeoPropData(key, Orvan::makePtr<IndexList>(), *cloud)) << key;
    }
    EXPECT_FALSE(editGeoPropData<int>("values", *cloud, [](Orvan::Array<int>&) { FAIL(); }));
    EXPECT_TRUE(sameContents(*cloud, *before));
}

TEST(GeoProperties, AreEditedInPlaceUnlessTheArrayIsShared)
{
    struct Unexpected { };
    auto const increment = [](IndexList& values) { ++values[0]; };
    auto const cloud = makeCloud();
    IndexList const* const array = readGeoPropData<unsigned int>(*cloud, "values").get();
    EXPECT_TRUE(editGeoPropData<unsigned int>("values", *cloud, increment));
    EXPECT_EQ(readGeoPropData<unsigned int>(*cloud, "values").get(), array);

    auto const held = readGeoPropData<unsigned int>(*cloud, "values");
    EXPECT_TRUE(editGeoPropData<unsigned int>("values", *cloud, increment));
    EXPECT_THROW(editGeoPropData<unsigned int>("values", *cloud, [](IndexList&) { throw Unexpected(); }), Unexpected);
    EXPECT_EQ(*readGeoPropData<unsigned int>(*cloud, "values"), (IndexList{9, 8, 9}));
    EXPECT_EQ(*held, (IndexList{8, 8, 9}));
}

TEST(GeoProperties, AreAllWrittenOrNoneIfMemoryRunsOut)
{
    auto const prepare = [](Object& object) {
        PreparedWrites writes(object);
        writes.setElementCount(sPointComp, 1);
        writes.setElementCount("absent", 1);
        writes.writeGeoPropData(sPointPosition, Orvan::makePtr<Orvan::Array<float3>>(1u));
        writes.writeGeoPropData("values", Orvan::makePtr<IndexList>(1u));
        writes.writeGeoPropData("absent", Orvan::makePtr<IndexList>(1u));
        writes.setProperty("", 0);
        writes.setProperty("new", 1);
        writes.setProperty("new and too long for the text itself", 2);
        writes.commit();
    };
    auto const cloud = makeCloud();
    expectAllOrNothing(*cloud, prepare);
    expectAllOrNothing(*cloud, [](Object& object) {
        editGeoPropData<unsigned int>("values", object, [](IndexList& values) { values.append(1); });
    });
    prepare(*cloud);
    EXPECT_EQ(getElementCount(*cloud, sPointComp), 1u);
    EXPECT_EQ(readGeoPropData<unsigned int>(*cloud, "values")->size, 1u);
    EXPECT_FALSE(cloud->hasProperty("absent") || cloud->hasProperty(""));
    EXPECT_EQ(*cloud->getProperty("new").get<int>(), 1);
}
