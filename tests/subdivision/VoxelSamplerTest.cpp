#include <Modeling/VoxelSampler.h>

#include "subdivision/haloTiles.h"

#include "support/Random.h"

#include <TessaraGeometryVolume/VolumeBuilder.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <memory>
#include <string>
#include <tuple>
#include <vector>

using namespace TSR::TileTree3D;
using namespace TSR::TileTree3D::Internal;
using Tessara::Math::float3;
using TestSupport::Random;

namespace {

constexpr int kIndexSpace = 0;
constexpr float kNaN = std::numeric_limits<float>::quiet_NaN();

template <class> class VoxelSampling : public testing::Test {
};
using Layouts = testing::Types<Traits2, Traits5>;
TYPED_TEST_SUITE(VoxelSampling, Layouts);

/// Values for all voxels from `first` up to `end`, and a plain look-up.
struct Field {
    int first, end;
    std::vector<float> values;

    template <class Rule> static Field of(int first, int end, Rule const& rule)
    {
        Field field{first, end, {}};
        for (int k = first; k < end; ++k)
            for (int j = first; j < end; ++j)
                for (int i = first; i < end; ++i)
                    field.values.push_back(rule(i, j, k));
        return field;
    }
    static Field random(int first, int end)
    {
        Random random(7);
        return of(first, end, [&](int, int, int) { return random.coordinate(); });
    }

    float operator()(int i, int j, int k) const
    {
        int const side = end - first;
        return values[static_cast<std::size_t>(((k - first) * side + (j - first)) * side + (i - first))];
    }
};

template <class Traits> Volume<Traits> volumeOf(
    Field const& field, unsigned int offsetType = 7, int coarserLevels = 0, int depth = Traits::kUnitDepth)
{
    VolumeSource source;
    source.background = 0.75f;
    source.offsetType = offsetType;
    source.depth = depth;
    int const side = field.end - field.first;
    source.block = {{field.first, field.first, field.first}, {side, side, side}, field.values.data()};
    source.coarsestDepth = depth - coarserLevels;
    return buildVolume<Traits>(source);
}

template <class Traits> LinearSampler<Traits> samplerOf(
    Volume<Traits> const& volume, float3 offset = {0, 0, 0}, Channel<Traits, float> const* haloChannel = nullptr)
{
    return {volume.container, volume.channel, volume.topology,
        {.scale = 1, .voxelOffset = offset, .background = volume.background}, haloChannel};
}

/// Rows of points give what single ones do. Points follow one another at random and on a line.
template <class Traits>
void expectSameInRows(LinearSampler<Traits> sampler, float reach, int depth = Traits::kUnitDepth)
{
    Random random(9);
    std::vector<float3> points;
    for (int n = 0; n < 300; ++n) {
        float3 const from{reach * random.coordinate(), reach * random.coordinate(), reach * random.coordinate()};
        for (int step = 0; step < 10; ++step)
            points.push_back({from.x + 0.3f * float(step), from.y, from.z - 0.1f * float(step)});
    }
    points[5].y = kNaN;
    std::vector<float> values(points.size());
    sampler.sampleAll(points.data(), points.size(), depth, kIndexSpace, values.data());
    for (std::size_t n = 0; n < points.size(); ++n) {
        float const single = LinearSampler<Traits>(sampler).sample(points[n], depth, kIndexSpace);
        ASSERT_TRUE(values[n] == single || (std::isnan(values[n]) && std::isnan(single))) << n;
        ASSERT_TRUE(single == sampler.sample(points[n], depth, kIndexSpace) || std::isnan(single)) << n;
    }
}

float blend(float u, float v, float f)
{
    return (v - u) * f + u;
}

/// A coordinate as voxel of its tile and fraction, straight from the rules.
struct Local {
    int tileOrigin, voxel;
    float fraction;
};

template <class Traits> Local localOf(float p, float offset)
{
    int const side = Traits::kSide;
    int const origin = static_cast<int>(std::floor(std::floor(p) / float(side))) * side;
    float x = p - float(origin) - offset;
    if (x > -1e-5f)
        x = std::max(x, 0.0f);
    int const voxel = std::min(static_cast<int>(std::floor(x)), side - 1);
    return {origin, std::max(voxel, -1), x - float(voxel)};
}

/// `valueAt` takes voxels of the tile.
template <class ValueAt> float plainSample(std::array<Local, 3> const& at, ValueAt const& valueAt)
{
    auto const alongX = [&](int j, int k) {
        return blend(valueAt(at[0].voxel, j, k), valueAt(at[0].voxel + 1, j, k), at[0].fraction);
    };
    auto const alongY = [&](int k) {
        return blend(alongX(at[1].voxel, k), alongX(at[1].voxel + 1, k), at[1].fraction);
    };
    return blend(alongY(at[2].voxel), alongY(at[2].voxel + 1), at[2].fraction);
}

float3 offsetsOf(unsigned int offsetType)
{
    auto const of = [&](int axis) { return offsetType >> axis & 1 ? 0.0f : 0.5f; };
    return {of(0), of(1), of(2)};
}

float linearField(float3 p)
{
    return 1.5f * p.x - 2 * p.y + 0.25f * p.z + 10;
}

}

