#include "PointRow.h"

#include "frame/Lanes.h"

#include <array>

namespace TSR::TileTree3D::Internal {

using namespace Modeling;
using Tessara::Math::float3;

namespace {

    /// The lower side of the tile that contains a coordinate. \param perWidth  1 / width, perhaps rounded
    Lanes tileBegin(Lanes p, Lanes width, Lanes perWidth)
    {
        Lanes const round = broadcast(0x1.8p23f); // adding and subtracting it rounds to the nearest integer
        Lanes const nearest = (p * perWidth + round - round) * width;
        return nearest - selectOrZero(nearest > p, width);
    }

    /// The two values at each address.
    Lanes loadPairs(float const* a, float const* b)
    {
        using Pairs = double __attribute__((vector_size(16)));
        double first, second;
        std::memcpy(&first, a, sizeof(first));
        std::memcpy(&second, b, sizeof(second));
        return reinterpret_cast<Lanes>(Pairs{first, second});
    }

    Lanes blendLanes(Lanes from, Lanes to, Lanes fraction)
    {
        return (to - from) * fraction + from;
    }

    /// Blends along x, between the two values at each of four addresses.
    Lanes blendPairs(float const* const (&corners)[4], Lanes fraction)
    {
        Lanes const ab = loadPairs(corners[0], corners[1]);
        Lanes const cd = loadPairs(corners[2], corners[3]);
        return blendLanes(
            __builtin_shufflevector(ab, cd, 0, 2, 4, 6), __builtin_shufflevector(ab, cd, 1, 3, 5, 7), fraction);
    }

    struct Coordinates {
        Lanes voxel, fraction;
    };

    /// Divides places in a tile into voxel, at least -1, and fraction.
    template <bool canBeBelow> Coordinates coordinatesOf(Lanes place, Lanes lastVoxel)
    {
        if constexpr (canBeBelow) {
            IntLanes const voxel = __builtin_convertvector(min(max(place, Lanes{}), lastVoxel), IntLanes);
            IntLanes const isBelow = place <= broadcast(-kBelowTile);
            Lanes const lower = __builtin_convertvector(voxel + isBelow, Lanes);
            return {lower, selectOrZero(isBelow | (place >= Lanes{}), place - lower)};
        } else {
            IntLanes const voxel = __builtin_convertvector(min(place, lastVoxel), IntLanes);
            Lanes const lower = __builtin_convertvector(voxel, Lanes);
            return {lower, place - lower};
        }
    }

    /// Four points in arrays of voxels.
    struct FourPoints {
        Lanes i, j, k; // the first of the voxels to blend
        Lanes x, y, z; // the fraction of the way to the next one
        float const* values[4]; // at voxel (0, 0, 0)
    };

    /// \param side  Of the array of each point. Inlined, because offsets of voxels are free if it is constant.
    [[gnu::always_inline]] inline Lanes blendCubes(FourPoints const& points, int const (&side)[4])
    {
        Lanes const perRow = __builtin_convertvector(IntLanes{side[0], side[1], side[2], side[3]}, Lanes);
        std::int32_t index[4];
        store(__builtin_convertvector(points.i + (points.j + points.k * perRow) * perRow, IntLanes), index);
        float const* const near[4] = {points.values[0] + index[0], points.values[1] + index[1],
            points.values[2] + index[2], points.values[3] + index[3]};
        float const* const far[4] = {near[0] + side[0] * side[0], near[1] + side[1] * side[1],
            near[2] + side[2] * side[2], near[3] + side[3] * side[3]};
        auto const layer = [&](float const* const(&corners)[4]) {
            float const* const next[4] = {
                corners[0] + side[0], corners[1] + side[1], corners[2] + side[2], corners[3] + side[3]};
            return blendLanes(blendPairs(corners, points.x), blendPairs(next, points.x), points.y);
        };
        return blendLanes(layer(near), layer(far), points.z);
    }

    /// What is known about each of the sixteen sets of lanes; bit i of its number is set if lane i belongs to it.
    struct LaneSets {
        std::array<std::uint32_t, 16> count{};
        std::array<IntLanes, 16> countUpTo{}; // in each lane: how many lanes of the set are not beyond it
        std::array<IntLanes, 16> members{}; // in ascending order, then zeros
    };

