#include "support/Volumes.h"

#include <TessaraGeometryVolume/HaloTile.h>

#include <gtest/gtest.h>

#include <climits>
#include <map>

using namespace TSR::TileTree3D;
using TestSupport::Field, TestSupport::forEachVoxel, TestSupport::linearField;

namespace {

template <class> class TileTree : public testing::Test {
};
using Layouts = testing::Types<Traits2, Traits5>;
TYPED_TEST_SUITE(TileTree, Layouts);

template <class Traits> VolumeSource sourceOf()
{
    return {.background = -1, .depth = Traits::kUnitDepth};
}

template <class Traits> Volume<Traits> volumeOf(std::vector<Voxel> const& voxels, VolumeSource source)
{
    VoxelList const list{source.depth, voxels};
    source.lists = {&list, 1};
    return buildVolume<Traits>(source);
}

/// The value of the voxel that contains an index, at any depth of the tree.
template <class Traits> float valueAt(Volume<Traits> const& volume, IJK index, int depth = Traits::kUnitDepth)
{
    typename Container<Traits>::ConstTileAccessor cursor(volume.container);
    auto const& tile = cursor.tileImpl(index.i, index.j, index.k, depth);
    auto const data = volume.channel.tileData(tile.treeIndex());
    if (!data)
        return volume.background;
    std::int64_t const width = Traits::tileWidth(tile.depth);
    auto const voxel = [&](std::int64_t from, int at) { return static_cast<int>((at - from) * Traits::kSide / width); };
    return data(voxel(tile.i, index.i), voxel(tile.j, index.j), voxel(tile.k, index.k));
}

std::vector<Voxel> randomVoxels(std::size_t count, int reach, unsigned int seed)
{
    TestSupport::Random random(seed);
    auto const coordinate = [&] { return static_cast<int>(random.below(static_cast<std::size_t>(2 * reach))) - reach; };
    std::vector<Voxel> voxels(count);
    for (Voxel& voxel : voxels)
        voxel = {coordinate(), coordinate(), coordinate(), random.coordinate()};
    return voxels;
}

}