TYPED_TEST(VoxelSampling, agreesWithADenseFieldInsideAndAcrossTiles)
{
    Field const field = Field::random(-20, 21);
    auto const volume = volumeOf<TypeParam>(field);
    auto const padded = makeHaloChannel(volume);
    auto sampler = samplerOf(volume), paddedSampler = samplerOf(volume, {0, 0, 0}, &padded);
    Random random(1);
    for (int n = 0; n < 20'000; ++n) {
        float3 p{19 * random.coordinate(), 19 * random.coordinate(), 19 * random.coordinate()};
        if (n % 5 == 0) // on the border
            p.x = std::floor(p.x / TypeParam::kSide) * TypeParam::kSide;
        std::array<Local, 3> const at{
            localOf<TypeParam>(p.x, 0), localOf<TypeParam>(p.y, 0), localOf<TypeParam>(p.z, 0)};
        float const expected = plainSample(at, [&](int i, int j, int k) {
            return field(at[0].tileOrigin + i, at[1].tileOrigin + j, at[2].tileOrigin + k);
        });
        ASSERT_EQ(sampler.sample(p, TypeParam::kUnitDepth, kIndexSpace), expected) << p.x << ' ' << p.y << ' ' << p.z;
        ASSERT_EQ(paddedSampler.sample(p, TypeParam::kUnitDepth, kIndexSpace), expected);
        // Caches hold what they say, whichever tiles came before.
        ASSERT_EQ(LinearSampler<TypeParam>(sampler).sample(p, TypeParam::kUnitDepth, kIndexSpace), expected);
    }
    for (float const offset : {0.0f, -0.3f, 0.4f}) {
        expectSameInRows(samplerOf(volume, {offset, 0, offset}), 25);
        expectSameInRows(samplerOf(volume, {offset, 0, offset}, &padded), 25);
    }
}

TYPED_TEST(VoxelSampling, mirrorsTilesThatNothingIsKnownAround)
{
    constexpr int kSide = TypeParam::kSide;
    Field const field = Field::random(-2 * kSide, 2 * kSide);
    for (unsigned int offsetType = 0; offsetType < 7; ++offsetType) {
        auto const volume = volumeOf<TypeParam>(field, offsetType);
        float3 const offset = offsetsOf(offsetType);
        auto sampler = samplerOf(volume, offset);
        expectSameInRows(sampler, 2 * kSide);
        Random random(offsetType);
        for (int n = 0; n < 3000; ++n) {
            float const reach = 2 * kSide;
            float3 const p{reach * random.coordinate(), reach * random.coordinate(), reach * random.coordinate()};
            std::array<Local, 3> const at{localOf<TypeParam>(p.x, offset.x), localOf<TypeParam>(p.y, offset.y),
                localOf<TypeParam>(p.z, offset.z)};
            bool const isInside = std::all_of(
                at.begin(), at.end(), [](Local const& axis) { return axis.voxel > 0 && axis.voxel + 1 < kSide; });
            float const expected = plainSample(at, [&](int i, int j, int k) {
                std::array<int, 3> voxel{i, j, k};
                bool isMirrored = false, isBackground = false, hasFirst = false;
                for (unsigned int axis = 0; axis < 3; ++axis) {
                    bool const isOutside = voxel[axis] < 0 || voxel[axis] >= kSide, isSet = offsetType >> axis & 1;
                    isMirrored |= isOutside;
                    isBackground |= isOutside && isSet;
                    hasFirst |= isSet && voxel[axis] == 0;
                    voxel[axis] = at[axis].tileOrigin + std::clamp(voxel[axis], 0, kSide - 1);
                }
                float const nearest = field(voxel[0], voxel[1], voxel[2]);
                if (isInside)
                    return nearest;
                if (isBackground || (hasFirst && !isMirrored))
                    return volume.background;
                return isMirrored ? volume.background + volume.background - nearest : nearest;
            });
            ASSERT_EQ(sampler.sample(p, TypeParam::kUnitDepth, kIndexSpace), expected) << offsetType;
        }
    }
}

