#include "sampleRow.h"

#include "KnownTiles.h"
#include "haloCache.h"
#include "interpolate.h"

#include "frame/Assert.h"

#include <algorithm>
#include <cmath>
#include <memory>

namespace TSR::TileTree3D::Internal {

namespace {

    constexpr float kNothingAround[7 * 7 * 7] = {}; // read for points without values, then overwritten
    constexpr float const* kNothing = kNothingAround + firstInLayer(7);

    /// Finds the values for each run of a row.
    template <class Traits> class TileFinder {
    public:
        using TileType = TileOf<Traits>;

        TileFinder(LinearSamplerState<Traits>& state, RowSettings const& settings, float3 const* points, PointRow& row)
            : state_(state)
            , settings_(settings)
            , points_(points)
            , row_(row)
        {
            if (!state.knownTiles)
                state.knownTiles = std::make_unique<KnownTiles<Traits>>();
        }

        /// Finds the values that each run reads. Known tiles come first, without an unpredictable branch.
        /// \return  the number of runs whose tiles hold no data
        std::size_t findTiles(std::size_t runCount)
        {
            KnownTiles<Traits>& knownTiles = *state_.knownTiles;
            int const depth = settings_.depth;
            CornerHash const hash = knownTiles.hashAt(depth);
            knownTiles.makeRoomForHalos(runCount);
            std::size_t openCount = 0, emptyCount = 0;
            for (std::size_t run = 0; run < runCount; ++run) {
                IJK const index = row_.tileOfRun(run);
                KnownTile const& known = knownTiles.known[hash(index)];
                float const* const values = known.values[row_.needsLayer[run]];
                bool const isFound = known.isOf(index, depth) & (values != nullptr);
                row_.values[run] = values;
                row_.open[openCount] = row_.empty[emptyCount] = static_cast<std::uint32_t>(run);
                openCount += isFound ? 0 : 1;
                emptyCount += (isFound & (values == kNothing)) ? 1 : 0;
            }
            for (std::size_t n = 0; n < openCount; ++n) {
                std::uint32_t const run = row_.open[n];
                row_.values[run] = findValues(run);
                row_.empty[emptyCount] = run;
                emptyCount += row_.values[run] == kNothing ? 1 : 0;
            }
            return emptyCount;
        }

    private:
        float const* findValues(std::size_t run)
        {
            std::size_t place = placeOfTile(row_.tileOfRun(run), settings_.depth);
            KnownTiles<Traits>& knownTiles = *state_.knownTiles;
            if (knownTiles.known[place].values[0] == kNothing)
                return kNothing;
            TileType const tile = knownTiles.tiles[place]; // a copy, because the entry may be replaced
            if (tile.depth != settings_.depth) {
                placeInTile(run, tile);
                // The outermost tiles begin below 32-bit indices.
                place = placeOfTile({clampedIndex(tile.i), clampedIndex(tile.j), clampedIndex(tile.k)}, tile.depth);
            }
            float const*& values = knownTiles.known[place].values[row_.needsLayer[run]];
            if (!values)
                values = buildLayeredValues(tile);
            return values;
        }

        /// The place of a tile in the table, where it is entered unless it is known.
        std::size_t placeOfTile(IJK index, int depth)
        {
            KnownTiles<Traits>& knownTiles = *state_.knownTiles;
            std::size_t const place = knownTiles.hashAt(depth)(index);
            if (!knownTiles.known[place].isOf(index, depth)) {
                TileType const& tile = state_.neighbors.tileImpl(index.i, index.j, index.k, depth);
                float const* const own = state_.valuesOf(tile, state_.copies);
                knownTiles.tiles[place] = tile;
                if (!own)
                    knownTiles.known[place] = {index, depth, {kNothing, kNothing}};
                else
                    knownTiles.known[place] = {index, depth, {tile.depth == depth ? own : nullptr, nullptr}};
            }
            return place;
        }

        /// Places the points of a run in a tile that is coarser than requested.
        void placeInTile(std::size_t run, TileType const& tile)
        {
            constexpr int kSide = TileLayout<Traits>::kSide;
            bool const isPositive = state_.hasPositiveHalos();
            float const voxelsPerUnit = TileLayout<Traits>::voxelsPerUnit(tile.depth);
            float3 const& offset = settings_.voxelOffset;
            bool isInside = true;
            auto const place = [&](float coordinate, std::int64_t begin, float shift) {
                // A float may be too coarse to represent where a wide tile begins.
                auto const distance =
                    static_cast<float>(static_cast<double>(coordinate * settings_.scale) - static_cast<double>(begin));
                float const inTile = distance * voxelsPerUnit - shift;
                isInside &= inTile < kSide - 1 && (isPositive || inTile >= 1);
                return inTile;
            };
            for (std::size_t n = row_.first[run]; n != row_.first[run + 1]; ++n) {
                row_.x[n] = place(points_[n].x, tile.i, offset.x);
                row_.y[n] = place(points_[n].y, tile.j, offset.y);
                row_.z[n] = place(points_[n].z, tile.k, offset.z);
            }
            row_.needsLayer[run] = isInside || state_.haloChannel ? 0 : 1;
        }

        float const* buildLayeredValues(TileType const& tile)
        {
            KnownTiles<Traits>& knownTiles = *state_.knownTiles;
            auto const build = [&](auto& halos) {
                if (knownTiles.haloCount == halos.size())
                    halos.emplace_back();
                auto& halo = halos[knownTiles.haloCount];
                fillHalo(state_, tile, halo);
                ++knownTiles.haloCount;
                return halo.values();
            };
            if (state_.hasPositiveHalos())
                return build(knownTiles.positiveHalos);
            return build(knownTiles.fullHalos) + firstInLayer(TileLayout<Traits>::kSide + 2);
        }

        LinearSamplerState<Traits>& state_;
        RowSettings const& settings_;
        float3 const* points_;
        PointRow& row_;
    };

