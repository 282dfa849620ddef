#include "host/GeoProperties.h"

#include "support/Compare.h"
#include "support/FailingAllocations.h"
#include "support/MeshBuilder.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Makers.h>

#include <gtest/gtest.h>

using namespace Modeling;
using namespace Tessara::Geometry;
using Tessara::Object;
using Tessara::Math::float3;
using Indices = Orvan::Array<unsigned int>;

namespace {

struct Unexpected { };

Orvan::MutablePtr<Object> cloudWith(Indices values)
{
    auto cloud = makePointCloud({{0, 0, 0}, {1, 0, 0}, {2, 0, 0}});
    addDataProperty<unsigned int>("values", sPointComp, std::move(values), *cloud);
    return cloud;
}

}

TEST(GeoProperties, readsOnlyWhatIsThereInThatType)
{
    auto const cloud = cloudWith({7, 8, 9});
    cloud->setProperty("text", Orvan::String("no geo property"));
    cloud->setProperty("null", Orvan::Ptr<Object>());
    ASSERT_TRUE(readGeoPropData<unsigned int>(*cloud, "values"));
    EXPECT_EQ(*readGeoPropData<unsigned int>(*cloud, "values"), (Indices{7, 8, 9}));
    EXPECT_EQ(readGeoPropData<unsigned int>(*cloud, "values"), dataOf<unsigned int>(*cloud, "values")) << "not copied";
    EXPECT_FALSE(readGeoPropData<int>(*cloud, "values"));
    for (char const* const key : {"absent", "text", "null", sPointComp})
        EXPECT_FALSE(readGeoPropData<unsigned int>(*cloud, key)) << key;
}

TEST(GeoProperties, writesLeaveOtherHoldersAlone)
{
    auto cloud = cloudWith({7, 8, 9});
    cloud->setProperty("text", Orvan::String("no geo property"));
    Object const other = *cloud;
    auto const before = TestSupport::deepCopy(other);
    for (char const* const key : {"absent", "text", sPointComp}) {
        EXPECT_FALSE(writeGeoPropData(key, Orvan::makePtr<Indices>(), *cloud)) << key;
        EXPECT_TRUE(TestSupport::sameContents(*cloud, *before)) << key;
    }
    auto const positions = readGeoPropData<float3>(*cloud, sPointPosition);
    EXPECT_TRUE(writeGeoPropData("values", Orvan::makePtr<Indices>(Indices{1}), *cloud));
    EXPECT_EQ(*readGeoPropData<unsigned int>(*cloud, "values"), (Indices{1}));
    EXPECT_EQ(readGeoPropData<float3>(*cloud, sPointPosition), positions);
    EXPECT_TRUE(TestSupport::sameContents(other, *before));
}

TEST(GeoProperties, editsInPlaceUnlessSomebodyElseHoldsTheArray)
{
    auto const raise = [](Indices& values) { ++values[0]; };
    auto cloud = cloudWith({7, 8, 9});
    Indices const* const array = readGeoPropData<unsigned int>(*cloud, "values").get();
    EXPECT_TRUE(editGeoPropData<unsigned int>("values", *cloud, raise));
    EXPECT_EQ(readGeoPropData<unsigned int>(*cloud, "values").get(), array);
    EXPECT_EQ((*array)[0], 8u);

    auto const held = readGeoPropData<unsigned int>(*cloud, "values");
    Object const other = *cloud;
    EXPECT_TRUE(editGeoPropData<unsigned int>("values", *cloud, raise));
    EXPECT_EQ(*readGeoPropData<unsigned int>(*cloud, "values"), (Indices{9, 8, 9}));
    EXPECT_EQ(*held, (Indices{8, 8, 9}));
    EXPECT_EQ(readGeoPropData<unsigned int>(other, "values"), held);

    EXPECT_FALSE(editGeoPropData<int>("values", *cloud, [](Orvan::Array<int>&) { FAIL(); }));
    EXPECT_THROW(editGeoPropData<unsigned int>("values", *cloud, [](Indices&) { throw Unexpected(); }), Unexpected);
    EXPECT_EQ(*readGeoPropData<unsigned int>(*cloud, "values"), (Indices{9, 8, 9}));
}