TYPED_TEST(VoxelSampling, keepsLinearFieldsAcrossTiles)
{
    // Neighbours all around are looked for at the width of a tile of this depth.
    constexpr int kDepth = std::is_same_v<TypeParam, Traits2> ? TypeParam::kUnitDepth + 1 : TypeParam::kUnitDepth;
    float const perUnit = TypeParam::voxelsPerUnit(kDepth);
    for (unsigned int offsetType = 0; offsetType < 8; ++offsetType) {
        float3 const offset = offsetsOf(offsetType);
        Field const field = Field::of(-25, 25, [&](int i, int j, int k) {
            return linearField(
                {(float(i) + offset.x) / perUnit, (float(j) + offset.y) / perUnit, (float(k) + offset.z) / perUnit});
        });
        auto const volume = volumeOf<TypeParam>(field, offsetType, 1, kDepth);
        auto sampler = samplerOf(volume, offset);
        Random random(3);
        for (int n = 0; n < 3000; ++n) {
            float const reach = 18 / perUnit;
            float3 const p{reach * random.coordinate(), reach * random.coordinate(), reach * random.coordinate()};
            ASSERT_NEAR(sampler.sample(p, kDepth, kIndexSpace), linearField(p), 2e-5f) << offsetType;
        }
    }
}

TEST(VoxelSampler, takesWideTilesForTheirOwnUpperNeighbours)
{
    // On purpose: the step to neighbours is half of a tile's width here.
    Field const field = Field::of(-8, 8, [](int i, int, int) { return static_cast<float>(i); });
    auto const volume = volumeOf<Traits2>(field, 0, 1);
    auto sampler = samplerOf(volume, {0.5f, 0.5f, 0.5f});
    EXPECT_EQ(sampler.sample({3.75f, 2, 2}, 28, kIndexSpace), blend(3, 0, 0.25f));
    EXPECT_EQ(sampler.sample({0.25f, 2, 2}, 28, kIndexSpace), blend(-1, 0, 0.75f));
    EXPECT_EQ(sampler.sample({1.75f, 2, 2}, 28, kIndexSpace), 1.25f);
}

TYPED_TEST(VoxelSampling, continuesTheParentWhereNeighboursAreMissing)
{
    constexpr int kSide = TypeParam::kSide;
    auto const valueAt = [](float3 p) { return linearField(p); };
    for (unsigned int offsetType = 0; offsetType < 8; ++offsetType) {
        float3 const offset = offsetsOf(offsetType);
        for (IJK const child : {IJK{0, 0, 0}, IJK{1, 0, 1}, IJK{TypeParam::kChildrenPerAxis - 1, 1, 0}}) {
            // In voxels of the parent; of the tile, `kChildrenPerAxis` to each.
            FullHalo<TypeParam> parent(-1);
            for (int k = -1; k <= kSide; ++k)
                for (int j = -1; j <= kSide; ++j)
                    for (int i = -1; i <= kSide; ++i)
                        parent(i, j, k) = valueAt({float(i) + offset.x, float(j) + offset.y, float(k) + offset.z});
            auto const expectedAt = [&](int i, int j, int k) {
                auto const coordinate = [&](int c, int voxel, float shift) {
                    return float(c * TypeParam::kParentVoxels) + (float(voxel) + shift) / TypeParam::kChildrenPerAxis;
                };
                return valueAt({coordinate(child.i, i, offset.x), coordinate(child.j, j, offset.y),
                    coordinate(child.k, k, offset.z)});
            };
            TileData<float, kSide, 0> tile(0), beside(0);
            for (int k = 0; k < kSide; ++k)
                for (int j = 0; j < kSide; ++j)
                    for (int i = 0; i < kSide; ++i) {
                        tile(i, j, k) = expectedAt(i, j, k);
                        beside(i, j, k) = static_cast<float>(1000 + i + 10 * j + 100 * k);
                    }
            TilesAround<TypeParam> around{};
            around[13] = tile;
            around[12] = beside; // x - 1
            for (bool const hasParent : {true, false}) {
                FullHalo<TypeParam> halo;
                fillHaloFromNeighbours<TypeParam>(
                    offsetType, halo, child, around, hasParent ? parent : FullHalo<TypeParam>());
                for (int k = -1; k <= kSide; ++k)
                    for (int j = -1; j <= kSide; ++j)
                        for (int i = -1; i <= kSide; ++i) {
                            bool const isBeside = i == -1 && std::min(j, k) >= 0 && std::max(j, k) < kSide;
                            float const expected = isBeside ? beside(kSide - 1, j, k) : expectedAt(i, j, k);
                            ASSERT_NEAR(halo(i, j, k), expected, 1e-4f)
                                << offsetType << ": " << i << ' ' << j << ' ' << k << ", parent " << hasParent;
                        }
            }
        }
    }
}

