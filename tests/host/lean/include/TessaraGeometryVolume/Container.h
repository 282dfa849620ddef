#pragma once

#include <TessaraGeometryVolume/Tile.h>

#include <map>
#include <tuple>
#include <vector>

namespace TSR::TileTree3D {

template <class> class Container;

/// Tiles of all depths, found in a map by depth and lower corner.
template <int childrenPerAxis, int voxelsPerAxis, int a, int b>
class Container<Traits<childrenPerAxis, voxelsPerAxis, a, b>> {
    using Place = std::tuple<int, int, int, int>;

public:
    using TraitsType = Traits<childrenPerAxis, voxelsPerAxis, a, b>;
    using TileInMap = Tile<TraitsType, childrenPerAxis * childrenPerAxis * childrenPerAxis>;

    class ConstTileAccessor {
    public:
        explicit ConstTileAccessor(Container const& container)
            : container_(&container)
        {
        }
        TileInMap const& tileImpl(int i, int j, int k, int depth)
        {
            auto const found = container_->numbers_.find(container_->placeOf(i, j, k, depth));
            return found == container_->numbers_.end() ? container_->none_ : container_->tile(found->second, depth);
        }

    private:
        Container const* container_;
    };

    TileInMap const& tile(std::uint64_t index, int depth) const
    {
        return tiles_.at(static_cast<std::size_t>(depth)).at(static_cast<std::size_t>(index));
    }
    TileInMap const& tile(TreeIndex index) const { return tile(index.index, static_cast<int>(index.depth)); }

    /// For tests: adds the tile of this depth that contains the index, and those above it. \return its tree index
    TreeIndex add(int i, int j, int k, int depth)
    {
        Place const place = placeOf(i, j, k, depth);
        if (auto const found = numbers_.find(place); found != numbers_.end())
            return tile(found->second, depth).treeIndex();
        TileInMap added;
        added.depth = depth;
        added.valid = true;
        std::tie(std::ignore, added.i, added.j, added.k) = place;
        if (depth > 0) {
            TileInMap const& parent = tile(add(i, j, k, depth - 1));
            int const width = widthAt(depth);
            added.parent = static_cast<std::int64_t>(parent.number);
            added.inParent = {(added.i - parent.i) / width, (added.j - parent.j) / width, (added.k - parent.k) / width};
        }
        if (tiles_.size() <= static_cast<std::size_t>(depth))
            tiles_.resize(static_cast<std::size_t>(depth) + 1);
        auto& level = tiles_[static_cast<std::size_t>(depth)];
        added.number = level.size();
        numbers_[place] = added.number;
        level.push_back(added);
        return added.treeIndex();
    }

    /// Tiles are one index unit wide at the deepest depth: 30 with 2 children per axis, 13 with 5.
    static int widthAt(int depth)
    {
        int width = 1;
        for (int deeper = childrenPerAxis == 2 ? 30 : 13; deeper > depth; --deeper)
            width *= childrenPerAxis;
        return width;
    }

private:
    static Place placeOf(int i, int j, int k, int depth)
    {
        int const width = widthAt(depth);
        auto const lower = [=](int index) { return (index / width - (index % width < 0 ? 1 : 0)) * width; };
        return {depth, lower(i), lower(j), lower(k)};
    }

    std::vector<std::vector<TileInMap>> tiles_; // by depth
    std::map<Place, std::uint64_t> numbers_;
    TileInMap none_;
};

}
