#pragma once

#include <Modeling/detail/VoxelSamplerState.h>

#include <array>

/// A tile with a layer of voxels all around, coordinates -1 to `kSide`, for samples whose voxels do not begin at the
/// lower side of the tile.
namespace TSR::TileTree3D::Internal {

template <class Traits> using TileValues = ConstTileData<float, TileLayout<Traits>::kSide, 0>;

/// The tile itself and those around it, x fastest: (dx + 1) + (dy + 1) * 3 + (dz + 1) * 9.
template <class Traits> using TilesAround = std::array<TileValues<Traits>, 27>;

/// For a tile without parent values, whose neighbors are ignored: along axes with a clear bit of `offsetType`, the
/// layer mirrors the tile at `background`. Along axes with a set bit it is `background`, and so is the tile's own first
/// layer.
template <class Traits>
void fillHaloFromTile(unsigned int offsetType, float background, TileValues<Traits> tile, FullHalo<Traits>& out);

/// Copies the layer from the tiles around. If one of them is missing, its part of the layer is a blend of the parent's
/// values; without a parent, it extrapolates the tile itself linearly.
/// \param child       The position of the tile in its parent.
/// \param parentHalo  Of the parent; may be empty.
template <class Traits> void fillHaloFromNeighbours(unsigned int offsetType, FullHalo<Traits>& out, IJK child,
    TilesAround<Traits> const& around, FullHalo<Traits> const& parentHalo);

}