TYPED_TEST(TileTree, HoldsWhatItWasBuiltFromAndBackgroundElsewhere)
{
    std::vector<Voxel> voxels = randomVoxels(3000, 40, 1);
    for (int const far : {INT_MIN, INT_MIN + 3, -1'000'000'007, INT_MAX - 3, INT_MAX})
        voxels.push_back({far, far / -2, far, 1234.5f});
    std::map<std::tuple<int, int, int>, float> expected;
    for (Voxel const& voxel : voxels)
        expected[{voxel.i, voxel.j, voxel.k}] = voxel.value;
    // A block, which wins over the voxels inside it.
    IJK const first{-7, 3, -11}, size{23, 9, 14};
    std::vector<float> values;
    for (int n = 0; n < size.i * size.j * size.k; ++n) {
        values.push_back(static_cast<float>(n));
        int const i = n % size.i, j = n / size.i % size.j, k = n / size.i / size.j;
        expected[{first.i + i, first.j + j, first.k + k}] = values.back();
    }
    VolumeSource source = sourceOf<TypeParam>();
    source.block = {first, size, values.data()};
    auto const volume = volumeOf<TypeParam>(voxels, source);

    for (Voxel const& voxel : randomVoxels(3000, 60, 2))
        expected.try_emplace({voxel.i, voxel.j, voxel.k}, -1.0f);
    for (auto const& [index, value] : expected)
        ASSERT_EQ(valueAt(volume, {std::get<0>(index), std::get<1>(index), std::get<2>(index)}), value);
}

TYPED_TEST(TileTree, LinksTilesWithTheirParents)
{
    auto const volume = volumeOf<TypeParam>(randomVoxels(500, 3000, 3), sourceOf<TypeParam>());
    std::size_t linked = 0;
    for (int depth = 0; depth < TypeParam::kDepthCount; ++depth)
        for (std::size_t number = 0; number < volume.container.tileCount(depth); ++number) {
            auto const& tile = volume.container.tile(number, depth);
            ASSERT_TRUE(tile.valid && tile.treeIndex() == (TreeIndex{number, static_cast<std::uint32_t>(depth)}));
            ASSERT_EQ(tile.hasChildren, depth < TypeParam::kUnitDepth);
            auto const& parent = volume.container.tile(tile.parentTreeIndex());
            ASSERT_EQ(parent.valid, depth > 0);
            if (!parent.valid)
                continue;
            ++linked;
            auto const [i, j, k] = tile.childIJK();
            std::int64_t const width = TypeParam::tileWidth(depth);
            ASSERT_TRUE(std::max({i, j, k}) < TypeParam::kChildrenPerAxis && std::min({i, j, k}) >= 0);
            ASSERT_TRUE(
                parent.i + i * width == tile.i && parent.j + j * width == tile.j && parent.k + k * width == tile.k);
        }
    EXPECT_GT(linked, 500);
    EXPECT_FALSE(volume.container.tile(TreeIndex()).treeIndex().isValid());
    typename Container<TypeParam>::ConstTileAccessor cursor(volume.container);
    EXPECT_FALSE(cursor.tileImpl(0, 0, 0, -1).valid);
    EXPECT_FALSE(cursor.tileImpl(0, 0, 0, TypeParam::kDeepest + 1).valid);
}

TYPED_TEST(TileTree, KeepsConstantRegionsCoarse)
{
    // Two wide boxes touch, and neither ends at a tile's side.
    std::vector<ConstantBox> const boxes{{{-64, -64, -64}, {64, 64, 64}, 3},
        {{64, -3001, -3001}, {4097, 3001, 3001}, 6}, {{70, 4001, 2}, {83, 4009, 4}, 4}, {{90, 0, 0}, {90, 5, 5}, 9}};
    VolumeSource source = sourceOf<TypeParam>();
    source.boxes = boxes;
    auto const volume = volumeOf<TypeParam>({{0, 0, 0, 5}}, source);

    for (Voxel const& at : randomVoxels(20'000, 100, 4)) {
        float expected = -1;
        for (auto const& [first, end, value] : boxes)
            if (first.i <= at.i && at.i < end.i && first.j <= at.j && at.j < end.j && first.k <= at.k && at.k < end.k)
                expected = value;
        bool const isVoxel = at.i == 0 && at.j == 0 && at.k == 0;
        ASSERT_EQ(valueAt(volume, {at.i, at.j, at.k}), isVoxel ? 5 : expected) << at.i << ' ' << at.j << ' ' << at.k;
    }
    auto const bytesOf = [](Volume<TypeParam> const& made) {
        return made.container.memoryInBytes() + made.channel.memoryInBytes();
    };
    EXPECT_LT(bytesOf(volume), 2'000'000);

    // Many boxes that could be one, each with two values: too many for one division.
    std::vector<ConstantBox> same, others;
    auto const box = [](int side, int i, int j, int k, float value) -> ConstantBox {
        return {{side * i, side * j, side * k}, {side * (i + 1), side * (j + 1), side * (k + 1)}, value};
    };
    forEachVoxel(0, 16, [&](int i, int j, int k) { same.push_back(box(8, i, j, k, 5)); });
    forEachVoxel(0, 4, [&](int i, int j, int k) { others.push_back(box(128, i, j, k, float(i + j + k))); });
    for (auto const* const many : {&same, &others}) {
        source.boxes = *many;
        EXPECT_LT(bytesOf(buildVolume<TypeParam>(source)), 5'000'000);
    }
}

TYPED_TEST(TileTree, FineTilesInsideCoarseOnesKeepTheirValues)
{
    for (int const variant : {0, 1, 2, 3}) {
        int const levels = 1 + variant % 2;
        bool const asBoxes = variant > 1;
        int const coarseDepth = TypeParam::kUnitDepth - levels;
        int const ratio =
            levels == 1 ? TypeParam::kChildrenPerAxis : TypeParam::kChildrenPerAxis * TypeParam::kChildrenPerAxis;
        std::vector<Voxel> const coarse{{-1, 0, 0, 8}, {-2, 0, 0, 6}}, fine{{-1, 0, 0, 5}, {1000, 0, 0, 9}};
        VoxelList const lists[] = {{coarseDepth, coarse}, {TypeParam::kUnitDepth, fine}};
        std::vector<ConstantBox> const boxes{{{-1, 0, 0}, {0, 1, 1}, 5}, {{1000, 0, 0}, {1001, 1, 1}, 9}};
        VolumeSource source = sourceOf<TypeParam>();
        source.boxes = std::span(boxes).first(asBoxes ? 2 : 0);
        source.lists = std::span(lists, asBoxes ? 1 : 2);
        auto const volume = buildVolume<TypeParam>(source);
        for (auto const& [i, j, value] : std::vector<std::tuple<int, int, float>>{{-1, 0, 5.0f}, {-2, 0, 8.0f},
                 {-ratio, ratio - 1, 8.0f}, {-ratio - 1, 0, 6.0f}, {-ratio - 1, ratio, -1.0f}, {1000, 0, 9.0f},
                 {1000 + TypeParam::kSide, 0, -1.0f}}) // the last is not the value of the tile above
            EXPECT_EQ(valueAt(volume, {i, j, 0}), value) << i << ' ' << j;
        EXPECT_EQ(valueAt(volume, {-ratio, 0, 0}, coarseDepth), 8);
        EXPECT_EQ(valueAt(volume, {-ratio, 0, 0}, coarseDepth - 1), -1) << "coarser than any data";
    }
}

// Whatever the order of the lists, a tile begins with the values of the coarser tile around it.
TYPED_TEST(TileTree, TilesOfListsBeginWithTheNextCoarserValues)
{
    std::vector<Voxel> const coarse{{-1, 0, 0, 8}}, fine{{-1, 0, 0, 5}};
    VoxelList const lists[] = {{TypeParam::kUnitDepth - 1, fine}, {TypeParam::kUnitDepth - 2, coarse}};
    VolumeSource source = sourceOf<TypeParam>();
    source.lists = lists;
    auto const volume = buildVolume<TypeParam>(source);
    int const ratio = TypeParam::kChildrenPerAxis;
    EXPECT_EQ(valueAt(volume, {-1, 0, 0}, TypeParam::kUnitDepth - 1), 5);
    EXPECT_EQ(valueAt(volume, {-ratio - 1, 0, 0}, TypeParam::kUnitDepth - 1), 8);
}

TYPED_TEST(TileTree, HalosOfWideBoxesEndWithTheNextBox)
{
    int const wide = static_cast<int>(TypeParam::tileWidth(0)); // each box is a tile of its own
    std::vector<ConstantBox> const boxes{{{-wide, 0, 0}, {0, wide, wide}, 3}, {{0, 0, 0}, {wide, wide, wide}, 6}};
    VolumeSource source = sourceOf<TypeParam>();
    source.boxes = boxes;
    auto const volume = buildVolume<TypeParam>(source);
    auto const padded = makeHaloChannel(volume);
    typename Container<TypeParam>::ConstTileAccessor cursor(volume.container);
    constexpr int kSide = TypeParam::kSide;
    for (int const begin : {-wide, -kSide, 0}) {
        auto const halo =
            padded.template tileData<kSide + 1>(cursor.tileImpl(begin, 0, 0, TypeParam::kUnitDepth).treeIndex());
        ASSERT_TRUE(halo);
        EXPECT_EQ(halo(kSide - 1, 0, 0), begin == 0 ? 6 : 3);
        EXPECT_EQ(halo(kSide, 0, 0), begin == -wide ? 3 : 6);
    }
}

TYPED_TEST(TileTree, CoarserTilesTakeTheValueOrTheMean)
{
    constexpr int kSide = TypeParam::kSide, kChildren = TypeParam::kChildrenPerAxis;
    int const end = 2 * kSide * kChildren;
    Field const field = Field::linear(-end, end);
    for (unsigned int offsetType = 0; offsetType < 8; ++offsetType) {
        VolumeSource source = sourceOf<TypeParam>();
        source.offsetType = offsetType;
        source.block = field.block();
        source.coarsestDepth = TypeParam::kUnitDepth - 2;
        auto const volume = buildVolume<TypeParam>(source);
        EXPECT_EQ(volume.channel.coarsestDepth(), TypeParam::kUnitDepth - 2);
        for (int const levels : {1, 2}) {
            int const span = levels == 1 ? kChildren : kChildren * kChildren;
            auto const shift = [&](int axis) { return offsetType >> axis & 1 ? 0 : float(span - 1) / 2; };
            for (IJK const coarse : {IJK{0, 0, 0}, IJK{-1, 1, -2}, IJK{1, -1, 0}}) {
                IJK const index{coarse.i * span, coarse.j * span, coarse.k * span};
                EXPECT_NEAR(valueAt(volume, index, TypeParam::kUnitDepth - levels),
                    linearField(float(index.i) + shift(0), float(index.j) + shift(1), float(index.k) + shift(2)), 1e-4f)
                    << offsetType << ", " << levels;
            }
        }
    }
}

TYPED_TEST(TileTree, HalosContinueNeighborsThenParentsThenTheTile)
{
    constexpr int kSide = TypeParam::kSide;
    auto const isExact = [&](Volume<TypeParam> const& volume, int tileBegin, auto const& expected) {
        auto const padded = makeHaloChannel(volume);
        typename Container<TypeParam>::ConstTileAccessor cursor(volume.container);
        auto const& tile = cursor.tileImpl(tileBegin, 0, 0, TypeParam::kUnitDepth);
        auto const halo = padded.template tileData<kSide + 1>(tile.treeIndex());
        ASSERT_TRUE(halo);
        forEachVoxel(0, kSide + 1,
            [&](int i, int j, int k) { ASSERT_EQ(halo(i, j, k), expected(i, j, k)) << i << ' ' << j << ' ' << k; });
    };
    VolumeSource source = sourceOf<TypeParam>();
    Field const around = Field::linear(0, 2 * kSide), alone = Field::linear(0, kSide);
    source.block = around.block();
    isExact(buildVolume<TypeParam>(source), 0, around);
    source.block = alone.block();
    for (int const coarserLevels : {0, 2}) { // the parent has nothing there either
        source.coarsestDepth = TypeParam::kUnitDepth - coarserLevels;
        isExact(buildVolume<TypeParam>(source), 0, [&](int i, int j, int k) {
            return alone(std::min(i, kSide - 1), std::min(j, kSide - 1), std::min(k, kSide - 1));
        });
    }

    // Only x + 1 is missing at this depth; two depths up there is a tile instead.
    int const wide = static_cast<int>(TypeParam::tileWidth(TypeParam::kUnitDepth - 2));
    std::vector<Voxel> someAround, coarse;
    forEachVoxel(0, 2 * kSide, [&](int i, int j, int k) {
        if (i < kSide) // in the last tiles before the next wide one
            someAround.push_back({wide - kSide + i, j, k, around(i, j, k)});
        if (std::max({i, j, k}) < kSide)
            coarse.push_back({kSide + i, j, k, 77});
    });
    VoxelList const lists[] = {{TypeParam::kUnitDepth - 2, coarse}, {TypeParam::kUnitDepth, someAround}};
    source = sourceOf<TypeParam>();
    source.lists = lists;
    isExact(buildVolume<TypeParam>(source), wide - kSide,
        [&](int i, int j, int k) { return i == kSide ? 77 : around(i, j, k); });
}

TYPED_TEST(TileTree, RefusesDepthsAndVoxelsThatTheLayoutDoesNotHave)
{
    VolumeSource source = sourceOf<TypeParam>();
    source.depth = TypeParam::kUnitDepth - 1; // 32-bit indices have fewer voxels of this size
    EXPECT_THROW(volumeOf<TypeParam>({{INT_MAX, 0, 0, 1}}, source), std::invalid_argument);
    for (int const depth : {-1, TypeParam::kDeepest + 1}) {
        source.depth = depth;
        EXPECT_THROW(buildVolume<TypeParam>(source), std::invalid_argument);
    }
    source = sourceOf<TypeParam>();
    source.offsetType = 8;
    EXPECT_THROW(buildVolume<TypeParam>(source), std::invalid_argument);
    EXPECT_EQ(buildVolume<TypeParam>(sourceOf<TypeParam>()).channel.coarsestDepth(), TypeParam::kDepthCount);
}
