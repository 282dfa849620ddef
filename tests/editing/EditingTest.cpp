#include "PlainEditing.h"

#include <Modeling/addPointsToPointCloud.h>
#include <Modeling/computeDeletedComponentMapping.h>
#include <Modeling/deleteComponents.h>
#include <Modeling/deleteFaces.h>
#include <Modeling/deletePointsInPointCloud.h>
#include <TessaraGeometry/Validators.h>

using namespace Tessara::GeometryAlgorithms;
using namespace TestSupport;
using PlainEditing::Flags;
using PlainEditing::Indices;
using Positions = Orvan::Array<float3>;

namespace {

/// Polygons with one to five corners, optionally also with none. Some points may belong to no face.
Orvan::MutablePtr<Object> randomMesh(std::size_t pointCount, std::size_t faceCount, bool withEmptyFaces, Random& random)
{
    auto mesh = PolygonMesh::soup(pointCount, faceCount, withEmptyFaces ? 0 : 1, 5, random).build();
    for (char const* const component : {sPointComp, sFaceVertexComp, sFaceComp})
        addRandomProperties(component, random, *mesh);
    return mesh;
}

Flags randomFlags(std::size_t count, Random& random)
{
    unsigned int const outOf = 1 + random.below(4); // 1: all or none
    Flags flags(count);
    for (bool& flag : flags)
        flag = random.below(outOf + 1) == 0;
    if (outOf == 1)
        std::fill(flags.begin(), flags.end(), random.below(2) == 1);
    return flags;
}

struct Edit {
    std::function<bool(Object&)> edit, plainEdit;
};

/// A random operation and a random object to run it on.
Orvan::MutablePtr<Object> randomCase(Random& random, Edit& edit)
{
    std::size_t const size = random.below(8) == 0 ? random.below(900) : random.below(9);
    if (unsigned int const kind = random.below(4); kind != 0) {
        auto cloud = makePointCloud(randomPositions(size, random));
        addRandomProperties(sPointComp, random, *cloud);
        if (kind == 1) {
            Indices indices;
            Flags flags(size);
            for (std::size_t i = random.below(size + 2); i != 0; --i) {
                indices.append(random.below(size + 2)); // some twice, some out of range
                if (indices[indices.size - 1] < size)
                    flags[indices[indices.size - 1]] = true;
            }
            edit = {[=](Object& o) { return deletePointsInPointCloud(indices, o, nullptr); },
                [=](Object& o) { return PlainEditing::deleteComponents(PlainEditing::mapping(flags), sPointComp, o); }};
        } else if (kind == 2) {
            Indices const remap = PlainEditing::mapping(randomFlags(size, random));
            edit = {[=](Object& o) { return deleteComponents(remap, sPointComp, o); },
                [=](Object& o) { return PlainEditing::deleteComponents(remap, sPointComp, o); }};
        } else {
            auto const positions = randomPositions(random.below(2 * size + 3), random);
            Orvan::String const tag = random.below(2) == 0 ? "" : random.below(2) == 0 ? "isNew" : "sPointComp1";
            edit = {[=](Object& o) { return addPointsToPointCloud(positions, tag, o, nullptr); },
                [=](Object& o) { return PlainEditing::addPoints(positions, tag, o); }};
        }
        return cloud;
    }
    auto mesh = randomMesh(1 + size, size == 0 ? 0 : random.below(size), random.below(4) == 0, random);
    Flags const deleted = randomFlags(getElementCount(*mesh, sFaceComp), random);
    edit = {[=](Object& o) { return deleteFaces(deleted, o); },
        [=](Object& o) { return PlainEditing::deleteFaces(deleted, o); }};
    return mesh;
}

/// A random operation on a random object that may be shared.
struct Trial {
    explicit Trial(unsigned int seed)
        : holders(static_cast<Holders>(seed % 4))
        , random(seed)
    {
    }

