#pragma once

#include "haloTiles.h"

#include <Modeling/detail/VoxelSamplerState.h>

#include <algorithm>
#include <cstdint>

/// Halos (copies of tiles with a layer of voxels around them): how they are filled, and a cache of the last one of each
/// depth, which single samples read.
namespace TSR::TileTree3D::Internal {

inline int clampedIndex(std::int64_t index)
{
    return static_cast<int>(std::clamp<std::int64_t>(index, INT32_MIN, INT32_MAX));
}

/// Fills the halo of a tile from the volume. A tile whose parent has data needs the parent's halo, which is cached.
template <class Traits>
void fillHalo(LinearSamplerState<Traits>& state, TileOf<Traits> const& tile, PositiveHalo<Traits>& halo);
template <class Traits>
void fillHalo(LinearSamplerState<Traits>& state, TileOf<Traits> const& tile, FullHalo<Traits>& halo);

/// The slot of the halo with a key; `kNoSlot` if it is not cached.
template <class Traits, class Cache>
std::uint32_t findHalo(LinearSamplerState<Traits>& state, std::uint64_t key, int depth, Cache& cache)
{
    auto const slot = static_cast<std::uint32_t>(depth);
    if (state.lastKey[slot] == key)
        return state.lastSlot[slot];
    if (cache.empty() || cache[slot].key != key)
        return LinearSamplerState<Traits>::kNoSlot;
    cache[slot].stamp = state.stamp;
    state.lastKey[slot] = key;
    return state.lastSlot[slot] = slot;
}

/// Builds the halo of a tile in place of the last one of its depth. \return its slot
template <class Traits, class Cache>
std::uint32_t buildHalo(LinearSamplerState<Traits>& state, TileOf<Traits> const& tile, Cache& cache)
{
    if (cache.empty())
        cache = Cache(TileLayout<Traits>::kDepthCount);
    auto const number = static_cast<std::uint32_t>(tile.depth);
    auto& slot = cache[number];
    slot.stamp = state.stamp;
    fillHalo(state, tile, slot.halo);
    slot.key = tile.treeIndex().index;
    state.lastKey[number] = slot.key;
    return state.lastSlot[number] = number;
}

/// The halo of a tile, built unless it is cached.
/// \param cache  one of the two of `state`
template <class Traits, class Cache>
auto const& haloOf(LinearSamplerState<Traits>& state, TileOf<Traits> const& tile, Cache& cache)
{
    std::uint32_t slot = findHalo(state, tile.treeIndex().index, tile.depth, cache);
    if (slot == LinearSamplerState<Traits>::kNoSlot)
        slot = buildHalo(state, tile, cache);
    return cache[slot].halo;
}

}
