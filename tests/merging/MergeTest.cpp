#include "PlainMerge.h"

#include "merging/MergedComponents.h"
#include "merging/mergeGeoComponent.h"

#include <Modeling/copyNonGeoProperties.h>
#include <Modeling/mergeMeshes.h>
#include <Modeling/mergePointClouds.h>
#include <Modeling/mergeStrands.h>

#include <tbb/parallel_for.h>

#include <thread>

using namespace Tessara::GeometryAlgorithms;
using namespace TestSupport;
using PlainMerge::Inputs, PlainMerge::Kind;
using IndexList = std::vector<unsigned int>;
using IndexArray = Orvan::Array<unsigned int>;

namespace {

bool merge(Kind kind, Inputs const& inputs, Object& output)
{
    return kind == Kind::Meshes     ? mergeMeshes(inputs, output, nullptr)
        : kind == Kind::PointClouds ? mergePointClouds(inputs, output, nullptr)
                                    : mergeStrands(inputs, output, nullptr);
}

Orvan::Ptr<Object> randomInput(Kind kind, std::size_t size, Random& random)
{
    std::size_t const pointCount = size + random.below(4);
    Orvan::Array<unsigned int> offsets{0};
    Orvan::MutablePtr<Object> input;
    std::vector<char const*> const components = PlainMerge::componentsOf(kind);
    if (kind == Kind::Meshes) {
        input = PolygonMesh::soup(pointCount, pointCount == 0 ? 0 : random.below(size + 1), 0, 4, random).build();
    } else if (kind == Kind::Strands) {
        for (std::size_t point = 0; point < pointCount;) {
            point = std::min(pointCount, point + random.below(4));
            offsets.append(static_cast<unsigned int>(point));
        }
        input = makeStrands(randomPositions(pointCount, random), std::move(offsets));
    } else {
        input = makePointCloud(randomPositions(pointCount, random));
    }
    for (char const* const component : components)
        addRandomProperties(component, random, *input);
    if (random.below(3) == 0)
        input->setProperty(random.below(4) == 0 ? "" : "note", static_cast<int>(random.below(100)));
    if (random.below(8) == 0)
        setElementCount(sPointComp, 12345, *input); // no longer valid
    if (random.below(8) == 0)
        addDataProperty<float>("sPointComp1", components.back(), Orvan::Array<float>(size), *input);
    return input;
}

/// A few inputs, of which some occur twice.
Inputs randomInputs(Kind kind, Random& random)
{
    Inputs inputs;
    for (std::size_t input = 1 + random.below(5); input != 0; --input)
        inputs.append(random.below(6) == 0 && !inputs.empty()
                ? inputs[0]
                : randomInput(kind, random.below(random.below(40) == 0 ? 3000 : 7), random));
    return inputs;
}

Orvan::MutablePtr<Object> cloudOf(std::size_t count)
{
    return makePointCloud(Orvan::Array<float3>(count));
}

template <class... Input> Inputs inputsOf(Input&&... input)
{
    Inputs inputs;
    (inputs.append(Orvan::Ptr<Object>(std::forward<Input>(input))), ...);
    return inputs;
}

Orvan::MutablePtr<Object> merged(Kind kind, Inputs const& inputs)
{
    auto output = Tessara::createObject();
    EXPECT_TRUE(merge(kind, inputs, *output));
    return output;
}

}

TEST(Merge, AgreesWithPlainMergingOnRandomInputs)
{
    for (unsigned int seed = 0; seed != 6000; ++seed) {
        SCOPED_TRACE(seed);
        Random random(seed);
        auto const kind = static_cast<Kind>(seed % 3);
        Inputs inputs = randomInputs(kind, random);
        Orvan::MutablePtr<Object> output = random.below(3) == 0 ? deepCopy(*inputs[0]) : Tessara::createObject();
        if (random.below(3) == 0)
            output->setProperty("note", 1.5);
        auto const expected = deepCopy(*output);
        Object& written = *output;
        Orvan::Ptr<Object> const shared = std::move(output);
        if (random.below(3) == 0) { // the output is an input too
            inputs.append(shared);
            inputs.append(inputs[0]);
        }
        bool const isMerged = mergePlainly(kind, inputs, *expected);
        ASSERT_EQ(merge(kind, inputs, written), isMerged);
        ASSERT_TRUE(sameContents(written, *expected));
        ASSERT_TRUE(!isMerged || isValid(written));
    }
}