TEST(HaloTiles, blendTheParentInQuartersAndEighths)
{
    // Along x, values a tile apart: the parent is 100 before the tile, 10 at and 1 behind, as far as it can be.
    FullHalo<Traits2> parent(-1);
    for (int k = -1; k <= 4; ++k)
        for (int j = -1; j <= 4; ++j)
            for (int i = -1; i <= 4; ++i)
                parent(i, j, k) = i < 2 ? 100 : i < 4 ? 10 : 1;
    parent(3, 1, 1) = 10; // the tile is the second child along x: voxels 2 and 3
    TileData<float, 4, 0> tile(0);
    for (int n = 0; n < 64; ++n)
        tile(n) = 0;
    TilesAround<Traits2> around{};
    around[13] = tile;
    FullHalo<Traits2> halo;
    auto const row = [&](unsigned int offsetType) { // across y, where no tile is
        fillHaloFromNeighbours<Traits2>(offsetType, halo, {1, 0, 0}, around, parent);
        return std::vector<float>{halo(0, 4, 1), halo(1, 4, 1), halo(2, 4, 1), halo(3, 4, 1)};
    };
    float const a = 100, b = 10, next = 1, mean = 1.5f * 1 - 0.5f * 10; // behind: what is there, in a straight line
    EXPECT_EQ(row(0),
        (std::vector<float>{
            0.375f * a + 0.625f * b, 0.125f * a + 0.875f * b, 1.125f * b - 0.125f * a, 0.375f * mean + 0.625f * b}));
    EXPECT_EQ(
        row(1), (std::vector<float>{b, 0.25f * next + 0.75f * b, 0.5f * next + 0.5f * b, 0.75f * next + 0.25f * b}));
}

TYPED_TEST(VoxelSampling, findsBackgroundOutsideAndNothingBeyondItsArrays)
{
    constexpr int kSide = TypeParam::kSide, kDepth = TypeParam::kUnitDepth;
    Field const field = Field::random(-kSide, kSide);
    auto const volume = volumeOf<TypeParam>(field);
    auto sampler = samplerOf(volume);
    float const nothing = volume.background;
    for (float const far :
        {kNaN, std::numeric_limits<float>::infinity(), -3e9f, 2147483648.0f, 1e30f, -2147483648.0f, 100.0f})
        for (float3 const p : {float3{far, 0, 0}, {0, far, 0}, {0, 0, far}})
            EXPECT_EQ(sampler.sample(p, kDepth, kIndexSpace), nothing) << far;
    EXPECT_EQ(sampler.sample({0, 0, 0}, kDepth - 1, kIndexSpace), nothing) << "no data at that depth";
    EXPECT_EQ(sampler.sample({0, 0, 0}, -5, kIndexSpace), nothing);
    EXPECT_EQ(sampler.sample({0, 0, 0}, kDepth, kIndexSpace), field(0, 0, 0));

    // Offsets that fit no volume: voxels stay inside, fractions tell the distance.
    for (float const offset : {-1000.0f, -1.5f, -0.3f, 0.4f, 2.5f, 77.0f}) {
        auto lost = samplerOf(volume, {offset, offset, offset});
        Random random(5);
        for (int n = 0; n < 200; ++n) {
            auto const coordinate = [&] { return (random.coordinate() - 1) / 2 * kSide; }; // of the lowest tile
            float3 const p{coordinate(), coordinate(), coordinate()};
            std::array<Local, 3> at{
                localOf<TypeParam>(p.x, offset), localOf<TypeParam>(p.y, offset), localOf<TypeParam>(p.z, offset)};
            for (Local& axis : at)
                axis.voxel = std::max(axis.voxel, 0);
            float const expected = plainSample(at, [&](int i, int j, int k) {
                return field(at[0].tileOrigin + i, at[1].tileOrigin + j, at[2].tileOrigin + k);
            });
            ASSERT_EQ(lost.sample(p, kDepth, kIndexSpace), expected) << offset;
        }
    }
    for (float const offset : {-1000.0f, -1.5f, 0.4f, 77.0f, 1e20f, -1e20f, kNaN})
        for (unsigned int offsetType : {0u, 3u, 7u}) {
            auto const typed = volumeOf<TypeParam>(field, offsetType);
            auto const padded = makeHaloChannel(typed);
            expectSameInRows(samplerOf(typed, {offset, offset, offset}), kSide);
            expectSameInRows(samplerOf(typed, {offset, offset, offset}, &padded), kSide);
        }
    auto shifted = samplerOf(volume, {-0.25f, 0, 0}); // the last voxel keeps what goes beyond
    EXPECT_EQ(shifted.sample({float(kSide) - 0.0625f - float(kSide), 0, 0}, kDepth, kIndexSpace),
        blend(field(-1, 0, 0), field(0, 0, 0), 1.1875f));
    auto below = samplerOf(volume, {0.25f, 0, 0}); // nothing is kept below the first; the fraction was taken before
    EXPECT_EQ(below.sample({0, 0, 0}, kDepth, kIndexSpace), blend(field(0, 0, 0), field(1, 0, 0), 0.75f));
    auto rounded = samplerOf(volume, {5e-6f, 0, 0});
    EXPECT_EQ(rounded.sample({0, 0, 0}, kDepth, kIndexSpace), field(0, 0, 0)) << "within rounding of the tile";
}

