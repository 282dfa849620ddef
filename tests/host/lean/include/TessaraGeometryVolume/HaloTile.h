#pragma once

#include <TessaraGeometryVolume/Channel.h>
#include <TessaraGeometryVolume/Container.h>

#include <algorithm>

namespace TSR::TileTree3D {

/// Copies the layer on the upper sides from the neighbors of the same depth, and repeats the tile's own last values if
/// there is none.
template <class Traits, int childCount, int haloSide> void setHaloTile(Tile<Traits, childCount> const& tile,
    Tile<Traits, childCount> const*, Channel<Traits, float> const& channel, TileData<float, haloSide, 0> const&, int,
    typename Container<Traits>::ConstTileAccessor& accessor, TileData<float, haloSide, 0>& out)
{
    constexpr int kSide = haloSide - 1;
    int const width = Container<Traits>::widthAt(tile.depth);
    out = TileData<float, haloSide, 0>(0);
    for (int k = 0; k <= kSide; ++k)
        for (int j = 0; j <= kSide; ++j)
            for (int i = 0; i <= kSide; ++i) {
                auto const& neighbor = accessor.tileImpl(tile.i + (i / kSide) * width, tile.j + (j / kSide) * width,
                    tile.k + (k / kSide) * width, tile.depth);
                auto const across = channel.tileData(neighbor.treeIndex());
                auto const own = channel.tileData(tile.treeIndex());
                out(i, j, k) = across ? across(i % kSide, j % kSide, k % kSide)
                    : own             ? own(std::min(i, kSide - 1), std::min(j, kSide - 1), std::min(k, kSide - 1))
                                      : 0;
            }
}

}
