#pragma once

#include <TessaraGeometryVolume/TileTraits.h>
#include <TessaraMathSupport/Types.h>

#include <cstddef>
#include <cstdint>

/// Samples a row of points in phases that take four points at a time: where the points are, which of them share a tile,
/// and their values. The caller finds the tiles before the last phase: how many consecutive points share a tile is
/// unpredictable, and a separate phase keeps those branches out of the others. Only where many share one does the last
/// phase have branches, which let it read arrays of a known size.
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
    std::uint32_t first[kCapacity + 1]; // the number of the first point of each run, then the number of points
    std::uint32_t needsLayer[kCapacity]; // of each run: 1 if some point reads voxels of other tiles, else 0
    float const* values[kCapacity]; // that each run reads, at voxel (0, 0, 0)
    std::uint32_t open[kCapacity]; // runs whose tiles are still to be found
    std::uint32_t empty[kCapacity]; // runs whose tiles hold no data

    IJK tileOfRun(std::size_t number) const
    {
        std::size_t const n = kFirstTile + first[number];
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

/// The voxels that places are blended from.
struct VoxelRange {
    int lowest; // 0, or -1 if there is a layer on the lower sides; places below it are read from it
    int last; // places beyond it are blended from it and the next voxel, however far they are
};

/// \pre     `count` is a multiple of 4, here and below
/// \return  false if some point is NaN, or too far away for exact steps
bool placePoints(Tessara::Math::float3 const* points, std::size_t count, Placing const& placing, PointRow& row);

/// Starts a run at each point whose tile differs from the one before, and at each 64th point.
/// \return  the number of runs
std::size_t findRuns(std::size_t count, PointRow& row);

/// Finds the runs that need the layer: those with a place outside of [begin, end) along some axis.
void findLayers(std::size_t count, std::size_t runCount, float begin, float end, PointRow& row);

/// Blends the values of all points.
/// \tparam side         Of the arrays of runs that need no layer, in voxels.
/// \tparam layeredSide  Of those of runs that need it.
/// \tparam canBeBelow   Whether some place may be below its tile.
template <int side, int layeredSide, bool canBeBelow> void interpolateRow(
    std::size_t count, std::size_t runCount, VoxelRange const& range, PointRow const& row, float* values);

}
