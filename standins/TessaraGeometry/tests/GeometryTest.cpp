#include "support/Testing.h"

#include <TessaraGeometry/Populate.h>
#include <TessaraGeometry/Prototypes.h>
#include <TessaraGeometry/Validators.h>

#include <gmock/gmock.h>

using namespace TestSupport;
using testing::ElementsAre, testing::IsEmpty;
using Indices = Orvan::Array<unsigned int>;
using Names = Orvan::Array<Orvan::String>;

namespace {

Orvan::MutablePtr<Object> twoTriangles()
{
    return makeMesh({{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}}, {0, 1, 2, 0, 2, 3}, {0, 3, 6});
}

Orvan::MutablePtr<Object> twoStrands()
{
    return makeStrands({{0, 0, 0}, {1, 0, 0}, {2, 0, 0}, {3, 0, 0}, {4, 0, 0}}, {0, 2, 5});
}

/// Names the prototypes of geometry that an object conforms to.
std::string kindsOf(Object const& object)
{
    return std::string(Object::isA(object, *getMeshPrototype()) ? "mesh " : "")
        + (Object::isA(object, *getPointCloudPrototype()) ? "cloud " : "")
        + (Object::isA(object, *getStrandPrototype()) ? "strands " : "");
}

std::vector<std::string> toStrings(Names const& names)
{
    std::vector<std::string> strings;
    for (Orvan::String const& name : names)
        strings.emplace_back(name.view());
    return strings;
}

}

TEST(Prototypes, DistinguishTheKindsOfGeoProperties)
{
    Orvan::MutablePtr<Object> component = Tessara::createObject(), range = Tessara::createObject();
    populateComponentGeoProperty(3, *component);
    ASSERT_TRUE(populateRangeGeoProperty(Orvan::makePtr<Indices>(), "target", *range));
    Orvan::MutablePtr<Object> bare = makeDataProperty<float>("target", nullptr);
    bare->setProperty(sData, Tessara::PropertyValue()); // empty, but present
    bare->eraseProperty(sDefault);
    auto const data = getDataGeoPropPrototype(sGenericDataGeoProp);
    auto const kindOf = [&](Object const& property) {
        return std::string(Object::isA(property, *getComponentGeoPropPrototype()) ? "component " : "")
            + (Object::isA(property, *getRangeGeoPropPrototype()) ? "range " : "")
            + (Object::isA(property, *data) ? "data " : "");
    };
    EXPECT_EQ(kindOf(*component) + kindOf(*range) + kindOf(*bare), "component range data ");
    EXPECT_FALSE(getDataGeoPropPrototype("no such name"));
    auto const cloud = makePointCloud({{0, 0, 0}});
    Random random(1);
    addAllTypes(sPointComp, random, *cloud);
    EXPECT_EQ(getGeoPropsByPrototype(*cloud, *data).size, 41u) << "and the positions";
}

TEST(Prototypes, DistinguishTheKindsOfGeometry)
{
    auto const populated = [](void (*populate)(Object&)) {
        auto object = Tessara::createObject();
        object->setProperty("own", 1.5f);
        populate(*object);
        EXPECT_TRUE(object->getProperty("own").get<float>()) << "other keys are kept";
        return object;
    };
    auto const mesh = populated(populateMesh), cloud = populated(populatePointCloud),
               strands = populated(populateStrand);
    EXPECT_EQ(kindsOf(*mesh) + kindsOf(*cloud) + kindsOf(*strands), "mesh cloud strands ");
    EXPECT_EQ(kindsOf(*Tessara::createObject()), "");
    EXPECT_TRUE(isValid(*mesh) && isValid(*cloud) && isValid(*strands));
    EXPECT_EQ(*dataOf<unsigned int>(*mesh, sFaceOffset), Indices{0});
    EXPECT_EQ(kindsOf(*twoTriangles()) + kindsOf(*makePointCloud({})) + kindsOf(*twoStrands()), "mesh cloud strands ");
}

TEST(Elements, HaveACountThatChangesNoArray)
{
    auto const mesh = twoTriangles();
    Object const other = *mesh;
    EXPECT_TRUE(setElementCount(sFaceVertexComp, 9, *mesh));
    EXPECT_EQ(getElementCount(*mesh, sFaceVertexComp), 9u);
    EXPECT_EQ(getElementCount(other, sFaceVertexComp), 6u);
    EXPECT_EQ(dataOf<unsigned int>(*mesh, sFaceVertex)->size, 6u);
    for (char const* const absent : {"absent", sPointPosition}) {
        EXPECT_EQ(getElementCount(*mesh, absent), 0u);
        EXPECT_FALSE(setElementCount(absent, 1, *mesh));
    }
}

TEST(Elements, AreUnchangedWhenAnAllocationFails)
{
    auto const mesh = twoTriangles();
    addRangeProperty("range", sPointComp, {1, 2, 3}, *mesh);
    for (void (*edit)(Object&) :
        {+[](Object& object) { populateMesh(object); }, +[](Object& object) { setElementCount(sPointComp, 7, object); },
            +[](Object& object) { setRangeGeoPropIndices("range", Orvan::makePtr<Indices>(), object); }})
        expectAllOrNothing(*mesh, edit);
}

