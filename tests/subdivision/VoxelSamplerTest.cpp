#include <Modeling/VoxelSampler.h>

#include "volume/haloTiles.h"

#include "support/Testing.h"
#include "support/Volumes.h"

using namespace TSR::TileTree3D;
using namespace TSR::TileTree3D::Internal;
using namespace TestSupport;

namespace {

constexpr int kIndexSpace = 0;
constexpr float kBackground = 0.3f;

template <class> class VoxelSampling : public testing::Test {
};
using Layouts = testing::Types<Traits2, Traits5>;
TYPED_TEST_SUITE(VoxelSampling, Layouts);

template <class Traits> Volume<Traits> volumeOf(
    Field const& field, unsigned int offsetType = 7, int coarserLevels = 0, int depth = Traits::kUnitDepth)
{
    return buildVolume<Traits>({.background = kBackground,
        .offsetType = offsetType,
        .depth = depth,
        .block = field.block(),
        .coarsestDepth = depth - coarserLevels});
}

template <class Traits> LinearSampler<Traits> samplerOf(
    Volume<Traits> const& volume, float3 offset = {0, 0, 0}, Channel<Traits, float> const* haloChannel = nullptr)
{
    return {volume.container, volume.channel, volume.topology,
        {.scale = 1, .voxelOffset = offset, .background = volume.background}, haloChannel};
}

template <class Traits> float sampled(LinearSampler<Traits>& sampler, float3 p, int depth = Traits::kUnitDepth)
{
    return sampler.sample(p, depth, kIndexSpace);
}

template <class Traits> std::vector<float> sampledInRows(
    LinearSampler<Traits>& sampler, std::vector<float3> const& points, int depth = Traits::kUnitDepth)
{
    std::vector<float> values(points.size());
    sampler.sampleAll(points.data(), points.size(), depth, kIndexSpace, values.data());
    return values;
}

/// Rows give the same values as single samples. Points are on short lines from random points; half of the lines are at
/// multiples of a quarter, and so at the sides of tiles and voxels. On the last lines, points are so dense that a row has
/// few tiles.
template <class Traits> void expectSameInRows(LinearSampler<Traits> sampler, float reach)
{
    Random random(9);
    std::vector<float3> points;
    for (int n = 0; n < 440; ++n) {
        bool const isSnapped = n % 2, isDense = n >= 400;
        float const stride = isDense ? 0.05f : 1;
        auto const snapped = [&](float c) { return isSnapped ? std::floor(4 * c) / 4 : c; };
        float3 const from = random.point(reach);
        for (int step = 0; step < (isDense ? 200 : 10); ++step)
            points.push_back({snapped(from.x) + (isSnapped ? 0.25f : 0.3f) * stride * float(step), snapped(from.y),
                snapped(from.z) - (isSnapped ? 0.25f : 0.1f) * stride * float(step)});
    }
    points[5].y = kNan;
    std::vector<float> const values = sampledInRows(sampler, points);
    for (std::size_t n = 0; n < points.size(); ++n) {
        LinearSampler<Traits> other(sampler);
        float const single = sampled(other, points[n]);
        ASSERT_TRUE(values[n] == single || (std::isnan(values[n]) && std::isnan(single))) << n;
        ASSERT_TRUE(single == sampled(sampler, points[n]) || std::isnan(single)) << n;
    }
}

float blend(float u, float v, float f)
{
    return (v - u) * f + u;
}

/// A coordinate as a voxel of its tile and a fraction, computed in the simplest way.
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

template <class Traits> std::array<Local, 3> localOf(float3 p, float3 offset)
{
    return {localOf<Traits>(p.x, offset.x), localOf<Traits>(p.y, offset.y), localOf<Traits>(p.z, offset.z)};
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

}

TYPED_TEST(VoxelSampling, AgreesWithADenseFieldForAnyOffset)
{
    Field const field = Field::random(-20, 21);
    auto const volume = volumeOf<TypeParam>(field);
    auto const padded = makeHaloChannel(volume);
    // With offsets that fit no volume, voxels are clamped to the tile and fractions hold the distance.
    for (float const offset : {0.0f, -1000.0f, -1.5f, -0.3f, 5e-6f, 1e-5f, 0.4f, 2.5f, 77.0f}) {
        float3 const offsets{offset, offset, offset};
        auto sampler = samplerOf(volume, offsets), paddedSampler = samplerOf(volume, offsets, &padded);
        Random random(1);
        for (int n = 0; n < 4000; ++n) {
            float3 p = random.point(19);
            if (n % 5 == 0) // at the side of a tile
                p.x = std::floor(p.x / TypeParam::kSide) * TypeParam::kSide;
            std::array<Local, 3> at = localOf<TypeParam>(p, offsets);
            for (Local& axis : at)
                axis.voxel = std::max(axis.voxel, 0);
            float const expected = plainSample(at, [&](int i, int j, int k) {
                return field(at[0].tileOrigin + i, at[1].tileOrigin + j, at[2].tileOrigin + k);
            });
            ASSERT_EQ(sampled(sampler, p), expected) << p.x << ' ' << p.y << ' ' << p.z << ", offset " << offset;
            ASSERT_EQ(sampled(paddedSampler, p), expected);
            // Caches are correct whichever tiles came before.
            LinearSampler<TypeParam> other(sampler);
            ASSERT_EQ(sampled(other, p), expected);
        }
    }
}

TYPED_TEST(VoxelSampling, TreatsBoxesLikeTheirVoxels)
{
    Random random(2);
    auto const below = [&](std::size_t count) { return static_cast<int>(random.below(count)); };
    for (int round = 0; round < 16; ++round) {
        SCOPED_TRACE(round);
        // Two touching boxes, with other voxels next to and inside them, at this depth and others.
        int const depth = TypeParam::kUnitDepth + below(3) - 1, middle = below(12) - 6;
        ConstantBox const boxes[] = {{{-17, -9 - 8 * below(3), -9}, {middle, 15, 7 + 8 * below(3)}, 2},
            {{middle, -9, -17}, {15, 7 + 8 * below(3), 23}, below(2) ? 2.0f : 5.0f}};
        std::vector<Voxel> voxels, listed;
        forEachVoxel(-30, 30, [&](int i, int j, int k) {
            for (auto const& [first, end, value] : boxes)
                if (first.i <= i && first.j <= j && first.k <= k && i < end.i && j < end.j && k < end.k)
                    voxels.push_back({i, j, k, value});
        });
        for (int n = below(3); n > 0; --n)
            listed.push_back({below(60) - 30, below(60) - 30, below(60) - 30, random.coordinate()});
        VoxelList const lists[] = {
            {depth, voxels}, {depth, listed}, {std::min(depth + round % 3 - 1, TypeParam::kDeepest), listed}};
        VolumeSource source{.background = kBackground, .depth = depth, .lists = lists};
        source.offsetType = round % 3 ? 7 : static_cast<unsigned int>(below(7));
        if (round % 4 == 3)
            source.coarsestDepth = depth - 2;
        auto const plain = buildVolume<TypeParam>(source);
        source.boxes = boxes;
        source.lists = source.lists.subspan(1);
        auto const boxed = buildVolume<TypeParam>(source);
        auto const padded = makeHaloChannel(boxed);

        float3 const offset = offsetsOf(source.offsetType);
        auto plainSampler = samplerOf(plain, offset), boxedSampler = samplerOf(boxed, offset),
             paddedSampler = samplerOf(boxed, {0, 0, 0}, &padded);
        float const unit = 1 / TypeParam::voxelsPerUnit(depth);
        for (int n = 0; n < 3000; ++n) {
            float3 const p = random.point(25 * unit);
            int const asked = depth + below(3) - (source.coarsestDepth ? 2 : 0);
            float const expected = sampled(plainSampler, p, asked);
            ASSERT_EQ(sampled(boxedSampler, p, asked), expected) << p.x << ' ' << p.y << ' ' << p.z << ", " << asked;
            ASSERT_TRUE(source.offsetType != 7 || sampled(paddedSampler, p, asked) == expected);
        }
        expectSameInRows(boxedSampler, 30 * unit);
        expectSameInRows(paddedSampler, 30 * unit);
    }
}

TYPED_TEST(VoxelSampling, GivesTheSameValuesInRows)
{
    // More tiles than a sampler caches, and a few values that would show even in a blend with a share of 0.
    Field field = Field::random(-5 * TypeParam::kSide, 5 * TypeParam::kSide);
    for (std::size_t n = 0; n < field.values.size(); n += 37)
        field.values[n] = std::numeric_limits<float>::infinity();
    for (unsigned int const offsetType : {0u, 3u, 7u}) {
        auto const volume = volumeOf<TypeParam>(field, offsetType);
        auto const padded = makeHaloChannel(volume);
        for (float const offset : {0.0f, -1000.0f, -1.5f, -0.3f, 5e-6f, 1e-5f, 0.5f, 1.0f, 1.5f, 77.0f, -1e20f, kNan}) {
            expectSameInRows(samplerOf(volume, {offset, 0, offset}), 6 * TypeParam::kSide);
            if (offsetType == 7)
                expectSameInRows(samplerOf(volume, {offset, offset, 0}, &padded), 6 * TypeParam::kSide);
        }
        for (float3 const odd : {float3{0, kNan, 0}, {0, 0, kNan}, {0, -1000, 0}, {0, 0, 77}})
            expectSameInRows(samplerOf(volume, odd), 6 * TypeParam::kSide);
    }
}

TYPED_TEST(VoxelSampling, MirrorsTilesWithoutNeighborsOrParent)
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
            float3 const p = random.point(2 * kSide);
            std::array<Local, 3> const at = localOf<TypeParam>(p, offset);
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
            ASSERT_EQ(sampled(sampler, p), expected) << offsetType;
        }
    }
}

