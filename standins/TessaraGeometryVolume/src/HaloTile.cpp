#include <TessaraGeometryVolume/HaloTile.h>

#include <algorithm>

namespace TSR::TileTree3D {

namespace {

    /// The position of a tile's voxel in the parent along an axis: between a voxel and the next.
    struct PlaceInParent {
        int voxel;
        float fraction;
    };

    template <class Traits> PlaceInParent placeInParent(int child, int voxel)
    {
        constexpr int kChildren = Traits::kChildrenPerAxis;
        return {child * Traits::kParentVoxels + voxel / kChildren,
            static_cast<float>(voxel % kChildren) / static_cast<float>(kChildren)};
    }

    float blend(float from, float to, float fraction)
    {
        return (to - from) * fraction + from;
    }

    template <class Traits> float valueOfParent(PositiveHalo<Traits> const& halo, IJK child, IJK voxel, int order)
    {
        PlaceInParent const x = placeInParent<Traits>(child.i, voxel.i);
        PlaceInParent const y = placeInParent<Traits>(child.j, voxel.j);
        PlaceInParent const z = placeInParent<Traits>(child.k, voxel.k);
        if (order < 2)
            return halo(x.voxel, y.voxel, z.voxel);
        // At the last voxel there is no next one to read, and its weight would be 0.
        int const nextX = x.voxel + (x.fraction > 0), nextY = y.voxel + (y.fraction > 0),
                  nextZ = z.voxel + (z.fraction > 0);
        auto const alongX = [&](int j, int k) { return blend(halo(x.voxel, j, k), halo(nextX, j, k), x.fraction); };
        auto const alongY = [&](int k) { return blend(alongX(y.voxel, k), alongX(nextY, k), y.fraction); };
        return blend(alongY(z.voxel), alongY(nextZ), z.fraction);
    }

    template <class Traits> void copyInterior(ConstTileData<float, Traits::kSide, 0> from, PositiveHalo<Traits>& out)
    {
        for (int k = 0; k < Traits::kSide; ++k)
            for (int j = 0; j < Traits::kSide; ++j)
                for (int i = 0; i < Traits::kSide; ++i)
                    out(i, j, k) = from(i, j, k);
    }

    /// The voxels across a face, an edge or the corner: along each axis either the one after the end, or all inside.
    struct Region {
        IJK first, end;
    };

    template <class Traits> Region regionAcross(IJK direction)
    {
        constexpr int kSide = Traits::kSide;
        auto const first = [](int step) { return step * kSide; };
        auto const end = [](int step) { return kSide + step; };
        return {{first(direction.i), first(direction.j), first(direction.k)},
            {end(direction.i), end(direction.j), end(direction.k)}};
    }

    template <class Rule> void forEachVoxel(Region const& region, Rule const& rule)
    {
        for (int k = region.first.k; k < region.end.k; ++k)
            for (int j = region.first.j; j < region.end.j; ++j)
                for (int i = region.first.i; i < region.end.i; ++i)
                    rule(IJK{i, j, k});
    }

    template <class Traits>
    typename Container<Traits>::TileType const& tileAcross(typename Container<Traits>::TileType const& tile,
        IJK direction, typename Container<Traits>::ConstTileAccessor& accessor)
    {
        static constexpr typename Container<Traits>::TileType kNone{};
        std::int64_t const width = Traits::tileWidth(tile.depth);
        std::int64_t const i = tile.i + direction.i * width, j = tile.j + direction.j * width,
                           k = tile.k + direction.k * width;
        if (std::max({i, j, k}) > INT32_MAX)
            return kNone;
        // A tile may begin below the range of 32 bits. The clamped index is still in the same tile.
        auto const inRange = [](std::int64_t index) {
            return static_cast<int>(std::max<std::int64_t>(index, INT32_MIN));
        };
        return accessor.tileImpl(inRange(i), inRange(j), inRange(k), tile.depth);
    }

}

template <class Traits> void setHaloTile(typename Container<Traits>::TileType const& tile,
    typename Container<Traits>::TileType const* parentTile, Channel<Traits, float> const& channel,
    PositiveHalo<Traits> const& parentHalo, int order, typename Container<Traits>::ConstTileAccessor& accessor,
    PositiveHalo<Traits>& out)
{
    constexpr int kSide = Traits::kSide;
    auto const own = channel.tileData(tile.treeIndex());
    if (!own) {
        out.clear();
        return;
    }
    out.reset(0);
    copyInterior<Traits>(own, out);
    bool const hasParent = parentTile && parentHalo;
    IJK const child = tile.childIJK();
    for (int across = 1; across < 8; ++across) {
        IJK const direction{across & 1, across >> 1 & 1, across >> 2 & 1};
        auto const& found = tileAcross<Traits>(tile, direction, accessor);
        auto const data = channel.tileData(found.treeIndex());
        bool const isNeighbor = data && found.depth == tile.depth;
        bool const isInCoarser = data && found.depth < tile.depth && hasParent;
        forEachVoxel(regionAcross<Traits>(direction), [&](IJK voxel) {
            float& value = out(voxel.i, voxel.j, voxel.k);
            if (isNeighbor)
                value =
                    data(voxel.i - direction.i * kSide, voxel.j - direction.j * kSide, voxel.k - direction.k * kSide);
            else if (isInCoarser)
                value = valueOfParent<Traits>(parentHalo, child, voxel, order);
            else
                value = own(std::min(voxel.i, kSide - 1), std::min(voxel.j, kSide - 1), std::min(voxel.k, kSide - 1));
        });
    }
}

template void setHaloTile<Traits2>(Container<Traits2>::TileType const&, Container<Traits2>::TileType const*,
    Channel<Traits2, float> const&, PositiveHalo<Traits2> const&, int, Container<Traits2>::ConstTileAccessor&,
    PositiveHalo<Traits2>&);
template void setHaloTile<Traits5>(Container<Traits5>::TileType const&, Container<Traits5>::TileType const*,
    Channel<Traits5, float> const&, PositiveHalo<Traits5> const&, int, Container<Traits5>::ConstTileAccessor&,
    PositiveHalo<Traits5>&);

}