    Holders holders;
    Random random;
    Edit edit;
    Orvan::MutablePtr<Object> object = randomCase(random, edit);
    Orvan::MutablePtr<Object> before = deepCopy(*object), expected = deepCopy(*object);
    Object other = held(holders, *object);
};

}

TEST(Editing, agreesWithThePlainReferenceOnRandomPropertyBags)
{
    unsigned int done = 0;
    for (unsigned int seed = 0; seed != 6000 && !HasFailure(); ++seed) {
        SCOPED_TRACE(seed);
        Trial trial(seed);
        bool const isDone = trial.edit.edit(*trial.object);
        EXPECT_EQ(isDone, trial.edit.plainEdit(*trial.expected));
        EXPECT_TRUE(sameContents(*trial.object, *trial.expected));
        EXPECT_TRUE(sameContents(trial.other, held(trial.holders, *trial.before))) << "another holder sees a change";
        done += isDone ? 1 : 0;
    }
    EXPECT_GT(done, 4000u);
    EXPECT_LT(done, 5800u) << "some are refused halfway";
}

TEST(Editing, editsInPlaceAndReadsArgumentsStoredInTheObject)
{
    auto const own = makePointCloud({{0, 0, 0}, {1, 0, 0}});
    addRangeProperty("range", sPointComp, {0, 1}, *own);
    addDataProperty<int>("of range", "range", {5, 6}, *own);
    auto const places = [&] {
        return std::array<void const*, 3>{dataOf<float3>(*own, sPointPosition)->data,
            getRangeGeoPropIndices(*own, "range")->data, dataOf<int>(*own, "of range")->data};
    };
    auto const before = places();
    ASSERT_TRUE(deletePointsInPointCloud(Indices{0}, *own, nullptr));
    EXPECT_EQ(places(), before);

    auto const cloud = makePointCloud({{0, 0, 0}, {1, 0, 0}});
    addDataProperty<unsigned int>("chosen", sPointComp, {1, 1, 0, 1}, *cloud);
    // References, not pointers: only the object holds these arrays.
    Positions const& positions = *dataOf<float3>(*cloud, sPointPosition);
    ASSERT_TRUE(addPointsToPointCloud(positions, "isNew", *cloud, nullptr));
    EXPECT_EQ(*dataOf<float3>(*cloud, sPointPosition), (Positions{{0, 0, 0}, {1, 0, 0}, {0, 0, 0}, {1, 0, 0}}));
    Indices const& chosen = *dataOf<unsigned int>(*cloud, "chosen");
    ASSERT_TRUE(deletePointsInPointCloud(chosen, *cloud, nullptr));
    EXPECT_EQ(*dataOf<unsigned int>(*cloud, "chosen"), (Indices{0, 1}));

    auto const mesh = MeshBuilder::tetrahedron().build();
    addDataProperty<bool>("deleted", sFaceComp, {true, false, true, true}, *mesh);
    Flags const& isDeleted = *dataOf<bool>(*mesh, "deleted");
    ASSERT_TRUE(deleteFaces(isDeleted, *mesh));
    EXPECT_EQ(countsOf(*mesh), (Counts{3, 3, 1}));
}

TEST(Editing, growsCapacityAndDropsRecords)
{
    auto const cloud = makePointCloud({{0, 0, 0}, {1, 0, 0}, {2, 0, 0}});
    addDataProperty<Mesh::FaceEdge>("edge", sPointComp, Orvan::Array<Mesh::FaceEdge>(3), *cloud);
    ASSERT_TRUE(addPointsToPointCloud({{9, 9, 9}}, "isNew", *cloud, nullptr));
    EXPECT_TRUE(getDataGeoProperty(*cloud, "edge")->getProperty(sData).empty())
        << "values of a record type are dropped";
    EXPECT_EQ(dataOf<float3>(*cloud, sPointPosition)->capacity, 6u) << "doubles";
    ASSERT_TRUE(addPointsToPointCloud(Positions(9), "isNew", *cloud, nullptr));
    EXPECT_EQ(dataOf<float3>(*cloud, sPointPosition)->capacity, 13u) << "grows by what is needed";
    EXPECT_FALSE(addPointsToPointCloud({{1, 1, 1}}, sPointPosition, *cloud, nullptr))
        << "the tag replaces the positions";
    EXPECT_EQ(dataOf<bool>(*cloud, sPointPosition)->size, 14u);
}

