#pragma once

#include <TessaraGeometryVolume/TileTraits.h>
#include <TessaraMathSupport/Types.h>

#include <cstddef>
#include <cstdint>

/// Samples of a row of points, in phases of four points at a time: where the points are; which of them are in one tile;
/// and the values. To find the tiles is up to the caller, before the last phase: how long points stay in a tile cannot
/// be foretold, and this way it does not hold up the rest.
namespace TSR::TileTree3D::Internal {

struct PointRow {
    static constexpr std::size_t kCapacity = 128;
    static constexpr std::size_t kFirstTile = 4; // there is no tile before

    float x[kCapacity], y[kCapacity], z[kCapacity]; // in index units
    // The lower corner of the tile that contains the point, from `kFirstTile` on. No number for points to be left out.
    float tileX[kFirstTile + kCapacity], tileY[kFirstTile + kCapacity], tileZ[kFirstTile + kCapacity];
    float voxelsPerUnit[kCapacity];

    // Points that follow one another in one tile are a run.
    std::uint32_t run[kCapacity]; // of each point
    std::uint32_t last[kCapacity]; // point of each run
    float const* values[kCapacity]; // that each run reads
    std::uint32_t open[kCapacity]; // runs with tiles that are not found yet

    std::int32_t hasValue[kCapacity]; // all bits set, or none

    IJK tileOfRun(std::size_t number) const
    {
        std::size_t const n = kFirstTile + last[number];
        return {static_cast<int>(tileX[n]), static_cast<int>(tileY[n]), static_cast<int>(tileZ[n])};
    }
};

/// What places in tiles are read with, in voxels.
struct PlaceReading {
    Tessara::Math::float3 offset; // finite
    float begin, end; // places between them have all their values in the tile
};

/// The widest tiles that points are placed in.
constexpr float kWidestTile = 0x1p23f;

/// \pre     `count` is a multiple of 4, here and below
/// \return  false where some point is no number, or too far away for exact steps
bool placePoints(Tessara::Math::float3 const* points, std::size_t count, float scale, float tileWidth,
    float voxelsPerUnit, PointRow& row);

/// Where the tile is another one than that of the point before, a run begins. \return how many there are
std::size_t findRuns(std::size_t count, PointRow& row);

/// \param side    of the arrays that are read
/// \param hasEnd  Whether places may be beyond the last voxel that the arrays have a next one for.
/// \return        false when there are points without a value
template <int side, bool hasEnd>
bool interpolateRow(std::size_t count, PlaceReading const& reading, PointRow& row, float* values);

}
