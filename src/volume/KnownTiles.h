#pragma once

#include "PointRow.h"
#include "haloTiles.h"

#include <TessaraGeometryVolume/Container.h>
#include <TessaraGeometryVolume/HaloTile.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <deque>

namespace TSR::TileTree3D::Internal {

/// A tile that rows have looked up, found by the lower corner and the depth that were requested.
template <class Traits> struct KnownTile {
    IJK index{};
    int depth = -1;
    TileOf<Traits> tile; // a copy, as repeated tiles are not stored; may be a coarser one
    bool hasData = false;
    // 0: the tile's own values. 1: those with the layer around it, null until they are built. Both are null if the tile
    // is coarser than `depth`.
    float const* values[2] = {};

    bool isOf(IJK asked, int askedDepth) const noexcept
    {
        return ((index.i ^ asked.i) | (index.j ^ asked.j) | (index.k ^ asked.k) | (depth ^ askedDepth)) == 0;
    }
};

/// Tiles by the upper bits of a hash; a new tile replaces the one with the same bits. The table is small because each
/// task of a parallel loop sets one up.
template <class Traits> struct KnownTiles {
    static constexpr int kBits = 9;
    static constexpr std::size_t kCapacity = std::size_t{1} << kBits;
    static_assert(kCapacity >= PointRow::kCapacity);

    std::array<KnownTile<Traits>, kCapacity> tiles;
    // Rows read halos in place, so none may be replaced within a row: if there is no room for as many as a row may
    // need, all are dropped before it. One of the two stays empty.
    std::deque<PositiveHalo<Traits>> positiveHalos;
    std::deque<FullHalo<Traits>> fullHalos;
    std::size_t haloCount = 0;

    KnownTile<Traits>& at(IJK index, int depth)
    {
        auto const of = [](int coordinate, std::uint32_t factor) {
            return static_cast<std::uint32_t>(coordinate) * factor;
        };
        std::uint32_t const hash =
            of(index.i, 0x9E3779B1u) ^ of(index.j, 0x85EBCA77u) ^ of(index.k, 0xC2B2AE3Du) ^ of(depth, 0x27D4EB2Fu);
        return tiles[hash >> (32 - kBits)];
    }

    void makeRoomForHalos(std::size_t count)
    {
        if (haloCount + count <= kCapacity)
            return;
        haloCount = 0;
        for (KnownTile<Traits>& known : tiles)
            known.values[1] = nullptr;
    }
};

}
