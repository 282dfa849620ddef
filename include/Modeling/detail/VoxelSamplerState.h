#pragma once

#include <TessaraGeometryVolume/Channel.h>
#include <TessaraGeometryVolume/Container.h>
#include <TessaraGeometryVolume/VoxelTopology.h>
#include <TessaraMathSupport/Types.h>

#include <cstdint>
#include <limits>
#include <memory>
#include <vector>

/// What the samplers of VoxelSampler.h hold. It is part of their size, and nothing else: all of it may change.
namespace TSR::TileTree3D::Internal {

template <class Traits> struct KnownTiles;

/// The tile that contains the last point.
template <class Traits> struct TileCursor {
    using TileType = typename Container<Traits>::TileType;

    TileCursor(
        Container<Traits> const& container, float indexUnitsPerUnit, Tessara::Math::float3 const& offset) noexcept
        : accessor(container)
        , scale(indexUnitsPerUnit)
        , voxelOffset(offset)
    {
        leaveTile();
    }
    TileCursor(TileCursor const&) = delete;
    TileCursor& operator=(TileCursor const&) = delete;

    bool hasTile() const noexcept { return tile->valid; }
    /// \pre  hasTile()
    TileType const& currentTile() const noexcept { return static_cast<TileType const&>(*tile); }

    void leaveTile() noexcept
    {
        constexpr float kBeyond = std::numeric_limits<float>::infinity();
        tile = &noTile;
        tileBegin = tileEnd = {kBeyond, kBeyond, kBeyond};
    }

    typename Container<Traits>::ConstTileAccessor accessor;
    float scale; // index units per unit of length
    Tessara::Math::float3 voxelOffset;
    TileBinaryNonCompatible<Traits::kChildCount> const* tile;
    TileBinaryNonCompatible<Traits::kChildCount> noTile;

    // Points between these corners are in the tile. Empty if the tile may not be kept for the next point.
    Tessara::Math::float3 tileBegin; // in index units
    Tessara::Math::float3 tileEnd;
    float voxelsPerUnit = 0;
    int depth = -1; // that was asked for
    std::uint64_t visit = 0; // incremented for each tile that is entered
};

/// The volume that a linear sampler reads, and what it has built and looked up so far.
template <class Traits> struct LinearSamplerState {
    static constexpr int kSide = Traits::kSide;
    static constexpr unsigned int kAllAxes = 7;
    static constexpr std::uint64_t kNoKey = ~std::uint64_t{0};
    static constexpr std::uint32_t kNoSlot = ~std::uint32_t{0};

    using TileType = typename Container<Traits>::TileType;

    /// A tile with a layer of voxels around it, found by the tile's index.
    template <int side> struct HaloSlot {
        std::uint64_t key = kNoKey;
        TileData<float, side, 0> values;
        std::uint64_t stamp = 0; // when it was used last
    };
    template <int side> using HaloCache = std::vector<HaloSlot<side>>;

    bool hasPositiveHalos() const noexcept { return offsetType == kAllAxes; }

    /// Null if the tile has no values that may be read.
    float const* valuesOf(TileType const& tile) const noexcept
    {
        if (!tile.valid || tile.depth < minDepth)
            return nullptr;
        return haloChannel ? haloChannel->template tileData<kSide + 1>(tile.treeIndex()).values()
                           : channel->tileData(tile.treeIndex()).values();
    }

    typename Container<Traits>::ConstTileAccessor neighbors; // fetches other tiles than the cursor's
    unsigned int offsetType;
    HaloCache<kSide + 1> positiveHaloCache = {}; // one slot per depth, once one is needed
    HaloCache<kSide + 2> fullHaloCache = {};
    std::uint64_t stamp = 0; // incremented for each sample
    std::uint64_t lastKey[Traits::kDepthCount] = {};
    std::uint32_t lastSlot[Traits::kDepthCount] = {};
    Container<Traits> const* container;
    Channel<Traits, float> const* channel;
    Channel<Traits, float> const* haloChannel;
    VoxelTopology const* topology;
    float background;
    int minDepth;
    int maxDepth;
    int coarsestDepth; // with data

    std::unique_ptr<KnownTiles<Traits>> knownTiles = {}; // once a row needs them

    // Of the tile that the cursor has entered.
    std::uint64_t fetchedVisit = 0;
    float const* values = nullptr; // null if there are none that may be read
};

}
