#include "HostFixture.h"
#include "HostObjects.h"

#include <Modeling/Modeling.h>
#include <TessaraMathSupport/ExceptionMessage.h>

#include <gtest/gtest.h>

#include <cmath>
#include <map>
#include <random>
#include <stdexcept>

using namespace HostTests;
using namespace Tessara::GeometryAlgorithms;

namespace {

using Floats = std::vector<float>;
using Corners = std::vector<unsigned int>;

Orvan::Array<Ptr<Object>> inputsOf(Orvan::MutablePtr<Object> a, Orvan::MutablePtr<Object> b)
{
    Orvan::Array<Ptr<Object>> inputs;
    inputs.append(std::move(a));
    inputs.append(std::move(b));
    return inputs;
}

/// Four points with data, a range and data of the range.
Orvan::MutablePtr<Object> makeCloudWithPalette()
{
    auto cloud = makeCloud(arrayOf<float3>({{0, 0, 0}, {1, 0, 0}, {2, 0, 0}, {3, 0, 0}}));
    addData<float>("weight", sPointComp, arrayOf<float>({1, 2, 3, 4}), 7, *cloud);
    addData<Text>("name", sPointComp, arrayOf<Text>({"a", "b", "c", "d"}), "none", *cloud);
    addRange("entry", sPointComp, arrayOf<unsigned int>({0, 1, 2, kInvalidIndex}), *cloud);
    addData<int>("palette", "entry", arrayOf({10, 20, 30}), 0, *cloud);
    return cloud;
}

/// Of the triangles' edges, the longest extent along an axis.
float longestExtent(Object const& mesh)
{
    auto const points = dataOf<float3>(mesh, sPointPosition);
    auto const corners = dataOf<unsigned int>(mesh, sFaceVertex);
    float longest = 0;
    for (std::uint64_t corner = 0; corner < corners->size; ++corner) {
        std::uint64_t const next = corner % 3 == 2 ? corner - 2 : corner + 1;
        float3 const &a = points->data[corners->data[corner]], &b = points->data[corners->data[next]];
        longest = std::max({longest, std::abs(a.x - b.x), std::abs(a.y - b.y), std::abs(a.z - b.z)});
    }
    return longest;
}

void expectClosedSphere(Object const& mesh)
{
    auto const corners = dataOf<unsigned int>(mesh, sFaceVertex);
    std::map<std::pair<unsigned int, unsigned int>, int> edges;
    for (std::uint64_t corner = 0; corner < corners->size; ++corner) {
        std::uint64_t const next = corner % 3 == 2 ? corner - 2 : corner + 1;
        ++edges[{corners->data[corner], corners->data[next]}];
    }
    for (auto const& [edge, count] : edges)
        ASSERT_TRUE(count == 1 && edges.contains({edge.second, edge.first}));
    unsigned int const faces = getElementCount(mesh, sFaceComp);
    EXPECT_EQ(corners->size, std::uint64_t{3} * faces);
    EXPECT_EQ(getElementCount(mesh, sPointComp), faces / 2 + 2) << "Euler's formula";
}

float one(int, int, int)
{
    return 1;
}

float linear(int i, int j, int k)
{
    return 1.5f * static_cast<float>(i) - 2 * static_cast<float>(j) + 0.25f * static_cast<float>(k) + 10;
}

template <class Traits> TSR::TileTree3D::LinearSampler<Traits> samplerOf(
    HostFixture::Volume<Traits> const& volume, float scale, float background)
{
    return {*volume.container, *volume.channel, *volume.topology, {.scale = scale, .background = background}};
}

template <class> class OperationsByVolume : public testing::Test {
};
using AllTraits = testing::Types<HostFixture::Traits2, HostFixture::Traits5>;
TYPED_TEST_SUITE(OperationsByVolume, AllTraits);

}