TYPED_TEST(VoxelSampling, KeepsConstantsToTheBitAndLinearFieldsAcrossTiles)
{
    // Neighbors all around are looked up at the width of a tile of this depth.
    constexpr int kDepth = std::is_same_v<TypeParam, Traits2> ? TypeParam::kUnitDepth + 1 : TypeParam::kUnitDepth;
    float const perUnit = TypeParam::voxelsPerUnit(kDepth);
    Field const constant = Field::of(-13, 14, [](int, int, int) { return kBackground; });
    for (unsigned int offsetType = 0; offsetType < 8; ++offsetType) {
        SCOPED_TRACE(offsetType);
        float3 const offset = offsetsOf(offsetType);
        Random random(3);
        for (int const coarserLevels : {0, 1, 2}) {
            auto const volume = volumeOf<TypeParam>(constant, offsetType, coarserLevels);
            auto sampler = samplerOf(volume, offset);
            for (int n = 0; n < 1000; ++n)
                ASSERT_EQ(sampled(sampler, random.point(16)), kBackground) << coarserLevels;
        }
        Field const field = Field::of(-25, 25, [&](int i, int j, int k) {
            return linearField(
                (float(i) + offset.x) / perUnit, (float(j) + offset.y) / perUnit, (float(k) + offset.z) / perUnit);
        });
        auto const volume = volumeOf<TypeParam>(field, offsetType, 1, kDepth);
        auto sampler = samplerOf(volume, offset);
        for (int n = 0; n < 3000; ++n) {
            float3 const p = random.point(18 / perUnit);
            ASSERT_NEAR(sampled(sampler, p, kDepth), linearField(p.x, p.y, p.z), 2e-5f);
        }
    }
}

