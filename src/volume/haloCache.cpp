#include "haloCache.h"

#include "frame/Assert.h"

#include <TessaraGeometryVolume/HaloTile.h>

namespace TSR::TileTree3D::Internal {

namespace {

    /// The distance at which the neighbors of a tile are looked up, in index units. It does not depend on the depth.
    template <class Traits> constexpr int kNeighborStep = 0;
    template <> constexpr int kNeighborStep<Traits2> = 2;
    template <> constexpr int kNeighborStep<Traits5> = 5;

    constexpr int kTrilinear = 2; // how the host blends values of the parent

    /// Whether the parent can supply values around the tile.
    template <class Traits> bool drawsOnParent(LinearSamplerState<Traits> const& state, TileOf<Traits> const& tile)
    {
        return tile.depth != 0 && tile.parent >= 0 && tile.depth > state.coarsestDepth;
    }

    /// The data of the tiles of this depth at a fixed distance, which makes a wider tile its own upper neighbor:
    /// existing volumes depend on it.
    template <class Traits>
    TilesAround<Traits> tilesAround(LinearSamplerState<Traits>& state, TileOf<Traits> const& tile)
    {
        auto const contains = [](std::int64_t begin, std::int64_t index, int depth) {
            return begin <= index && index < begin + TileLayout<Traits>::tileWidth(depth);
        };
        TilesAround<Traits> around;
        std::size_t number = 0;
        for (int dz = -1; dz <= 1; ++dz)
            for (int dy = -1; dy <= 1; ++dy)
                for (int dx = -1; dx <= 1; ++dx, ++number) {
                    constexpr std::int64_t kStep = kNeighborStep<Traits>;
                    std::int64_t const i = tile.i + dx * kStep, j = tile.j + dy * kStep, k = tile.k + dz * kStep;
                    // The outermost tiles extend beyond 32-bit indices. The clamped index is still in the same tile.
                    auto const& found =
                        state.neighbors.tileImpl(clampedIndex(i), clampedIndex(j), clampedIndex(k), tile.depth);
                    if (found.depth == tile.depth && contains(found.i, i, found.depth)
                        && contains(found.j, j, found.depth) && contains(found.k, k, found.depth))
                        around[number] = state.channel->tileData(found.treeIndex());
                }
        return around;
    }

}

template <class Traits>
void fillHalo(LinearSamplerState<Traits>& state, TileOf<Traits> const& tile, PositiveHalo<Traits>& halo)
{
    MODELING_ASSERT(tile.valid && tile.depth < TileLayout<Traits>::kDepthCount);
    auto const fill = [&](TileOf<Traits> const* parent, decltype(halo.voxels) const& parentVoxels) {
        setHaloTile<Traits>(tile, parent, *state.channel, parentVoxels, kTrilinear, state.neighbors, halo.voxels);
    };
    if (drawsOnParent(state, tile)) {
        auto const& parent = state.container->tile(tile.parentTreeIndex());
        fill(&parent, haloOf(state, parent, state.positiveHaloCache).voxels);
    } else {
        fill(nullptr, {});
    }
    if constexpr (!HasAddress<decltype(halo.voxels)>)
        if (state.channel->tileData(tile.treeIndex()))
            halo.copyVoxels();
}

template <class Traits>
void fillHalo(LinearSamplerState<Traits>& state, TileOf<Traits> const& tile, FullHalo<Traits>& halo)
{
    MODELING_ASSERT(tile.valid && tile.depth < TileLayout<Traits>::kDepthCount);
    auto const own = state.channel->tileData(tile.treeIndex());
    if (!own) {
        halo.clear();
        return;
    }
    if (!drawsOnParent(state, tile)) {
        fillHaloFromTile<Traits>(state.offsetType, state.background, own, halo);
        return;
    }
    FullHalo<Traits> const& parentHalo =
        haloOf(state, state.container->tile(tile.parentTreeIndex()), state.fullHaloCache);
    fillHaloFromNeighbours<Traits>(state.offsetType, halo, tile.childIJK(), tilesAround(state, tile), parentHalo);
}

template void fillHalo(LinearSamplerState<Traits2>&, TileOf<Traits2> const&, PositiveHalo<Traits2>&);
template void fillHalo(LinearSamplerState<Traits5>&, TileOf<Traits5> const&, PositiveHalo<Traits5>&);
template void fillHalo(LinearSamplerState<Traits2>&, TileOf<Traits2> const&, FullHalo<Traits2>&);
template void fillHalo(LinearSamplerState<Traits5>&, TileOf<Traits5> const&, FullHalo<Traits5>&);

}