TEST(Lookup, FindsGeoPropertiesByKindAndTarget)
{
    auto const mesh = twoTriangles();
    addDataProperty<float>("weight", sPointComp, {1, 2, 3, 4}, *mesh);
    addRangeProperty("range", sFaceComp, {0, 1}, *mesh);
    addDataProperty<float>("material", "range", {1, 2}, *mesh);
    addRangeProperty("far", "range", {0}, *mesh);
    mesh->setProperty("text", Orvan::String(sPointComp));
    mesh->setProperty("null", Orvan::Ptr<Object>());
    Orvan::MutablePtr<Object> other = Tessara::createObject(); // is neither data nor a range
    other->setProperty(sTarget, Orvan::String(sPointComp));
    mesh->setProperty("other", Orvan::Ptr<Object>(std::move(other)));

    auto const data = getDataGeoPropPrototype(sGenericDataGeoProp);
    EXPECT_THAT(toStrings(getGeoPropNamesByPrototype(*mesh, *data)),
        ElementsAre(sPointPosition, sFaceVertex, sFaceOffset, "weight", "material"));
    EXPECT_EQ(getGeoPropsByPrototype(*mesh, *getRangeGeoPropPrototype()).size, 2u);
    EXPECT_THAT(toStrings(getGeoPropNamesByTarget(*mesh, sPointComp)), ElementsAre(sPointPosition, "weight"));
    EXPECT_THAT(toStrings(getGeoPropNamesByTarget(*mesh, "range")), ElementsAre("material", "far"));

    EXPECT_TRUE(getGeoPropTargetName(*mesh, "material") == "range" && getGeoPropTargetName(*mesh, "text") == "");
    EXPECT_TRUE(getDataGeoProperty(*mesh, "weight") && getRangeGeoProperty(*mesh, "range"));
    EXPECT_FALSE(getDataGeoProperty(*mesh, "range") || getRangeGeoProperty(*mesh, "weight")
        || getDataGeoProperty(*mesh, "null"));
    EXPECT_EQ(*getRangeGeoPropIndices(*mesh, "range"), (Indices{0, 1}));
    EXPECT_FALSE(getRangeGeoPropIndices(*mesh, "weight"));
    EXPECT_TRUE(setRangeGeoPropIndices("range", Orvan::makePtr<Indices>(Indices{1, 1}), *mesh));
    EXPECT_EQ(*getRangeGeoPropIndices(*getRangeGeoProperty(*mesh, "range")), (Indices{1, 1}));
    EXPECT_FALSE(setRangeGeoPropIndices("weight", Orvan::makePtr<Indices>(), *mesh));
}

TEST(Lookup, FollowsTargetsToTheirComponent)
{
    auto const mesh = twoTriangles();
    addRangeProperty("range", sFaceComp, {0, 1}, *mesh);
    addRangeProperty("far", "range", {0}, *mesh);
    addDataProperty<float>("farthest", "far", {1}, *mesh);
    addDataProperty<float>("astray", "nowhere", {1}, *mesh);
    addRangeProperty("circleA", "circleB", {0}, *mesh);
    addRangeProperty("circleB", "circleA", {0}, *mesh);
    addDataProperty<float>("onCircle", "circleA", {1}, *mesh);
    addDataProperty<float>("onData", sPointPosition, {1}, *mesh);
    std::map<std::string, char const*> const expected{{sPointPosition, sPointComp}, {"range", sFaceComp},
        {"farthest", sFaceComp}, {"astray", ""}, {"circleA", ""}, {"onCircle", ""}, {"onData", ""}, {sFaceComp, ""},
        {"absent", ""}};
    for (auto const& [name, component] : expected)
        EXPECT_EQ(getTargetComponent(*mesh, name.c_str()), component) << name;
}

