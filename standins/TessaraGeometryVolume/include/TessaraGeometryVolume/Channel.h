#pragma once

#include <TessaraGeometryVolume/Export.h>
#include <TessaraGeometryVolume/TileData.h>
#include <TessaraGeometryVolume/TileTraits.h>

#include <array>
#include <utility>
#include <vector>

namespace TSR::TileTree3D {

/// The values of a volume: `side`³ a tile, for all tiles of the depths that hold data. Read by any number of threads.
template <class Traits, class T> class TESSARAGEOMETRYVOLUME_EXPORT Channel {
public:
    /// Without data. \param side  that of a tile, or one more for tiles that are padded on their upper sides
    explicit Channel(int side = Traits::kSide) noexcept
        : side_(side)
    {
    }
    Channel(Channel const&) = default;
    Channel(Channel&&) noexcept = default;
    Channel& operator=(Channel const&) = default;
    Channel& operator=(Channel&&) noexcept = default;
    virtual ~Channel() = default;

    /// Above it no tile has data. The deepest depth and one more where no tile has any.
    virtual int coarsestDepth() const noexcept
    {
        int depth = 0;
        while (depth < Traits::kDepthCount && levels_[static_cast<std::size_t>(depth)].empty())
            ++depth;
        return depth;
    }

    /// Nothing where the tile holds no data, and where tiles of this channel have another side.
    template <int side = Traits::kSide> ConstTileData<T, side, 0> tileData(TreeIndex tile) const noexcept
    {
        constexpr std::size_t kVoxelCount = std::size_t{side} * side * side;
        if (!tile.isValid() || side != side_)
            return {};
        std::vector<T> const& level = levels_[tile.depth];
        std::size_t const first = static_cast<std::size_t>(tile.index) * kVoxelCount;
        return first < level.size() ? ConstTileData<T, side, 0>(level.data() + first) : ConstTileData<T, side, 0>();
    }

    int side() const noexcept { return side_; }
    /// All values of a depth, tile after tile, for those who fill them. Empty, or as long as there are tiles.
    std::vector<T>& values(int depth) { return levels_[static_cast<std::size_t>(depth)]; }
    std::vector<T> const& values(int depth) const { return levels_[static_cast<std::size_t>(depth)]; }

private:
    int side_;
    std::array<std::vector<T>, Traits::kDepthCount> levels_;
};

}
