#pragma once

#include <TessaraGeometryVolume/HaloTile.h>

namespace TSR::TileTree3D::Internal {

/// Fills the layer of a padded tile on its upper sides, as `setHaloTile` does. The tile's own values are in `out` already.
/// \param channelSide  Of the tiles of the channel, which may be padded themselves.
/// \param parentHalo   The values of the padded parent, or null.
template <class Traits, int channelSide> void fillUpperLayer(typename Container<Traits>::TileType const& tile,
    float const* parentHalo, Channel<Traits, float> const& channel, int order,
    typename Container<Traits>::ConstTileAccessor& accessor, float* out);

}
