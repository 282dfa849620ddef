#include <TessaraGeometryVolume/Container.h>

#include <algorithm>
#include <new>
#include <utility>

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

    // Neighbors differ in few bits, and not in the lowest ones, so all bits have to affect the upper ones.
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

/// The slot of the tile with this lower corner, or the free one where it would be.
/// \pre  the level has slots
template <class Traits>
std::size_t Container<Traits>::slotOf(Level const& level, std::int64_t i, std::int64_t j, std::int64_t k)
{
    std::size_t const mask = level.slots.size() - 1;
    for (std::size_t slot = static_cast<std::size_t>(hashOf(i, j, k)) & mask;; slot = (slot + 1) & mask) {
        if (level.slots[slot] == kNoTile)
            return slot;
        TileType const& tile = level.tiles[level.slots[slot]];
        if (tile.i == i && tile.j == j && tile.k == k)
            return slot;
    }
}

template <class Traits> auto Container<Traits>::find(std::int64_t i, std::int64_t j, std::int64_t k, int depth) const
    -> TileType const&
{
    Level const& level = levels_[static_cast<std::size_t>(depth)];
    if (level.tiles.empty())
        return noTile();
    std::size_t const slot =
        slotOf(level, tileOrigin<Traits>(i, depth), tileOrigin<Traits>(j, depth), tileOrigin<Traits>(k, depth));
    return level.slots[slot] == kNoTile ? noTile() : level.tiles[level.slots[slot]];
}

template <class Traits> void Container<Traits>::doubleSlots(Level& level)
{
    level.slots = std::vector<std::uint32_t>(std::max<std::size_t>(8, 2 * level.slots.size()), kNoTile);
    std::size_t const mask = level.slots.size() - 1;
    for (TileType const& tile : level.tiles) {
        auto slot = static_cast<std::size_t>(hashOf(tile.i, tile.j, tile.k)) & mask;
        while (level.slots[slot] != kNoTile) // no other tile is equal, so there is no need to compare
            slot = (slot + 1) & mask;
        level.slots[slot] = tile.index;
    }
}

template <class Traits>
std::uint32_t Container<Traits>::findOrInsert(std::int64_t i, std::int64_t j, std::int64_t k, int depth, bool& isNew)
{
    TileType tile;
    tile.i = tileOrigin<Traits>(i, depth);
    tile.j = tileOrigin<Traits>(j, depth);
    tile.k = tileOrigin<Traits>(k, depth);
    Level& level = levels_[static_cast<std::size_t>(depth)];
    auto const slotOfTile = [&] { return slotOf(level, tile.i, tile.j, tile.k); };
    std::size_t slot = level.slots.empty() ? 0 : slotOfTile();
    isNew = level.slots.empty() || level.slots[slot] == kNoTile;
    if (!isNew)
        return level.slots[slot];
    if (level.tiles.size() >= kFirstRepeated)
        throw std::bad_alloc();
    // At least half of the slots remain free, so that searches are short.
    if (2 * (level.tiles.size() + 1) > level.slots.size()) {
        doubleSlots(level);
        slot = slotOfTile();
    }
    tile.index = static_cast<std::uint32_t>(level.tiles.size());
    tile.depth = depth;
    tile.valid = true;
    level.tiles.push_back(tile);
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
        std::uint32_t parent = kNoTile; // of the previous tile, which mostly is the next one's as well
        for (TileType& tile : levels_[static_cast<std::size_t>(depth)].tiles) {
            bool isNew = false;
            if (parent == kNoTile || !contains(parents[parent], tile.i, tile.j, tile.k))
                parent = findOrInsert(tile.i, tile.j, tile.k, depth - 1, isNew);
            parents[parent].hasChildren = true;
            tile.parent = parent;
        }
    }
}

template <class Traits>
std::uint32_t Container<Traits>::addRepeated(std::int64_t i, std::int64_t j, std::int64_t k, int depth)
{
    if (repeated_.size() >= kNoTile - kFirstRepeated)
        throw std::bad_alloc();
    TileType tile;
    tile.i = i;
    tile.j = j;
    tile.k = k;
    tile.index = kFirstRepeated + static_cast<std::uint32_t>(repeated_.size());
    tile.depth = depth;
    tile.valid = tile.isTerminal = tile.isRepeated = true;
    repeated_.push_back(tile);
    repeatedDepth_ = depth;
    return tile.index;
}

template <class Traits> std::int32_t Container<Traits>::addDivision(Division division)
{
    divisions_.push_back(std::move(division));
    return static_cast<std::int32_t>(divisions_.size() - 1);
}

template <class Traits> void Container<Traits>::divide(std::uint32_t index, int depth, std::int32_t division)
{
    levels_[static_cast<std::size_t>(depth)].tiles[index].division = division;
    setTerminal(index, depth);
}

template <class Traits> auto Container<Traits>::repeatedTile(
    TileType const& divided, std::int64_t i, std::int64_t j, std::int64_t k, TileType& room) const -> TileType const&
{
    Division const& division = divisions_[static_cast<std::size_t>(divided.division)];
    std::int64_t const width = Traits::tileWidth(repeatedDepth_);
    std::int64_t const number[3] = {(i - divided.i) / width, (j - divided.j) / width, (k - divided.k) / width};
    std::size_t part[3];
    for (std::size_t axis = 0; axis < 3; ++axis) {
        auto const& begins = division.begins[axis];
        part[axis] =
            static_cast<std::size_t>(std::upper_bound(begins.begin(), begins.end(), number[axis]) - begins.begin() - 1);
    }
    std::uint32_t const index =
        division.tiles[part[0] + division.begins[0].size() * (part[1] + division.begins[1].size() * part[2])];
    if (index == Division::kNoRepeated)
        return noTile();
    room = repeated_[index - kFirstRepeated];
    room.i = divided.i + number[0] * width;
    room.j = divided.j + number[1] * width;
    room.k = divided.k + number[2] * width;
    return room;
}

template <class Traits> std::size_t Container<Traits>::memoryInBytes() const
{
    std::size_t bytes = sizeof(*this) + repeated_.capacity() * sizeof(TileType);
    for (Division const& division : divisions_) {
        bytes += sizeof(division) + division.tiles.capacity() * sizeof(std::uint32_t);
        for (auto const& begins : division.begins)
            bytes += begins.capacity() * sizeof(std::uint32_t);
    }
    for (Level const& level : levels_)
        bytes += level.tiles.capacity() * sizeof(TileType) + level.slots.capacity() * sizeof(std::uint32_t);
    return bytes;
}

template <class Traits> auto Container<Traits>::ConstTileAccessor::lookUp(int i, int j, int k, int depth)
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
        TileType const& tile = container_->find(i, j, k, coarser);
        if (tile.division >= 0 && depth >= container_->repeatedDepth_)
            return container_->repeatedTile(tile, i, j, k, repeated_);
        if (tile.isTerminal)
            return tile;
    }
    return noTile();
}

template class Container<Traits2>;
template class Container<Traits5>;

}
