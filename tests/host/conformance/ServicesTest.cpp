#include "HostFixture.h"

#include <OrvanCppOpSDK/Job.h>
#include <OrvanCppOpSDK/RuntimeServices.h>
#include <TessaraGeometryVolume/Canceller.h>
#include <TessaraGeometryVolume/ChannelParser.h>
#include <TessaraGeometryVolume/HaloTile.h>
#include <TessaraMathSupport/ExceptionMessage.h>
#include <TessaraMathSupport/Loggers.h>
#include <TessaraMathSupport/Stepper.h>
#include <TessaraMathSupport/Types.h>
#include <TessaraSpatial/SpatialQuery.h>

#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <type_traits>

using namespace HostFixture;
using namespace Tessara::SpatialQuery;
using Tessara::Math::float2;

namespace {

template <class Logger> void expectToEnd(float amount, Logger const& logger)
{
    float sum = 0;
    int steps = 0;
    for (Tessara::Math::Stepper stepper(amount, 0.9f); stepper; stepper.step(logger)) {
        ASSERT_LT(++steps, 1000) << "it must end";
        Tessara::Math::Stepper const& due = stepper;
        ASSERT_EQ(due.increment(), due.increment()) << "the same for all points of a step";
        sum += due.increment();
    }
    EXPECT_NEAR(sum, std::max(amount, 0.0f), 1e-4f);
}

bool isLeftTurn(float2 a, float2 b, float2 c)
{
    return static_cast<int>(pointEdgeOrientation(a, b, c)) == 1;
}

bool isInTriangle(float2 p)
{
    float u, v, w;
    return pointInTriangle(p, {0, 0}, {4, 0}, {0, 4}, u, v, w, nullptr);
}

float fieldAt(int i, int j, int k)
{
    return static_cast<float>(i + 50 * j + 2500 * k);
}

template <class Traits> struct Layout;
template <> struct Layout<Traits2> {
    static constexpr int kSide = 4, kDepth = 28;
};
template <> struct Layout<Traits5> {
    static constexpr int kSide = 5, kDepth = 12;
};

template <class> class Volumes : public testing::Test {
};
using AllTraits = testing::Types<Traits2, Traits5>;
TYPED_TEST_SUITE(Volumes, AllTraits);

}

TEST(Jobs, TellWhetherTheyAreCancelled)
{
    EXPECT_FALSE(Orvan::isJobCancelled());
    if (!setJobCancelled(true))
        GTEST_SKIP() << "the fixture cannot cancel";
    EXPECT_TRUE(Orvan::isJobCancelled());
    setJobCancelled(false);
    EXPECT_FALSE(Orvan::isJobCancelled());
    EXPECT_FALSE(TSR::exceptionMessage.empty());
    TSR::Canceller::ID place{4};
    TSR::Canceller::cancelID(place);
}

TEST(Steppers, EndAfterTheAmount)
{
    for (float const amount : {-1.0f, 0.0f, 0.5f, 0.9f, 2.0f})
        expectToEnd(amount, CoreGL::NOPLogger());
    expectToEnd(2, CoreGL::ConsoleLogger());
    expectToEnd(2, CoreGL::OrvanLogger());
}

TEST(SpatialQueries, TellStrictLeftTurns)
{
    EXPECT_TRUE(isLeftTurn({0, 0}, {1, 0}, {1, 1}));
    EXPECT_FALSE(isLeftTurn({0, 0}, {1, 1}, {1, 0}));
    EXPECT_FALSE(isLeftTurn({0, 0}, {1, 1}, {2, 2}));
    EXPECT_FALSE(isLeftTurn({0.1f, 0.7f}, {0.3f, 0.2f}, {0.1f, 0.7f})) << "back to the start";
    EXPECT_FALSE(isLeftTurn({0.1f, 0.7f}, {0.1f, 0.7f}, {0.3f, 0.2f}));
    EXPECT_FALSE(isLeftTurn({0, 0}, {1, 0}, {std::numeric_limits<float>::quiet_NaN(), 1}));
}

TEST(SpatialQueries, TellPointsInTriangles)
{
    EXPECT_TRUE(isInTriangle({1, 1}));
    for (float2 const outside : {float2{3, 3}, float2{-1, 1}, float2{5, 0}})
        EXPECT_FALSE(isInTriangle(outside)) << outside.x << ' ' << outside.y;
    float u, v, w;
    EXPECT_FALSE(pointInTriangle({1, 0}, {0, 0}, {1, 0}, {2, 0}, u, v, w, nullptr)) << "a flat triangle is empty";
}

