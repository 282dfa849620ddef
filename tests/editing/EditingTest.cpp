#include <Modeling/addPointsToPointCloud.h>
#include <Modeling/computeDeletedComponentMapping.h>
#include <Modeling/deleteComponents.h>
#include <Modeling/deleteFaces.h>
#include <Modeling/deletePointsInPointCloud.h>

#include "editing/compactArray.h"
#include "support/AllocationHooks.h"
#include "support/Testing.h"

#include <TessaraGeometry/Validators.h>

#include <tbb/global_control.h>

#include <numeric>

using namespace Tessara::GeometryAlgorithms;
using namespace TestSupport;
using Flags = Orvan::Array<bool>;
using IndexList = Orvan::Array<unsigned int>;
using Positions = Orvan::Array<float3>;

namespace {

/// A plain reference for any property bag: one property after the other, each array copied and then edited element by
/// element.
namespace Plain {

    IndexList mapping(Flags const& deleted)
    {
        IndexList remap;
        unsigned int next = 0;
        for (bool const isDeleted : deleted)
            remap.append(isDeleted ? kDeletedElement : next++);
        return remap;
    }

    template <class T>
    void replaceArray(Orvan::String const& name, char const* key, Orvan::Array<T> array, Object& object)
    {
        replaceIn(name, key, Orvan::makePtr<Orvan::Array<T>>(std::move(array)), object);
    }

    template <class T> Orvan::Array<T> compacted(Orvan::Array<T> const& array, IndexList const& remap)
    {
        Orvan::Array<T> kept;
        for (std::uint64_t i = 0; i != remap.size; ++i)
            if (remap[i] != kDeletedElement)
                kept.append(array[i]);
        return kept;
    }

    /// Returns false if the array is missing or too short.
    bool compactData(Orvan::String const& name, IndexList const& remap, Object& object)
    {
        bool isDone = false;
        visitArray(getDataGeoProperty(object, name)->getProperty(sData), [&](auto const& array, auto) {
            isDone = array.size >= remap.size;
            if (isDone)
                replaceArray(name, sData, compacted(array, remap), object);
        });
        return isDone;
    }

    bool deleteRange(Orvan::String const& name, IndexList const& remap, Object& object)
    {
        auto const held = getRangeGeoPropIndices(object, name);
        bool const hasIndices = held && !held->empty();
        if (hasIndices && held->size < remap.size)
            return true;
        IndexList indices = hasIndices ? compacted(*held, remap) : IndexList();
        IndexList dataRemap;
        for (Orvan::String const& data : getGeoPropNamesByTarget(object, name)) {
            if (!getDataGeoProperty(object, data))
                continue;
            if (!hasIndices || !dataRemap.empty())
                return false;
            Flags dropped;
            visitArray(getDataGeoProperty(object, data)->getProperty(sData),
                [&](auto const& array, auto) { dropped = Flags(array.size, true); });
            for (unsigned int const entry : indices)
                if (entry < dropped.size)
                    dropped[entry] = false;
            dataRemap = mapping(dropped);
            if (!compactData(data, dataRemap, object))
                return false;
        }
        for (unsigned int& entry : indices)
            if (!dataRemap.empty() && entry != kInvalidIndex)
                entry = dataRemap[entry];
        if (hasIndices)
            replaceArray(name, sIndices, indices, object);
        return true;
    }

    template <class T> Orvan::Array<T> extended(Orvan::Array<T> array, std::uint64_t newCount, T const& value)
    {
        array.reserve(newCount);
        while (array.size < newCount)
            array.append(value);
        array.resize(newCount);
        return array;
    }

    void extendData(Orvan::String const& name, std::uint64_t newCount, Object& object)
    {
        Tessara::PropertyValue result;
        auto const property = getDataGeoProperty(object, name);
        visitArray(property->getProperty(sData), [&]<class T>(Orvan::Array<T> const& array, auto type) {
            if (type.name[0] >= 'A' && type.name[0] <= 'Z')
                return; // the host's record types
            auto const fallback = property->getProperty(sDefault);
            result = Orvan::makePtr<Orvan::Array<T>>(
                extended(array, newCount, fallback.template get<T>() ? *fallback.template get<T>() : T{}));
        });
        replaceIn(name, sData, std::move(result), object);
    }

