#pragma once

#include <TessaraGeometryVolume/TileTraits.h>

namespace TSR::TileTree3D {

template <int childCount> struct TileBinaryNonCompatible {
    std::uint64_t number = ~std::uint64_t{0};
    int i = 0, j = 0, k = 0;
    int depth = -1;
    std::int64_t parent = -1;
    bool valid = false;

    TreeIndex treeIndex() const
    {
        return valid ? TreeIndex{number, static_cast<std::uint32_t>(depth)} : TreeIndex{~0ull, ~0u};
    }
};

template <class Traits, int childCount> struct Tile : TileBinaryNonCompatible<childCount> {
    TreeIndex parentTreeIndex() const
    {
        return this->parent < 0
            ? TreeIndex{~0ull, ~0u}
            : TreeIndex{static_cast<std::uint64_t>(this->parent), static_cast<std::uint32_t>(this->depth - 1)};
    }
    IJK childIJK() const { return inParent; }

    IJK inParent{};
};

}
