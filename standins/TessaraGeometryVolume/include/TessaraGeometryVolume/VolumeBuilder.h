#pragma once

#include <TessaraGeometryVolume/Channel.h>
#include <TessaraGeometryVolume/Container.h>
#include <TessaraGeometryVolume/VoxelTopology.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>

namespace TSR::TileTree3D {

/// A sparse volume: its tiles, their values, and where in its voxel each value is.
template <class Traits> struct Volume {
    Container<Traits> container;
    Channel<Traits, float> channel;
    VoxelTopology topology;
    float background = 0; // everywhere else
};

/// A value at a voxel, counted in voxels of its depth.
struct Voxel {
    int i, j, k;
    float value;
};

/// Voxels of one depth. The last of several values for the same voxel is kept.
struct VoxelList {
    int depth;
    std::span<Voxel const> voxels;
};

/// Some voxels of a cube of 8³; coordinates count voxels of the source's `depth`.
struct VoxelCube {
    IJK first;
    std::array<std::uint64_t, 8> active; // entry z, bit x + 8 * y
    std::size_t firstValue; // of the active voxels, x fastest, among the values of all cubes
};

/// Voxels from `first` up to but excluding `end` along each axis, all of one value; coordinates count voxels of the
/// source's `depth`.
struct ConstantBox {
    IJK first, end;
    float value;
};

/// All voxels of a box, x fastest: `size.i * size.j * size.k` values.
struct DenseBlock {
    IJK first, size;
    float const* values;
};

/// What a volume is built from. Boxes must not overlap one another. If other sources overlap, the finer one wins; at
/// the same depth, lists win over boxes, cubes over both, and the block over all. The rest of a tile that is inside a
/// coarser one gets the coarser one's values.
struct VolumeSource {
    float background = 0;
    unsigned int offsetType = 7; // see VoxelTopology
    int depth; // of boxes, cubes and the block
    std::span<ConstantBox const> boxes = {};
    std::span<VoxelList const> lists = {};
    std::span<VoxelCube const> cubes = {};
    std::span<float const> cubeValues = {};
    DenseBlock block = {{0, 0, 0}, {0, 0, 0}, nullptr};
    /// Tiles of this depth and all deeper ones hold data, computed from the tiles inside them. Clamped to the depth of
    /// the coarsest source, which is also the default.
    std::optional<int> coarsestDepth = {};
};

/// Builds the tree. A box is equivalent to a list of all its voxels: any sample gives the same value to the bit. But if
/// all data is at `depth` or deeper, tiles inside boxes and along their sides are stored once for all that have the
/// same values; touching boxes of one value count as one. Tiles are numbered in the order in which they are first
/// needed.
///
/// Values of coarser tiles without a source of their own are computed from finer ones: along an axis with a set bit of
/// `offsetType` the finer value at the same place, along an axis with a clear bit the mean of the voxels covered. If
/// there are no finer ones, they are those of the next coarser tile with a source, or `background`.
///
/// Linear in the number of voxels. Memory is proportional to the number of tiles with active voxels plus the number of
/// boxes: each box takes a few kilobytes at most, and tiles of its own only next to listed voxels or many other boxes.
/// If there is coarser data, boxes take time and memory for all their tiles.
/// \throws std::invalid_argument  if the layout does not have a depth, a voxel is beyond 32-bit indices, or
///                                `offsetType` is above 7
/// \throws std::bad_alloc         also for 2^31 tiles of one depth
template <class Traits> Volume<Traits> buildVolume(VolumeSource const& source);

/// A channel whose tiles have an additional layer on their upper sides (`setHaloTile`), so that samplers need not build
/// it. Takes up to twice the memory of the stored tiles, and more where tiles shared values: here each has its own.
template <class Traits> Channel<Traits, float> makeHaloChannel(Volume<Traits> const& volume);

extern template TESSARAGEOMETRYVOLUME_EXPORT Volume<Traits2> buildVolume(VolumeSource const& source);
extern template TESSARAGEOMETRYVOLUME_EXPORT Volume<Traits5> buildVolume(VolumeSource const& source);
extern template TESSARAGEOMETRYVOLUME_EXPORT Channel<Traits2, float> makeHaloChannel(Volume<Traits2> const& volume);
extern template TESSARAGEOMETRYVOLUME_EXPORT Channel<Traits5, float> makeHaloChannel(Volume<Traits5> const& volume);

}