TEST(Operations, AddPoints)
{
    auto const cloud = makeCloudWithPalette();
    auto const before = dataOf<float>(*cloud, "weight");
    EXPECT_TRUE(addPointsToPointCloud(arrayOf<float3>({{9, 8, 7}}), "new", *cloud, nullptr));
    EXPECT_EQ(
        elementsOf(dataOf<float3>(*cloud, sPointPosition)), (Floats{0, 0, 0, 1, 0, 0, 2, 0, 0, 3, 0, 0, 9, 8, 7}));
    EXPECT_EQ(elementsOf(dataOf<float>(*cloud, "weight")), (Floats{1, 2, 3, 4, 7}));
    EXPECT_EQ(elementsOf(dataOf<Text>(*cloud, "name")), (Texts{"a", "b", "c", "d", "none"}));
    EXPECT_EQ(elementsOf(getRangeGeoPropIndices(*cloud, "entry")), (Corners{0, 1, 2, kInvalidIndex, kInvalidIndex}));
    auto const tag = dataOf<bool>(*cloud, "new");
    ASSERT_TRUE(tag && tag->size == 5);
    EXPECT_TRUE(!tag->data[3] && tag->data[4]);
    EXPECT_EQ(before->size, 4u);
    EXPECT_FALSE(addPointsToPointCloud(arrayOf<float3>({{9, 8, 7}}), "", *makeOctahedron(), nullptr));
}

TEST(Operations, DeletePoints)
{
    for (bool const isShared : {false, true}) {
        auto const cloud = makeCloudWithPalette();
        auto const weights = isShared ? dataOf<float>(*cloud, "weight") : nullptr;
        auto const indices = isShared ? getRangeGeoPropIndices(*cloud, "entry") : nullptr;
        EXPECT_TRUE(deletePointsInPointCloud(arrayOf<unsigned int>({1, 99}), *cloud, nullptr));
        EXPECT_EQ(getElementCount(*cloud, sPointComp), 3u);
        EXPECT_EQ(elementsOf(dataOf<float3>(*cloud, sPointPosition)), (Floats{0, 0, 0, 2, 0, 0, 3, 0, 0}));
        EXPECT_EQ(elementsOf(dataOf<float>(*cloud, "weight")), (Floats{1, 3, 4}));
        EXPECT_EQ(elementsOf(dataOf<Text>(*cloud, "name")), (Texts{"a", "c", "d"}));
        EXPECT_EQ(elementsOf(getRangeGeoPropIndices(*cloud, "entry")), (Corners{0, 1, kInvalidIndex}));
        EXPECT_EQ(elementsOf(dataOf<int>(*cloud, "palette")), (std::vector<int>{10, 30}));
        if (isShared) {
            EXPECT_EQ(elementsOf(weights), (Floats{1, 2, 3, 4}));
            EXPECT_EQ(elementsOf(indices), (Corners{0, 1, 2, kInvalidIndex}));
        }
    }
}

TEST(Operations, DeleteFaces)
{
    auto const mesh = makeTriangles(arrayOf<float3>({{0, 0, 0}, {1, 0, 0}, {2, 0, 0}, {3, 0, 0}, {4, 0, 0}}),
        arrayOf<unsigned int>({0, 1, 2, 0, 2, 3, 3, 2, 4}));
    addData<int>("material", sFaceComp, arrayOf({5, 6, 7}), 0, *mesh);
    EXPECT_TRUE(deleteFaces(arrayOf({true, false, false}), *mesh));
    EXPECT_EQ(elementsOf(dataOf<float3>(*mesh, sPointPosition)), (Floats{0, 0, 0, 2, 0, 0, 3, 0, 0, 4, 0, 0}));
    EXPECT_EQ(elementsOf(dataOf<unsigned int>(*mesh, sFaceVertex)), (Corners{0, 1, 2, 2, 1, 3}));
    EXPECT_EQ(elementsOf(dataOf<unsigned int>(*mesh, sFaceOffset)), (Corners{0, 3, 6}));
    EXPECT_EQ(elementsOf(dataOf<int>(*mesh, "material")), (std::vector<int>{6, 7}));
}