TEST(Editing, refusesBeforeTheFirstChange)
{
    auto const cloud = makePointCloud({{0, 0, 0}, {1, 0, 0}}), emptyCloud = makePointCloud({});
    auto const withTwo = makePointCloud({{0, 0, 0}}), withoutPositions = makePointCloud({{0, 0, 0}});
    addComponent("sOtherComp", 1, *withTwo);
    auto const withText = makePointCloud({{0, 0, 0}}), withFaces = makePointCloud({{0, 0, 0}});
    withText->setProperty(sFaceComp, Orvan::String("text")); // not a component
    EXPECT_TRUE(PointCloudValidator().validate(*withText));
    EXPECT_TRUE(addPointsToPointCloud({{1, 0, 0}}, "", *withText, nullptr));
    addComponent(sFaceComp, 0, *withFaces);
    addDataProperty<int>(sPointPosition, sPointComp, {1}, *withoutPositions);
    auto const mesh = MeshBuilder::tetrahedron().build(), shortOffsets = MeshBuilder::tetrahedron().build();
    addDataProperty<unsigned int>(sFaceOffset, sFaceComp, {0, 3, 6, 9}, *shortOffsets);
    auto const shortCorners = deepCopy(*mesh), otherOffsets = deepCopy(*mesh);
    addDataProperty<unsigned int>(sFaceVertex, sFaceVertexComp, Indices(11), *shortCorners);
    addDataProperty<unsigned int>(sFaceOffset, sPointComp, {0, 3, 6, 9, 12}, *otherOffsets);
    auto const noPoints = makeMesh({}, {}, {});
    Positions one(1), tooMany(1);
    tooMany.size = 0xFFFFFFFFu; // more than a component can hold, and never read
    auto const add = [](Positions const& p) {
        return [&](Object& o) { return addPointsToPointCloud(p, "t", o, nullptr); };
    };
    Indices const none, first{0};
    auto const deletePoint = [&](Object& o) { return deletePointsInPointCloud(first, o, nullptr); };
    auto const deleteNone = [](Object& o) { return deleteFaces(Flags(getElementCount(o, sFaceComp)), o); };
    std::map<std::string, std::pair<Object*, std::function<bool(Object&)>>> const cases{
        {"add to a mesh", {mesh.get(), add(one)}},
        {"add to a cloud with a second component", {withTwo.get(), add(one)}},
        {"add to a cloud with faces", {withFaces.get(), add(one)}},
        {"delete points of a cloud with faces", {withFaces.get(), deletePoint}},
        {"add to a cloud without positions", {withoutPositions.get(), add(one)}},
        {"add more than 32 bits", {cloud.get(), add(tooMany)}},
        {"delete points of a mesh", {mesh.get(), deletePoint}},
        {"delete points of an empty cloud", {emptyCloud.get(), deletePoint}},
        {"remap of another length", {cloud.get(), [&](Object& o) { return deleteComponents(first, sPointComp, o); }}},
        {"no such component", {cloud.get(), [&](Object& o) { return deleteComponents(none, "absent", o); }}},
        {"delete faces of a cloud", {cloud.get(), deleteNone}},
        {"flags of another length", {mesh.get(), [](Object& o) { return deleteFaces(Flags(3), o); }}},
        {"short offsets", {shortOffsets.get(), deleteNone}},
        {"one corner too few", {shortCorners.get(), deleteNone}},
        {"offsets of the points", {otherOffsets.get(), deleteNone}},
        {"mesh without points", {noPoints.get(), deleteNone}},
    };
    for (auto const& [name, c] : cases) {
        auto const before = deepCopy(*c.first);
        EXPECT_FALSE(c.second(*c.first)) << name;
        EXPECT_TRUE(sameContents(*c.first, *before)) << name;
    }
    tooMany.size = 1;
}