    bool addPoints(Positions const& positions, Orvan::String const& tag, Object& object)
    {
        std::uint64_t const oldCount = getElementCount(object, sPointComp), newCount = oldCount + positions.size;
        setElementCount(sPointComp, static_cast<unsigned int>(newCount), object);
        for (Orvan::String const& name : getGeoPropNamesByTarget(object, sPointComp))
            if (getDataGeoProperty(object, name))
                extendData(name, newCount, object);
            else if (auto const indices = getRangeGeoPropIndices(object, name))
                replaceArray(name, sIndices, extended(*indices, newCount, kInvalidIndex), object);
        Positions all = *dataOf<float3>(object, sPointPosition);
        std::copy(positions.begin(), positions.end(), all.data + oldCount);
        replaceArray(sPointPosition, sData, all, object);
        if (!tag.empty())
            addDataProperty(tag, sPointComp, extended(Flags(oldCount), newCount, true), object);
        return true;
    }

    bool deleteComponents(IndexList const& remap, Orvan::String const& component, Object& object)
    {
        unsigned int const count = getElementCount(object, component);
        if (count != remap.size || count == 0)
            return false;
        auto const deletedCount = std::count(remap.begin(), remap.end(), kDeletedElement);
        setElementCount(component, count - static_cast<unsigned int>(deletedCount), object);
        for (Orvan::String const& name : getGeoPropNamesByTarget(object, component))
            if (getDataGeoProperty(object, name))
                compactData(name, remap, object);
            else if (!deleteRange(name, remap, object))
                return false;
        return true;
    }

    bool deleteFaces(Flags const& deleted, Object& mesh)
    {
        IndexList const offsets = *dataOf<unsigned int>(mesh, sFaceOffset),
                        corners = *dataOf<unsigned int>(mesh, sFaceVertex);
        Flags pointDeleted(getElementCount(mesh, sPointComp), true), cornerDeleted(corners.size, true);
        for (unsigned int face = 0; face != deleted.size; ++face)
            for (unsigned int corner = offsets[face]; !deleted[face] && corner < offsets[face + 1]; ++corner)
                cornerDeleted[corner] = pointDeleted[corners[corner]] = false;
        IndexList const pointRemap = mapping(pointDeleted);
        IndexList cornerRemap = mapping(cornerDeleted);
        if (!deleteComponents(pointRemap, sPointComp, mesh) || !deleteComponents(cornerRemap, sFaceVertexComp, mesh))
            return false;
        IndexList faceVertex = *dataOf<unsigned int>(mesh, sFaceVertex);
        for (unsigned int& entry : faceVertex)
            entry = pointRemap[entry];
        replaceArray(sFaceVertex, sData, faceVertex, mesh);
        if (!deleteComponents(mapping(deleted), sFaceComp, mesh))
            return false;
        IndexList faceOffset = *dataOf<unsigned int>(mesh, sFaceOffset);
        cornerRemap.append(getElementCount(mesh, sFaceVertexComp)); // for a face without corners at the end
        for (unsigned int& entry : faceOffset)
            entry = cornerRemap[entry];
        faceOffset.append(getElementCount(mesh, sFaceVertexComp));
        replaceArray(sFaceOffset, sData, faceOffset, mesh);
        return true;
    }

}

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
    unsigned int const outOf = random.below(5); // 0: all, 1: none
    Flags flags(count);
    for (bool& flag : flags)
        flag = outOf == 0 || (outOf > 1 && random.below(outOf) == 0);
    return flags;
}

using Edit = std::function<bool(Object&)>;

