#include <TessaraGeometryVolume/Container.h>

#include <new>

namespace TSR::TileTree3D {

using Internal::floorDivide;

namespace {

    constexpr std::uint32_t kNoTile = ~std::uint32_t{0};

    template <class Traits> std::int64_t tileOrigin(std::int64_t index, int depth)
    {
        std::int64_t const width = Traits::tileWidth(depth);
        if constexpr ((Traits::kChildrenPerAxis & (Traits::kChildrenPerAxis - 1)) == 0)
            return index & -width; // a power of two
        else
            return floorDivide(index, width) * width;
    }

    // Neighbours differ in few bits, and not in the lowest ones: all bits have to reach the upper ones.
    std::uint64_t hashOf(std::int64_t i, std::int64_t j, std::int64_t k)
    {
        auto hash = static_cast<std::uint64_t>(i) * 0x9E3779B97F4A7C15u;
        hash = (hash ^ (hash >> 32) ^ static_cast<std::uint64_t>(j)) * 0xC2B2AE3D27D4EB4Fu;
        hash = (hash ^ (hash >> 32) ^ static_cast<std::uint64_t>(k)) * 0x165667B19E3779F9u;
        return hash ^ (hash >> 32);
    }

}

template <class Traits> auto Container<Traits>::noTile() -> TileType const&
{
    static constexpr TileType kNone{};
    return kNone;
}

template <class Traits>
std::size_t Container<Traits>::firstSlot(Level const& level, std::int64_t i, std::int64_t j, std::int64_t k)
{
    return static_cast<std::size_t>(hashOf(i, j, k)) & (level.slots.size() - 1);
}

template <class Traits> auto Container<Traits>::find(std::int64_t i, std::int64_t j, std::int64_t k, int depth) const
    -> TileType const&
{
    Level const& level = levels_[static_cast<std::size_t>(depth)];
    if (level.tiles.empty())
        return noTile();
    i = tileOrigin<Traits>(i, depth);
    j = tileOrigin<Traits>(j, depth);
    k = tileOrigin<Traits>(k, depth);
    for (std::size_t slot = firstSlot(level, i, j, k);; slot = (slot + 1) & (level.slots.size() - 1)) {
        if (level.slots[slot] == kNoTile)
            return noTile();
        TileType const& tile = level.tiles[level.slots[slot]];
        if (tile.i == i && tile.j == j && tile.k == k)
            return tile;
    }
}

/// Never more than half of the slots are taken, so that searches are short.
template <class Traits> void Container<Traits>::growSlots(Level& level)
{
    if (2 * (level.tiles.size() + 1) <= level.slots.size())
        return;
    Level grown;
    grown.slots.assign(level.slots.empty() ? 8 : 2 * level.slots.size(), kNoTile);
    for (TileType const& tile : level.tiles) {
        std::size_t slot = firstSlot(grown, tile.i, tile.j, tile.k);
        while (grown.slots[slot] != kNoTile)
            slot = (slot + 1) & (grown.slots.size() - 1);
        grown.slots[slot] = tile.index;
    }
    level.slots = std::move(grown.slots);
}

template <class Traits>
std::uint32_t Container<Traits>::findOrInsert(std::int64_t i, std::int64_t j, std::int64_t k, int depth, bool& isNew)
{
    TileType const& known = find(i, j, k, depth);
    isNew = !known.valid;
    if (!isNew)
        return known.index;

    Level& level = levels_[static_cast<std::size_t>(depth)];
    if (level.tiles.size() >= kNoTile)
        throw std::bad_alloc();
    growSlots(level);
    TileType tile;
    tile.i = tileOrigin<Traits>(i, depth);
    tile.j = tileOrigin<Traits>(j, depth);
    tile.k = tileOrigin<Traits>(k, depth);
    tile.index = static_cast<std::uint32_t>(level.tiles.size());
    tile.depth = depth;
    tile.valid = true;
    level.tiles.push_back(tile);
    std::size_t slot = firstSlot(level, tile.i, tile.j, tile.k);
    while (level.slots[slot] != kNoTile)
        slot = (slot + 1) & (level.slots.size() - 1);
    level.slots[slot] = tile.index;
    return tile.index;
}

template <class Traits> void Container<Traits>::setTerminal(std::uint32_t index, int depth)
{
    levels_[static_cast<std::size_t>(depth)].tiles[index].isTerminal = true;
    terminalDepths_ |= std::uint32_t{1} << depth;
}

template <class Traits> void Container<Traits>::completeParents()
{
    for (int depth = Traits::kDeepest; depth > 0; --depth) {
        std::vector<TileType>& parents = levels_[static_cast<std::size_t>(depth - 1)].tiles;
        for (TileType& tile : levels_[static_cast<std::size_t>(depth)].tiles) {
            bool isNew = false;
            std::uint32_t const parent = findOrInsert(tile.i, tile.j, tile.k, depth - 1, isNew);
            parents[parent].hasChildren = true;
            tile.parent = parent;
        }
    }
}

template <class Traits> std::size_t Container<Traits>::memoryInBytes() const
{
    std::size_t bytes = sizeof(*this);
    for (Level const& level : levels_)
        bytes += level.tiles.capacity() * sizeof(TileType) + level.slots.capacity() * sizeof(std::uint32_t);
    return bytes;
}

template <class Traits> auto Container<Traits>::ConstTileAccessor::lookUp(int i, int j, int k, int depth) const
    -> TileType const&
{
    if (depth < 0 || depth > Traits::kDeepest)
        return noTile();
    if (TileType const& exact = container_->find(i, j, k, depth); exact.valid)
        return exact;
    std::uint32_t const terminalDepths = container_->terminalDepths_;
    for (int coarser = depth - 1; coarser >= 0 && terminalDepths & ((std::uint32_t{2} << coarser) - 1); --coarser) {
        if (!(terminalDepths >> coarser & 1))
            continue;
        if (TileType const& tile = container_->find(i, j, k, coarser); tile.isTerminal)
            return tile;
    }
    return noTile();
}

template class Container<Traits2>;
template class Container<Traits5>;

}
