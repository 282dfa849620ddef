#include <TessaraGeometryVolume/HaloTile.h>

#include <algorithm>
#include <utility>

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

    /// Which of the upper neighbors: 0 or 1 along each axis. A type, so that loops over regions have constant bounds.
    template <int across> struct Direction {
        static constexpr int i = across & 1, j = across >> 1 & 1, k = across >> 2 & 1;
    };

    template <class Visit, int... numbers>
    void visitDirections(Visit const& visit, std::integer_sequence<int, numbers...>)
    {
        (visit(Direction<numbers + 1>()), ...);
    }

    /// Calls `rule(i, j, k)` for the voxels of a halo across a face, an edge or the corner: along each axis either the
    /// one after the end, or all inside.
    template <class Traits, int across, class Rule> void forEachVoxelAcross(Direction<across> step, Rule const& rule)
    {
        constexpr int kSide = Traits::kSide;
        for (int k = step.k * kSide; k < kSide + step.k; ++k)
            for (int j = step.j * kSide; j < kSide + step.j; ++j)
                for (int i = step.i * kSide; i < kSide + step.i; ++i)
                    rule(i, j, k);
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
    float* const halo = &out(0);
    auto const outAt = [=](int i, int j, int k) -> float& { return halo[i + (j + k * (kSide + 1)) * (kSide + 1)]; };
    auto const valueOf = [](float const* values, int i, int j, int k) { return values[i + (j + k * kSide) * kSide]; };
    forEachVoxelAcross<Traits>(
        Direction<0>(), [&](int i, int j, int k) { outAt(i, j, k) = valueOf(own.values(), i, j, k); });
    bool const hasParent = parentTile && parentHalo;
    IJK const child = tile.childIJK();
    auto const fillAcross = [&]<int across>(Direction<across> step) {
        auto const& found = tileAcross<Traits>(tile, {step.i, step.j, step.k}, accessor);
        auto const data = channel.tileData(found.treeIndex());
        if (data && found.depth == tile.depth)
            forEachVoxelAcross<Traits>(step, [&](int i, int j, int k) {
                outAt(i, j, k) = valueOf(data.values(), i - step.i * kSide, j - step.j * kSide, k - step.k * kSide);
            });
        else if (data && found.depth < tile.depth && hasParent)
            forEachVoxelAcross<Traits>(step, [&](int i, int j, int k) {
                outAt(i, j, k) = valueOfParent<Traits>(parentHalo, child, {i, j, k}, order);
            });
        else
            forEachVoxelAcross<Traits>(step, [&](int i, int j, int k) {
                outAt(i, j, k) =
                    valueOf(own.values(), std::min(i, kSide - 1), std::min(j, kSide - 1), std::min(k, kSide - 1));
            });
    };
    visitDirections(fillAcross, std::make_integer_sequence<int, 7>());
}

template void setHaloTile<Traits2>(Container<Traits2>::TileType const&, Container<Traits2>::TileType const*,
    Channel<Traits2, float> const&, PositiveHalo<Traits2> const&, int, Container<Traits2>::ConstTileAccessor&,
    PositiveHalo<Traits2>&);
template void setHaloTile<Traits5>(Container<Traits5>::TileType const&, Container<Traits5>::TileType const*,
    Channel<Traits5, float> const&, PositiveHalo<Traits5> const&, int, Container<Traits5>::ConstTileAccessor&,
    PositiveHalo<Traits5>&);

}
