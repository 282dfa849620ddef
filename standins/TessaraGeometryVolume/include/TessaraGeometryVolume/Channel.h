#pragma once

#include <TessaraGeometryVolume/Export.h>
#include <TessaraGeometryVolume/Tile.h>
#include <TessaraGeometryVolume/TileData.h>
#include <TessaraGeometryVolume/TileTraits.h>

#include <array>
#include <utility>
#include <vector>

namespace TSR::TileTree3D {

/// The values of a volume: `side`³ per tile that holds data. Tiles of equal values can share them. Any number of
/// threads may read a channel at once.
template <class Traits, class T> class TESSARAGEOMETRYVOLUME_EXPORT Channel {
public:
    /// Without data. \param side  that of a tile, or one more for tiles with an additional layer on their upper sides
    explicit Channel(int side = Traits::kSide) noexcept
        : side_(side)
    {
    }
    Channel(Channel const&) = default;
    Channel(Channel&&) noexcept = default;
    Channel& operator=(Channel const&) = default;
    Channel& operator=(Channel&&) noexcept = default;
    virtual ~Channel() = default;

    /// The lowest depth at which a tile has data. The deepest depth plus one if there is no data at all.
    virtual int coarsestDepth() const noexcept
    {
        int depth = 0;
        while (depth < Traits::kDepthCount && levels_[static_cast<std::size_t>(depth)].roomCount == 0)
            ++depth;
        return depth;
    }

    /// Empty if the tile holds no data, or if tiles of this channel have another side.
    template <int side = Traits::kSide> ConstTileData<T, side, 0> tileData(TreeIndex tile) const noexcept
    {
        if (!tile.isValid() || side != side_)
            return {};
        Level const& level = levels_[tile.depth];
        std::uint32_t const room = level.roomOf(tile.index);
        return room == kNoRoom ? ConstTileData<T, side, 0>()
                               : ConstTileData<T, side, 0>(level.valuesOf(room, voxelCount()));
    }

    int side() const noexcept { return side_; }

    /// For filling a channel: the values of a tile, which the first call adds as zeros.
    /// \pre  the tile does not share its values
    T* values(TreeIndex tile)
    {
        Level& level = levels_[tile.depth];
        std::uint32_t& room = level.entryOf(tile.index);
        if (room == kNoRoom) {
            if (level.roomCount % kPageRooms == 0)
                level.pages.emplace_back(kPageRooms * voxelCount());
            room = level.roomCount++;
        }
        return level.valuesOf(room, voxelCount());
    }
    /// Makes a tile share the values of another one of its depth. \pre  `other` has values
    void share(TreeIndex tile, TreeIndex other)
    {
        Level& level = levels_[tile.depth];
        std::uint32_t const room = level.roomOf(other.index);
        level.entryOf(tile.index) = room;
    }

    std::size_t memoryInBytes() const
    {
        std::size_t bytes = sizeof(*this);
        for (Level const& level : levels_)
            bytes += (level.rooms.capacity() + level.repeatedRooms.capacity()) * sizeof(std::uint32_t)
                + level.pages.size() * (kPageRooms * voxelCount() * sizeof(T) + sizeof(level.pages[0]));
        return bytes;
    }

private:
    // A room stores the values of one tile; tiles that share values have the same room.
    static constexpr std::uint32_t kNoRoom = ~std::uint32_t{0};
    static constexpr std::size_t kPageRooms = 64; // growing adds a page and copies no values

    struct Level {
        std::vector<std::uint32_t> rooms, repeatedRooms; // of stored tiles, and of repeated ones (`kFirstRepeated`)
        std::vector<std::vector<T>> pages;
        std::uint32_t roomCount = 0;

        std::uint32_t roomOf(std::uint64_t tile) const noexcept
        {
            bool const isRepeated = tile >= kFirstRepeated;
            std::vector<std::uint32_t> const& table = isRepeated ? repeatedRooms : rooms;
            auto const number = static_cast<std::size_t>(isRepeated ? tile - kFirstRepeated : tile);
            return number < table.size() ? table[number] : kNoRoom;
        }
        std::uint32_t& entryOf(std::uint64_t tile)
        {
            bool const isRepeated = tile >= kFirstRepeated;
            std::vector<std::uint32_t>& table = isRepeated ? repeatedRooms : rooms;
            auto const number = static_cast<std::size_t>(isRepeated ? tile - kFirstRepeated : tile);
            if (number >= table.size())
                table.resize(number + 1, kNoRoom);
            return table[number];
        }
        T const* valuesOf(std::uint32_t room, std::size_t voxelCount) const noexcept
        {
            return pages[room / kPageRooms].data() + room % kPageRooms * voxelCount;
        }
        T* valuesOf(std::uint32_t room, std::size_t voxelCount) noexcept
        {
            return pages[room / kPageRooms].data() + room % kPageRooms * voxelCount;
        }
    };

    std::size_t voxelCount() const noexcept
    {
        auto const side = static_cast<std::size_t>(side_);
        return side * side * side;
    }

    int side_;
    std::array<Level, Traits::kDepthCount> levels_;
};

}
