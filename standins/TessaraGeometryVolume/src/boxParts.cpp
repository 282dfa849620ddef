#include "boxParts.h"

#include <TessaraGeometryVolume/TileTraits.h>

#include <bit>

namespace TSR::TileTree3D::Internal {

namespace {

    /// A range along one axis; `end` is excluded.
    struct Interval {
        std::int64_t first, end;
    };

    /// The part of a tile that a box covers along an axis: which voxels of the tile, whether some of the next tile, and
    /// whether the next tile's first one.
    struct Share {
        std::int64_t first, end;
        bool reachesNext, holdsNextFirst;

        Share(Interval const& box, std::int64_t tile, std::int64_t side)
            : first(std::clamp(box.first - tile * side, std::int64_t{0}, side))
            , end(std::clamp(box.end - tile * side, std::int64_t{0}, side))
            , reachesNext(box.first < (tile + 2) * side && (tile + 1) * side < box.end)
            , holdsNextFirst(box.first <= (tile + 1) * side && (tile + 1) * side < box.end)
        {
            if (first >= end)
                first = end = 0;
        }
        friend bool operator==(Share const&, Share const&) = default;
    };

    std::vector<std::uint32_t> partsAlong(Interval const& range, std::int64_t side, std::vector<Interval> const& boxes)
    {
        std::int64_t const tileBegin = range.first / side - (range.first % side < 0 ? 1 : 0);
        std::int64_t const tileEnd = tileBegin + (range.end - range.first) / side;
        // Shares differ only between tiles next to the end of a box.
        std::vector<std::int64_t> candidates;
        for (Interval const& box : boxes)
            for (std::int64_t const end : {floorDivide(box.first, side), floorDivide(box.end - 1, side)})
                for (std::int64_t const tile : {end - 1, end, end + 1})
                    if (tileBegin < tile && tile < tileEnd)
                        candidates.push_back(tile);
        std::sort(candidates.begin(), candidates.end());
        candidates.erase(std::unique(candidates.begin(), candidates.end()), candidates.end());

        std::vector<std::uint32_t> begins{0};
        for (std::int64_t const tile : candidates)
            if (std::any_of(boxes.begin(), boxes.end(),
                    [=](Interval const& box) { return Share(box, tile - 1, side) != Share(box, tile, side); }))
                begins.push_back(static_cast<std::uint32_t>(tile - tileBegin));
        return begins;
    }

    /// Compares bits: 0 and -0 differ.
    bool isSame(float a, float b)
    {
        return std::bit_cast<std::uint32_t>(a) == std::bit_cast<std::uint32_t>(b);
    }

}

std::optional<float> commonValue(std::span<ConstantBox const* const> boxes, VoxelRange const& range)
{
    constexpr std::int64_t kCountable = std::int64_t{1} << 20;
    std::int64_t covered = 0;
    std::optional<float> value;
    for (ConstantBox const* const box : boxes) {
        if (rangeOf(*box).contains(range))
            return box->value;
        VoxelRange const shared = rangeOf(*box).overlapWith(range);
        if (shared.isEmpty())
            continue;
        if (range.longestSide() > kCountable || (value && !isSame(*value, box->value)))
            return {};
        value = box->value;
        covered += shared.voxelCount();
    }
    return value && covered == range.voxelCount() ? value : std::nullopt;
}

std::array<std::vector<std::uint32_t>, 3> partsOf(
    VoxelRange const& range, int tileSide, std::span<ConstantBox const* const> boxes)
{
    auto const along = [&](std::int64_t Index::*axis) {
        std::vector<Interval> intervals;
        for (ConstantBox const* const box : boxes)
            intervals.push_back({rangeOf(*box).first.*axis, rangeOf(*box).end.*axis});
        return partsAlong({range.first.*axis, range.end.*axis}, tileSide, intervals);
    };
    return {along(&Index::i), along(&Index::j), along(&Index::k)};
}

}
