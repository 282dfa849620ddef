#pragma once

#include <Modeling/Export.h>
#include <Modeling/detail/VoxelSamplerState.h>
#include <OrvanCore/String.h>
#include <TessaraGeometryVolume/Channel.h>
#include <TessaraGeometryVolume/Container.h>
#include <TessaraGeometryVolume/VoxelTopology.h>
#include <TessaraMathSupport/Types.h>

#include <cstddef>

/// Samples a sparse volume of floats at arbitrary points by trilinear interpolation.
namespace TSR::TileTree3D {

/// Base of all kinds of samplers: finds the tile that contains a point, and the place in it.
template <class Traits, class Value, class Point> class VoxelSampler;
/// Trilinear interpolation of the eight values around a point.
template <class Traits, class Value, int components, class Real, class Point, int, int> class VoxelSamplerLinear;

template <class Traits> using LinearSampler = VoxelSamplerLinear<Traits, float, 1, float, Tessara::Math::float3, 0, 0>;

/// The `space` of points in units of length. With any other value, points are in index units.
inline constexpr int kWorldSpace = 2;

template <class Traits> class MODELING_EXPORT VoxelSampler<Traits, float, Tessara::Math::float3> {
public:
    using ContainerType = Container<Traits>;
    using TileType = Internal::TileOf<Traits>;

    virtual ~VoxelSampler();
    /// Returns "kNone".
    virtual Orvan::String name() const;

protected:
    MODELING_NO_EXPORT VoxelSampler(
        ContainerType const& container, float scale, Tessara::Math::float3 const& voxelOffset) noexcept;
    VoxelSampler(VoxelSampler const&) = delete;
    VoxelSampler& operator=(VoxelSampler const&) = delete;

    Internal::TileCursor<Traits> cursor_;
};

/// The parameters of a sampler besides the volume.
struct LinearSamplerSettings {
    float scale = 1; // index units per unit of length of the points
    Tessara::Math::float3 voxelOffset{0, 0, 0}; // position of a voxel's value relative to its lower corner, in voxels
    float background = 0; // value where no tile holds data
    int minDepth = 0; // coarser tiles count as missing
    int maxDepth = 0x7FFFFFFF; // finer tiles are not read
};

/// Interpolates the eight values around a point along x, then y, then z. If some of them are in other tiles, it builds
/// a copy of the tile with a halo, an additional layer of voxels. `sample` keeps the last such copy of each depth,
/// `sampleAll` many more.
///
/// A sampler remembers its tile from one sample to the next, so each thread needs a copy of its own; copies begin with
/// empty caches. It only reads the volume. `sample` allocates nothing, except when it first needs the cache of halos.
///
/// The halo depends on the volume's offset type (`VoxelTopology`). With all bits set, it is on the upper sides and
/// holds values of the neighbors, if there are any (`setHaloTile`). Otherwise it is all around, and
/// - for a tile without parent values, neighbors are ignored: along axes with a clear bit the halo mirrors the tile at
///   `background`; along the others it is `background`, and so is the tile's own first layer;
/// - for a tile with parent values, neighbors are looked up at a fixed distance: 2 index units in `Traits2`, 5 in
///   `Traits5`. A wider tile is therefore its own upper neighbor, and a narrower one skips its nearest neighbors.
/// Volumes that guide a refinement are best built with all bits set.
template <class Traits> class MODELING_EXPORT VoxelSamplerLinear<Traits, float, 1, float, Tessara::Math::float3, 0, 0>
    : public VoxelSampler<Traits, float, Tessara::Math::float3> {
public:
    using ChannelType = Channel<Traits, float>;

    /// \param container    Which tiles the volume has.
    /// \param channel      Their values.
    /// \param topology     Where in its voxel each value is.
    /// \param haloChannel  Tiles with a halo on their upper sides (`makeHaloChannel`). If given, it is read instead of
    ///                     `channel`, and samples need no cache. It has no layer below the first voxel, so offsets
    ///                     should not be positive.
    /// \pre  All of the volume outlives the sampler and its copies, and is not modified.
    VoxelSamplerLinear(Container<Traits> const& container, ChannelType const& channel, VoxelTopology const& topology,
        LinearSamplerSettings const& settings, ChannelType const* haloChannel = nullptr);
    VoxelSamplerLinear(VoxelSamplerLinear const& other);
    ~VoxelSamplerLinear() override;
    /// Returns "kLinear".
    Orvan::String name() const override;

    /// The value at a point; `background` if no tile there holds data, if the point is outside the range of 32-bit
    /// indices, or if a coordinate is NaN.
    /// \param depth  Depth of the tiles to read. If the tree ends at a coarser tile, that one is read.
    /// \param space  `kWorldSpace`, or any other number for index units.
    float sample(Tessara::Math::float3 const& point, int depth, int space);

    /// Samples `count` points; each value equals that of `sample` to the bit. Faster than `sample`, most of all if
    /// consecutive points are mostly in the same tile; no faster if points are beyond 2^22 index units, or if an offset
    /// is greater than 1. The first call on a copy allocates 40 kilobytes. Without `haloChannel`, calls allocate 0.5 to
    /// 1.4 kilobytes for each tile that they build a halo around, up to 512 tiles, which they keep.
    /// \throws std::bad_alloc  Some of `values` may have been written; the sampler remains usable.
    void sampleAll(Tessara::Math::float3 const* points, std::size_t count, int depth, int space, float* values);

private:
    using Base = VoxelSampler<Traits, float, Tessara::Math::float3>;

    Internal::LinearSamplerState<Traits> state_;
};

extern template class MODELING_EXPORT VoxelSampler<Traits2, float, Tessara::Math::float3>;
extern template class MODELING_EXPORT VoxelSampler<Traits5, float, Tessara::Math::float3>;
extern template class MODELING_EXPORT VoxelSamplerLinear<Traits2, float, 1, float, Tessara::Math::float3, 0, 0>;
extern template class MODELING_EXPORT VoxelSamplerLinear<Traits5, float, 1, float, Tessara::Math::float3, 0, 0>;

}