TYPED_TEST(VoxelSampling, readsCoarseAndFineTilesInAnyOrder)
{
    // Few fine voxels, some in coarse tiles, and borders with nothing behind.
    std::vector<Voxel> coarse, fine;
    Random random(11);
    auto const at = [&](int reach) { return static_cast<int>(std::floor(random.coordinate() * float(reach))); };
    for (int n = 0; n < 40; ++n)
        coarse.push_back({at(5), at(5), at(5), random.coordinate()});
    for (int n = 0; n < 300; ++n)
        fine.push_back({at(30), at(30), at(30), random.coordinate()});
    VoxelList const lists[] = {{TypeParam::kUnitDepth - 2, coarse}, {TypeParam::kUnitDepth, fine}};
    VolumeSource source;
    source.depth = TypeParam::kUnitDepth;
    source.lists = lists;
    for (unsigned int offsetType = 0; offsetType < 8; ++offsetType) {
        source.offsetType = offsetType;
        auto const volume = buildVolume<TypeParam>(source);
        expectSameInRows(samplerOf(volume, offsetsOf(offsetType)), 40);
        if (offsetType != 7)
            continue;
        auto const padded = makeHaloChannel(volume);
        auto plainSampler = samplerOf(volume), paddedSampler = samplerOf(volume, {0, 0, 0}, &padded);
        expectSameInRows(paddedSampler, 40);
        for (int n = 0; n < 10'000; ++n) {
            float3 const p{40 * random.coordinate(), 40 * random.coordinate(), 40 * random.coordinate()};
            int const depth = TypeParam::kDeepest + 1 - n % 5;
            ASSERT_EQ(plainSampler.sample(p, depth, kIndexSpace), paddedSampler.sample(p, depth, kIndexSpace));
        }
        EXPECT_EQ(plainSampler.sample({0, 0, 0}, -1, kIndexSpace), 0);
    }
}

TYPED_TEST(VoxelSampling, keepsConstantsToTheBit)
{
    float const value = 0.3f;
    Field const field = Field::of(-13, 14, [&](int, int, int) { return value; });
    for (unsigned int offsetType = 0; offsetType < 8; ++offsetType)
        for (int const coarserLevels : {0, 1, 2}) {
            VolumeSource source;
            source.background = value;
            source.offsetType = offsetType;
            source.depth = TypeParam::kUnitDepth;
            source.block = {{-13, -13, -13}, {27, 27, 27}, field.values.data()};
            source.coarsestDepth = source.depth - coarserLevels;
            auto const volume = buildVolume<TypeParam>(source);
            auto sampler = samplerOf(volume, offsetsOf(offsetType));
            Random random(6);
            for (int n = 0; n < 1000; ++n)
                ASSERT_EQ(sampler.sample({16 * random.coordinate(), 16 * random.coordinate(), 16 * random.coordinate()},
                              source.depth, kIndexSpace),
                    value)
                    << offsetType << ", " << coarserLevels;
        }
}