TEST(Operations, MergeMeshes)
{
    auto const triangle = [](float x) {
        return makeTriangles(arrayOf<float3>({{x, 0, 0}, {x, 1, 0}, {x, 0, 1}}), arrayOf<unsigned int>({0, 1, 2}));
    };
    auto first = triangle(0), second = triangle(1);
    addData<float>("weight", sPointComp, arrayOf<float>({1, 2, 3}), 7, *first);
    addRange("entry", sFaceComp, arrayOf<unsigned int>({0}), *first);
    addData<int>("palette", "entry", arrayOf({5}), 9, *first);
    addData<Text>("name", sPointComp, arrayOf<Text>({"x", "y", "z"}), "?", *second);
    second->setProperty("title", Text("second"));
    auto const output = Tessara::createObject();
    EXPECT_TRUE(mergeMeshes(inputsOf(std::move(first), std::move(second)), *output, nullptr));
    EXPECT_EQ(elementsOf(dataOf<float3>(*output, sPointPosition)),
        (Floats{0, 0, 0, 0, 1, 0, 0, 0, 1, 1, 0, 0, 1, 1, 0, 1, 0, 1}));
    EXPECT_EQ(elementsOf(dataOf<unsigned int>(*output, sFaceVertex)), (Corners{0, 1, 2, 3, 4, 5}));
    EXPECT_EQ(elementsOf(dataOf<unsigned int>(*output, sFaceOffset)), (Corners{0, 3, 6}));
    EXPECT_EQ(elementsOf(dataOf<float>(*output, "weight")), (Floats{1, 2, 3, 7, 7, 7}));
    EXPECT_EQ(elementsOf(dataOf<Text>(*output, "name")), (Texts{"?", "?", "?", "x", "y", "z"}));
    EXPECT_EQ(elementsOf(getRangeGeoPropIndices(*output, "entry")), (Corners{0, 1}));
    EXPECT_EQ(elementsOf(dataOf<int>(*output, "palette")), (std::vector<int>{5, 9}));
    EXPECT_TRUE(valueIn<Text>(output->getProperty("title")) == "second");
    EXPECT_EQ(getElementCount(*output, sFaceVertexComp), 6u);
}

TEST(Operations, MergePointCloudsAndStrands)
{
    auto const clouds = Tessara::createObject(), strands = Tessara::createObject();
    EXPECT_TRUE(
        mergePointClouds(inputsOf(makeCloudWithPalette(), makeCloud(arrayOf<float3>({{8, 0, 0}}))), *clouds, nullptr));
    EXPECT_EQ(elementsOf(dataOf<float>(*clouds, "weight")), (Floats{1, 2, 3, 4, 7}));
    EXPECT_EQ(elementsOf(dataOf<int>(*clouds, "palette")), (std::vector<int>{10, 20, 30, 0}));
    auto const line = arrayOf<float3>({{0, 0, 0}, {1, 0, 0}, {2, 0, 0}});
    EXPECT_TRUE(mergeStrands(
        inputsOf(makeStrands(line, arrayOf<unsigned int>({0, 2, 3})), makeStrands(line, arrayOf<unsigned int>({0, 3}))),
        *strands, nullptr));
    EXPECT_EQ(elementsOf(dataOf<unsigned int>(*strands, sStrandOffset)), (Corners{0, 2, 3, 6}));
    EXPECT_EQ(getElementCount(*strands, sStrandComp), 3u);
}

TEST(Operations, Triangulate)
{
    auto const mesh = makeMesh(arrayOf<float3>({{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}, {2, 0, 0}, {4, 0, 0},
                                   {4, 4, 0}, {3, 1, 0}, {2, 4, 0}}),
        arrayOf<unsigned int>({0, 1, 2, 3, 4, 5, 6, 7, 8}), arrayOf<unsigned int>({0, 4, 9}));
    addData<int>("uv", sFaceVertexComp, arrayOf({10, 11, 12, 13, 14, 15, 16, 17, 18}), 0, *mesh);
    addData<int>("material", sFaceComp, arrayOf({1, 2}), 0, *mesh);
    Geometry::Mesh::triangulate("uv", *mesh);
    auto const corners = elementsOf(dataOf<unsigned int>(*mesh, sFaceVertex));
    ASSERT_EQ(corners.size(), 15u);
    EXPECT_EQ(Corners(corners.begin(), corners.begin() + 6), (Corners{3, 0, 1, 3, 1, 2}));
    EXPECT_EQ(elementsOf(dataOf<unsigned int>(*mesh, sFaceOffset)), (Corners{0, 3, 6, 9, 12, 15}));
    auto const uv = elementsOf(dataOf<int>(*mesh, "uv"));
    ASSERT_EQ(uv.size(), corners.size());
    for (std::size_t corner = 0; corner < corners.size(); ++corner)
        EXPECT_EQ(uv[corner], static_cast<int>(10 + corners[corner]));
    EXPECT_FALSE(mesh->hasProperty("material"));
    // The five corners of the second polygon are not convex: only triangles inside of it add up to its area.
    auto const points = dataOf<float3>(*mesh, sPointPosition);
    for (std::size_t corner = 6; corner < corners.size(); corner += 3) {
        float3 const &a = points->data[corners[corner]], &b = points->data[corners[corner + 1]],
                     &c = points->data[corners[corner + 2]];
        EXPECT_GT((b.x - a.x) * (c.y - a.y) - (b.y - a.y) * (c.x - a.x), 0);
    }
}

