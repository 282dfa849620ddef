#pragma once

#include <TessaraGeometryVolume/Channel.h>
#include <TessaraGeometryVolume/Container.h>

namespace TSR::TileTree3D {

/// A tile with an additional layer on its upper sides, for trilinear samples between its last voxels and the next ones.
template <class Traits> using PositiveHalo = TileData<float, Traits::kSide + 1, 0>;

/// Fills the halo tile of `tile`, coordinates 0 to `kSide`. Values across the upper faces, edges and corner are copied
/// from the first layer of the neighbors of the same depth that hold data. If a coarser tile holds the data there, they
/// are interpolated from the parent's values; if no tile does, they repeat the outermost layer of the tile itself,
/// whatever the parent holds. Values are at the lower sides of their voxels.
///
/// \param parentTile  May be null.
/// \param parentHalo  Of the parent tile; if it is empty, the parent's values are not used.
/// \param order       How the parent's values are interpolated: 2, trilinearly; 1, the nearest lower voxel.
/// \param accessor    Fetches the neighbors.
/// \param out         Empty afterwards if the tile holds no data.
/// Allocates nothing.
template <class Traits> void setHaloTile(typename Container<Traits>::TileType const& tile,
    typename Container<Traits>::TileType const* parentTile, Channel<Traits, float> const& channel,
    PositiveHalo<Traits> const& parentHalo, int order, typename Container<Traits>::ConstTileAccessor& accessor,
    PositiveHalo<Traits>& out);

// Traits cannot be deduced through the types above.
extern template TESSARAGEOMETRYVOLUME_EXPORT void setHaloTile<Traits2>(Container<Traits2>::TileType const&,
    Container<Traits2>::TileType const*, Channel<Traits2, float> const&, PositiveHalo<Traits2> const&, int,
    Container<Traits2>::ConstTileAccessor&, PositiveHalo<Traits2>&);
extern template TESSARAGEOMETRYVOLUME_EXPORT void setHaloTile<Traits5>(Container<Traits5>::TileType const&,
    Container<Traits5>::TileType const*, Channel<Traits5, float> const&, PositiveHalo<Traits5> const&, int,
    Container<Traits5>::ConstTileAccessor&, PositiveHalo<Traits5>&);

}