TEST(VoxelSampler, ReadsWideTilesAsTheirOwnUpperNeighbors)
{
    // The step to neighbors is half of a tile's width here: existing volumes depend on it.
    Field const field = Field::of(-8, 8, [](int i, int, int) { return static_cast<float>(i); });
    auto const volume = volumeOf<Traits2>(field, 0, 1);
    auto sampler = samplerOf(volume, {0.5f, 0.5f, 0.5f});
    EXPECT_EQ(sampled(sampler, {3.75f, 2, 2}), blend(3, 0, 0.25f));
    EXPECT_EQ(sampled(sampler, {0.25f, 2, 2}), blend(-1, 0, 0.75f));
    EXPECT_EQ(sampled(sampler, {1.75f, 2, 2}), 1.25f);
}

TYPED_TEST(VoxelSampling, ContinuesTheParentIfNeighborsAreMissing)
{
    constexpr int kSide = TypeParam::kSide;
    for (unsigned int offsetType = 0; offsetType < 8; ++offsetType) {
        float3 const offset = offsetsOf(offsetType);
        // In voxels of the parent, each of which covers `kChildrenPerAxis` of the tile along an axis.
        FullHalo<TypeParam> parent, halo;
        parent.reset();
        forEachVoxel(-1, kSide + 1, [&](int i, int j, int k) {
            parent(i, j, k) = linearField(float(i) + offset.x, float(j) + offset.y, float(k) + offset.z);
        });
        for (IJK const child : {IJK{0, 0, 0}, IJK{1, 0, 1}, IJK{TypeParam::kChildrenPerAxis - 1, 1, 0}}) {
            auto const expectedAt = [&](int i, int j, int k) {
                auto const coordinate = [&](int c, int voxel, float shift) {
                    return float(c * TypeParam::kParentVoxels) + (float(voxel) + shift) / TypeParam::kChildrenPerAxis;
                };
                return linearField(coordinate(child.i, i, offset.x), coordinate(child.j, j, offset.y),
                    coordinate(child.k, k, offset.z));
            };
            TileData<float, kSide, 0> tile(0), beside(0);
            forEachVoxel(0, kSide, [&](int i, int j, int k) {
                tile(i, j, k) = expectedAt(i, j, k);
                beside(i, j, k) = static_cast<float>(1000 + i + 10 * j + 100 * k);
            });
            TilesAround<TypeParam> around{};
            around[13] = tile;
            around[12] = beside; // x - 1
            for (bool const hasParent : {true, false}) {
                fillHaloFromNeighbours<TypeParam>(
                    offsetType, halo, child, around, hasParent ? parent : FullHalo<TypeParam>());
                forEachVoxel(-1, kSide + 1, [&](int i, int j, int k) {
                    bool const isBeside = i == -1 && std::min(j, k) >= 0 && std::max(j, k) < kSide;
                    ASSERT_NEAR(halo(i, j, k), isBeside ? beside(kSide - 1, j, k) : expectedAt(i, j, k), 1e-4f)
                        << offsetType << ": " << i << ' ' << j << ' ' << k << ", parent " << hasParent;
                });
            }
        }
    }
}

