#pragma once

#include <Modeling/detail/TileLayout.h>
#include <TessaraGeometryVolume/Channel.h>
#include <TessaraGeometryVolume/Container.h>
#include <TessaraGeometryVolume/TileData.h>
#include <TessaraGeometryVolume/VoxelTopology.h>
#include <TessaraMathSupport/Types.h>

#include <concepts>
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
    using TileType = TileOf<Traits>;

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
    TileBinaryNonCompatible<TileLayout<Traits>::kChildCount> const* tile;
    TileBinaryNonCompatible<TileLayout<Traits>::kChildCount> noTile;

    // The tile's box: points inside are in the tile. Empty if the tile has to be looked up again for the next point.
    Tessara::Math::float3 tileBegin; // in index units
    Tessara::Math::float3 tileEnd;
    float voxelsPerUnit = 0;
    int depth = -1; // the requested one; the tile may be coarser
    std::uint64_t visit = 0; // incremented for each tile that is entered
};

template <class Voxels>
concept HasAddress = requires(Voxels const& voxels)
{
    {
        voxels.values()
        } -> std::convertible_to<float const*>;
};

template <class... Voxels> inline constexpr bool kHaveAddresses = (HasAddress<Voxels> && ...);

/// Where the values of a cube of voxels are. A host whose views tell where they are is read in place; of other hosts,
/// which only give single values, it is a copy.
template <int side, bool isInPlace = HasAddress<ConstTileData<float, side, 0>>> class VoxelValues {
public:
    /// Null if there are none. Valid until the next call, and as long as the volume is not modified.
    float const* read(ConstTileData<float, side, 0> const& voxels) noexcept { return voxels.values(); }
};

template <int side> class VoxelValues<side, false> {
public:
    float const* read(ConstTileData<float, side, 0> const& voxels)
    {
        if (!voxels)
            return nullptr;
        for (int voxel = 0; voxel != side * side * side; ++voxel)
            copied_[voxel] = voxels(voxel);
        return copied_;
    }

private:
    float copied_[side * side * side];
};

/// A tile with an additional layer on its upper sides, which the host fills (`setHaloTile`).
template <class Traits, bool isInPlace = HasAddress<TileData<float, TileLayout<Traits>::kSide + 1, 0>>>
struct PositiveHalo {
    static constexpr int kSide = TileLayout<Traits>::kSide + 1;

    PositiveHalo() noexcept { } // leaves the storage uninitialized

    float const* values() const noexcept { return voxels.values(); }

    TileData<float, kSide, 0> voxels;
};

template <class Traits> struct PositiveHalo<Traits, false> {
    static constexpr int kSide = TileLayout<Traits>::kSide + 1;

    TileData<float, kSide, 0> voxels;
    float copied[kSide * kSide * kSide] = {};

    /// To be called once the host has filled the voxels.
    void copyVoxels()
    {
        float* copy = copied;
        for (int k = 0; k != kSide; ++k)
            for (int j = 0; j != kSide; ++j)
                for (int i = 0; i != kSide; ++i)
                    *copy++ = voxels(i, j, k);
    }
    float const* values() const noexcept { return copied; }
};

/// A tile with a layer all around, coordinates -1 to `TileLayout::kSide`. Empty by default.
template <class Traits> class FullHalo {
public:
    FullHalo() noexcept { } // leaves the storage uninitialized

    explicit operator bool() const noexcept { return hasValues_; }
    float& operator()(int i, int j, int k) noexcept { return values_[indexOf(i, j, k)]; }
    float operator()(int i, int j, int k) const noexcept { return values_[indexOf(i, j, k)]; }
    float const* values() const noexcept { return values_; }

    /// `reset` leaves the values uninitialized, `clear` leaves none.
    void reset() noexcept { hasValues_ = true; }
    void clear() noexcept { hasValues_ = false; }

private:
    static constexpr int kSide = TileLayout<Traits>::kSide + 2;
    static int indexOf(int i, int j, int k) noexcept { return i + 1 + (j + 1 + (k + 1) * kSide) * kSide; }

    float values_[kSide * kSide * kSide];
    bool hasValues_ = false;
};

/// The volume that a linear sampler reads, and what it has built and looked up so far.
template <class Traits> struct LinearSamplerState {
    static constexpr int kSide = TileLayout<Traits>::kSide;
    static constexpr unsigned int kAllAxes = 7;
    static constexpr std::uint64_t kNoKey = ~std::uint64_t{0};
    static constexpr std::uint32_t kNoSlot = ~std::uint32_t{0};

    using TileType = TileOf<Traits>;

    /// A tile with its halo, found by the tile's index.
    template <class Halo> struct HaloSlot {
        std::uint64_t key = kNoKey;
        Halo halo;
        std::uint64_t stamp = 0; // of the sample that looked it up
    };
    template <class Halo> using HaloCache = std::vector<HaloSlot<Halo>>;

    /// Copies of a tile's values, of a host that does not tell where they are.
    struct TileCopies {
        [[no_unique_address]] VoxelValues<kSide> plain;
        [[no_unique_address]] VoxelValues<kSide + 1> padded;
    };

    /// Whether pointers to the values of many tiles can be kept.
    static constexpr bool kReadsInPlace = kHaveAddresses<ConstTileData<float, kSide, 0>,
        ConstTileData<float, kSide + 1, 0>, TileData<float, kSide + 1, 0>>;

    bool hasPositiveHalos() const noexcept { return offsetType == kAllAxes; }

    /// Null if the tile has no values, or is coarser than `minDepth`.
    /// \param room  Where the values are copied to, if need be.
    float const* valuesOf(TileType const& tile, TileCopies& room) const
    {
        if (!tile.valid || tile.depth < minDepth)
            return nullptr;
        return haloChannel ? room.padded.read(haloChannel->template tileData<kSide + 1>(tile.treeIndex()))
                           : room.plain.read(channel->tileData(tile.treeIndex()));
    }

    typename Container<Traits>::ConstTileAccessor neighbors; // looks up tiles other than the cursor's
    unsigned int offsetType;
    HaloCache<PositiveHalo<Traits>> positiveHaloCache = {}; // one slot per depth, once one is needed
    HaloCache<FullHalo<Traits>> fullHaloCache = {};
    std::uint64_t stamp = 0; // incremented for each sample
    std::uint64_t lastKey[TileLayout<Traits>::kDepthCount] = {};
    std::uint32_t lastSlot[TileLayout<Traits>::kDepthCount] = {};
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
    [[no_unique_address]] TileCopies copies = {};
};

}