TEST(Validators, NameTheFirstFailure)
{
    using Break = std::function<void(Object&)>;
    auto const data = [](auto values, char const* name, char const* target) -> Break {
        return [=](Object& object) { addDataProperty(name, target, values, object); };
    };
    auto const erase = [](char const* key) -> Break { return [=](Object& object) { object.eraseProperty(key); }; };
    auto const offsets = [&](Indices values) { return data(values, sFaceOffset, sFaceComp); };
    Break const text = [](Object& mesh) { mesh.setProperty(sFaceComp, Orvan::String("text")); };
    Break const otherDefault = [](Object& mesh) { replaceIn(sPointPosition, sDefault, 1.0f, mesh); };
    std::vector<std::pair<Break, std::string>> const breaks{
        {erase(sFaceVertexComp), "the component sFaceVertexComp is missing"},
        {erase(sFaceOffset), "the data property sFaceOffset is missing"},
        {text, "the component sFaceComp is missing"},
        {data(Orvan::Array<int>(6), sFaceVertex, sFaceVertexComp),
            "sFaceVertex does not hold an array of unsigned int"},
        {data(Indices(6), sFaceVertex, sPointComp), "sFaceVertex targets \"sPointComp\" instead of sFaceVertexComp"},
        {otherDefault, "sPointPosition has no sDefault of type float3"},
        {data(Orvan::Array<float3>(3), sPointPosition, sPointComp),
            "sPointPosition has 3 entries instead of 4 for 4 elements of sPointComp"},
        {offsets({0, 6}), "sFaceOffset has 2 entries instead of 3 for 2 elements of sFaceComp"},
        {offsets({1, 3, 6}), "sFaceOffset[0] is 1 instead of 0"},
        {offsets({0, 7, 6}), "sFaceOffset[2] is 6, less than the 7 before it"},
        {offsets({0, 3, 5}), "sFaceOffset[2] is 5, but the mesh has 6 face corners"},
        {data(Indices{0, 1, 2, 0, 4, 3}, sFaceVertex, sFaceVertexComp),
            "sFaceVertex[4] is 4, but the mesh has 4 points"},
    };
    for (auto const& [damage, sentence] : breaks) {
        auto const mesh = twoTriangles();
        damage(*mesh);
        GeoValidator::Status const status = validateMesh(*mesh);
        EXPECT_FALSE(status) << sentence;
        EXPECT_EQ(status.message(), sentence.c_str());
    }

    auto const cloud = makePointCloud({{0, 0, 0}});
    addComponent("second", 1, *cloud);
    EXPECT_EQ(PointCloudValidator().validate(*cloud).message(),
        "a point cloud has one component, but there is also \"second\"");
    auto const strands = twoStrands();
    addDataProperty<unsigned int>(sStrandOffset, sStrandComp, {0, 2, 4}, *strands);
    EXPECT_EQ(StrandValidator().validate(*strands).message(), "sStrandOffset[2] is 4, but the strand set has 5 points");
}

TEST(Validators, AcceptUnusualButValidGeometry)
{
    auto const odd = twoTriangles();
    addDataProperty<float>("too short", sPointComp, {1}, *odd);
    std::pair<Orvan::Ptr<Object>, bool> const cases[] = {
        {deepCopy(*odd), true},
        {makeMesh({}, {}, {}), true},
        {makeMesh({{0, 0, 0}}, {0, 0, 0}, {3}), false}, // corners without faces
        {makeMesh({{kNan, 0, 0}, {1, 0, 0}}, {}, {0}), true}, // points without faces, not finite
        {makeMesh({{0, 0, 0}}, {0, 0}, {0, 0, 2}), true}, // faces without corners and with two
        {twoStrands(), true},
        {makeStrands({{0, 0, 0}}, {0}), true},
        {makeStrands({{0, 0, 0}}, {1}), true},
        {makeStrands({{0, 0, 0}, {1, 0, 0}}, {1}), false},
        {makeStrands({{0, 0, 0}, {1, 0, 0}}, {1, 2}), true}, // the first point belongs to no strand
        {makeStrands({{0, 0, 0}, {1, 0, 0}}, {0, 1}), false},
        {makePointCloud({{kNan, 0, 0}}), true},
    };
    for (auto const& [geometry, accepted] : cases)
        EXPECT_EQ(static_cast<bool>(isValid(*geometry)), accepted);
}

TEST(Validators, ReportSuspiciousProperties)
{
    auto const mesh = twoTriangles();
    EXPECT_THAT(toStrings(reportProperties(*mesh)), IsEmpty());
    addDataProperty<float>("weight", sPointComp, {1, 2}, *mesh);
    addDataProperty<float>("astray", "nowhere", {1}, *mesh);
    addRangeProperty("range", sFaceComp, {0, 2}, *mesh);
    addDataProperty<Orvan::String>("label", "range", {"a", "b", "c"}, *mesh);
    addDataProperty<float>("tint", "range", {1, 2}, *mesh);
    addRangeProperty("fine", sFaceComp, {kInvalidIndex, 0}, *mesh);
    addDataProperty<float>("fineData", "fine", {1}, *mesh);
    addDataProperty<float>("other", "weight", {1}, *mesh);
    addDataProperty<float>("hollow", sPointComp, {1}, *mesh);
    addRangeProperty("bare", sFaceComp, {0, 0}, *mesh);
    for (auto const& [name, key] : {std::pair{"hollow", sData}, {"bare", sIndices}}) {
        Object property = **mesh->getProperty(name).get<Orvan::Ptr<Object>>();
        property.setProperty(key, 1.5f);
        mesh->setProperty(name, Orvan::makePtr<Object>(property));
    }
    EXPECT_THAT(toStrings(reportProperties(*mesh)),
        ElementsAre("\"weight\" has 2 entries for 4 elements of sPointComp",
            "\"astray\" targets \"nowhere\", which does not exist",
            "\"other\" targets \"weight\", which does not exist", "\"hollow\" holds no array of a known element type",
            "\"range\"[1] is 2, but \"tint\" has 2 values", "\"bare\" holds no indices"));
}
