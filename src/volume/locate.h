#pragma once

#include "PointRow.h"

#include <Modeling/detail/VoxelSamplerState.h>

#include <algorithm>
#include <cmath>
#include <cstdint>

namespace TSR::TileTree3D::Internal {

using Tessara::Math::float3;

/// Where a point is: its voxel in the tile's data, and the fraction of the way to the next voxel.
struct Place {
    IJK voxel;
    float3 fraction;
};

/// A coordinate in a tile, divided into voxel and fraction.
struct Coordinate {
    int voxel;
    float fraction;
};

inline bool fitsIndex(float coordinate)
{
    return coordinate >= -0x1p31f && coordinate < 0x1p31f;
}

/// Rounds down, without calling `floor`.
inline int indexOf(float coordinate)
{
    int const towardsZero = static_cast<int>(coordinate);
    return towardsZero - (static_cast<float>(towardsZero) > coordinate ? 1 : 0);
}

/// Beyond the upper side the voxel is the last one. Below the lower side it is the layer around the tile, however far a
/// wrong offset points, so nothing in front of the tile's data is read.
template <int side> inline Coordinate coordinateOf(float value)
{
    if (value >= 0) [[likely]] { // calling `floor` would be most of the cost of a sample
        int const voxel = static_cast<int>(std::min(value, static_cast<float>(side - 1)));
        return {voxel, value - static_cast<float>(voxel)};
    }
    if (value > -kBelowTile)
        return {0, 0};
    return {-1, value - std::floor(value)};
}

/// Whether finer tiles may be inside: true if the host does not tell.
template <class TileType> bool mayContainFiner(TileType const& tile)
{
    if constexpr (requires { tile.hasChildren; })
        return tile.hasChildren;
    else
        return true;
}

/// Enters the tile that contains the point, if there is one. Not inlined: it would slow down samples in the same tile.
template <class Traits> [[gnu::noinline]] void enterTile(TileCursor<Traits>& cursor, float3 const& p, int depth)
{
    ++cursor.visit;
    cursor.depth = depth;
    cursor.leaveTile();
    if (!(fitsIndex(p.x) && fitsIndex(p.y) && fitsIndex(p.z)))
        return;
    auto const& tile = cursor.accessor.tileImpl(indexOf(p.x), indexOf(p.y), indexOf(p.z), depth);
    cursor.tile = &tile;
    if (!tile.valid)
        return;
    cursor.voxelsPerUnit = TileLayout<Traits>::voxelsPerUnit(tile.depth);

    // A coarse tile may contain finer ones, and large floats cannot represent where a tile ends: then the next point is
    // looked up again.
    constexpr float kAllExact = 0x1p23f; // floats up to twice this one represent all corners of tiles
    auto const width = static_cast<float>(TileLayout<Traits>::tileWidth(tile.depth));
    bool const isExact = std::max({std::abs(p.x), std::abs(p.y), std::abs(p.z), width}) <= kAllExact;
    if (isExact && (tile.depth == depth || !mayContainFiner(tile))) {
        cursor.tileBegin = {static_cast<float>(tile.i), static_cast<float>(tile.j), static_cast<float>(tile.k)};
        cursor.tileEnd = {cursor.tileBegin.x + width, cursor.tileBegin.y + width, cursor.tileBegin.z + width};
    }
}

template <class Traits> inline float3 distanceFromTile(TileCursor<Traits> const& cursor, float3 const& p) noexcept
{
    float3 const& begin = cursor.tileBegin;
    if (std::isfinite(begin.x)) [[likely]]
        return {p.x - begin.x, p.y - begin.y, p.z - begin.z};
    // A float may be too coarse to represent where the tile begins.
    auto const distance = [](float from, std::int64_t to) {
        return static_cast<float>(static_cast<double>(from) - static_cast<double>(to));
    };
    return {distance(p.x, cursor.tile->i), distance(p.y, cursor.tile->j), distance(p.z, cursor.tile->k)};
}

/// Finds the place of a point. If no tile contains it, the cursor is in none, and the place is meaningless.
/// \param isWorldPoint  whether the point is in units of length, not in index units
/// \pre                 depth <= kDeepest
template <class Traits>
inline Place locate(TileCursor<Traits>& cursor, float3 const& point, int depth, bool isWorldPoint)
{
    float const scale = cursor.scale;
    float3 const p = isWorldPoint ? float3{point.x * scale, point.y * scale, point.z * scale} : point;
    float3 const &begin = cursor.tileBegin, &end = cursor.tileEnd;
    bool const isInside = (depth == cursor.depth) & (p.x >= begin.x) & (p.y >= begin.y) & (p.z >= begin.z)
        & (p.x < end.x) & (p.y < end.y) & (p.z < end.z);
    if (!isInside) {
        enterTile(cursor, p, depth);
        if (!cursor.hasTile())
            return {};
    }
    float3 const fromTile = distanceFromTile(cursor, p);
    float3 const& offset = cursor.voxelOffset;
    constexpr int kSide = TileLayout<Traits>::kSide;
    Coordinate const x = coordinateOf<kSide>(fromTile.x * cursor.voxelsPerUnit - offset.x);
    Coordinate const y = coordinateOf<kSide>(fromTile.y * cursor.voxelsPerUnit - offset.y);
    Coordinate const z = coordinateOf<kSide>(fromTile.z * cursor.voxelsPerUnit - offset.z);
    return {{x.voxel, y.voxel, z.voxel}, {x.fraction, y.fraction, z.fraction}};
}

}