/// A random operation, the plain one that must agree, and a random object to run them on.
Orvan::MutablePtr<Object> randomCase(Random& random, Edit& edit, Edit& plainEdit)
{
    std::size_t const size = random.below(8) == 0 ? random.below(900) : random.below(9);
    unsigned int const kind = random.below(4);
    if (kind == 0) {
        auto mesh = randomMesh(1 + size, size == 0 ? 0 : random.below(size), random.below(4) == 0, random);
        Flags const deleted = randomFlags(getElementCount(*mesh, sFaceComp), random);
        edit = [=](Object& o) { return deleteFaces(deleted, o); };
        plainEdit = [=](Object& o) { return Plain::deleteFaces(deleted, o); };
        return mesh;
    }
    auto cloud = makePointCloud(randomPositions(size, random));
    addRandomProperties(sPointComp, random, *cloud);
    if (kind == 1) {
        auto const positions = randomPositions(random.below(2 * size + 3), random);
        Orvan::String const tag = random.below(2) == 0 ? "" : random.below(2) == 0 ? "isNew" : "sPointComp1";
        edit = [=](Object& o) { return addPointsToPointCloud(positions, tag, o, nullptr); };
        plainEdit = [=](Object& o) { return Plain::addPoints(positions, tag, o); };
        return cloud;
    }
    Flags const flags = randomFlags(size, random);
    IndexList const remap = Plain::mapping(flags);
    edit = [=](Object& o) { return deleteComponents(remap, sPointComp, o); };
    plainEdit = [=](Object& o) { return Plain::deleteComponents(remap, sPointComp, o); };
    if (kind == 2) {
        IndexList indices{static_cast<unsigned int>(size)}; // out of range, the others twice
        for (unsigned int i = 0; i != 2 * size; ++i)
            if (flags[i / 2])
                indices.append(i / 2);
        edit = [=](Object& o) { return deletePointsInPointCloud(indices, o, nullptr); };
    }
    return cloud;
}

}

TEST(Editing, AgreesWithThePlainReferenceOnRandomPropertyBags)
{
    unsigned int done = 0;
    for (unsigned int seed = 0; seed != 6000 && !HasFailure(); ++seed) {
        SCOPED_TRACE(seed);
        Random random(seed);
        Edit edit, plainEdit;
        auto const object = randomCase(random, edit, plainEdit);
        auto const before = deepCopy(*object), expected = deepCopy(*object);
        auto const holders = static_cast<Holders>(seed % 4); // some arrays are edited in place
        Object const other = held(holders, *object);
        bool const isDone = edit(*object);
        EXPECT_EQ(isDone, plainEdit(*expected));
        EXPECT_TRUE(sameContents(*object, *expected));
        EXPECT_TRUE(sameContents(other, held(holders, *before))) << "another holder sees a change";
        done += isDone ? 1 : 0;
    }
    EXPECT_GT(done, 4000u);
    EXPECT_LT(done, 5800u) << "some are refused halfway";
}

TEST(Editing, EditsInPlaceAndReadsArgumentsStoredInTheObject)
{
    auto const own = makePointCloud({{0, 0, 0}, {1, 0, 0}});
    addRangeProperty("range", sPointComp, {0, 1}, *own);
    addDataProperty<int>("of range", "range", {5, 6}, *own);
    auto const places = [&] {
        return std::array<void const*, 3>{dataOf<float3>(*own, sPointPosition)->data,
            getRangeGeoPropIndices(*own, "range")->data, dataOf<int>(*own, "of range")->data};
    };
    auto const before = places();
    ASSERT_TRUE(deletePointsInPointCloud(IndexList{0}, *own, nullptr));
    EXPECT_EQ(places(), before);

    auto const cloud = makePointCloud({{0, 0, 0}, {1, 0, 0}});
    addDataProperty<unsigned int>("chosen", sPointComp, {1, 1, 0, 1}, *cloud);
    // References, not pointers: only the object holds these arrays.
    Positions const& positions = *dataOf<float3>(*cloud, sPointPosition);
    ASSERT_TRUE(addPointsToPointCloud(positions, "isNew", *cloud, nullptr));
    EXPECT_EQ(*dataOf<float3>(*cloud, sPointPosition), (Positions{{0, 0, 0}, {1, 0, 0}, {0, 0, 0}, {1, 0, 0}}));
    EXPECT_EQ(dataOf<float3>(*cloud, sPointPosition)->capacity, 4u) << "doubles";
    IndexList const& chosen = *dataOf<unsigned int>(*cloud, "chosen");
    ASSERT_TRUE(deletePointsInPointCloud(chosen, *cloud, nullptr));
    EXPECT_EQ(*dataOf<unsigned int>(*cloud, "chosen"), (IndexList{0, 1}));

    auto const mesh = MeshBuilder::tetrahedron().build();
    addDataProperty<bool>("deleted", sFaceComp, {true, false, true, true}, *mesh);
    Flags const& isDeleted = *dataOf<bool>(*mesh, "deleted");
    ASSERT_TRUE(deleteFaces(isDeleted, *mesh));
    EXPECT_EQ(countsOf(*mesh), (Counts{3, 3, 1}));
}

