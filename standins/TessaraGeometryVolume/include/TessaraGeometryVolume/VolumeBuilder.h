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

/// A sparse field of values: what there is of tiles, what stands in them, and what their values stand for.
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

/// Voxels of one depth. Of several values for the same voxel the last stands.
struct VoxelList {
    int depth;
    std::span<Voxel const> voxels;
};

/// Some voxels of a cube of 8³, counted in voxels of the source's `depth`.
struct VoxelCube {
    IJK first;
    std::array<std::uint64_t, 8> active; // entry z, bit x + 8 * y
    std::size_t firstValue; // of the active voxels, x fastest, among the values of all cubes
};

/// All voxels from `first` up to but without `end`, counted in voxels of the source's `depth`, of one value.
struct ConstantBox {
    IJK first, end;
    float value;
};

/// All voxels of a box, x fastest: `size.i * size.j * size.k` values.
struct DenseBlock {
    IJK first, size;
    float const* values;
};

/// What a volume is built from. Boxes do not overlap one another. Otherwise the finer source wins where sources overlap,
/// and at one depth lists over boxes, cubes over both, and the block over all; the rest of a tile that is begun inside a
/// coarser one has the coarser one's values.
struct VolumeSource {
    float background = 0;
    unsigned int offsetType = 7; // see VoxelTopology
    int depth; // of boxes, cubes and the block
    std::span<ConstantBox const> boxes = {};
    std::span<VoxelList const> lists = {};
    std::span<VoxelCube const> cubes = {};
    std::span<float const> cubeValues = {};
    DenseBlock block = {{0, 0, 0}, {0, 0, 0}, nullptr};
    /// Tiles of all depths from this one on hold data, taken from those inside them. Never below that of the coarsest
    /// source, which is also the default.
    std::optional<int> coarsestDepth = {};
};

/// Builds the tree in one go. A box is the same as all its voxels: any sample gives the same value to the bit. But if
/// all data is at `depth` or deeper, tiles inside boxes, and along the sides of boxes, are stored once for all that have
/// the same values; boxes of one value that touch are one. Tiles are numbered in the order in which they are first
/// needed.
///
/// Tiles between and above given ones take, along an axis with a set bit of `offsetType`, the value at the place of
/// theirs, along one with a clear bit the mean of the voxels that they cover; if there is none, what a given tile
/// above says, or `background`.
///
/// Linear in voxels. Memory is proportional to tiles with active voxels, and otherwise to the number of boxes: each
/// takes some kilobytes at most, and tiles of its own only next to listed voxels or many other boxes. With coarser data
/// boxes take time and memory for all their tiles.
/// \throws std::invalid_argument  for a depth that the layout does not have, a voxel beyond 32-bit indices, and an
///                                `offsetType` above 7
/// \throws std::bad_alloc         also for 2^31 tiles of one depth
template <class Traits> Volume<Traits> buildVolume(VolumeSource const& source);

/// A channel with a layer more on the upper sides: what `setHaloTile` gives for every tile that has data. Samples
/// then need no halo tiles of their own. Twice the memory of stored tiles; tiles of one value no longer share theirs.
template <class Traits> Channel<Traits, float> makeHaloChannel(Volume<Traits> const& volume);

extern template TESSARAGEOMETRYVOLUME_EXPORT Volume<Traits2> buildVolume(VolumeSource const& source);
extern template TESSARAGEOMETRYVOLUME_EXPORT Volume<Traits5> buildVolume(VolumeSource const& source);
extern template TESSARAGEOMETRYVOLUME_EXPORT Channel<Traits2, float> makeHaloChannel(Volume<Traits2> const& volume);
extern template TESSARAGEOMETRYVOLUME_EXPORT Channel<Traits5, float> makeHaloChannel(Volume<Traits5> const& volume);

}