    constexpr LaneSets kLaneSets = [] {
        LaneSets sets;
        for (unsigned int set = 0; set != 16; ++set) {
            std::int32_t count = 0, countUpTo[4] = {}, members[4] = {};
            for (std::int32_t lane = 0; lane != 4; ++lane) {
                if (set >> lane & 1)
                    members[count++] = lane;
                countUpTo[lane] = count;
            }
            sets.count[set] = static_cast<std::uint32_t>(count);
            sets.countUpTo[set] = IntLanes{countUpTo[0], countUpTo[1], countUpTo[2], countUpTo[3]};
            sets.members[set] = IntLanes{members[0], members[1], members[2], members[3]};
        }
        return sets;
    }();

    IntLanes inAllLanes(std::size_t value)
    {
        return IntLanes{} + static_cast<std::int32_t>(value);
    }

    constexpr std::size_t kWordBits = 64; // no run spans two words with a bit per point

}

bool placePoints(float3 const* points, std::size_t count, Placing const& placing, PointRow& row)
{
    Lanes const width = broadcast(placing.tileWidth), perWidth = broadcast(1 / placing.tileWidth);
    Lanes const scale = broadcast(placing.scale), voxelsPerUnit = broadcast(placing.voxelsPerUnit);
    Lanes const farthest = broadcast(0x1p22f); // up to here all steps are exact
    IntLanes areNear = ~IntLanes{};
    auto const place = [&](Lanes four, Lanes offset, float* tile, float* places) {
        Lanes const p = four * scale;
        areNear &= Modeling::abs(p) <= farthest;
        Lanes const begin = tileBegin(p, width, perWidth);
        Lanes const inTile = (p - begin) * voxelsPerUnit - offset;
        store(begin, tile + PointRow::kFirstTile);
        store(inTile, places);
    };
    Lanes const offsetX = broadcast(placing.offset.x), offsetY = broadcast(placing.offset.y),
                offsetZ = broadcast(placing.offset.z);
    for (std::size_t n = 0; n < count; n += 4) {
        float const* const first = &points[n].x;
        Lanes const a = load(first), b = load(first + 4), c = load(first + 8);
        Lanes const yz01 = __builtin_shufflevector(a, b, 1, 2, 4, 5),
                    xy2zx3 = __builtin_shufflevector(b, c, 2, 3, 4, 5);
        Lanes const y23 = __builtin_shufflevector(b, c, 3, 3, 6, 6);
        place(__builtin_shufflevector(a, xy2zx3, 0, 3, 4, 7), offsetX, row.tileX + n, row.x + n);
        place(__builtin_shufflevector(yz01, y23, 0, 2, 4, 6), offsetY, row.tileY + n, row.y + n);
        place(__builtin_shufflevector(yz01, c, 1, 3, 4, 7), offsetZ, row.tileZ + n, row.z + n);
    }
    return all(areNear);
}

std::size_t findRuns(std::size_t count, PointRow& row)
{
    constexpr std::size_t kFirst = PointRow::kFirstTile;
    row.tileX[kFirst - 1] = row.tileY[kFirst - 1] = row.tileZ[kFirst - 1] = 0;
    std::size_t runCount = 0;
    for (std::size_t n = 0; n < count; n += 4) {
        auto const differs = [n](float const* tile) { return load(tile + kFirst + n - 1) != load(tile + kFirst + n); };
        unsigned int starts = bitsOf(differs(row.tileX) | differs(row.tileY) | differs(row.tileZ));
        starts |= n % kWordBits == 0 ? 1 : 0;
        store(inAllLanes(runCount - 1) + kLaneSets.countUpTo[starts], row.run + n);
        store(inAllLanes(n) + kLaneSets.members[starts], row.first + runCount);
        runCount += kLaneSets.count[starts];
    }
    row.first[runCount] = static_cast<std::uint32_t>(count);
    return runCount;
}

void findLayers(std::size_t count, std::size_t runCount, float begin, float end, PointRow& row)
{
    std::uint64_t isOutside[PointRow::kCapacity / kWordBits] = {}; // a bit per point
    for (std::size_t n = 0; n < count; n += 4) {
        Lanes const x = load(row.x + n), y = load(row.y + n), z = load(row.z + n);
        IntLanes const isInside = (min(min(x, y), z) >= broadcast(begin)) & (max(max(x, y), z) < broadcast(end));
        isOutside[n / kWordBits] |= std::uint64_t{bitsOf(~isInside)} << n % kWordBits;
    }
    for (std::size_t run = 0; run != runCount; ++run) {
        std::uint32_t const first = row.first[run], length = row.first[run + 1] - first;
        std::uint64_t const pointsOfRun = ~std::uint64_t{0} >> (kWordBits - length) << first % kWordBits;
        row.needsLayer[run] = (isOutside[first / kWordBits] & pointsOfRun) != 0 ? 1 : 0;
    }
}

template <int side, int layeredSide, bool canBeBelow> void interpolateRow(
    std::size_t count, std::size_t runCount, VoxelRange const& range, PointRow const& row, float* values)
{
    Lanes const lowest = broadcast(static_cast<float>(range.lowest)), last = broadcast(static_cast<float>(range.last));
    auto const voxelToRead = [=](Lanes voxel) { return canBeBelow ? max(voxel, lowest) : voxel; };
    auto const sideOf = [&](std::uint32_t run) { return row.needsLayer[run] ? layeredSide : side; };
    bool const areRunsLong = runCount <= count / 16; // otherwise the branches below would be unpredictable
    for (std::size_t n = 0; n < count; n += 4) {
        std::uint32_t const a = row.run[n], b = row.run[n + 1], c = row.run[n + 2], d = row.run[n + 3];
        Coordinates const x = coordinatesOf<canBeBelow>(load(row.x + n), last);
        Coordinates const y = coordinatesOf<canBeBelow>(load(row.y + n), last);
        Coordinates const z = coordinatesOf<canBeBelow>(load(row.z + n), last);
        FourPoints const points{voxelToRead(x.voxel), voxelToRead(y.voxel), voxelToRead(z.voxel), x.fraction,
            y.fraction, z.fraction, {row.values[a], row.values[b], row.values[c], row.values[d]}};
        bool const isOneRun = areRunsLong && a == d;
        if (side == layeredSide || (isOneRun && !row.needsLayer[a]))
            store(blendCubes(points, {side, side, side, side}), values + n);
        else if (isOneRun)
            store(blendCubes(points, {layeredSide, layeredSide, layeredSide, layeredSide}), values + n);
        else
            store(blendCubes(points, {sideOf(a), sideOf(b), sideOf(c), sideOf(d)}), values + n);
    }
}

template void interpolateRow<4, 5, false>(std::size_t, std::size_t, VoxelRange const&, PointRow const&, float*);
template void interpolateRow<4, 5, true>(std::size_t, std::size_t, VoxelRange const&, PointRow const&, float*);
template void interpolateRow<4, 6, false>(std::size_t, std::size_t, VoxelRange const&, PointRow const&, float*);
template void interpolateRow<4, 6, true>(std::size_t, std::size_t, VoxelRange const&, PointRow const&, float*);
template void interpolateRow<5, 5, false>(std::size_t, std::size_t, VoxelRange const&, PointRow const&, float*);
template void interpolateRow<5, 5, true>(std::size_t, std::size_t, VoxelRange const&, PointRow const&, float*);
template void interpolateRow<5, 6, false>(std::size_t, std::size_t, VoxelRange const&, PointRow const&, float*);
template void interpolateRow<5, 6, true>(std::size_t, std::size_t, VoxelRange const&, PointRow const&, float*);
template void interpolateRow<5, 7, false>(std::size_t, std::size_t, VoxelRange const&, PointRow const&, float*);
template void interpolateRow<5, 7, true>(std::size_t, std::size_t, VoxelRange const&, PointRow const&, float*);
template void interpolateRow<6, 6, false>(std::size_t, std::size_t, VoxelRange const&, PointRow const&, float*);
template void interpolateRow<6, 6, true>(std::size_t, std::size_t, VoxelRange const&, PointRow const&, float*);

}