TEST(Merge, GivesResultsWorkedOutByHand)
{
    auto const with = [](Orvan::Array<unsigned int> const& indices, Orvan::Array<int> const& data) {
        auto cloud = cloudOf(indices.size);
        addRangeProperty("material", sPointComp, indices, *cloud);
        addDataProperty<int>("color", "material", data, *cloud, 77);
        return cloud;
    };
    // Surplus indices continue into the next input's elements if that has no indices for them.
    auto longer = with({1}, {30, 40}), shorter = with({0, 0}, {50});
    replaceIn("material", sIndices, Orvan::makePtr<IndexArray>(IndexArray{1, 1, 1}), *longer);
    replaceIn("material", sIndices, Orvan::makePtr<IndexArray>(IndexArray{0}), *shorter);
    auto const cloud = merged(Kind::PointClouds,
        inputsOf(with({0, kInvalidIndex}, {10, 20}), cloudOf(1), std::move(longer), std::move(shorter)));
    EXPECT_EQ(*getRangeGeoPropIndices(*cloud, "material"), (IndexArray{0, kInvalidIndex, 5, 3, 4, 3}));
    EXPECT_EQ(valuesOf<int>(*cloud, "color"), (std::vector<int>{10, 20, 30, 40, 50, 77}));

    Orvan::Ptr<Object> const triangle = makeMesh({{0, 0, 0}, {1, 0, 0}, {0, 1, 0}}, {0, 1, 2}, {0, 3});
    auto const mesh = merged(
        Kind::Meshes, inputsOf(triangle, makeMesh({{5, 5, 5}}, {}, {0}), cloudOf(2), nullptr, deepCopy(*triangle)));
    EXPECT_EQ(valuesOf<unsigned int>(*mesh, sFaceVertex), (IndexList{0, 1, 2, 4, 5, 6}));
    EXPECT_EQ(valuesOf<unsigned int>(*mesh, sFaceOffset), (IndexList{0, 3, 6}));
    EXPECT_EQ(dataOf<unsigned int>(*mesh, sFaceOffset)->capacity, 3u) << "allocated with its closing entry";

    // Points before the first strand belong to no strand, and a result can be merged again.
    auto const strands =
        merged(Kind::Strands, inputsOf(makeStrands({{}, {}}, {0}), makeStrands(Orvan::Array<float3>(6), {0, 2, 6})));
    EXPECT_EQ(valuesOf<unsigned int>(*strands, sStrandOffset), (IndexList{2, 4, 8}));
    auto const twice = merged(Kind::Strands, inputsOf(deepCopy(*strands), deepCopy(*strands)));
    EXPECT_EQ(valuesOf<unsigned int>(*twice, sStrandOffset), (IndexList{2, 4, 10, 12, 16}));
}