TEST(HaloTiles, BlendTheParentInQuartersAndEighths)
{
    // Along x, the parent is 100 before the tile, 10 at the tile, and 1 after it as far as its halo reaches.
    FullHalo<Traits2> parent, halo;
    parent.reset();
    forEachVoxel(-1, 5, [&](int i, int j, int k) { parent(i, j, k) = i < 2 ? 100 : i < 4 ? 10 : 1; });
    TileData<float, 4, 0> tile(0); // the second child along x: voxels 2 and 3
    forEachVoxel(0, 4, [&](int i, int j, int k) { tile(i, j, k) = 0; });
    TilesAround<Traits2> around{};
    around[13] = tile;
    auto const row = [&](unsigned int offsetType) { // across y, where there is no tile
        fillHaloFromNeighbours<Traits2>(offsetType, halo, {1, 0, 0}, around, parent);
        return std::vector<float>{halo(0, 4, 1), halo(1, 4, 1), halo(2, 4, 1), halo(3, 4, 1)};
    };
    float const a = 100, b = 10, next = 1, mean = 1.5f * 1 - 0.5f * 10; // after it: extrapolated
    EXPECT_EQ(row(0),
        (std::vector<float>{
            0.375f * a + 0.625f * b, 0.125f * a + 0.875f * b, 1.125f * b - 0.125f * a, 0.375f * mean + 0.625f * b}));
    EXPECT_EQ(
        row(1), (std::vector<float>{b, 0.25f * next + 0.75f * b, 0.5f * next + 0.5f * b, 0.75f * next + 0.25f * b}));
}