    template <int side, bool canBeBelow, class State>
    void interpolateIn(State const& state, std::size_t count, std::size_t runCount, PointRow const& row, float* values)
    {
        if (state.haloChannel)
            interpolateRow<side + 1, side + 1, canBeBelow>(count, runCount, {0, side - 1}, row, values);
        else if (state.hasPositiveHalos())
            interpolateRow<side, side + 1, canBeBelow>(count, runCount, {0, side - 1}, row, values);
        else
            interpolateRow<side, side + 2, canBeBelow>(count, runCount, {-1, side - 1}, row, values);
    }

    float largestCoordinate(float3 const& v)
    {
        return std::max({v.x, v.y, v.z});
    }

}

template <class Traits> bool fitsRows(RowSettings const& settings) noexcept
{
    float3 const& offset = settings.voxelOffset;
    // Rows read many tiles at once, so values that are copied one tile at a time are of no use.
    return LinearSamplerState<Traits>::kReadsInPlace && settings.depth >= 0
        && static_cast<float>(TileLayout<Traits>::tileWidth(settings.depth)) <= kWidestTile && std::isfinite(offset.x)
        && std::isfinite(offset.y) && std::isfinite(offset.z) && largestCoordinate(offset) <= kLargestOffset;
}

template <class Traits> bool sampleRow(LinearSamplerState<Traits>& state, RowSettings const& settings,
    float3 const* points, std::size_t count, float* values)
{
    constexpr int kSide = TileLayout<Traits>::kSide;
    MODELING_ASSERT(count <= PointRow::kCapacity && count % 4 == 0 && fitsRows<Traits>(settings));
    PointRow row;
    bool const areNear = placePoints(points, count,
        {settings.scale, static_cast<float>(TileLayout<Traits>::tileWidth(settings.depth)),
            TileLayout<Traits>::voxelsPerUnit(settings.depth), settings.voxelOffset},
        row);
    if (!areNear)
        return false;
    std::size_t const runCount = findRuns(count, row);
    // If layers are on the upper sides only, places below the tile read its first voxels.
    if (state.haloChannel)
        std::fill_n(row.needsLayer, runCount, 0u);
    else
        findLayers(count, runCount, state.hasPositiveHalos() ? -kLargestOffset : 1, kSide - 1, row);
    std::size_t const emptyCount = TileFinder<Traits>(state, settings, points, row).findTiles(runCount);
    MODELING_ASSERT(std::find(row.values, row.values + runCount, nullptr) == row.values + runCount);
    MODELING_ASSERT(runCount != 0 && row.first[0] == 0 && row.first[runCount] == count);
    // No place is below its tile if no offset is positive.
    if (largestCoordinate(settings.voxelOffset) <= 0)
        interpolateIn<kSide, false>(state, count, runCount, row, values);
    else
        interpolateIn<kSide, true>(state, count, runCount, row, values);
    for (std::size_t n = 0; n < emptyCount; ++n) {
        std::uint32_t const run = row.empty[n];
        std::fill(values + row.first[run], values + row.first[run + 1], state.background);
    }
    return true;
}

template bool fitsRows<Traits2>(RowSettings const&) noexcept;
template bool fitsRows<Traits5>(RowSettings const&) noexcept;
template bool sampleRow(LinearSamplerState<Traits2>&, RowSettings const&, float3 const*, std::size_t, float*);
template bool sampleRow(LinearSamplerState<Traits5>&, RowSettings const&, float3 const*, std::size_t, float*);

}