TEST(ChannelParsers, AcceptNothingUntilTheyHaveParsed)
{
    TSR::Utils::ChannelParser parser;
    EXPECT_FALSE(parser.accepts("uv"));
    static_assert(std::is_same_v<decltype(parser.parses("uv")), TSR::Utils::ChannelParser::Status>);
    static_cast<void>(parser.parses("uv"));
    TSR::Utils::ChannelParser const& parsed = parser;
    EXPECT_TRUE(parsed.accepts("uv") && !parsed.accepts("color"));
    static_cast<void>(parser.parses(""));
    EXPECT_FALSE(parsed.accepts("uv")) << "the new list replaces the old one";
}

TEST(MathTypes, ArePlainScalars)
{
    using namespace Tessara::Math;
    static_assert(sizeof(float3) == 12 && alignof(float3) == 4 && sizeof(float2x3) == 24 && sizeof(float4x4) == 64);
    static_assert(sizeof(double3) == 24 && alignof(double3) == 8 && sizeof(double4x4) == 128);
    static_assert(sizeof(int2x3) == 24 && sizeof(short3) == 6 && alignof(short3) == 2 && sizeof(short2x3) == 12);
    static_assert(sizeof(uchar3) == 3 && sizeof(uchar4) == 4 && std::is_trivially_copyable_v<float3x3>);
    float3 const v{1, 2, 3};
    EXPECT_TRUE(v.x == 1 && v.y == 2 && v.z == 3 && (&v.x)[2] == 3);
}

TYPED_TEST(Volumes, FindTilesByIndex)
{
    constexpr int kSide = Layout<TypeParam>::kSide, kDepth = Layout<TypeParam>::kDepth;
    auto const volume = makeVolume<TypeParam>(fieldAt, 7);
    if (!volume)
        GTEST_SKIP() << "the fixture makes no volumes";
    typename TSR::TileTree3D::Container<TypeParam>::ConstTileAccessor accessor(*volume.container);
    for (int const index : {-20, -1, 0, 1, 19}) {
        auto const& tile = accessor.tileImpl(index, 0, 0, kDepth);
        ASSERT_TRUE(tile.valid && tile.depth == kDepth);
        EXPECT_TRUE(tile.i <= index && index < tile.i + kSide && tile.j == 0 && tile.k == 0);
        auto const number = tile.treeIndex();
        EXPECT_EQ(static_cast<int>(number.depth), kDepth);
        EXPECT_EQ(volume.container->tile(number).i, tile.i);
        EXPECT_EQ(volume.container->tile(number.index, kDepth).i, tile.i);
        ASSERT_GE(tile.parent, 0);
        auto const& parent = volume.container->tile(tile.parentTreeIndex());
        auto const child = tile.childIJK();
        EXPECT_EQ(parent.depth, kDepth - 1);
        EXPECT_EQ(parent.i + child.i * kSide, tile.i);
        auto copied = accessor;
        EXPECT_EQ(copied.tileImpl(index, 0, 0, kDepth).i, tile.i);
    }
    EXPECT_FALSE(accessor.tileImpl(1000, 0, 0, kDepth).valid);
    EXPECT_FALSE(volume.channel->tileData(accessor.tileImpl(1000, 0, 0, kDepth).treeIndex()));
    EXPECT_LE(volume.channel->coarsestDepth(), kDepth);
    EXPECT_EQ(volume.topology->offsetType(), 7u);
}

TYPED_TEST(Volumes, ReadVoxelsAndContinueThemAcrossTiles)
{
    constexpr int kSide = Layout<TypeParam>::kSide, kDepth = Layout<TypeParam>::kDepth;
    auto const volume = makeVolume<TypeParam>(fieldAt, 7);
    if (!volume)
        GTEST_SKIP() << "the fixture makes no volumes";
    typename TSR::TileTree3D::Container<TypeParam>::ConstTileAccessor accessor(*volume.container);
    auto const tile = accessor.tileImpl(-1, 0, 0, kDepth);
    auto const values = volume.channel->tileData(tile.treeIndex());
    ASSERT_TRUE(bool(values));
    TSR::TileTree3D::TileData<float, kSide + 1, 0> halo, none;
    decltype(&tile) const noParent = nullptr;
    TSR::TileTree3D::setHaloTile<TypeParam>(tile, noParent, *volume.channel, none, 2, accessor, halo);
    for (int k = 0; k <= kSide; ++k)
        for (int j = 0; j <= kSide; ++j)
            for (int i = 0; i <= kSide; ++i) {
                float const expected = fieldAt(i - kSide, j, k);
                EXPECT_EQ(halo(i, j, k), expected);
                if (std::max({i, j, k}) < kSide) {
                    EXPECT_EQ(values(i, j, k), expected);
                    EXPECT_EQ(values(i + (j + k * kSide) * kSide), expected);
                }
            }
    TSR::TileTree3D::TileData<float, kSide + 2, 0> sized(-1);
    sized(-1, kSide, 0) = 3;
    EXPECT_EQ(sized(-1, kSide, 0), 3);
}