TEST(Operations, SubdivideByLength)
{
    auto const mesh = makeOctahedron();
    addData<float3>("carried", sPointComp, octahedronPoints(), {}, *mesh);
    addData<int>("dropped", sPointComp, Orvan::Array<int>(6), 0, *mesh);
    EXPECT_TRUE(Geometry::Mesh::subdivide(0.1f, *mesh));
    expectClosedSphere(*mesh);
    EXPECT_GT(getElementCount(*mesh, sFaceComp), 24u);
    EXPECT_LE(longestExtent(*mesh), 0.2f);
    EXPECT_EQ(dataOf<float3>(*mesh, "carried")->size, getElementCount(*mesh, sPointComp));
    EXPECT_FALSE(mesh->hasProperty("dropped"));
}

TEST(Operations, SubdivideUntilTheJobIsCancelled)
{
    if (!HostFixture::setJobCancelled(true))
        GTEST_SKIP() << "the fixture cannot cancel";
    std::string message;
    try {
        Geometry::Mesh::subdivide(0.01f, *makeOctahedron());
    } catch (std::runtime_error const& error) {
        message = error.what();
    }
    EXPECT_EQ(message, TSR::exceptionMessage.c_str());
    EXPECT_TRUE(deletePointsInPointCloud(arrayOf<unsigned int>({0}), *makeCloudWithPalette(), nullptr));
    HostFixture::setJobCancelled(false);
}

TYPED_TEST(OperationsByVolume, SubdivideAsByLengthIfTheVolumeIsConstant)
{
    auto const volume = HostFixture::makeVolume<TypeParam>(one, 7);
    if (!volume)
        GTEST_SKIP() << "the fixture makes no volumes";
    auto const byVolume = makeOctahedron(), byLength = makeOctahedron();
    EXPECT_TRUE(Geometry::Mesh::subdivide<TypeParam>(samplerOf(volume, 10, 1), *byVolume, 0.1f));
    EXPECT_TRUE(Geometry::Mesh::subdivide(0.1f, *byLength));
    EXPECT_EQ(
        elementsOf(dataOf<float3>(*byVolume, sPointPosition)), elementsOf(dataOf<float3>(*byLength, sPointPosition)));
    EXPECT_EQ(elementsOf(dataOf<unsigned int>(*byVolume, sFaceVertex)),
        elementsOf(dataOf<unsigned int>(*byLength, sFaceVertex)));
}

TYPED_TEST(OperationsByVolume, SampleLinearFieldsAcrossTiles)
{
    auto const volume = HostFixture::makeVolume<TypeParam>(linear, 7);
    if (!volume)
        GTEST_SKIP() << "the fixture makes no volumes";
    auto sampler = samplerOf(volume, 1, -5);
    std::mt19937 random(3);
    std::uniform_real_distribution<float> coordinate(-19.5f, 18.5f);
    std::vector<float3> points;
    for (int n = 0; n < 1000; ++n)
        points.push_back({coordinate(random), coordinate(random), coordinate(random)});
    points.push_back({500, 0, 0});
    constexpr int kDepth = std::is_same_v<TypeParam, HostFixture::Traits2> ? 28 : 12;
    Floats values(points.size());
    sampler.sampleAll(points.data(), points.size(), kDepth, 0, values.data());
    for (std::size_t n = 0; n < 1000; ++n) {
        float3 const& p = points[n];
        ASSERT_NEAR(values[n], 1.5f * p.x - 2 * p.y + 0.25f * p.z + 10, 1e-3f);
        ASSERT_EQ(values[n], sampler.sample(p, kDepth, 0));
    }
    EXPECT_EQ(values.back(), -5) << "the background";
}

