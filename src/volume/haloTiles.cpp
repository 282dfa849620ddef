#include "haloTiles.h"

#include <algorithm>

// How the parent's values are blended
//
// Along an axis, take the parent's values a tile's width apart: one for the previous tile (a), one for the tile itself
// (b), and one for the next tile (c). With a clear bit of the offset type they are at the middle, each the mean of the
// parent's voxels that its tile covers; with a set bit they are at the lower side, each the parent's voxel at that place.
// For tiles of 4 voxels:
//
//                previous tile         tile             next tile
//              |               |               |               |
//   clear bit  |       a       |       b       |       c       |
//              | .   .   .  -1 | 0   1   2   3 | 4   .   .   . |
//
//     -1: 0.625 a + 0.375 b    0: 0.375 a + 0.625 b    1: 0.125 a + 0.875 b
//      2: 1.125 b - 0.125 a    3: 0.375 c + 0.625 b    4: 0.625 c + 0.375 b
//
//   set bit    a               b               c
//              .   .   .  -1   0   1   2   3   4   .   .   .
//
//     -1: 0.25 a + 0.75 b    0: b    1: 0.25 c + 0.75 b    2: 0.5 c + 0.5 b    3: 0.75 c + 0.25 b    4: c
//
// Voxel 2 of the clear axis continues the line from a through b, so that values up to there depend on two of the
// parent's only. Tiles of 5 voxels use fifths in the same way, with b alone in the middle. In three dimensions the blend
// is the product of those along the axes. What the parent's own halo does not cover (half of a tile before its first
// child, or after its last) is extrapolated linearly. Blends are written as differences, so that those of equal values
// are that value to the bit.

namespace TSR::TileTree3D::Internal {

namespace {

    /// first * (1 - share) + second * share
    struct Blend {
        int first, second;
        float share;
    };

    bool isAtLowerSide(unsigned int offsetType, int axis)
    {
        return offsetType >> axis & 1;
    }

    /// Voxel -1 to `side` as a blend of the values of the previous tile, the tile and the next tile: 0, 1, 2.
    Blend blendOfVoxel(bool atLowerSide, int side, int voxel)
    {
        auto const width = static_cast<float>(side);
        // Tile widths from b.
        float const distance =
            atLowerSide ? static_cast<float>(voxel) / width : (static_cast<float>(2 * voxel + 1) - width) / (2 * width);
        bool const continuesLine = !atLowerSide && 2 * voxel == side;
        if (distance < 0 || continuesLine)
            return {1, 0, -distance};
        return {1, 2, distance};
    }

    /// The value for a tile, `tile` tiles away from the child, as a blend of voxels of the parent's halo.
    template <class Traits> Blend blendOfParent(bool atLowerSide, int child, int tile)
    {
        constexpr int kCovered = TileLayout<Traits>::kParentVoxels;
        static_assert(kCovered <= 2);
        int const first = (child + tile) * kCovered;
        int const last = first + kCovered - 1;
        if (first < -1) // extrapolates through the first two
            return {-1, 0, atLowerSide ? -1 : -0.5f};
        if (atLowerSide || kCovered == 1)
            return {first, first, 0};
        if (last > TileLayout<Traits>::kSide)
            return {TileLayout<Traits>::kSide, TileLayout<Traits>::kSide - 1, -0.5f};
        return {first, last, 0.5f};
    }

    using Triple = std::array<Blend, 3>; // one per axis

    template <class ValueAt> float blended(Triple const& axes, ValueAt const& valueAt)
    {
        auto const mix = [](float first, float second, float share) { return first + (second - first) * share; };
        auto const alongX = [&](int j, int k) {
            return mix(valueAt(axes[0].first, j, k), valueAt(axes[0].second, j, k), axes[0].share);
        };
        auto const alongY = [&](int k) {
            return mix(alongX(axes[1].first, k), alongX(axes[1].second, k), axes[1].share);
        };
        return mix(alongY(axes[2].first), alongY(axes[2].second), axes[2].share);
    }

    /// The parent's values for the tile and those around it.
    using CoarseValues = std::array<float, 27>;

    int indexAround(int i, int j, int k)
    {
        return i + j * 3 + k * 9;
    }

    template <class Traits>
    CoarseValues coarseValues(unsigned int offsetType, IJK child, FullHalo<Traits> const& parentHalo)
    {
        CoarseValues values{};
        auto const valueOfParent = [&](int i, int j, int k) { return parentHalo(i, j, k); };
        for (int k = -1; k <= 1; ++k)
            for (int j = -1; j <= 1; ++j)
                for (int i = -1; i <= 1; ++i)
                    values[static_cast<std::size_t>(indexAround(i + 1, j + 1, k + 1))] =
                        blended({blendOfParent<Traits>(isAtLowerSide(offsetType, 0), child.i, i),
                                    blendOfParent<Traits>(isAtLowerSide(offsetType, 1), child.j, j),
                                    blendOfParent<Traits>(isAtLowerSide(offsetType, 2), child.k, k)},
                            valueOfParent);
        return values;
    }