TYPED_TEST(VoxelSampling, FindsBackgroundOutside)
{
    auto const volume = volumeOf<TypeParam>(Field::random(-TypeParam::kSide, TypeParam::kSide));
    auto sampler = samplerOf(volume);
    for (float const far :
        {kNan, std::numeric_limits<float>::infinity(), -3e9f, 2147483648.0f, 1e30f, -2147483648.0f, 100.0f})
        for (float3 const p : {float3{far, 0, 0}, {0, far, 0}, {0, 0, far}})
            EXPECT_EQ(sampled(sampler, p), kBackground) << far;
    for (int const depth : {TypeParam::kUnitDepth - 1, 0, -5}) {
        EXPECT_EQ(sampled(sampler, {0, 0, 0}, depth), kBackground) << "no data at that depth";
        EXPECT_EQ(sampledInRows(sampler, std::vector<float3>(9), depth), std::vector<float>(9, kBackground));
    }
}

TYPED_TEST(VoxelSampling, ReadsCoarseAndFineTilesInAnyOrder)
{
    // Few fine voxels, some of them in coarse tiles, and tiles without neighbors.
    std::vector<Voxel> coarse, fine;
    Random random(11);
    auto const at = [&](int reach) { return static_cast<int>(std::floor(random.coordinate() * float(reach))); };
    auto const voxel = [&](int reach) { return Voxel{at(reach), at(reach), at(reach), random.coordinate()}; };
    std::generate_n(std::back_inserter(coarse), 40, [&] { return voxel(5); });
    std::generate_n(std::back_inserter(fine), 300, [&] { return voxel(30); });
    VoxelList const lists[] = {{TypeParam::kUnitDepth - 2, coarse}, {TypeParam::kUnitDepth, fine}};
    for (unsigned int offsetType = 0; offsetType < 8; ++offsetType) {
        auto const volume =
            buildVolume<TypeParam>({.offsetType = offsetType, .depth = TypeParam::kUnitDepth, .lists = lists});
        expectSameInRows(samplerOf(volume, offsetsOf(offsetType)), 40);
        if (offsetType != 7)
            continue;
        auto const padded = makeHaloChannel(volume);
        auto plainSampler = samplerOf(volume), paddedSampler = samplerOf(volume, {0, 0, 0}, &padded);
        expectSameInRows(paddedSampler, 40);
        for (int n = 0; n < 10'000; ++n) {
            float3 const p = random.point(40);
            int const depth = TypeParam::kDeepest + 1 - n % 5;
            ASSERT_EQ(sampled(plainSampler, p, depth), sampled(paddedSampler, p, depth));
        }
    }
}

TYPED_TEST(VoxelSampling, FindsVoxelsFarAway)
{
    constexpr int kDepth = TypeParam::kUnitDepth, kLowest = std::numeric_limits<int>::min();
    std::vector<Voxel> voxels;
    Random random(8);
    for (int n = 0; n < 2000; ++n) {
        auto const far = [&](float reach) { return static_cast<int>(reach * random.coordinate()); };
        float const reach = n % 2 ? 2147483520.0f : 30e6f;
        voxels.push_back({far(reach), n % 3 ? far(reach) : kLowest, far(reach), random.coordinate()});
    }
    std::vector<float3> points; // the list has numbers that floats represent
    for (Voxel const& v : voxels)
        points.push_back({float(v.i), float(v.j), float(v.k)});
    VoxelList const lists[] = {{kDepth, voxels}};
    for (unsigned int const offsetType : {0u, 7u}) {
        auto const volume = buildVolume<TypeParam>(
            {.offsetType = offsetType, .depth = kDepth, .lists = lists, .coarsestDepth = kDepth - 1});
        auto sampler = samplerOf(volume);
        std::vector<float> const values = sampledInRows(sampler, points);
        for (std::size_t n = 0; n < points.size(); ++n) {
            ASSERT_EQ(values[n], voxels[n].value) << n << ", " << offsetType;
            if (voxels[n].j == kLowest) {
                EXPECT_EQ(sampled(sampler, {points[n].x, -points[n].y, points[n].z}), volume.background);
            }
        }
    }

    // In tiles of one unit, at a distance where adjacent floats are half a unit apart.
    constexpr int kFar = 0x400001;
    std::vector<Voxel> const one{{kFar * TypeParam::kSide, 0, 0, 7}};
    VoxelList const deepest[] = {{TypeParam::kDeepest, one}};
    auto const volume = buildVolume<TypeParam>({.depth = TypeParam::kDeepest, .lists = deepest});
    auto sampler = samplerOf(volume);
    EXPECT_EQ(sampledInRows(sampler, {4, {float(kFar), 0, 0}}, TypeParam::kDeepest), std::vector<float>(4, 7));
}

