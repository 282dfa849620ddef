#include <Modeling/subdivideByVolume.h>

#include "frame/VectorMath.h"
#include "support/Testing.h"
#include "support/Volumes.h"

#include <Modeling/subdivide.h>

using namespace Modeling;
using namespace TSR::TileTree3D;
using namespace TestSupport;
using Geometry::Mesh::subdivide;

namespace {

constexpr float kScale = 10; // voxels per unit

template <class> class SubdivideByVolume : public testing::Test {
};
using Layouts = testing::Types<Traits2, Traits5>;
TYPED_TEST_SUITE(SubdivideByVolume, Layouts);

/// A field of constant value, or one that grows with x, around the origin.
template <class Traits> Volume<Traits> volumeOf(float atCenter, float perUnit, float background)
{
    constexpr int kReach = 13; // the unit ball and a voxel more, where neighbors end
    Field const field = Field::of(
        -kReach, kReach, [=](int i, int, int) { return atCenter + perUnit * static_cast<float>(i) / kScale; });
    return buildVolume<Traits>({.background = background, .depth = Traits::kUnitDepth, .block = field.block()});
}

template <class Traits> LinearSampler<Traits> guideOf(Volume<Traits> const& volume, float scale = kScale)
{
    return {
        volume.container, volume.channel, volume.topology, {.scale = scale, .background = volume.background}, nullptr};
}

template <class Traits> std::vector<bool> marksOf(
    LinearSampler<Traits> const& sampler, Object const& mesh, float tolerance, std::vector<bool> before = {})
{
    auto const faceCount = static_cast<unsigned int>(countsOf(mesh).faces);
    before.resize(faceCount);
    Orvan::Array<bool> marks;
    for (bool const mark : before)
        marks.append(mark);
    Geometry::Mesh::Internal::markForSubdivision(sampler, faceCount, *dataOf<float3>(mesh, sPointPosition),
        *dataOf<unsigned int>(mesh, sFaceVertex), *dataOf<unsigned int>(mesh, sFaceOffset), marks, tolerance);
    return std::vector<bool>(marks.begin(), marks.end());
}

}

TYPED_TEST(SubdivideByVolume, EqualsSubdivideIfTheVolumeIsConstant)
{
    for (auto const& builder : {MeshBuilder::sphere(6).withNoise(0.05f, 3).shuffled(4), MeshBuilder::torus(9, 7)}) {
        auto const volume = volumeOf<TypeParam>(0.3f, 0, 0.3f);
        auto const guided = builder.build(), plain = builder.build();
        EXPECT_TRUE(subdivide(guideOf(volume), *guided, 0.17f));
        EXPECT_TRUE(subdivide(0.3f * 0.17f, *plain));
        EXPECT_GT(countsOf(*guided).faces, countsOf(*builder.build()).faces);
        EXPECT_TRUE(sameContents(*guided, *plain));
    }
}

TYPED_TEST(SubdivideByVolume, MarksByTheSecondCornerForAnyNumberOfThreads)
{
    auto const volume = volumeOf<TypeParam>(0.6f, 0.5f, 1);
    auto const sampler = guideOf(volume);
    auto const mesh = MeshBuilder::sphere(40).withNoise(0.02f, 1).shuffled(2);
    float const tolerance = 0.04f;
    std::vector<bool> expected;
    for (auto const& face : mesh.faces) {
        float3 const o = mesh.points[face[0]], p = mesh.points[face[1]], q = mesh.points[face[2]];
        float side = 0; // the longest one of the bounding box
        for (float3 const& edge : {p - o, q - p, o - q})
            side = std::max({side, std::abs(edge.x), std::abs(edge.y), std::abs(edge.z)});
        auto const mean = [](float c) { return (0 + c + c + c) / 3.0f; };
        float const value =
            LinearSampler<TypeParam>(sampler).sample({mean(p.x), mean(p.y), mean(p.z)}, TypeParam::kUnitDepth, 2);
        expected.push_back(value * tolerance > 1.1920929e-7f && side > value * tolerance + value * tolerance);
    }
    auto const marked = std::count(expected.begin(), expected.end(), true);
    EXPECT_GT(marked, 1000);
    EXPECT_LT(marked, static_cast<long>(mesh.faces.size()) - 1000);
    for (int const threads : {1, 2, 8})
        EXPECT_EQ(withThreads(threads, [&] { return marksOf(sampler, *mesh.build(), tolerance); }), expected)
            << threads;
}

TYPED_TEST(SubdivideByVolume, LeavesFacesAloneWithoutAPositiveTolerance)
{
    auto const sphere = MeshBuilder::sphere(3);
    auto const mesh = sphere.build();
    std::vector<bool> const none(sphere.faces.size(), false), all(sphere.faces.size(), true);
    for (float const value : {0.0f, -2.0f, kNan, 1e-7f}) {
        auto const volume = volumeOf<TypeParam>(value, 0, value);
        EXPECT_EQ(marksOf(guideOf(volume), *mesh, 1), none) << value;
        EXPECT_EQ(marksOf(guideOf(volume), *mesh, 1, all), all) << "no mark is cleared";
    }
    auto const positive = volumeOf<TypeParam>(0.01f, 0, 0.01f), empty = volumeOf<TypeParam>(1, 0, 0);
    EXPECT_EQ(marksOf(guideOf(positive), *mesh, 1), all);
    EXPECT_EQ(marksOf(guideOf(positive), *mesh, -1), none);
    auto far = sphere;
    for (float3& point : far.points)
        point.x += 50;
    EXPECT_EQ(marksOf(guideOf(empty), *far.build(), 1), none) << "background";
    far.points[sphere.faces[5][1]].y = kNan;
    EXPECT_EQ(marksOf(guideOf(positive), *far.build(), 1)[5], true)
        << "its other corners are far apart, and the background applies";
    EXPECT_EQ(marksOf(guideOf(positive), *MeshBuilder::of({}, {}).build(), 1), std::vector<bool>());
    auto wide = sphere;
    wide.points[sphere.faces[5][1]].x = 2e38f; // the sum of three is infinite, so the mean is too
    LinearSampler<TypeParam> const tiny(
        empty.container, empty.channel, empty.topology, {.scale = 1e-38f, .background = 0});
    EXPECT_EQ(marksOf(tiny, *wide.build(), 1)[5], false);

    auto const open = MeshBuilder::sphere(3).withoutFace(4).build(), before = deepCopy(*open);
    EXPECT_FALSE(subdivide(guideOf(positive), *open, 1));
    EXPECT_TRUE(sameContents(*open, *before));
}
