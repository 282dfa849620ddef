#pragma once

#include <TessaraGeometryVolume/TileData.h>
#include <TessaraGeometryVolume/TileTraits.h>

#include <map>
#include <utility>
#include <vector>

namespace TSR::TileTree3D {

template <class Traits, class T> class Channel;

template <int childrenPerAxis, int voxelsPerAxis, int a, int b, class T>
class Channel<Traits<childrenPerAxis, voxelsPerAxis, a, b>, T> {
public:
    virtual ~Channel() = default;
    virtual int coarsestDepth() const { return values.empty() ? 31 : static_cast<int>(values.begin()->first.first); }

    template <int side = voxelsPerAxis> ConstTileData<T, side, 0> tileData(TreeIndex tile) const
    {
        auto const found = values.find({tile.depth, tile.index});
        bool const fits = found != values.end() && found->second.size() == std::size_t{side} * side * side;
        return fits ? ConstTileData<T, side, 0>(found->second.data()) : ConstTileData<T, side, 0>();
    }

    /// For tests: by depth and index of the tile.
    std::map<std::pair<std::uint32_t, std::uint64_t>, std::vector<T>> values;
};

}