TYPED_TEST(VoxelSampling, ReadsTheAllowedDepthsAndScalesWorldPoints)
{
    constexpr int kDepth = TypeParam::kUnitDepth, kWide = TypeParam::kChildrenPerAxis;
    auto const volume = volumeOf<TypeParam>(Field::linear(-25, 25), 7, 2);
    auto const padded = makeHaloChannel(volume);
    float3 const p{1.5f, 2.25f, -3.75f};
    float const value = linearField(p.x, p.y, p.z), none = -1;
    auto const with = [&](LinearSamplerSettings settings, Channel<TypeParam, float> const* channel = nullptr) {
        settings.background = none;
        return LinearSampler<TypeParam>(volume.container, volume.channel, volume.topology, settings, channel);
    };
    auto const sampledBy = [&](LinearSampler<TypeParam> const& original) {
        LinearSampler<TypeParam> copy(original);
        return sampled(copy, p);
    };
    EXPECT_FLOAT_EQ(sampledBy(with({.maxDepth = kDepth - 1})), value) << "coarser values of the same linear field";
    EXPECT_EQ(sampledBy(with({.minDepth = kDepth, .maxDepth = kDepth - 1})), none);
    EXPECT_EQ(sampledBy(with({.minDepth = kDepth})), value);
    EXPECT_EQ(sampledBy(with({.minDepth = kDepth}, &padded)), value);
    EXPECT_EQ(sampledBy(with({.minDepth = kDepth + 1}, &padded)), none);
    EXPECT_EQ(sampledBy(with({}, &volume.channel)), none) << "not padded";
    EXPECT_EQ(sampledBy(with({.scale = 2})), value);
    EXPECT_EQ(with({.scale = 2}).sample({p.x / 2, p.y / 2, p.z / 2}, kDepth, kWorldSpace), value);

    // A coarse tile at which the tree ends.
    std::vector<Voxel> const coarse{{0, 0, 0, 4}, {1, 0, 0, 8}, {0, 2, 0, std::numeric_limits<float>::infinity()}};
    VoxelList const lists[] = {{kDepth - 1, coarse}};
    auto const coarseVolume = buildVolume<TypeParam>({.depth = kDepth, .lists = lists});
    auto sampler = samplerOf(coarseVolume);
    EXPECT_FLOAT_EQ(sampled(sampler, {0.25f * kWide, 0, 0}), 5);
    expectSameInRows(sampler, 3 * kWide);
    // At a tile's last voxel, the next value in memory must not have an effect.
    EXPECT_EQ(sampledInRows(sampler, {4, {static_cast<float>(kWide * (TypeParam::kSide - 1)), kWide, 0}}),
        std::vector<float>(4, coarseVolume.background));
    EXPECT_EQ(sampler.name().view(), "kLinear");
    using Base = VoxelSampler<TypeParam, float, float3>;
    EXPECT_EQ(static_cast<Base&>(sampler).Base::name().view(), "kNone");
}
