#pragma once

#include "VoxelRange.h"

#include <algorithm>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <vector>

namespace TSR::TileTree3D::Internal {

/// The number of the tile that contains a voxel of its depth. \pre  coordinates are at most 2^33 from 0
template <int side> Index tileOfVoxel(Index const& voxel)
{
    auto const divided = [](std::int64_t coordinate) {
        if constexpr (std::has_single_bit(static_cast<unsigned int>(side)))
            return coordinate >> std::countr_zero(static_cast<unsigned int>(side));
        // Unsigned division by a constant takes a few cycles; the bias keeps it from rounding towards zero.
        constexpr std::int64_t kBias = std::int64_t{1} << 33;
        return static_cast<std::int64_t>(static_cast<std::uint64_t>(coordinate + kBias * side) / side) - kBias;
    };
    return {divided(voxel.i), divided(voxel.j), divided(voxel.k)};
}

/// Where the values of recent tiles of one depth are. Voxels come in rows mostly, and each row returns to tiles of the
/// row before: with a table of them, only new tiles cost a search. How many voxels of a row share a tile is
/// unpredictable, so comparing with the previous voxel's tile first would cost more than reading the table for each.
class RecentTiles {
public:
    struct Entry {
        Index tile{INT64_MAX, 0, 0}; // initially one that contains no voxel
        float* values = nullptr;

        bool isOf(Index const& asked) const noexcept
        {
            return ((tile.i ^ asked.i) | (tile.j ^ asked.j) | (tile.k ^ asked.k)) == 0;
        }
    };

    /// \param voxelCount  About how many voxels will be asked for: few of them are not worth a large table.
    explicit RecentTiles(std::size_t voxelCount)
        : entries_(std::bit_ceil(std::clamp<std::size_t>(voxelCount / kVoxelsPerEntry, 1, kMostEntries)))
    {
    }

    /// The only entry that can be of this tile; a new tile replaces the one in it.
    Entry& at(Index const& tile) noexcept
    {
        // With these factors, tiles of an axis-parallel plane that share an entry of n are more than 0.8 sqrt(n) apart.
        auto const place = static_cast<std::uint32_t>(tile.i) + static_cast<std::uint32_t>(tile.j) * 3957u
            + static_cast<std::uint32_t>(tile.k) * 2269u;
        return entries_[place & (entries_.size() - 1)];
    }

private:
    static constexpr std::size_t kVoxelsPerEntry = 64;
    static constexpr std::size_t kMostEntries = 4096; // 128 kilobytes

    std::vector<Entry> entries_;
};

}