TEST(GeoProperties, surviveEveryFailingAllocation)
{
    TestSupport::sweepFailingAllocations([](TestSupport::Attempt const& attempt) {
        auto cloud = cloudWith({7, 8, 9});
        Object const other = *cloud; // so that editing has to copy
        auto const before = TestSupport::deepCopy(*cloud);
        bool const isDone = attempt(
            [&] { editGeoPropData<unsigned int>("values", *cloud, [](Indices& values) { values.append(1); }); });
        EXPECT_TRUE(TestSupport::sameContents(other, *before));
        EXPECT_EQ(
            *readGeoPropData<unsigned int>(*cloud, "values"), isDone ? Indices({7, 8, 9, 1}) : Indices({7, 8, 9}));
    });
    TestSupport::sweepFailingAllocations([](TestSupport::Attempt const& attempt) {
        auto cloud = cloudWith({7, 8, 9});
        Object const other = *cloud;
        auto const before = TestSupport::deepCopy(*cloud);
        bool const isDone = attempt([&] {
            PreparedWrites writes(*cloud);
            writes.setElementCount(sPointComp, 1);
            writes.setElementCount("absent", 1);
            writes.writeGeoPropData(sPointPosition, Orvan::makePtr<Orvan::Array<float3>>(1u));
            writes.writeGeoPropData("values", Orvan::makePtr<Indices>(1u));
            writes.writeGeoPropData("absent", Orvan::makePtr<Indices>(1u));
            writes.commit();
        });
        EXPECT_TRUE(TestSupport::sameContents(other, *before));
        if (isDone) {
            EXPECT_EQ(getElementCount(*cloud, sPointComp), 1u);
            EXPECT_EQ(readGeoPropData<float3>(*cloud, sPointPosition)->size, 1u);
            EXPECT_EQ(readGeoPropData<unsigned int>(*cloud, "values")->size, 1u);
        } else {
            EXPECT_TRUE(TestSupport::sameContents(*cloud, *before));
        }
    });
}

TEST(GeoProperties, collectsPrivateClonesByTarget)
{
    auto mesh = TestSupport::MeshBuilder::tetrahedron().build();
    addDataProperty<float>("weight", sPointComp, {1, 2, 3, 4}, *mesh);
    addRangeProperty("range", sPointComp, {0, 0, 0, 0}, *mesh);
    mesh->setProperty("text", Orvan::String(sPointComp));
    auto const before = TestSupport::deepCopy(*mesh);
    auto collected = collectGeoPropsByTarget(*mesh, sPointComp);
    ASSERT_EQ(collected.size(), 3u);
    EXPECT_EQ(collected[0].first, sPointPosition);
    EXPECT_EQ(collected[1].first, "weight");
    EXPECT_EQ(collected[2].first, "range");
    for (auto& [name, clone] : collected)
        clone->eraseAllProperties();
    EXPECT_TRUE(TestSupport::sameContents(*mesh, *before));
}

TEST(GeoProperties, populatesDataThatConformsToItsPrototype)
{
    auto const property = populateDataGeoProperty<float3>({1, 2, 3});
    EXPECT_EQ(*property->keys(), (Orvan::Array<Orvan::String>{sData, sTarget, sDependsOn, sDefault, sInterp}));
    EXPECT_EQ(*property->getProperty(sDefault).get<float3>(), (float3{1, 2, 3}));
    EXPECT_EQ(static_cast<int>(*property->getProperty(sInterp).get<Common::DataInterpolationMode>()), 1);
    auto const object = Tessara::createObject();
    object->setProperty("property", Orvan::makePtr<Object>(*property));
    EXPECT_TRUE(getDataGeoProperty(*object, "property"));
}
