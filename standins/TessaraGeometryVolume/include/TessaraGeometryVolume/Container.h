#pragma once

#include <TessaraGeometryVolume/Export.h>
#include <TessaraGeometryVolume/Tile.h>

#include <array>
#include <vector>

namespace TSR::TileTree3D {

/// A tree of tiles: which parts of space a volume has values in. Any number of threads may read it at once, each with
/// accessors of its own.
template <class Traits> class TESSARAGEOMETRYVOLUME_EXPORT Container {
public:
    using TileType = Tile<Traits, Traits::kChildCount>;
    class ConstTileAccessor;

    /// \pre  the tile is there
    TileType const& tile(std::uint64_t index, int depth) const
    {
        return levels_[static_cast<std::size_t>(depth)].tiles[static_cast<std::size_t>(index)];
    }

    /// A tile that is not valid where there is none.
    TileType const& tile(TreeIndex index) const
    {
        return index.isValid() ? tile(index.index, static_cast<int>(index.depth)) : noTile();
    }

    std::size_t tileCount(int depth) const { return levels_[static_cast<std::size_t>(depth)].tiles.size(); }
    /// Of all depths, with the tables to find them by.
    std::size_t memoryInBytes() const;

    /// The tile of exactly this depth that contains the index; one that is not valid where there is none.
    TileType const& find(std::int64_t i, std::int64_t j, std::int64_t k, int depth) const;

    /// The tile of this depth that contains the index, made with its values to come when it is not there.
    /// \pre     the index fits 32 bits, and nothing else uses the container
    /// \return  its number among the tiles of this depth
    /// \throws  std::bad_alloc  also for 2^32 - 1 tiles; nothing has changed then
    std::uint32_t findOrInsert(std::int64_t i, std::int64_t j, std::int64_t k, int depth, bool& isNew);

    /// Makes a tile one that has values of its own.
    void setTerminal(std::uint32_t index, int depth);
    /// Makes the parents that are missing, up to depth 0.
    void completeParents();

private:
    struct Level {
        std::vector<TileType> tiles;
        std::vector<std::uint32_t> slots; // numbers of tiles by hash; a power of two of them
    };

    static TileType const& noTile();
    static std::size_t firstSlot(Level const& level, std::int64_t i, std::int64_t j, std::int64_t k);
    static void growSlots(Level& level);

    std::array<Level, Traits::kDepthCount> levels_;
    std::uint32_t terminalDepths_ = 0; // bit d: some tile of depth d has values of its own
};

/// A cursor that remembers the tile it was at, so that the next look-up nearby costs a comparison. Cheap to copy; it is
/// for one thread, and for the container's life.
template <class Traits> class TESSARAGEOMETRYVOLUME_EXPORT Container<Traits>::ConstTileAccessor {
public:
    explicit ConstTileAccessor(Container const& container) noexcept
        : container_(&container)
        , tile_(&noTile())
    {
    }

    /// The tile at `depth` that contains the index. Where there is none, the deepest one above it with values of its
    /// own, which stand for all that is deeper. Otherwise, and for a depth that the layout does not have, one whose
    /// valid flag is false.
    TileType const& tileImpl(int i, int j, int k, int depth)
    {
        if (!(isAnswerAt(depth) && contains(*tile_, i, j, k)))
            tile_ = &lookUp(i, j, k, depth);
        return *tile_;
    }

private:
    bool isAnswerAt(int depth) const noexcept
    {
        return tile_->valid && depth <= Traits::kDeepest
            && (tile_->depth == depth || (tile_->depth < depth && tile_->isTerminal && !tile_->hasChildren));
    }
    static bool contains(TileType const& tile, std::int64_t i, std::int64_t j, std::int64_t k) noexcept
    {
        // A distance below 0 is a large one without a sign.
        auto const width = static_cast<std::uint64_t>(Traits::tileWidth(tile.depth));
        return static_cast<std::uint64_t>(i - tile.i) < width && static_cast<std::uint64_t>(j - tile.j) < width
            && static_cast<std::uint64_t>(k - tile.k) < width;
    }
    TileType const& lookUp(int i, int j, int k, int depth) const;

    Container const* container_;
    TileType const* tile_;
};

extern template class TESSARAGEOMETRYVOLUME_EXPORT Container<Traits2>;
extern template class TESSARAGEOMETRYVOLUME_EXPORT Container<Traits5>;

}