TYPED_TEST(OperationsByVolume, SampleConstantsWithLayersAllAround)
{
    auto const volume = HostFixture::makeVolume<TypeParam>(one, 0);
    if (!volume)
        GTEST_SKIP() << "the fixture makes no volumes";
    auto sampler = samplerOf(volume, 1, 1);
    constexpr int kDepth = std::is_same_v<TypeParam, HostFixture::Traits2> ? 28 : 12;
    for (float x = -19; x < 19; x += 0.37f)
        EXPECT_EQ(sampler.sample({x, -x, x / 2}, kDepth, 0), 1);
}

TEST(Operations, Smooth)
{
    // One step of 0.5 moves each corner half of the way to the centroid, (1, 1, 0).
    auto positions = arrayOf<float3>({{0, 0, 0}, {3, 0, 0}, {0, 3, 0}});
    Geometry::Mesh::smooth(0.5f, 3, 1, arrayOf<unsigned int>({0, 1, 2}), arrayOf<unsigned int>({0, 3}), nullptr,
        positions, CoreGL::NOPLogger());
    EXPECT_EQ(
        elementsOf(Orvan::makePtr<Orvan::Array<float3>>(positions)), (Floats{0.5f, 0.5f, 0, 2, 0.5f, 0, 0.5f, 2, 0}));
}

TEST(Operations, RemoveSlivers)
{
    // An octahedron, one edge of which is split close to its end.
    auto points = octahedronPoints();
    points.append({0.99f, 0.01f, 0});
    auto const mesh = makeTriangles(std::move(points),
        arrayOf<unsigned int>(
            {0, 6, 4, 6, 1, 4, 1, 2, 4, 2, 3, 4, 3, 0, 4, 6, 0, 5, 1, 6, 5, 2, 1, 5, 3, 2, 5, 0, 3, 5}));
    EXPECT_TRUE(Geometry::Mesh::removeSlivers(0.05f, *mesh));
    EXPECT_EQ(getElementCount(*mesh, sFaceComp), 8u);
    expectClosedSphere(*mesh);
}

TEST(Operations, LayStitchTemplates)
{
    auto const square =
        Orvan::makePtr<Orvan::Array<float3>>(arrayOf<float3>({{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}}));
    auto const strand =
        Orvan::makePtr<Orvan::Array<float3>>(arrayOf<float3>({{0.5f, 0, 0}, {0.25f, 0.5f, 0.5f}, {0.5f, 1, 0}}));
    Tessara::Modeling::StitchTemplate const stitch(
        square, strand, Orvan::makePtr<Indices>(arrayOf<unsigned int>({0, 3})), false);
    EXPECT_STREQ(stitch.getErrors().c_str(), "");
    ASSERT_EQ(stitch.getStrands().size, 1u);
    auto const& points = stitch.getStrands().data[0].controlPoints;
    ASSERT_EQ(points.size, 3u);
    for (std::uint64_t point = 0; point < 3; ++point) {
        float3 position{};
        stitch.findControlPointPos(*square, points.data[point], 1, false, position);
        float3 const& expected = strand->data[point];
        EXPECT_NEAR(position.x, expected.x, 1e-6f);
        EXPECT_NEAR(position.y, expected.y, 1e-6f);
        EXPECT_NEAR(position.z, expected.z, 1e-6f);
    }
    auto const& ends = stitch.getEdgeEndpoints();
    ASSERT_EQ(ends.size, 4u);
    EXPECT_TRUE(
        ends.data[0].size == 1 && !ends.data[0].data[0].end && ends.data[2].size == 1 && ends.data[2].data[0].end);
    EXPECT_STREQ(Tessara::Modeling::StitchTemplate().getErrors().c_str(), "---empty stitch template---");
}
