#include "PointRow.h"

#include "frame/Lanes.h"

#include <limits>

namespace TSR::TileTree3D::Internal {

using namespace Modeling;
using Tessara::Math::float3;

namespace {

    Lanes lowest(Lanes a, Lanes b)
    {
        return a < b ? a : b;
    }

    Lanes highest(Lanes a, Lanes b)
    {
        return a > b ? a : b;
    }

    /// Where the tile begins that contains a coordinate. \param perWidth  perhaps rounded
    Lanes tileBegin(Lanes p, Lanes width, Lanes perWidth)
    {
        Lanes const round = everyLane(0x1.8p23f); // a sum with it has no fraction
        Lanes const nearest = (p * perWidth + round - round) * width;
        return nearest - lanesWhere(nearest > p, width);
    }

    /// The two values that stand at each address.
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

    /// Along x, between the two values at an offset from each of four corners.
    Lanes blendPairs(float const* const (&corners)[4], int offset, Lanes fraction)
    {
        Lanes const ab = loadPairs(corners[0] + offset, corners[1] + offset);
        Lanes const cd = loadPairs(corners[2] + offset, corners[3] + offset);
        return blendLanes(
            __builtin_shufflevector(ab, cd, 0, 2, 4, 6), __builtin_shufflevector(ab, cd, 1, 3, 5, 7), fraction);
    }

}

bool placePoints(
    float3 const* points, std::size_t count, float scale, float tileWidth, float voxelsPerUnit, PointRow& row)
{
    Lanes const width = everyLane(tileWidth), perWidth = everyLane(1 / tileWidth);
    Lanes const farthest = everyLane(0x1p22f); // up to there all is exact
    IntLanes const noSign = IntLanes{} + INT32_MAX;
    IntLanes areNear = ~IntLanes{};
    auto const place = [&](Lanes four, float* p, float* tile) {
        Lanes const scaled = four * everyLane(scale);
        areNear &= lanesWhere(noSign, scaled) <= farthest;
        storeLanes(scaled, p);
        storeLanes(tileBegin(scaled, width, perWidth), tile + PointRow::kFirstTile);
    };
    for (std::size_t n = 0; n < count; n += 4) {
        float const* const first = &points[n].x;
        Lanes const a = loadLanes(first), b = loadLanes(first + 4), c = loadLanes(first + 8);
        Lanes const yz01 = __builtin_shufflevector(a, b, 1, 2, 4, 5),
                    xy2zx3 = __builtin_shufflevector(b, c, 2, 3, 4, 5);
        Lanes const y23 = __builtin_shufflevector(b, c, 3, 3, 6, 6);
        place(__builtin_shufflevector(a, xy2zx3, 0, 3, 4, 7), row.x + n, row.tileX + n);
        place(__builtin_shufflevector(yz01, y23, 0, 2, 4, 6), row.y + n, row.tileY + n);
        place(__builtin_shufflevector(yz01, c, 1, 3, 4, 7), row.z + n, row.tileZ + n);
        storeLanes(everyLane(voxelsPerUnit), row.voxelsPerUnit + n);
    }
    return areAll(areNear);
}

std::size_t findRuns(std::size_t count, PointRow& row)
{
    constexpr std::size_t kFirst = PointRow::kFirstTile;
    row.tileX[kFirst - 1] = std::numeric_limits<float>::quiet_NaN(); // differs from all
    std::uint32_t run = ~std::uint32_t{0};
    for (std::size_t n = 0; n < count; n += 4) {
        auto const differs = [n](float const* tile) {
            return loadLanes(tile + kFirst + n - 1) != loadLanes(tile + kFirst + n);
        };
        std::int32_t isNew[4]; // -1 where it is
        storeLanes(differs(row.tileX) | differs(row.tileY) | differs(row.tileZ), isNew);
        for (std::size_t k = 0; k < 4; ++k) {
            run -= static_cast<std::uint32_t>(isNew[k]);
            row.run[n + k] = run;
            row.last[run] = static_cast<std::uint32_t>(n + k);
        }
    }
    return run + 1;
}

template <int side, bool hasEnd>
bool interpolateRow(std::size_t count, PlaceReading const& reading, PointRow& row, float* values)
{
    Lanes const begin = everyLane(reading.begin), end = everyLane(reading.end), lastVoxel = everyLane(side - 2);
    Lanes const offsetX = everyLane(reading.offset.x), offsetY = everyLane(reading.offset.y),
                offsetZ = everyLane(reading.offset.z);
    IntLanes haveValues = ~IntLanes{};
    for (std::size_t n = 0; n < count; n += 4) {
        Lanes const perUnit = loadLanes(row.voxelsPerUnit + n);
        auto const placeOf = [&](float const* p, float const* tile, Lanes offset) {
            return (loadLanes(p + n) - loadLanes(tile + PointRow::kFirstTile + n)) * perUnit - offset;
        };
        Lanes const x = placeOf(row.x, row.tileX, offsetX), y = placeOf(row.y, row.tileY, offsetY),
                    z = placeOf(row.z, row.tileZ, offsetZ);
        IntLanes hasValue = lowest(lowest(z, y), x) >= begin; // x comes last: it alone may be no number
        if constexpr (hasEnd)
            hasValue &= highest(highest(z, y), x) < end;
        storeLanes(hasValue, row.hasValue + n);
        haveValues &= hasValue;

        // Points without a value read something, too.
        auto const voxelOf = [&](Lanes place) {
            Lanes const inside = lowest(highest(place, Lanes{}), lastVoxel);
            return __builtin_convertvector(__builtin_convertvector(inside, IntLanes), Lanes);
        };
        Lanes const i = voxelOf(x), j = voxelOf(y), k = voxelOf(z);
        std::int32_t index[4];
        storeLanes(__builtin_convertvector(i + (j + k * everyLane(side)) * everyLane(side), IntLanes), index);
        std::uint32_t const* const run = row.run + n;
        float const* const corners[4] = {row.values[run[0]] + index[0], row.values[run[1]] + index[1],
            row.values[run[2]] + index[2], row.values[run[3]] + index[3]};
        auto const alongX = [&](int offset) { return blendPairs(corners, offset, x - i); };
        Lanes const near = blendLanes(alongX(0), alongX(side), y - j);
        Lanes const far = blendLanes(alongX(side * side), alongX(side * side + side), y - j);
        storeLanes(blendLanes(near, far, z - k), values + n);
    }
    return areAll(haveValues);
}

template bool interpolateRow<4, true>(std::size_t, PlaceReading const&, PointRow&, float*);
template bool interpolateRow<5, true>(std::size_t, PlaceReading const&, PointRow&, float*);
template bool interpolateRow<5, false>(std::size_t, PlaceReading const&, PointRow&, float*);
template bool interpolateRow<6, false>(std::size_t, PlaceReading const&, PointRow&, float*);

}
