#pragma once

#include <TessaraGeometryVolume/Export.h>
#include <TessaraGeometryVolume/Tile.h>

#include <array>
#include <vector>

namespace TSR::TileTree3D {

/// Describes the finer tiles in a coarse tile, if most of them are equal: the coarse tile is cut into parts along each
/// axis, and all finer tiles in the same three parts have the same values.
struct Division {
    std::array<std::vector<std::uint32_t>, 3> begins; // of parts, in finer tiles from the coarse tile's lower corner
    std::vector<std::uint32_t> tiles; // by part, x fastest: index of a repeated tile, or `kNoRepeated`

    static constexpr std::uint32_t kNoRepeated = ~std::uint32_t{0};
};

/// A tree of tiles: the parts of space in which a volume has values. Any number of threads may read it at once, each
/// with its own accessors.
template <class Traits> class TESSARAGEOMETRYVOLUME_EXPORT Container {
public:
    using TileType = Tile<Traits, Traits::kChildCount>;
    class ConstTileAccessor;

    /// For an index that repeated tiles share, the first of them. \pre  the tile exists
    TileType const& tile(std::uint64_t index, int depth) const
    {
        if (index >= kFirstRepeated)
            return repeated_[static_cast<std::size_t>(index - kFirstRepeated)];
        return levels_[static_cast<std::size_t>(depth)].tiles[static_cast<std::size_t>(index)];
    }

    /// An invalid tile if the index is invalid.
    TileType const& tile(TreeIndex index) const
    {
        return index.isValid() ? tile(index.index, static_cast<int>(index.depth)) : noTile();
    }

    std::size_t tileCount(int depth) const { return levels_[static_cast<std::size_t>(depth)].tiles.size(); }
    /// The number of indices of repeated tiles, which are all of one depth.
    std::uint32_t repeatedCount() const noexcept { return static_cast<std::uint32_t>(repeated_.size()); }
    int repeatedDepth() const noexcept { return repeatedDepth_; }
    /// Of tiles of all depths, including the hash tables.
    std::size_t memoryInBytes() const;

    /// The tile of exactly this depth that contains the index; an invalid one if there is none.
    TileType const& find(std::int64_t i, std::int64_t j, std::int64_t k, int depth) const;

    /// The tile of this depth that contains the index. Adds one without values if there is none.
    /// \pre     the index fits 32 bits, and no other thread uses the container
    /// \return  its number among the tiles of this depth
    /// \throws  std::bad_alloc  also for 2^31 tiles; the container is unchanged then
    std::uint32_t findOrInsert(std::int64_t i, std::int64_t j, std::int64_t k, int depth, bool& isNew);

    /// Marks a tile as having values of its own.
    void setTerminal(std::uint32_t index, int depth);
    /// Adds missing parents, up to depth 0.
    void completeParents();

    /// Adds an index of repeated tiles. \param i, j, k  the lower corner of the first of them
    std::uint32_t addRepeated(std::int64_t i, std::int64_t j, std::int64_t k, int depth);
    /// \return  the number for `divide`
    std::int32_t addDivision(Division division);
    /// Makes a tile answer lookups of finer tiles from the division. \pre  no finer tile is inside
    void divide(std::uint32_t index, int depth, std::int32_t division);

private:
    struct Level {
        std::vector<TileType> tiles;
        std::vector<std::uint32_t> slots; // numbers of tiles by hash; the size is a power of two
    };

    static TileType const& noTile();
    static bool contains(TileType const& tile, std::int64_t i, std::int64_t j, std::int64_t k) noexcept
    {
        // A negative distance becomes a large unsigned one.
        auto const width = static_cast<std::uint64_t>(Traits::tileWidth(tile.depth));
        return static_cast<std::uint64_t>(i - tile.i) < width && static_cast<std::uint64_t>(j - tile.j) < width
            && static_cast<std::uint64_t>(k - tile.k) < width;
    }
    TileType const& repeatedTile(
        TileType const& divided, std::int64_t i, std::int64_t j, std::int64_t k, TileType& room) const;
    static std::size_t slotOf(Level const& level, std::int64_t i, std::int64_t j, std::int64_t k);
    static void doubleSlots(Level& level);

    std::array<Level, Traits::kDepthCount> levels_;
    std::uint32_t terminalDepths_ = 0; // bit d: some tile of depth d has values of its own, or a division
    std::vector<TileType> repeated_;
    std::vector<Division> divisions_;
    int repeatedDepth_ = Traits::kDepthCount;
};

/// A cursor that remembers its last tile, so that a lookup in the same tile costs a few comparisons. Cheap to copy. For
/// one thread; the container must outlive it.
template <class Traits> class TESSARAGEOMETRYVOLUME_EXPORT Container<Traits>::ConstTileAccessor {
public:
    explicit ConstTileAccessor(Container const& container) noexcept
        : container_(&container)
        , tile_(&noTile())
    {
    }
    /// The copy remembers no tile.
    ConstTileAccessor(ConstTileAccessor const& other) noexcept
        : ConstTileAccessor(*other.container_)
    {
    }
    ConstTileAccessor& operator=(ConstTileAccessor const& other) noexcept
    {
        container_ = other.container_;
        tile_ = &noTile();
        return *this;
    }

    /// The tile at `depth` that contains the index. If there is none, the deepest coarser one with values of its own,
    /// which apply to everything inside it. If there is none either, or if the layout does not have this depth, a tile
    /// whose valid flag is false. A reference to a repeated tile is valid until the next call.
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
            && (tile_->depth == depth
                || (tile_->depth < depth && tile_->isTerminal && !tile_->hasChildren && tile_->division < 0));
    }
    TileType const& lookUp(int i, int j, int k, int depth);

    Container const* container_;
    TileType const* tile_;
    TileType repeated_;
};

extern template class TESSARAGEOMETRYVOLUME_EXPORT Container<Traits2>;
extern template class TESSARAGEOMETRYVOLUME_EXPORT Container<Traits5>;

}
