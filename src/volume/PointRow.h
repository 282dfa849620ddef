#pragma once

#include <TessaraGeometryVolume/TileTraits.h>
#include <TessaraMathSupport/Types.h>

#include <cstddef>
#include <cstdint>

/// Samples a row of points in phases that take four points at a time: where the points are, which of them share a tile,
/// and their values. The caller finds the tiles before the last phase: how many consecutive points share a tile is
/// unpredictable, and a separate phase keeps those branches out of the others.
namespace TSR::TileTree3D::Internal {

struct PointRow {
    static constexpr std::size_t kCapacity = 128;
    static constexpr std::size_t kFirstTile = 4; // nothing precedes it, but four lanes are read from one before it

    // The place of each point in its tile, in voxels.
    float x[kCapacity], y[kCapacity], z[kCapacity];
    // The lower corner of the tile that contains the point, from `kFirstTile` on.
    float tileX[kFirstTile + kCapacity], tileY[kFirstTile + kCapacity], tileZ[kFirstTile + kCapacity];

    // Consecutive points in one tile are a run.
    std::uint32_t run[kCapacity]; // the number of each point's run
    std::uint32_t last[kCapacity]; // the number of the last point of each run
    std::uint32_t needsLayer[kCapacity]; // of each run: 1 if some point reads voxels of other tiles, else 0
    float const* values[kCapacity]; // that each run reads, at voxel (0, 0, 0)
    std::uint32_t open[kCapacity]; // runs whose tiles are still to be found
    std::uint32_t empty[kCapacity]; // runs whose tiles hold no data

    std::size_t first(std::size_t number) const { return number ? last[number - 1] + 1 : 0; }
    IJK tileOfRun(std::size_t number) const
    {
        std::size_t const n = kFirstTile + last[number];
        return {static_cast<int>(tileX[n]), static_cast<int>(tileY[n]), static_cast<int>(tileZ[n])};
    }
};

/// How points are mapped to places in tiles.
struct Placing {
    float scale;
    float tileWidth; // at most `kWidestTile`
    float voxelsPerUnit;
    Tessara::Math::float3 offset; // in voxels, finite, at most `kLargestOffset`
};

/// The widest tiles that points are placed in.
constexpr float kWidestTile = 0x1p23f;
/// A larger offset would place points below the layer around a tile.
constexpr float kLargestOffset = 1;

constexpr float kBelowTile = 1e-5f; // voxels; how far rounding can put a point below the tile that contains it

/// The arrays that runs read: index 0 for runs that need no layer, 1 for those that do.
struct TileArrays {
    int side[2];
    int lowestVoxel; // 0, or -1 if there is a layer on the lower sides; places below it are read from it
    int lastVoxel; // places beyond it are blended from it and the next voxel, however far they are
};

/// \pre     `count` is a multiple of 4, here and below
/// \return  false if some point is NaN, or too far away for exact steps
bool placePoints(Tessara::Math::float3 const* points, std::size_t count, Placing const& placing, PointRow& row);

/// Starts a run at each point whose tile differs from the one before. Runs with a place outside of [begin, end) along
/// some axis need the layer.
/// \tparam canNeedLayer  If it is false, none does.
/// \return  the number of runs
template <bool canNeedLayer> std::size_t findRuns(std::size_t count, float begin, float end, PointRow& row);

/// Blends the values of all points.
/// \tparam onlySide  The side of all arrays, if no place is below its tile; otherwise 0, which reads `arrays.side`.
template <int onlySide>
void interpolateRow(std::size_t count, TileArrays const& arrays, PointRow const& row, float* values);

}