TEST(Merge, RefusesWithoutChangingTheOutput)
{
    // That many elements do not fit into memory, so only the counts are set.
    auto const huge = cloudOf(0), rest = cloudOf(0);
    addComponent(sPointComp, 3'000'000'000u, *huge);
    addComponent(sPointComp, 1'294'967'295u, *rest);
    auto const fits = [](std::vector<Object const*> const& objects) {
        using namespace Modeling::Internal;
        return computeElementOffsets(planMerge(objects, {sPointComp}), sPointComp).has_value();
    };
    EXPECT_TRUE(fits({huge.get(), rest.get()}));
    EXPECT_FALSE(fits({huge.get(), rest.get(), cloudOf(1).get()}));

    for (Kind const kind : {Kind::Meshes, Kind::PointClouds, Kind::Strands})
        for (Inputs const& inputs : {Inputs{}, Inputs{nullptr}}) {
            auto const output = cloudOf(2);
            auto const before = deepCopy(*output);
            EXPECT_FALSE(merge(kind, inputs, *output));
            EXPECT_TRUE(sameContents(*output, *before));
        }

    // 2^32 points or values in all, of one input that occurs 1024 times.
    constexpr unsigned int kCount = 1u << 22, kTimes = 1u << 10;
    Orvan::Array<float3> const points(kCount);
    auto const ofRange = cloudOf(1), output = cloudOf(2);
    addRangeProperty("range", sPointComp, {0}, *ofRange);
    addDataProperty<bool>("of range", "range", Orvan::Array<bool>(kCount), *ofRange);
    auto const before = deepCopy(*output);
    auto const mergeMany = [&](Kind kind, Orvan::Ptr<Object> const& input) {
        Inputs inputs;
        for (unsigned int i = 0; i != kTimes; ++i)
            inputs.append(input);
        return merge(kind, inputs, *output);
    };
    EXPECT_FALSE(mergeMany(Kind::Meshes, makeMesh(points, {}, {0})));
    EXPECT_FALSE(mergeMany(Kind::PointClouds, makePointCloud(points)));
    EXPECT_FALSE(mergeMany(Kind::Strands, makeStrands(points, {0})));
    EXPECT_THROW(mergeMany(Kind::PointClouds, deepCopy(*ofRange)), std::bad_alloc);
    EXPECT_TRUE(sameContents(*output, *before));
}

TEST(Merge, CopiesOtherPropertiesFromTheFirstInputThatHasThem)
{
    auto first = Tessara::createObject(), second = cloudOf(1);
    first->setProperty("a", 1);
    first->setProperty("null", Orvan::Ptr<Object>());
    second->setProperty("a", 2.5);
    second->setProperty("", 5);
    second->setProperty("kept", 4);
    addRangeProperty("range", sPointComp, {0}, *second);
    auto const output = Tessara::createObject(), expected = Tessara::createObject();
    output->setProperty("kept", 3);
    copyNonGeoProperties(inputsOf(std::move(first), nullptr, std::move(second)), *output);
    expected->setProperty("kept", 3);
    expected->setProperty("a", 1);
    expected->setProperty("null", Orvan::Ptr<Object>());
    EXPECT_TRUE(sameContents(*output, *expected));
}

TEST(Merge, RebasesAnArrayThatHasReplacedTheConnectivity)
{
    using namespace Modeling::Internal;
    Offsets const regions{0, 2, 3, 50}, bases{0, 10, 100, 1000};
    auto const output = cloudOf(0);
    addDataProperty<unsigned int>("other", sPointComp, {1, 2, 3, 4}, *output); // shorter than the regions
    Connectivity connectivity{"other", bases, 1000u, nullptr};
    EXPECT_FALSE(finishConnectivity(connectivity, regions, *output)) << "nothing was merged";
    connectivity.merged = Orvan::makePtr<Orvan::Array<unsigned int>>();
    EXPECT_TRUE(finishConnectivity(connectivity, regions, *output));
    EXPECT_EQ(valuesOf<unsigned int>(*output, "other"), (IndexList{1, 2, 13, 104, 1100}));
    addDataProperty<int>("other", sPointComp, {1, 2, 3, 4}, *output);
    EXPECT_FALSE(finishConnectivity(connectivity, regions, *output));

    // Inputs without values of their own get the default, which is rebased too.
    auto const with = cloudOf(2), without = cloudOf(2), target = cloudOf(0);
    addDataProperty<unsigned int>("other", sPointComp, {1, 2}, *with, 7u);
    Offsets const points{0, 2, 4};
    mergeGeoComponent(planMerge({with.get(), without.get()}, {sPointComp}), sPointComp, points, &connectivity, *target);
    EXPECT_EQ(valuesOf<unsigned int>(*target, "other"), (IndexList{1, 2, 17, 17, 1000}));
}

TEST(Merge, IsCompleteOrRefusedIfAnEnclosingGroupIsCancelled)
{
    std::map<Kind, Orvan::Ptr<Object>> const inputs{{Kind::Meshes, PolygonMesh::quads(3).build()},
        {Kind::PointClouds, cloudOf(3)}, {Kind::Strands, makeStrands(Orvan::Array<float3>(4), {0, 4})}};
    for (auto const& [kind, input] : inputs) {
        Object output = *cloudOf(1), expected = output;
        bool isMerged = false;
        tbb::task_group group;
        group.run_and_wait([&, kind = kind, input = input] {
            group.cancel();
            isMerged = merge(kind, inputsOf(input, input), output);
        });
        EXPECT_EQ(isMerged, kind == Kind::PointClouds) << "needs no tasks";
        if (kind == Kind::Meshes)
            expected.eraseAllProperties();
        if (isMerged) {
            EXPECT_TRUE(merge(kind, inputsOf(input, input), expected));
        }
        EXPECT_TRUE(sameContents(output, expected));
    }
}

TEST(Merge, RunsConcurrentlyOnSharedInputs)
{
    Random random(1);
    auto mesh = PolygonMesh::quads(40).build();
    addAllTypes(sFaceVertexComp, random, *mesh);
    Orvan::Ptr<Object> const shared = std::move(mesh);
    Inputs const inputs = inputsOf(shared, shared);
    auto const expected = merged(Kind::Meshes, inputs);
    std::vector<std::jthread> threads;
    for (int thread = 0; thread != 4; ++thread)
        threads.emplace_back([&] { EXPECT_TRUE(sameContents(*merged(Kind::Meshes, inputs), *expected)); });
}

TEST(Merge, MergesManySmallInputsWithAndWithoutCommonLayouts)
{
    for (Kind const kind : {Kind::Meshes, Kind::PointClouds, Kind::Strands}) {
        SCOPED_TRACE(static_cast<int>(kind));
        Random random(7);
        Inputs inputs;
        auto const loose = Tessara::createObject();
        loose->setProperty(sData, Orvan::makePtr<Orvan::Array<int>>(Orvan::Array<int>{7, 8, 9}));
        while (inputs.size != 400) { // runs of equal properties, and of properties that change
            auto const input = deepCopy(*randomInput(kind, 1 + random.below(5), random));
            for (unsigned int alike = random.below(9); alike != 0 && inputs.size != 400; --alike) {
                auto copy = deepCopy(*input);
                // "weight" is data of either component or type, or an object with values that is not a geo property.
                if (random.below(3) == 0)
                    addDataProperty<int>("weight",
                        random.below(2) == 0 ? sPointComp : PlainMerge::componentsOf(kind).back(), {1, 2}, *copy, 5);
                else if (random.below(3) == 0)
                    addDataProperty<float>("weight", sPointComp, {1.5f}, *copy, 0.5f);
                else if (random.below(3) == 0)
                    copy->setProperty("weight", Orvan::Ptr<Object>(deepCopy(*loose)));
                inputs.append(std::move(copy));
            }
        }
        auto const expected = Tessara::createObject();
        ASSERT_TRUE(mergePlainly(kind, inputs, *expected));
        EXPECT_TRUE(sameContents(*merged(kind, inputs), *expected));
        expectSameForThreads({1, 2, 8}, [&] { return merged(kind, inputs); });
    }
}
