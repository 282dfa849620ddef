#pragma once

#include <TessaraGeometryVolume/TileTraits.h>

namespace TSR::TileTree3D {

/// The lowest index of repeated tiles; stored tiles have lower indices.
inline constexpr std::uint32_t kFirstRepeated = std::uint32_t{1} << 31;

/// A tile in a tree with `childCount` children per tile, whatever their arrangement. Invalid by default; a cursor
/// without a tile points to an invalid one.
template <int childCount> struct TileBinaryNonCompatible {
    // The corner with the lowest indices: a multiple of the tile's width, so perhaps below the range of 32 bits.
    std::int64_t i = 0, j = 0, k = 0;
    std::int64_t parent = -1; // among the tiles one depth up; negative if none
    std::uint32_t index = 0; // among the tiles of its depth; repeated tiles share one from `kFirstRepeated` on
    std::int32_t depth = -1;
    bool valid = false;
    bool isTerminal = false; // has values of its own; if the tree ends here, they apply at all deeper depths
    bool hasChildren = false;
    // One of many tiles with the same values. It is not stored, but valid until the next lookup of the accessor.
    bool isRepeated = false;
    std::int32_t division = -1; // the container's division that describes the finer tiles inside; negative if none

    /// Invalid if this tile is.
    TreeIndex treeIndex() const noexcept
    {
        return valid ? TreeIndex{index, static_cast<std::uint32_t>(depth)} : TreeIndex();
    }
};

template <class Traits, int childCount> struct Tile : TileBinaryNonCompatible<childCount> {
    static_assert(childCount == Traits::kChildCount);

    /// Invalid at depth 0.
    TreeIndex parentTreeIndex() const noexcept
    {
        if (!this->valid || this->parent < 0)
            return {};
        return {static_cast<std::uint64_t>(this->parent), static_cast<std::uint32_t>(this->depth - 1)};
    }

    /// The position of this tile in its parent: 0 to `kChildrenPerAxis` - 1 along each axis.
    IJK childIJK() const noexcept
    {
        std::int64_t const width = Traits::tileWidth(this->depth);
        return {placeAmongSiblings(this->i / width), placeAmongSiblings(this->j / width),
            placeAmongSiblings(this->k / width)};
    }

private:
    // Of a tile's number along an axis, which may be negative.
    static int placeAmongSiblings(std::int64_t number) noexcept
    {
        std::int64_t const remainder = number % Traits::kChildrenPerAxis;
        return static_cast<int>(remainder < 0 ? remainder + Traits::kChildrenPerAxis : remainder);
    }
};

}
