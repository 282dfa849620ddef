#include "PointRow.h"

#include "frame/Lanes.h"

#include <limits>

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
        Lanes const inside = min(max(place, Lanes{}), lastVoxel);
        IntLanes const voxel = __builtin_convertvector(inside, IntLanes);
        if constexpr (canBeBelow) {
            IntLanes const isBelow = place <= broadcast(-kBelowTile);
            Lanes const lower = __builtin_convertvector(voxel + isBelow, Lanes);
            return {lower, selectOrZero(isBelow | (place >= Lanes{}), place - lower)};
        } else {
            Lanes const lower = __builtin_convertvector(voxel, Lanes);
            return {lower, place - lower};
        }
    }

}

bool placePoints(float3 const* points, std::size_t count, Placing const& placing, PointRow& row)
{
    Lanes const width = broadcast(placing.tileWidth), perWidth = broadcast(1 / placing.tileWidth);
    Lanes const farthest = broadcast(0x1p22f); // up to here all steps are exact
    IntLanes areNear = ~IntLanes{};
    auto const place = [&](Lanes four, float offset, float* tile, float* places) {
        Lanes const p = four * broadcast(placing.scale);
        areNear &= Modeling::abs(p) <= farthest;
        Lanes const begin = tileBegin(p, width, perWidth);
        Lanes const inTile = (p - begin) * broadcast(placing.voxelsPerUnit) - broadcast(offset);
        store(begin, tile + PointRow::kFirstTile);
        store(inTile, places);
    };
    for (std::size_t n = 0; n < count; n += 4) {
        float const* const first = &points[n].x;
        Lanes const a = load(first), b = load(first + 4), c = load(first + 8);
        Lanes const yz01 = __builtin_shufflevector(a, b, 1, 2, 4, 5),
                    xy2zx3 = __builtin_shufflevector(b, c, 2, 3, 4, 5);
        Lanes const y23 = __builtin_shufflevector(b, c, 3, 3, 6, 6);
        float3 const& offset = placing.offset;
        place(__builtin_shufflevector(a, xy2zx3, 0, 3, 4, 7), offset.x, row.tileX + n, row.x + n);
        place(__builtin_shufflevector(yz01, y23, 0, 2, 4, 6), offset.y, row.tileY + n, row.y + n);
        place(__builtin_shufflevector(yz01, c, 1, 3, 4, 7), offset.z, row.tileZ + n, row.z + n);
    }
    return all(areNear);
}

template <bool canNeedLayer> std::size_t findRuns(std::size_t count, float begin, float end, PointRow& row)
{
    constexpr std::size_t kFirst = PointRow::kFirstTile;
    row.tileX[kFirst - 1] = std::numeric_limits<float>::quiet_NaN(); // differs from all
    row.tileY[kFirst - 1] = row.tileZ[kFirst - 1] = 0;
    std::uint32_t run = ~std::uint32_t{0}, needsLayer = 0;
    for (std::size_t n = 0; n < count; n += 4) {
        auto const differs = [n](float const* tile) { return load(tile + kFirst + n - 1) != load(tile + kFirst + n); };
        std::uint32_t isSame[4], isOutside[4] = {}; // all bits are set if it is, and 1 if it is
        store(~(differs(row.tileX) | differs(row.tileY) | differs(row.tileZ)), isSame);
        if constexpr (canNeedLayer) {
            Lanes const x = load(row.x + n), y = load(row.y + n), z = load(row.z + n);
            IntLanes const isInside = (min(min(x, y), z) >= broadcast(begin)) & (max(max(x, y), z) < broadcast(end));
            store(isInside + 1, isOutside);
        }
        for (std::size_t k = 0; k < 4; ++k) {
            run += isSame[k] + 1;
            needsLayer = (needsLayer & isSame[k]) | isOutside[k];
            row.run[n + k] = run;
            // The last point of the run writes last.
            row.last[run] = static_cast<std::uint32_t>(n + k);
            row.needsLayer[run] = needsLayer;
        }
    }
    return run + 1;
}

template std::size_t findRuns<true>(std::size_t, float, float, PointRow&);
template std::size_t findRuns<false>(std::size_t, float, float, PointRow&);

template <int onlySide>
void interpolateRow(std::size_t count, TileArrays const& arrays, PointRow const& row, float* values)
{
    constexpr bool kIsPadded = onlySide != 0;
    Lanes const lowestVoxel = broadcast(static_cast<float>(arrays.lowestVoxel));
    Lanes const lastVoxel = broadcast(static_cast<float>(arrays.lastVoxel));
    for (std::size_t n = 0; n < count; n += 4) {
        std::uint32_t const* const run = row.run + n;
        int side[4];
        for (std::size_t k = 0; k < 4; ++k)
            side[k] = kIsPadded ? onlySide : arrays.side[row.needsLayer[run[k]]];
        Coordinates const x = coordinatesOf<!kIsPadded>(load(row.x + n), lastVoxel);
        Coordinates const y = coordinatesOf<!kIsPadded>(load(row.y + n), lastVoxel);
        Coordinates const z = coordinatesOf<!kIsPadded>(load(row.z + n), lastVoxel);
        auto const readVoxel = [&](Lanes voxel) { return kIsPadded ? voxel : max(voxel, lowestVoxel); };
        Lanes const i = readVoxel(x.voxel), j = readVoxel(y.voxel), k = readVoxel(z.voxel);
        Lanes const perRow = kIsPadded ? broadcast(onlySide)
                                       : __builtin_convertvector(IntLanes{side[0], side[1], side[2], side[3]}, Lanes);
        std::int32_t index[4];
        store(__builtin_convertvector(i + (j + k * perRow) * perRow, IntLanes), index);
        float const* const near[4] = {row.values[run[0]] + index[0], row.values[run[1]] + index[1],
            row.values[run[2]] + index[2], row.values[run[3]] + index[3]};
        float const* const far[4] = {near[0] + side[0] * side[0], near[1] + side[1] * side[1],
            near[2] + side[2] * side[2], near[3] + side[3] * side[3]};
        auto const layer = [&](float const* const(&corners)[4]) {
            float const* const next[4] = {
                corners[0] + side[0], corners[1] + side[1], corners[2] + side[2], corners[3] + side[3]};
            return blendLanes(blendPairs(corners, x.fraction), blendPairs(next, x.fraction), y.fraction);
        };
        store(blendLanes(layer(near), layer(far), z.fraction), values + n);
    }
}

template void interpolateRow<0>(std::size_t, TileArrays const&, PointRow const&, float*);
template void interpolateRow<5>(std::size_t, TileArrays const&, PointRow const&, float*);
template void interpolateRow<6>(std::size_t, TileArrays const&, PointRow const&, float*);

}
