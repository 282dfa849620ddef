#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/String.h>
#include <TessaraGeometryVolume/Channel.h>
#include <TessaraGeometryVolume/Container.h>
#include <TessaraGeometryVolume/VoxelTopology.h>
#include <TessaraMathSupport/Types.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <vector>

namespace TSR::TileTree3D {

namespace Internal {

    struct PointRow;
    template <class Traits> struct KnownTile;
    template <class Traits> struct KnownTiles;

}

/// Reads values of a sparse volume at points. What all kinds share: finding the tile, and the place in it.
template <class Traits, class Value, class Point> class VoxelSampler;
/// Trilinear: blends the eight values around a point.
template <class Traits, class Value, int components, class Real, class Point, int, int> class VoxelSamplerLinear;

template <class Traits> using LinearSampler = VoxelSamplerLinear<Traits, float, 1, float, Tessara::Math::float3, 0, 0>;

/// Points are in units of length. In any other space they are in index units.
inline constexpr int kWorldSpace = 2;

template <class Traits> class MODELING_EXPORT VoxelSampler<Traits, float, Tessara::Math::float3> {
public:
    using ContainerType = Container<Traits>;
    using TileType = typename ContainerType::TileType;

    virtual ~VoxelSampler();
    /// "kNone"
    virtual Orvan::String name() const;

private:
    typename ContainerType::ConstTileAccessor cursor_;

protected:
    float scale_;
    Tessara::Math::float3 voxelOffset_;

private:
    TileBinaryNonCompatible<Traits::kChildCount> const* tile_;
    TileBinaryNonCompatible<Traits::kChildCount> noTile_;

protected:
    /// Where a point is: its voxel in the tile's data, and the fraction of the way to the next voxel.
    struct Place {
        IJK voxel;
        Tessara::Math::float3 fraction;
    };

    // Points between these corners are in the current tile. Empty if the tile may not be kept for the next point.
    Tessara::Math::float3 tileBegin_; // in index units
    Tessara::Math::float3 tileEnd_;
    float voxelsPerUnit_ = 0;
    int depth_ = -1; // that was asked for
    std::uint64_t visit_ = 0; // incremented for each tile that is entered

    MODELING_NO_EXPORT VoxelSampler(
        ContainerType const& container, float scale, Tessara::Math::float3 const& voxelOffset) noexcept;
    VoxelSampler(VoxelSampler const&) = delete;
    VoxelSampler& operator=(VoxelSampler const&) = delete;

    /// Enters the tile that contains the point, if there is one. \pre depth <= kDeepest, here and below
    MODELING_NO_EXPORT Place locate(Tessara::Math::float3 const& point, int depth, int space);
    MODELING_NO_EXPORT Tessara::Math::float3 distanceFromTile(Tessara::Math::float3 const& p) const noexcept;
    MODELING_NO_EXPORT void enterTile(Tessara::Math::float3 const& p, int depth);
    MODELING_NO_EXPORT void leaveTile() noexcept;
    MODELING_NO_EXPORT bool hasTile() const noexcept { return tile_->valid; }
    /// \pre  there is one
    MODELING_NO_EXPORT TileType const& currentTile() const noexcept { return static_cast<TileType const&>(*tile_); }
};

/// The parameters of a sampler besides the volume.
struct LinearSamplerSettings {
    float scale = 1; // index units per unit of length of the points
    Tessara::Math::float3 voxelOffset{0, 0, 0}; // in voxels; where the value of a voxel is, from its lower corner
    float background = 0; // outside all tiles
    int minDepth = 0; // coarser tiles count as missing
    int maxDepth = 0x7FFFFFFF; // finer tiles are not read
};

/// Blends the eight values around a point along x, then y, then z. If some of them are in other tiles, it builds a copy of
/// the tile with an additional layer of voxels. Single samples keep the last such copy of each depth, rows many more.
///
/// A sampler holds on to its place from one sample to the next, so each thread needs a copy of its own; copies begin
/// with empty caches. It reads the volume only. A single sample allocates nothing, except the first one of a copy that
/// needs the caches.
///
/// The layer depends on the volume's offset type. With all bits set, it is across the upper faces and holds values of the
/// neighbors, if there are any (`setHaloTile`). Otherwise it is all around, and
/// - for a tile without parent values, neighbors are ignored: along axes with a clear bit the layer mirrors the tile at
///   `background`; along the others it is `background`, and so is the tile's own first layer;
/// - for a tile with parent values, neighbors are looked up at a fixed distance: 2 index units in `Traits2`, 5 in
///   `Traits5`. A wider tile is therefore its own upper neighbor, and a narrower one takes a tile further away.
/// Volumes that guide a refinement are best built with all bits set.
template <class Traits> class MODELING_EXPORT VoxelSamplerLinear<Traits, float, 1, float, Tessara::Math::float3, 0, 0>
    : public VoxelSampler<Traits, float, Tessara::Math::float3> {
public:
    using ChannelType = Channel<Traits, float>;

    /// \param haloChannel  Tiles with an additional layer on their upper sides (`makeHaloChannel`). If given, it is read
    ///                     instead of `channel`, and samples need no cache. It has no layer below the first voxel, so
    ///                     offsets should not be positive.
    /// \pre  All of the volume outlives the sampler and its copies, unchanged.
    VoxelSamplerLinear(Container<Traits> const& container, ChannelType const& channel, VoxelTopology const& topology,
        LinearSamplerSettings const& settings, ChannelType const* haloChannel = nullptr);
    VoxelSamplerLinear(VoxelSamplerLinear const& other);
    ~VoxelSamplerLinear() override;
    /// "kLinear"
    Orvan::String name() const override;

    /// The value at a point; `background` if no tile there holds data, if the point is outside the range of 32-bit
    /// indices, or if a coordinate is NaN.
    /// \param depth  Of the tiles to read. If the tree ends at a coarser tile, that one is read.
    /// \param space  `kWorldSpace`, or any other number for index units
    float sample(Tessara::Math::float3 const& point, int depth, int space);

    /// The same for `count` points, to the bit. Faster than `sample`, most of all if consecutive points are mostly in the
    /// same tile; as fast if points are beyond 2^22 index units, or if an offset is greater than 1. The first row of a
    /// copy allocates 48 kilobytes. Without `haloChannel`, rows allocate 0.5 to 1.4 kilobytes for each tile that they build
    /// a layer around, up to 512 tiles, which they keep.
    /// \throws std::bad_alloc  Some of `values` may have been written; the sampler remains usable.
    void sampleAll(Tessara::Math::float3 const* points, std::size_t count, int depth, int space, float* values);

private:
    using Base = VoxelSampler<Traits, float, Tessara::Math::float3>;
    using typename Base::TileType;
    enum : int { kSide = Traits::kSide };

    MODELING_NO_EXPORT void fetchValues();
    MODELING_NO_EXPORT float const* valuesOf(TileType const& tile) const;
    MODELING_NO_EXPORT bool fitsRows(int depth) const noexcept;
    MODELING_NO_EXPORT void sampleRow(
        Tessara::Math::float3 const* points, std::size_t count, int depth, int space, float* values);
    /// Gives each run its values. \return  the number of runs whose tiles hold no data
    MODELING_NO_EXPORT std::size_t findTiles(
        Tessara::Math::float3 const* points, std::size_t runCount, int depth, float scale, Internal::PointRow& row);
    MODELING_NO_EXPORT float const* findValues(
        Tessara::Math::float3 const* points, std::size_t run, int depth, float scale, Internal::PointRow& row);
    MODELING_NO_EXPORT Internal::KnownTile<Traits>& knownTile(IJK index, int depth);
    MODELING_NO_EXPORT void placeInTile(Tessara::Math::float3 const* points, std::size_t run, TileType const& tile,
        float scale, Internal::PointRow& row) const;
    MODELING_NO_EXPORT float const* buildLayeredValues(TileType const& tile);

    enum : std::uint64_t { kNoKey = ~std::uint64_t{0} };
    enum : std::uint32_t { kNoSlot = ~std::uint32_t{0} };

    /// The tile with index `key`, with a layer around it.
    template <int side> struct HaloSlot {
        std::uint64_t key = kNoKey;
        TileData<float, side, 0> values;
        std::uint64_t stamp = 0; // when it was used last
    };
    template <int side> using HaloCache = std::vector<HaloSlot<side>>;

    MODELING_NO_EXPORT int readDepth(int depth) const noexcept;
    MODELING_NO_EXPORT float samplePositive(typename Base::Place const& place);
    MODELING_NO_EXPORT float sampleFull(typename Base::Place const& place);
    template <int side> MODELING_NO_EXPORT HaloSlot<side> const& haloOf(TileType const& tile, HaloCache<side>& cache);
    template <int side> MODELING_NO_EXPORT std::uint32_t findHalo(std::uint64_t key, int depth, HaloCache<side>& cache);
    template <int side> MODELING_NO_EXPORT std::uint32_t buildHalo(TileType const& tile, HaloCache<side>& cache);
    MODELING_NO_EXPORT bool drawsOnParent(TileType const& tile) const;
    MODELING_NO_EXPORT void fillHalo(TileType const& tile, TileData<float, kSide + 1, 0>& halo);
    MODELING_NO_EXPORT void fillHalo(TileType const& tile, TileData<float, kSide + 2, 0>& halo);
    MODELING_NO_EXPORT bool hasPositiveHalos() const noexcept;
    using TilesAround = std::array<ConstTileData<float, kSide, 0>, 27>;
    MODELING_NO_EXPORT TilesAround tilesAround(TileType const& tile);

    typename Container<Traits>::ConstTileAccessor neighbours_;
    unsigned int offsetType_;
    HaloCache<kSide + 1> positiveHaloCache_; // one slot per depth, once one is needed
    HaloCache<kSide + 2> fullHaloCache_;
    std::uint64_t stamp_ = 0;
    std::uint64_t lastKey_[Traits::kDepthCount];
    std::uint32_t lastSlot_[Traits::kDepthCount];
    Container<Traits> const* container_;
    ChannelType const* channel_;
    ChannelType const* haloChannel_;
    VoxelTopology const* topology_;
    float background_;
    int minDepth_;
    int maxDepth_;
    int coarsestDepth_; // with data

    std::unique_ptr<Internal::KnownTiles<Traits>> knownTiles_; // once a row needs them

    // Of the tile that the base has entered.
    std::uint64_t fetchedVisit_ = 0;
    float const* values_ = nullptr; // null if there are none that may be read
};

extern template class MODELING_EXPORT VoxelSampler<Traits2, float, Tessara::Math::float3>;
extern template class MODELING_EXPORT VoxelSampler<Traits5, float, Tessara::Math::float3>;
extern template class MODELING_EXPORT VoxelSamplerLinear<Traits2, float, 1, float, Tessara::Math::float3, 0, 0>;
extern template class MODELING_EXPORT VoxelSamplerLinear<Traits5, float, 1, float, Tessara::Math::float3, 0, 0>;

}