TEST(Editing, givesResultsWorkedOutByHand)
{
    auto const cloud = makePointCloud({{0, 0, 0}, {1, 0, 0}, {2, 0, 0}});
    addRangeProperty("seam", sPointComp, {3, kInvalidIndex, 1}, *cloud);
    addDataProperty<int>("of seam", "seam", {5, 6, 7, 8}, *cloud);
    ASSERT_TRUE(deletePointsInPointCloud(Orvan::Array<long long>{-1, 3, 1LL << 40, -(1LL << 40)}, *cloud, nullptr));
    EXPECT_EQ(*getRangeGeoPropIndices(*cloud, "seam"), (Indices{1, kInvalidIndex, 0}));
    EXPECT_EQ(*dataOf<int>(*cloud, "of seam"), (Orvan::Array<int>{6, 8}))
        << "unused values are removed even if no point is";
    ASSERT_TRUE(deletePointsInPointCloud(Orvan::Array<long long>{0, 0, 2}, *cloud, nullptr));
    EXPECT_EQ(*getRangeGeoPropIndices(*cloud, "seam"), (Indices{kInvalidIndex}));

    Positions const points{{0, 0, 0}, {1, 0, 0}, {9, 9, 9}, {1, 1, 0}, {0, 1, 0}};
    auto const mesh = makeMesh(points, {0, 1, 3, 4, 3, 1}, {0, 3, 3, 6});
    ASSERT_TRUE(deleteFaces({false, false, true}, *mesh));
    EXPECT_EQ(*dataOf<unsigned int>(*mesh, sFaceVertex), (Indices{0, 1, 2})) << "without the unused points";
    EXPECT_EQ(*dataOf<unsigned int>(*mesh, sFaceOffset), (Indices{0, kDeletedElement, 3}));
    EXPECT_EQ(computeDeletedComponentMapping({false, true, false}), (Indices{0, kDeletedElement, 1}));

    auto const lacking = makePointCloud({{0, 0, 0}, {1, 0, 0}, {2, 0, 0}});
    addDataProperty<float3>(sPointPosition, sPointComp, {{5, 5, 5}}, *lacking, float3{7, 7, 7});
    ASSERT_TRUE(addPointsToPointCloud({{9, 9, 9}}, "", *lacking, nullptr));
    EXPECT_EQ(*dataOf<float3>(*lacking, sPointPosition), (Positions{{5, 5, 5}, {7, 7, 7}, {7, 7, 7}, {9, 9, 9}}));
}

TEST(Editing, staysInsideArraysWhateverTheyHold)
{
    for (unsigned int seed = 0; seed != 2000; ++seed) {
        Random random(seed);
        auto const mesh = randomMesh(1 + random.below(9), 1 + random.below(9), false, random);
        std::size_t const faceCount = getElementCount(*mesh, sFaceComp);
        for (char const* const name : {sFaceVertex, sFaceOffset}) {
            Indices values = *dataOf<unsigned int>(*mesh, name);
            for (unsigned int& value : values)
                value = random.below(3) == 0 ? 0u - random.below(4) : random.below(3) == 0 ? random.below(40) : value;
            addDataProperty<unsigned int>(name, getGeoPropTargetName(*mesh, name), values, *mesh);
        }
        deleteFaces(randomFlags(faceCount, random), *mesh);
        Indices remap(getElementCount(*mesh, sPointComp), Orvan::kUninitialized);
        for (unsigned int& entry : remap)
            entry = random.below(2) == 0 ? 0u - random.below(4) : random.below(40);
        deleteComponents(remap, sPointComp, *mesh);
    }
}
