#pragma once

#include "PointRow.h"
#include "haloTiles.h"

#include <TessaraGeometryVolume/Container.h>
#include <TessaraGeometryVolume/HaloTile.h>

#include <array>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <deque>

namespace TSR::TileTree3D::Internal {

/// A tile that rows have looked up, found by the lower corner and the depth that were requested. Small, so that the
/// table remains in the first-level cache.
struct KnownTile {
    IJK index{};
    int depth = -1;
    // 0: the tile's own values. 1: those with the layer around it, null until they are built. Both are null if the tile
    // is coarser than `depth`, and the same if there is no data.
    float const* values[2] = {};

    bool isOf(IJK asked, int askedDepth) const noexcept
    {
        return ((index.i ^ asked.i) | (index.j ^ asked.j) | (index.k ^ asked.k) | (depth ^ askedDepth)) == 0;
    }
};

/// Maps the lower corners of the tiles of a depth to places in a table of 2^`bits`. Tiles that share a place are at least
/// 8 tiles apart, and 21 in an axis-parallel plane: so those of a small part of a surface, or of a slice through a larger
/// part, do not replace one another.
class CornerHash {
public:
    static constexpr int kBits = 9; // for which the factors below are the best

    constexpr CornerHash(std::int64_t tileWidth, int depth)
        : shift_(std::countr_zero(static_cast<std::uint64_t>(tileWidth)))
        , offset_(static_cast<std::uint32_t>(depth) * 0x9Eu)
    {
        // Corners are multiples of the width. Multiplication by the inverse modulo 2^32 divides by its odd part.
        auto const odd = static_cast<std::uint32_t>(tileWidth >> shift_);
        std::uint32_t inverse = odd;
        for (int step = 0; step < 4; ++step) // each doubles the number of correct bits, three at first
            inverse *= 2 - odd * inverse;
        factors_ = {inverse, inverse * 491, inverse * 351};
    }

    constexpr std::size_t operator()(IJK corner) const noexcept
    {
        std::uint32_t const sum = static_cast<std::uint32_t>(corner.i) * factors_[0]
            + static_cast<std::uint32_t>(corner.j) * factors_[1] + static_cast<std::uint32_t>(corner.k) * factors_[2];
        return ((sum >> shift_) + offset_) & ((std::size_t{1} << kBits) - 1);
    }

private:
    std::array<std::uint32_t, 3> factors_{};
    int shift_;
    std::uint32_t offset_; // keeps a coarse tile apart from the finer ones at its corner
};

/// Tiles by a hash; a new tile replaces the one at its place. The table is small because each task of a parallel loop
/// sets one up.
template <class Traits> struct KnownTiles {
    static constexpr std::size_t kCapacity = std::size_t{1} << CornerHash::kBits;
    static_assert(kCapacity >= PointRow::kCapacity);

    std::array<KnownTile, kCapacity> known;
    std::array<TileOf<Traits>, kCapacity> tiles; // copies, as repeated tiles are not stored; may be coarser ones
    // Rows read halos in place, so none may be replaced within a row: if there is no room for as many as a row may
    // need, all are dropped before it. One of the two stays empty.
    std::deque<PositiveHalo<Traits>> positiveHalos;
    std::deque<FullHalo<Traits>> fullHalos;
    std::size_t haloCount = 0;

    static CornerHash hashAt(int depth) { return CornerHash(TileLayout<Traits>::tileWidth(depth), depth); }

    void makeRoomForHalos(std::size_t count)
    {
        if (haloCount + count <= kCapacity)
            return;
        haloCount = 0;
        for (KnownTile& tile : known)
            if (tile.values[1] != tile.values[0])
                tile.values[1] = nullptr;
    }
};

}