namespace {

constexpr char kLong[] = "a default that is too long to be stored without an allocation";

Orvan::MutablePtr<Object> makeCloudToGrow(unsigned int count)
{
    Random random(3);
    auto cloud = makePointCloud(randomPositions(count, random));
    addDataProperty<double>("weight", sPointComp, Orvan::Array<double>(count, 2.0), *cloud, 0.5);
    addDataProperty<Orvan::String>("text", sPointComp, Orvan::Array<Orvan::String>(count, "x"), *cloud, kLong);
    addRangeProperty("range", sPointComp, IndexList(count, 0u), *cloud);
    addDataProperty<int>("of range", "range", {5}, *cloud);
    return cloud;
}

/// Where the arrays of such a cloud are.
std::array<void const*, 4> arraysOf(Object const& cloud)
{
    return {dataOf<float3>(cloud, sPointPosition)->data, dataOf<double>(cloud, "weight")->data,
        dataOf<Orvan::String>(cloud, "text")->data, getRangeGeoPropIndices(cloud, "range")->data};
}

}

TEST(Editing, AppendsInPlaceWhereNobodySharesTheArrays)
{
    Random random(4);
    auto const cloud = makeCloudToGrow(1000), expected = deepCopy(*cloud);
    auto before = arraysOf(*cloud);
    unsigned int moves = 0;
    for (int call = 0; call != 64; ++call) {
        auto const positions = randomPositions(100, random);
        ASSERT_TRUE(addPointsToPointCloud(positions, "isNew", *cloud, nullptr));
        ASSERT_TRUE(Plain::addPoints(positions, "isNew", *expected));
        moves += arraysOf(*cloud) != before ? 1 : 0;
        before = arraysOf(*cloud);
    }
    EXPECT_TRUE(sameContents(*cloud, *expected));
    EXPECT_EQ(moves, 3u) << "to 2000, 4000 and 8000 points";

    IndexList most(7000);
    std::iota(most.begin(), most.end(), 0u);
    ASSERT_TRUE(deletePointsInPointCloud(most, *cloud, nullptr));
    for (unsigned int const count : {400u, 800u, 1600u, 3200u, 6400u}) { // has room until the last
        Positions const& own = *dataOf<float3>(*cloud, sPointPosition);
        Positions const copy = own;
        ASSERT_TRUE(addPointsToPointCloud(own, "", *cloud, nullptr));
        Positions const& doubled = *dataOf<float3>(*cloud, sPointPosition);
        EXPECT_EQ(copy.size, count);
        EXPECT_EQ(doubled.data == before[0], count < 6400);
        EXPECT_TRUE(std::equal(copy.begin(), copy.end(), doubled.begin()));
        EXPECT_TRUE(std::equal(copy.begin(), copy.end(), doubled.begin() + count));
    }
}

