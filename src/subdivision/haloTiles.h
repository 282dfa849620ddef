#pragma once

#include <TessaraGeometryVolume/TileData.h>
#include <TessaraGeometryVolume/TileTraits.h>

#include <array>

/// A tile with a layer of voxels all around, coordinates -1 to `kSide`, for samples whose voxels do not begin at the
/// lower side of the tile.
namespace TSR::TileTree3D::Internal {

template <class Traits> using FullHalo = TileData<float, Traits::kSide + 2, 0>;
template <class Traits> using TileValues = ConstTileData<float, Traits::kSide, 0>;

/// The tile itself and those around it, x fastest: (dx + 1) + (dy + 1) * 3 + (dz + 1) * 9.
template <class Traits> using TilesAround = std::array<TileValues<Traits>, 27>;

/// For a tile that nothing is known around: the layer mirrors the tile at `background` along axes with a clear bit of
/// `offsetType`. Along axes with a set bit it is `background`, and so is the tile's own layer at 0.
template <class Traits>
void fillHaloFromTile(unsigned int offsetType, float background, TileValues<Traits> tile, FullHalo<Traits>& out);

/// The layer continues the tiles around: values are copied straight across. Where there is none, it takes a blend of
/// the parent's values; where there are no such, it continues the tile itself in a straight line.
/// \param child       The position of the tile in its parent.
/// \param parentHalo  That of the parent, or an empty one.
template <class Traits> void fillHaloFromNeighbours(unsigned int offsetType, FullHalo<Traits>& out, IJK child,
    TilesAround<Traits> const& around, FullHalo<Traits> const& parentHalo);

}
