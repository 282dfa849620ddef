#pragma once

#include <TessaraGeometryVolume/Channel.h>
#include <TessaraGeometryVolume/Container.h>
#include <TessaraGeometryVolume/VoxelTopology.h>
#include <TessaraMathSupport/Types.h>

#include <cstdint>
#include <limits>
#include <memory>
#include <vector>

/// The state of the samplers of VoxelSampler.h. It is here only because it determines their size: it is not part of the
/// interface and may change.
namespace TSR::TileTree3D::Internal {

template <class Traits> struct KnownTiles;

/// Remembers the tile that contains the last point.
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

    // The tile's box: points inside are in the tile. Empty if the tile has to be looked up again for the next point.
    Tessara::Math::float3 tileBegin; // in index units
    Tessara::Math::float3 tileEnd;
    float voxelsPerUnit = 0;
    int depth = -1; // the requested one; the tile may be coarser
    std::uint64_t visit = 0; // incremented for each tile that is entered
};

/// The volume that a linear sampler reads, and what it has built and looked up so far.
template <class Traits> struct LinearSamplerState {
    static constexpr int kSide = Traits::kSide;
    static constexpr unsigned int kAllAxes = 7;
    static constexpr std::uint64_t kNoKey = ~std::uint64_t{0};
    static constexpr std::uint32_t kNoSlot = ~std::uint32_t{0};

    using TileType = typename Container<Traits>::TileType;

    /// A tile with its halo, found by the tile's index.
    template <int side> struct HaloSlot {
        std::uint64_t key = kNoKey;
        TileData<float, side, 0> values;
        std::uint64_t stamp = 0; // of the sample that looked it up
    };
    template <int side> using HaloCache = std::vector<HaloSlot<side>>;

    bool hasPositiveHalos() const noexcept { return offsetType == kAllAxes; }

    /// Null if the tile has no values, or is coarser than `minDepth`.
    float const* valuesOf(TileType const& tile) const noexcept
    {
        if (!tile.valid || tile.depth < minDepth)
            return nullptr;
        return haloChannel ? haloChannel->template tileData<kSide + 1>(tile.treeIndex()).values()
                           : channel->tileData(tile.treeIndex()).values();
    }

    typename Container<Traits>::ConstTileAccessor neighbors; // looks up tiles other than the cursor's
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
    int coarsestDepth; // the coarsest depth with data

    std::unique_ptr<KnownTiles<Traits>> knownTiles = {}; // null until `sampleAll` needs them

    // The values of the cursor's tile, and the visit for which they were fetched.
    std::uint64_t fetchedVisit = 0;
    float const* values = nullptr; // null if there are none that may be read
};

}
