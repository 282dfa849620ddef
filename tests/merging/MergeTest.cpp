#include "PlainMerge.h"

#include "merging/MergedComponents.h"
#include "merging/mergeGeoComponent.h"
#include "support/Testing.h"

#include <Modeling/copyNonGeoProperties.h>
#include <Modeling/mergeMeshes.h>
#include <Modeling/mergePointClouds.h>
#include <Modeling/mergeStrands.h>

#include <tbb/parallel_for.h>

#include <thread>

using namespace Tessara::GeometryAlgorithms;
using namespace TestSupport;
using PlainMerge::Inputs, PlainMerge::Kind;

namespace {

using Indices = std::vector<unsigned int>;
using IndexArray = Orvan::Array<unsigned int>;

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

struct Trial {
    explicit Trial(unsigned int seed)
    {
        Random random(seed);
        kind = static_cast<Kind>(seed % 3);
        for (std::size_t input = 1 + random.below(5); input != 0; --input)
            inputs.append(random.below(6) == 0 && !inputs.empty()
                    ? inputs[0]
                    : randomInput(kind, random.below(random.below(40) == 0 ? 3000 : 7), random));
        if (random.below(3) == 0)
            output->setProperty("note", 1.5);
    }

    Kind kind;
    Inputs inputs;
    Orvan::MutablePtr<Object> output = Tessara::createObject();
};

Orvan::Array<Orvan::Ptr<Object>> copiesOf(Inputs const& inputs)
{
    Inputs copies;
    for (auto const& input : inputs)
        copies.append(deepCopy(*input));
    return copies;
}

void expectUnchanged(Inputs const& inputs, Inputs const& before)
{
    for (std::size_t input = 0; input != inputs.size; ++input)
        EXPECT_TRUE(sameContents(*inputs[input], *before[input])) << "input " << input;
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

TEST(Merge, agreesWithPlainMergingOnRandomInputs)
{
    for (unsigned int seed = 0; seed != 6000; ++seed) {
        SCOPED_TRACE(seed);
        Trial const trial(seed);
        Inputs const before = copiesOf(trial.inputs);
        auto const expected = deepCopy(*trial.output);
        bool const isMerged = mergePlainly(trial.kind, trial.inputs, *expected);
        ASSERT_EQ(merge(trial.kind, trial.inputs, *trial.output), isMerged);
        ASSERT_TRUE(sameContents(*trial.output, *expected));
        expectUnchanged(trial.inputs, before);
        if (isMerged) {
            ASSERT_TRUE(isValid(*trial.output));
        }
    }
}

TEST(Merge, givesResultsWorkedOutByHand)
{
    auto const with = [](Orvan::Array<unsigned int> const& indices, Orvan::Array<int> const& data) {
        auto cloud = cloudOf(indices.size);
        addDataProperty<int>("weight", sPointComp, {5}, *cloud, static_cast<int>(indices.size));
        addRangeProperty("material", sPointComp, indices, *cloud);
        addDataProperty<int>("color", "material", data, *cloud, 77);
        return cloud;
    };
    auto const cloud = merged(
        Kind::PointClouds, inputsOf(with({0, 2, 1}, {10, 20, 30}), cloudOf(2), with({1, kInvalidIndex}, {40, 50})));
    EXPECT_EQ(*getRangeGeoPropIndices(*cloud, "material"), (IndexArray{0, 2, 1, 5, 5, 4, 2}));
    EXPECT_EQ(valuesOf<int>(*cloud, "color"), (std::vector<int>{10, 20, 30, 40, 50, 77}));
    EXPECT_EQ(valuesOf<int>(*cloud, "weight"), (std::vector<int>{5, 3, 3, 3, 3, 5, 3}));

    // Surplus indices continue into the next input's elements if that has no indices for them.
    auto longer = with({1}, {30, 40});
    replaceIn("material", sIndices, Orvan::makePtr<IndexArray>(IndexArray{1, 1, 1}), *longer);
    auto shorter = with({0, 0}, {50});
    replaceIn("material", sIndices, Orvan::makePtr<IndexArray>(IndexArray{0}), *shorter);
    auto const odd = merged(Kind::PointClouds, inputsOf(with({0, 0}, {10, 20}), std::move(longer), std::move(shorter)));
    EXPECT_EQ(*getRangeGeoPropIndices(*odd, "material"), (IndexArray{0, 0, 3, 4, 3}));

    Orvan::Ptr<Object> const triangle = makeMesh({{0, 0, 0}, {1, 0, 0}, {0, 1, 0}}, {0, 1, 2}, {0, 3});
    auto const mesh = merged(
        Kind::Meshes, inputsOf(triangle, makeMesh({{5, 5, 5}}, {}, {0}), cloudOf(2), nullptr, deepCopy(*triangle)));
    EXPECT_EQ(valuesOf<unsigned int>(*mesh, sFaceVertex), (Indices{0, 1, 2, 4, 5, 6}));
    EXPECT_EQ(valuesOf<unsigned int>(*mesh, sFaceOffset), (Indices{0, 3, 6}));
    EXPECT_EQ(dataOf<unsigned int>(*mesh, sFaceOffset)->capacity, 3u) << "allocated with its closing entry";
    EXPECT_EQ(countsOf(*mesh), (Counts{7, 6, 2}));

    // One name on two components: the last component wins, even if only the last of many inputs has the name there.
    auto onPoints = deepCopy(*triangle), onFaces = deepCopy(*triangle);
    addDataProperty<int>("tag", sPointComp, {1, 2, 3}, *onPoints);
    addDataProperty<int>("tag", sFaceComp, {7}, *onFaces);
    Inputs many = inputsOf(std::move(onPoints));
    while (many.size != 255)
        many.append(many[0]);
    many.append(std::move(onFaces));
    auto const tagged = merged(Kind::Meshes, many);
    std::vector<int> tags(256, 1);
    tags.back() = 7;
    EXPECT_EQ(getGeoPropTargetName(*tagged, "tag"), sFaceComp);
    EXPECT_EQ(valuesOf<int>(*tagged, "tag"), tags);

    auto const strands = merged(Kind::Strands,
        inputsOf(makeStrands(Orvan::Array<float3>(10), {0, 4, 10}), makeStrands({{}, {}}, {0}),
            makeStrands(Orvan::Array<float3>(6), {0, 6})));
    EXPECT_EQ(valuesOf<unsigned int>(*strands, sStrandOffset), (Indices{0, 4, 12, 18}));

    // Points before the first strand belong to no strand, and a result can be merged again.
    auto const withoutStrands = merged(Kind::Strands,
        inputsOf(makeStrands({{}, {}}, {0}), makeStrands(Orvan::Array<float3>(6), {0, 6}), deepCopy(*strands)));
    EXPECT_EQ(valuesOf<unsigned int>(*withoutStrands, sStrandOffset), (Indices{2, 8, 12, 20, 26}));
    auto const twice = merged(Kind::Strands, inputsOf(deepCopy(*withoutStrands), deepCopy(*withoutStrands)));
    EXPECT_EQ(valuesOf<unsigned int>(*twice, sStrandOffset), (Indices{2, 8, 12, 20, 28, 34, 38, 46, 52}));
}

TEST(Merge, refusesWithoutChangingTheOutput)
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
}

TEST(Merge, acceptsTheOutputAsAnInput)
{
    for (unsigned int seed = 0; seed != 60; ++seed) {
        SCOPED_TRACE(seed);
        Trial const trial(seed);
        Orvan::MutablePtr<Object> output = deepCopy(*trial.inputs[0]);
        auto const expected = deepCopy(*output);
        bool const isMerged =
            mergePlainly(trial.kind, inputsOf(deepCopy(*output), trial.inputs[0], deepCopy(*output)), *expected);
        Object& written = *output;
        Orvan::Ptr<Object> const shared = std::move(output);
        EXPECT_EQ(merge(trial.kind, inputsOf(shared, trial.inputs[0], shared), written), isMerged);
        EXPECT_TRUE(sameContents(*shared, *expected));
    }
}

TEST(Merge, copiesOtherPropertiesFromTheFirstInputThatHasThem)
{
    auto first = Tessara::createObject(), second = cloudOf(1);
    Orvan::Ptr<Object> const object = cloudOf(1);
    first->setProperty("a", 1);
    first->setProperty("object", Orvan::Ptr<Object>(object));
    first->setProperty("null", Orvan::Ptr<Object>());
    second->setProperty("a", 2.5);
    second->setProperty("", 5);
    second->setProperty("kept", 4);
    addDataProperty<int>("data", sPointComp, {1}, *second);
    addRangeProperty("range", sPointComp, {0}, *second);
    auto const output = Tessara::createObject(), expected = Tessara::createObject();
    output->setProperty("kept", 3);
    copyNonGeoProperties(inputsOf(std::move(first), nullptr, std::move(second)), *output);
    expected->setProperty("kept", 3);
    expected->setProperty("a", 1);
    expected->setProperty("object", Orvan::Ptr<Object>(object));
    expected->setProperty("null", Orvan::Ptr<Object>());
    EXPECT_TRUE(sameContents(*output, *expected));
}

TEST(Merge, rebasesAnArrayThatHasReplacedTheConnectivity)
{
    using namespace Modeling::Internal;
    Offsets const regions{0, 2, 3, 50}, bases{0, 10, 100, 1000};
    auto const output = cloudOf(0);
    addDataProperty<unsigned int>("other", sPointComp, {1, 2, 3, 4}, *output); // shorter than the regions
    Connectivity connectivity{"other", bases, 1000u, nullptr};
    EXPECT_FALSE(finishConnectivity(connectivity, regions, *output)) << "nothing was merged";
    connectivity.merged = Orvan::makePtr<Orvan::Array<unsigned int>>();
    EXPECT_TRUE(finishConnectivity(connectivity, regions, *output));
    EXPECT_EQ(valuesOf<unsigned int>(*output, "other"), (Indices{1, 2, 13, 104, 1100}));
    addDataProperty<int>("other", sPointComp, {1, 2, 3, 4}, *output);
    EXPECT_FALSE(finishConnectivity(connectivity, regions, *output));

    // Inputs without values of their own get the default, which is rebased too.
    auto const with = cloudOf(2), without = cloudOf(2), target = cloudOf(0);
    addDataProperty<unsigned int>("other", sPointComp, {1, 2}, *with, 7u);
    Offsets const points{0, 2, 4};
    mergeGeoComponent(planMerge({with.get(), without.get()}, {sPointComp}), sPointComp, points, &connectivity, *target);
    EXPECT_EQ(valuesOf<unsigned int>(*target, "other"), (Indices{1, 2, 17, 17, 1000}));
}

TEST(Merge, isCompleteOrRefusedIfAnEnclosingGroupIsCancelled)
{
    std::map<Kind, Orvan::Ptr<Object>> const inputs{{Kind::Meshes, PolygonMesh::quads(3).build()},
        {Kind::PointClouds, cloudOf(3)}, {Kind::Strands, makeStrands(Orvan::Array<float3>(4), {0, 4})}};
    Object const before = *cloudOf(1);
    for (auto const& entry : inputs) {
        Kind const kind = entry.first;
        Inputs const twice = inputsOf(entry.second, entry.second);
        Object expected = before;
        EXPECT_TRUE(merge(kind, twice, expected));
        Object const refused = kind == Kind::Meshes ? Object() : before;
        bool isReached = true;
        for (int number = 1; isReached; ++number) {
            SCOPED_TRACE("cancelled in allocation " + std::to_string(number));
            Object output = before;
            bool isMerged = false;
            withThreads(1, [&] {
                tbb::task_group group;
                group.run_and_wait([&] {
                    isReached = runDuringAllocation(
                        number, [&] { group.cancel(); }, [&] { isMerged = merge(kind, twice, output); });
                });
            });
            EXPECT_TRUE(sameContents(output, isMerged ? expected : refused));
            EXPECT_TRUE(isMerged || kind != Kind::PointClouds);
        }
    }
}

TEST(Merge, runsConcurrentlyOnSharedInputs)
{
    Random random(1);
    auto const mesh = PolygonMesh::quads(40).build();
    addAllTypes(sFaceVertexComp, random, *mesh);
    Orvan::Ptr<Object> const shared = deepCopy(*mesh);
    auto const expected = merged(Kind::Meshes, inputsOf(shared, shared));
    std::vector<std::thread> threads;
    for (int thread = 0; thread != 4; ++thread)
        threads.emplace_back(
            [&] { EXPECT_TRUE(sameContents(*merged(Kind::Meshes, inputsOf(shared, shared)), *expected)); });
    for (std::thread& thread : threads)
        thread.join();
}

TEST(Merge, mergesManySmallInputsWithAndWithoutCommonLayouts)
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