    /// -1, 0 or 1: whether a coordinate of a halo tile is below the tile, inside or above it.
    template <class Traits> int sideOf(int coordinate)
    {
        return coordinate < 0 ? -1 : coordinate >= TileLayout<Traits>::kSide ? 1 : 0;
    }

    template <class Traits> int nearestInside(int coordinate)
    {
        return std::clamp(coordinate, 0, TileLayout<Traits>::kSide - 1);
    }

    template <class Traits, class Rule> void forEachHaloVoxel(Rule const& rule)
    {
        for (int k = -1; k <= TileLayout<Traits>::kSide; ++k)
            for (int j = -1; j <= TileLayout<Traits>::kSide; ++j)
                for (int i = -1; i <= TileLayout<Traits>::kSide; ++i)
                    rule(i, j, k, IJK{sideOf<Traits>(i), sideOf<Traits>(j), sideOf<Traits>(k)});
    }

    template <class Traits> float continuedLine(TileValues<Traits> tile, int i, int j, int k, IJK side)
    {
        int const x = nearestInside<Traits>(i), y = nearestInside<Traits>(j), z = nearestInside<Traits>(k);
        return 2 * tile(x, y, z) - tile(x - side.i, y - side.j, z - side.k);
    }

}

template <class Traits>
void fillHaloFromTile(unsigned int offsetType, float background, TileValues<Traits> tile, FullHalo<Traits>& out)
{
    float const twice = background + background;
    out.reset();
    forEachHaloVoxel<Traits>([&](int i, int j, int k, IJK side) {
        // The bits of the axes along which this voxel is outside.
        unsigned int const outside = (side.i ? 1u : 0u) | (side.j ? 2u : 0u) | (side.k ? 4u : 0u);
        float const nearest = tile(nearestInside<Traits>(i), nearestInside<Traits>(j), nearestInside<Traits>(k));
        // Existing volumes depend on it, even though it discards values of the tile.
        bool const isFirstLayer =
            !outside && ((offsetType & 1 && i == 0) || (offsetType & 2 && j == 0) || (offsetType & 4 && k == 0));
        if (outside & offsetType || isFirstLayer)
            out(i, j, k) = background;
        else
            out(i, j, k) = outside ? twice - nearest : nearest;
    });
}

template <class Traits> void fillHaloFromNeighbours(unsigned int offsetType, FullHalo<Traits>& out, IJK child,
    TilesAround<Traits> const& around, FullHalo<Traits> const& parentHalo)
{
    constexpr int kSide = TileLayout<Traits>::kSide;
    bool const isSurrounded = std::all_of(around.begin(), around.end(), [](TileValues<Traits> tile) { return !!tile; });
    CoarseValues const coarse =
        parentHalo && !isSurrounded ? coarseValues<Traits>(offsetType, child, parentHalo) : CoarseValues{};
    auto const coarseValue = [&](int i, int j, int k) {
        return coarse[static_cast<std::size_t>(indexAround(i, j, k))];
    };
    TileValues<Traits> const own = around[13];
    out.reset();
    forEachHaloVoxel<Traits>([&](int i, int j, int k, IJK side) {
        TileValues<Traits> const tile =
            around[static_cast<std::size_t>(indexAround(side.i + 1, side.j + 1, side.k + 1))];
        if (tile)
            out(i, j, k) = tile(i - side.i * kSide, j - side.j * kSide, k - side.k * kSide);
        else if (parentHalo)
            out(i, j, k) = blended({blendOfVoxel(isAtLowerSide(offsetType, 0), kSide, i),
                                       blendOfVoxel(isAtLowerSide(offsetType, 1), kSide, j),
                                       blendOfVoxel(isAtLowerSide(offsetType, 2), kSide, k)},
                coarseValue);
        else
            out(i, j, k) = continuedLine<Traits>(own, i, j, k, side);
    });
}

template void fillHaloFromTile<Traits2>(unsigned int, float, TileValues<Traits2>, FullHalo<Traits2>&);
template void fillHaloFromTile<Traits5>(unsigned int, float, TileValues<Traits5>, FullHalo<Traits5>&);
template void fillHaloFromNeighbours<Traits2>(
    unsigned int, FullHalo<Traits2>&, IJK, TilesAround<Traits2> const&, FullHalo<Traits2> const&);
template void fillHaloFromNeighbours<Traits5>(
    unsigned int, FullHalo<Traits5>&, IJK, TilesAround<Traits5> const&, FullHalo<Traits5> const&);

}