TEST(Editing, CopiesASharedArrayOnceToAppendToIt)
{
    constexpr unsigned int kCount = 100'000;
    auto const cloud = makePointCloud(Positions(kCount));
    auto const held = dataOf<float3>(*cloud, sPointPosition);
    auto const memory = memoryOf([&] { addPointsToPointCloud({{1, 2, 3}}, "", *cloud, nullptr); });
    EXPECT_LT(memory.peak, 2 * kCount * 12 + 10'000) << "room for as many points, and no second copy";
    EXPECT_EQ(held->size, kCount);
    EXPECT_EQ(dataOf<float3>(*cloud, sPointPosition)->capacity, 2 * kCount);
}

TEST(Editing, LeavesArraysWithRoomAsTheyWereWhenMemoryRunsOut)
{
    auto const source = makeCloudToGrow(5);
    Positions const first(1), second{{1, 2, 3}, {4, 5, 6}};
    auto const before = deepCopy(*source), expected = deepCopy(*source);
    ASSERT_TRUE(addPointsToPointCloud(first, "", *before, nullptr) && Plain::addPoints(first, "", *expected));
    ASSERT_TRUE(Plain::addPoints(second, "isNew", *expected));
    sweepFailingAllocations([&](Attempt const& attempt) {
        auto const cloud = deepCopy(*source);
        ASSERT_TRUE(addPointsToPointCloud(first, "", *cloud, nullptr)); // doubles
        auto const arrays = arraysOf(*cloud);
        bool const isDone = attempt([&] { addPointsToPointCloud(second, "isNew", *cloud, nullptr); });
        EXPECT_TRUE(sameContents(*cloud, isDone ? *expected : *before));
        EXPECT_EQ(arraysOf(*cloud), arrays);
    });
}

namespace {

/// Patterns of deleted elements, from none to all.
std::vector<Flags> deletionPatterns(std::size_t count, Random& random)
{
    auto const flags = [&](auto const& isDeleted) {
        Flags made(count);
        for (std::size_t i = 0; i != count; ++i)
            made[i] = isDeleted(i);
        return made;
    };
    return {flags([](std::size_t) { return false; }), flags([](std::size_t) { return true; }),
        flags([&](std::size_t) { return random.below(2) == 0; }), flags([](std::size_t i) { return i / 100 % 2 == 1; }),
        flags([](std::size_t i) { return i % 7 == 0; }), flags([&](std::size_t) { return random.below(10'000) == 0; }),
        flags([=](std::size_t i) { return i == count / 2; }), flags([=](std::size_t i) { return i < count / 3; }),
        flags([&](std::size_t i) { return i > 1000 && random.below(100) != 0; })};
}

}

TEST(Editing, CompactsLargeArraysInPlaceAsItCopiesThem)
{
    Random random(11);
    constexpr std::size_t kCount = 50'001;
    auto const cloud = makePointCloud(randomPositions(kCount, random));
    addAllTypes(sPointComp, random, *cloud);
    addRangeProperty("range", sPointComp, IndexList(kCount, 1u), *cloud);
    addDataProperty<int>("of range", "range", {5, 6}, *cloud);
    for (Flags const& deleted : deletionPatterns(kCount, random)) {
        IndexList const remap = computeDeletedComponentMapping(deleted);
        EXPECT_EQ(remap, Plain::mapping(deleted));
        auto const expected = deepCopy(*cloud);
        ASSERT_TRUE(Plain::deleteComponents(remap, sPointComp, *expected));
        for (int const threads : {1, 8}) {
            Object shared = *cloud;
            auto const own = deepCopy(*cloud);
            float3 const* const place = dataOf<float3>(*own, sPointPosition)->data;
            withThreads(threads, [&] {
                EXPECT_TRUE(deleteComponents(remap, sPointComp, shared));
                EXPECT_TRUE(deleteComponents(remap, sPointComp, *own));
            });
            EXPECT_TRUE(sameContents(shared, *expected)) << threads << " threads";
            EXPECT_TRUE(sameContents(*own, *expected)) << threads << " threads, in place";
            EXPECT_EQ(dataOf<float3>(*own, sPointPosition)->data, place);
        }
    }
}

TEST(Editing, CompactsInPlaceEvenIfLoopsFail)
{
    using namespace Modeling::Internal;
    Random random(12);
    constexpr std::size_t kCount = 1'000'000;
    // Threads of oneTBB that begin to work while there is no memory end the process.
    tbb::global_control const alone(tbb::global_control::max_allowed_parallelism, 1);
    for (Flags const& deleted : deletionPatterns(kCount, random)) {
        KeptElements const kept(deleted);
        IndexList values(kCount, Orvan::kUninitialized), expected;
        for (unsigned int i = 0; i != kCount; ++i)
            values[i] = i;
        for (unsigned int i = 0; i != kCount; ++i)
            if (!deleted[i])
                expected.append(i + 7);
        CompactionBuffer buffer(kCompactionBufferBytes);
        // oneTBB may fail in the middle of a loop.
        auto const transfer = RenumberingTransfer{[](unsigned int i) { return i + 7; }};
        {
            ExhaustedMemory const exhausted;
            compactInPlace(kept, transfer, values.data, buffer);
        }
        values.resize(kept.count());
        EXPECT_EQ(values, expected);
    }
}

TEST(Editing, RefusesBeforeTheFirstChange)
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
    addDataProperty<unsigned int>(sFaceVertex, sFaceVertexComp, IndexList(11), *shortCorners);
    addDataProperty<unsigned int>(sFaceOffset, sPointComp, {0, 3, 6, 9, 12}, *otherOffsets);
    auto const noPoints = makeMesh({}, {}, {});
    Positions one(1), tooMany(1);
    tooMany.size = 0xFFFFFFFFu; // more than a component can hold, and never read
    auto const add = [](Positions const& p) {
        return [&](Object& o) { return addPointsToPointCloud(p, "t", o, nullptr); };
    };
    IndexList const none, first{0};
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

TEST(Editing, GivesResultsWorkedOutByHand)
{
    auto const cloud = makePointCloud({{0, 0, 0}, {1, 0, 0}, {2, 0, 0}});
    addRangeProperty("seam", sPointComp, {3, kInvalidIndex, 1}, *cloud);
    addDataProperty<int>("of seam", "seam", {5, 6, 7, 8}, *cloud);
    ASSERT_TRUE(deletePointsInPointCloud(Orvan::Array<long long>{-1, 3, 1LL << 40, -(1LL << 40)}, *cloud, nullptr));
    EXPECT_EQ(*getRangeGeoPropIndices(*cloud, "seam"), (IndexList{1, kInvalidIndex, 0}));
    EXPECT_EQ(*dataOf<int>(*cloud, "of seam"), (Orvan::Array<int>{6, 8}))
        << "unused values are removed even if no point is";
    ASSERT_TRUE(deletePointsInPointCloud(Orvan::Array<long long>{0, 0, 2}, *cloud, nullptr));
    EXPECT_EQ(*getRangeGeoPropIndices(*cloud, "seam"), (IndexList{kInvalidIndex}));
    EXPECT_EQ(computeDeletedComponentMapping({false, true, false}), (IndexList{0, kDeletedElement, 1}));

    auto const lacking = makePointCloud({{0, 0, 0}, {1, 0, 0}, {2, 0, 0}});
    addDataProperty<float3>(sPointPosition, sPointComp, {{5, 5, 5}}, *lacking, float3{7, 7, 7});
    ASSERT_TRUE(addPointsToPointCloud({{9, 9, 9}}, "", *lacking, nullptr));
    EXPECT_EQ(*dataOf<float3>(*lacking, sPointPosition), (Positions{{5, 5, 5}, {7, 7, 7}, {7, 7, 7}, {9, 9, 9}}));
    EXPECT_FALSE(addPointsToPointCloud({{1, 1, 1}}, sPointPosition, *lacking, nullptr))
        << "the tag replaces the positions";
    EXPECT_EQ(dataOf<bool>(*lacking, sPointPosition)->size, 5u);
}

TEST(Editing, StaysInsideArraysWhateverTheyHold)
{
    for (unsigned int seed = 0; seed != 2000; ++seed) {
        Random random(seed);
        auto const mesh = randomMesh(1 + random.below(9), 1 + random.below(9), false, random);
        std::size_t const faceCount = getElementCount(*mesh, sFaceComp);
        for (char const* const name : {sFaceVertex, sFaceOffset}) {
            IndexList values = *dataOf<unsigned int>(*mesh, name);
            for (unsigned int& value : values)
                value = random.below(3) == 0 ? 0u - random.below(4) : random.below(3) == 0 ? random.below(40) : value;
            addDataProperty<unsigned int>(name, getGeoPropTargetName(*mesh, name), values, *mesh);
        }
        deleteFaces(randomFlags(faceCount, random), *mesh);
        IndexList remap(getElementCount(*mesh, sPointComp), Orvan::kUninitialized);
        for (unsigned int& entry : remap)
            entry = random.below(2) == 0 ? 0u - random.below(4) : random.below(40);
        deleteComponents(remap, sPointComp, *mesh);
    }
}