TYPED_TEST(VoxelSampling, findsVoxelsFarAway)
{
    std::vector<Voxel> voxels;
    Random random(8);
    for (int n = 0; n < 2000; ++n) {
        auto const far = [&](float reach) { return static_cast<int>(reach * random.coordinate()); };
        float const reach = n % 2 ? 2147483520.0f : 30e6f;
        voxels.push_back(
            {far(reach), n % 3 ? far(reach) : std::numeric_limits<int>::min(), far(reach), random.coordinate()});
    }
    VoxelList const list{TypeParam::kUnitDepth, voxels};
    VolumeSource source;
    source.depth = TypeParam::kUnitDepth;
    source.lists = {&list, 1};
    for (unsigned int const offsetType : {0u, 7u}) {
        source.offsetType = offsetType;
        source.coarsestDepth = source.depth - 1;
        auto const volume = buildVolume<TypeParam>(source);
        auto sampler = samplerOf(volume);
        for (Voxel const& v : voxels) {
            float3 const p{float(v.i), float(v.j), float(v.k)}; // the list has numbers that floats hold
            float row = 0;
            sampler.sampleAll(&p, 1, source.depth, kIndexSpace, &row);
            ASSERT_EQ(row, v.value) << v.i << ' ' << v.j << ' ' << v.k << ", " << offsetType;
        }
    }
}

TYPED_TEST(VoxelSampling, readsTheDepthsItMayAndScalesWorldPoints)
{
    constexpr int kDepth = TypeParam::kUnitDepth, kWide = TypeParam::kChildrenPerAxis;
    Field const field = Field::of(-25, 25, [](int i, int j, int k) {
        return linearField({float(i), float(j), float(k)});
    });
    auto const volume = volumeOf<TypeParam>(field, 7, 2);
    auto const sampled = [&](LinearSamplerSettings settings, float3 p, int space = kIndexSpace) {
        settings.background = -1;
        return LinearSampler<TypeParam>(volume.container, volume.channel, volume.topology, settings)
            .sample(p, kDepth, space);
    };
    float3 const p{1.5f, 2.25f, -3.75f};
    EXPECT_FLOAT_EQ(sampled({.maxDepth = kDepth - 1}, p), linearField(p)) << "coarser values, on the same line";
    EXPECT_EQ(sampled({.minDepth = kDepth, .maxDepth = kDepth - 1}, p), -1);
    EXPECT_EQ(sampled({.minDepth = kDepth}, p), linearField(p));
    auto const padded = makeHaloChannel(volume);
    for (auto const& [minDepth, channel, expected] : {std::tuple{kDepth, &padded, linearField(p)},
             std::tuple{kDepth + 1, &padded, -1.0f}, std::tuple{0, &volume.channel, -1.0f /* not padded */}})
        EXPECT_EQ(LinearSampler<TypeParam>(volume.container, volume.channel, volume.topology,
                      {.background = -1, .minDepth = minDepth}, channel)
                      .sample(p, kDepth, kIndexSpace),
            expected);
    EXPECT_EQ(sampled({.scale = 2}, {p.x / 2, p.y / 2, p.z / 2}, kWorldSpace), linearField(p));
    EXPECT_EQ(sampled({.scale = 2}, p), linearField(p));

    // A coarse tile, where the tree ends there.
    std::vector<Voxel> const coarse{{0, 0, 0, 4}, {1, 0, 0, 8}};
    VoxelList const list{kDepth - 1, coarse};
    VolumeSource source;
    source.depth = kDepth;
    source.lists = {&list, 1};
    auto const coarseVolume = buildVolume<TypeParam>(source);
    auto sampler = samplerOf(coarseVolume);
    EXPECT_FLOAT_EQ(sampler.sample({0.25f * kWide, 0, 0}, kDepth, kIndexSpace), 5);
    expectSameInRows(sampler, 3 * kWide);
    EXPECT_EQ(sampler.name().view(), "kLinear");
    EXPECT_EQ((static_cast<VoxelSampler<TypeParam, float, float3>&>(sampler)
                      .VoxelSampler<TypeParam, float, float3>::name()
                      .view()),
        "kNone");
}
