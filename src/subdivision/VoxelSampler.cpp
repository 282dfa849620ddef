#include <Modeling/VoxelSampler.h>

#include "PointRow.h"
#include "haloTiles.h"

#include <TessaraGeometryVolume/HaloTile.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <deque>
#include <limits>

namespace TSR::TileTree3D {

using Tessara::Math::float3;

namespace {

    constexpr unsigned int kAllBits = 7; // of the three axes

    /// The distance at which the neighbors of a tile are looked up, in index units. It does not change with the depth.
    template <class Traits> constexpr int kNeighbourStep = 0;
    template <> constexpr int kNeighbourStep<Traits2> = 2;
    template <> constexpr int kNeighbourStep<Traits5> = 5;

    bool fitsIndex(float coordinate)
    {
        return coordinate >= -0x1p31f && coordinate < 0x1p31f;
    }

    int clampedIndex(std::int64_t index)
    {
        return static_cast<int>(std::clamp<std::int64_t>(index, INT32_MIN, INT32_MAX));
    }

    /// Downwards, without a call of `floor`.
    int indexOf(float coordinate)
    {
        int const towardsZero = static_cast<int>(coordinate);
        return towardsZero - (static_cast<float>(towardsZero) > coordinate ? 1 : 0);
    }

    /// A coordinate in a tile, cut into voxel and fraction.
    struct Coordinate {
        int voxel;
        float fraction;
    };

    /// At the upper side the last voxel keeps what goes beyond. At the lower side nothing is read below the layer
    /// around a tile, wherever a wrong offset points.
    template <int side> inline Coordinate coordinateOf(float value)
    {
        if (value >= 0) [[likely]] { // no call of `floor`: it is most of what a sample would cost
            int const voxel = static_cast<int>(std::min(value, static_cast<float>(side - 1)));
            return {voxel, value - static_cast<float>(voxel)};
        }
        if (value > -Internal::kBelowTile)
            return {0, 0};
        return {-1, value - std::floor(value)};
    }

    float blend(float from, float to, float fraction)
    {
        return (to - from) * fraction + from;
    }

    template <int side> inline float interpolate(float const* values, int i, int j, int k, float3 const& fraction)
    {
        constexpr int kNextRow = side, kNextLayer = side * side;
        float const* const v = values + (i + (j + k * side) * side);
        float const near =
            blend(blend(v[0], v[1], fraction.x), blend(v[kNextRow], v[kNextRow + 1], fraction.x), fraction.y);
        float const far = blend(blend(v[kNextLayer], v[kNextLayer + 1], fraction.x),
            blend(v[kNextLayer + kNextRow], v[kNextLayer + kNextRow + 1], fraction.x), fraction.y);
        return blend(near, far, fraction.z);
    }

    /// Where the array begins with the tile: a place below it reads the first voxels.
    template <int side> inline float interpolateFromFirst(float const* values, IJK voxel, float3 const& fraction)
    {
        return interpolate<side>(values, std::max(voxel.i, 0), std::max(voxel.j, 0), std::max(voxel.k, 0), fraction);
    }

    /// Where voxel (0, 0, 0) is in an array with a layer all around.
    constexpr int firstInLayer(int side)
    {
        return 1 + (1 + side) * side;
    }

    constexpr float kNothingAround[7 * 7 * 7] = {}; // read for points without values, then overwritten
    constexpr float const* kNothing = kNothingAround + firstInLayer(7);

}

namespace Internal {

    /// A tile that rows came to, found by its lower corner and the depth that was asked for.
    template <class Traits> struct KnownTile {
        IJK index{};
        int depth = -1;
        typename Container<Traits>::TileType tile; // a copy, as repeated tiles are not stored; may be a coarser one
        bool hasData = false;
        // Of a tile of that depth: its own, and those with the layer that samples read, null until they are built.
        float const* values[2] = {};

        bool isOf(IJK asked, int askedDepth) const noexcept
        {
            return ((index.i ^ asked.i) | (index.j ^ asked.j) | (index.k ^ asked.k) | (depth ^ askedDepth)) == 0;
        }
    };

    /// Tiles by the upper bits of a hash; a new one replaces the one before. Few enough to be set up for each part of a
    /// loop.
    template <class Traits> struct KnownTiles {
        static constexpr int kBits = 9;
        static constexpr std::size_t kCapacity = std::size_t{1} << kBits;
        static_assert(kCapacity >= PointRow::kCapacity);

        std::array<KnownTile<Traits>, kCapacity> tiles;
        // Rows read halos where they are built, so none may be replaced within a row: if there is no room for as many
        // as a row may need, all are forgotten before it. One of the two stays empty.
        std::deque<PositiveHalo<Traits>> positiveHalos;
        std::deque<FullHalo<Traits>> fullHalos;
        std::size_t haloCount = 0;

        KnownTile<Traits>& at(IJK index, int depth)
        {
            auto const of = [](int coordinate, std::uint32_t factor) {
                return static_cast<std::uint32_t>(coordinate) * factor;
            };
            std::uint32_t const hash =
                of(index.i, 0x9E3779B1u) ^ of(index.j, 0x85EBCA77u) ^ of(index.k, 0xC2B2AE3Du) ^ of(depth, 0x27D4EB2Fu);
            return tiles[hash >> (32 - kBits)];
        }

        void makeRoomForHalos(std::size_t count)
        {
            if (haloCount + count <= kCapacity)
                return;
            haloCount = 0;
            for (KnownTile<Traits>& known : tiles)
                known.values[1] = nullptr;
        }
    };

}

template <class Traits> VoxelSampler<Traits, float, float3>::VoxelSampler(
    ContainerType const& container, float scale, float3 const& voxelOffset) noexcept
    : cursor_(container)
    , scale_(scale)
    , voxelOffset_(voxelOffset)
{
    leaveTile();
}

template <class Traits> VoxelSampler<Traits, float, float3>::~VoxelSampler() = default;

template <class Traits> Orvan::String VoxelSampler<Traits, float, float3>::name() const
{
    return "kNone";
}

template <class Traits>
inline auto VoxelSampler<Traits, float, float3>::locate(float3 const& point, int depth, int space) -> Place
{
    float3 const p = space == kWorldSpace ? float3{point.x * scale_, point.y * scale_, point.z * scale_} : point;
    bool const isInside = (depth == depth_) & (p.x >= tileBegin_.x) & (p.y >= tileBegin_.y) & (p.z >= tileBegin_.z)
        & (p.x < tileEnd_.x) & (p.y < tileEnd_.y) & (p.z < tileEnd_.z);
    if (!isInside) {
        enterTile(p, depth);
        if (!tile_->valid)
            return {};
    }
    float3 const fromTile = distanceFromTile(p);
    constexpr int kSide = Traits::kSide;
    Coordinate const x = coordinateOf<kSide>(fromTile.x * voxelsPerUnit_ - voxelOffset_.x);
    Coordinate const y = coordinateOf<kSide>(fromTile.y * voxelsPerUnit_ - voxelOffset_.y);
    Coordinate const z = coordinateOf<kSide>(fromTile.z * voxelsPerUnit_ - voxelOffset_.z);
    return {{x.voxel, y.voxel, z.voxel}, {x.fraction, y.fraction, z.fraction}};
}

template <class Traits>
inline float3 VoxelSampler<Traits, float, float3>::distanceFromTile(float3 const& p) const noexcept
{
    if (std::isfinite(tileBegin_.x)) [[likely]]
        return {p.x - tileBegin_.x, p.y - tileBegin_.y, p.z - tileBegin_.z};
    // Far away a float may not hold where the tile begins.
    auto const distance = [](float from, std::int64_t to) {
        return static_cast<float>(static_cast<double>(from) - static_cast<double>(to));
    };
    return {distance(p.x, tile_->i), distance(p.y, tile_->j), distance(p.z, tile_->k)};
}

template <class Traits> void VoxelSampler<Traits, float, float3>::leaveTile() noexcept
{
    constexpr float kBeyond = std::numeric_limits<float>::infinity();
    tile_ = &noTile_;
    tileBegin_ = tileEnd_ = {kBeyond, kBeyond, kBeyond};
}

template <class Traits> void VoxelSampler<Traits, float, float3>::enterTile(float3 const& p, int depth)
{
    ++visit_;
    depth_ = depth;
    leaveTile();
    if (!(fitsIndex(p.x) && fitsIndex(p.y) && fitsIndex(p.z)))
        return;
    TileType const& tile = cursor_.tileImpl(indexOf(p.x), indexOf(p.y), indexOf(p.z), depth);
    tile_ = &tile;
    if (!tile.valid)
        return;
    voxelsPerUnit_ = Traits::voxelsPerUnit(tile.depth);

    // Finer tiles may lie in a coarse one, and far away floats no longer tell where a tile ends.
    constexpr float kAllExact = 0x1p23f; // of tiles that begin and end within twice of that
    auto const width = static_cast<float>(Traits::tileWidth(tile.depth));
    bool const isExact = std::max({std::abs(p.x), std::abs(p.y), std::abs(p.z), width}) <= kAllExact;
    if (isExact && (tile.depth == depth || !tile.hasChildren)) {
        tileBegin_ = {static_cast<float>(tile.i), static_cast<float>(tile.j), static_cast<float>(tile.k)};
        tileEnd_ = {tileBegin_.x + width, tileBegin_.y + width, tileBegin_.z + width};
    }
}

template <class Traits> VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::VoxelSamplerLinear(
    Container<Traits> const& container, ChannelType const& channel, VoxelTopology const& topology,
    LinearSamplerSettings const& settings, ChannelType const* haloChannel)
    : Base(container, settings.scale, settings.voxelOffset)
    , neighbours_(container)
    , offsetType_(topology.offsetType() & kAllBits)
    , container_(&container)
    , channel_(&channel)
    , haloChannel_(haloChannel)
    , topology_(&topology)
    , background_(settings.background)
    , minDepth_(settings.minDepth)
    , maxDepth_(settings.maxDepth)
    , coarsestDepth_(channel.coarsestDepth())
{
    std::fill(std::begin(lastKey_), std::end(lastKey_), kNoKey);
    std::fill(std::begin(lastSlot_), std::end(lastSlot_), kNoSlot);
}

template <class Traits>
VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::VoxelSamplerLinear(VoxelSamplerLinear const& other)
    : VoxelSamplerLinear(*other.container_, *other.channel_, *other.topology_,
        {other.scale_, other.voxelOffset_, other.background_, other.minDepth_, other.maxDepth_}, other.haloChannel_)
{
}

template <class Traits> VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::~VoxelSamplerLinear() = default;

template <class Traits> Orvan::String VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::name() const
{
    return "kLinear";
}

template <class Traits>
int VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::readDepth(int depth) const noexcept
{
    return std::min({depth, maxDepth_, Traits::kDeepest});
}

template <class Traits>
float VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::sample(float3 const& point, int depth, int space)
{
    typename Base::Place const place = Base::locate(point, readDepth(depth), space);
    if (Base::visit_ != fetchedVisit_)
        fetchValues();
    if (!values_)
        return background_;
    if (haloChannel_)
        return interpolateFromFirst<kSide + 1>(values_, place.voxel, place.fraction);
    ++stamp_;
    return hasPositiveHalos() ? samplePositive(place) : sampleFull(place);
}

template <class Traits> void VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::sampleAll(
    float3 const* points, std::size_t count, int depth, int space, float* values)
{
    std::size_t const inRows = fitsRows(readDepth(depth)) ? count & ~std::size_t{3} : 0;
    for (std::size_t first = 0; first < inRows; first += Internal::PointRow::kCapacity) {
        std::size_t const length = std::min(Internal::PointRow::kCapacity, inRows - first);
        sampleRow(points + first, length, depth, space, values + first);
    }
    for (std::size_t n = inRows; n < count; ++n)
        values[n] = sample(points[n], depth, space);
}

template <class Traits>
bool VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::fitsRows(int depth) const noexcept
{
    float3 const& offset = Base::voxelOffset_;
    return depth >= 0 && static_cast<float>(Traits::tileWidth(depth)) <= Internal::kWidestTile
        && std::isfinite(offset.x) && std::isfinite(offset.y) && std::isfinite(offset.z)
        && std::max({offset.x, offset.y, offset.z}) <= Internal::kLargestOffset;
}

template <class Traits>
bool VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::hasPositiveHalos() const noexcept
{
    return offsetType_ == kAllBits;
}

template <class Traits> void VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::sampleRow(
    float3 const* points, std::size_t count, int depth, int space, float* values)
{
    int const askedDepth = readDepth(depth);
    float const scale = space == kWorldSpace ? Base::scale_ : 1;
    Internal::PointRow row;
    bool const areNear = Internal::placePoints(points, count,
        {scale, static_cast<float>(Traits::tileWidth(askedDepth)), Traits::voxelsPerUnit(askedDepth),
            Base::voxelOffset_},
        row);
    if (!areNear) {
        for (std::size_t n = 0; n < count; ++n)
            values[n] = sample(points[n], depth, space);
        return;
    }
    std::size_t const runCount = Internal::findRuns(count, row);
    bool const isPadded = haloChannel_, isPositive = isPadded || hasPositiveHalos();
    if (!isPadded)
        Internal::findLayers(count, isPositive ? -Internal::kLargestOffset : 1, kSide - 1, row);
    std::size_t const emptyCount = findTiles(points, runCount, askedDepth, scale, row);
    int const padded = kSide + (isPositive ? 1 : 2);
    Internal::TileArrays const arrays{{isPadded ? padded : kSide, padded}, isPositive ? 0 : -1, kSide - 1};
    if (isPadded && std::max({Base::voxelOffset_.x, Base::voxelOffset_.y, Base::voxelOffset_.z}) <= 0)
        Internal::interpolateRow<kSide + 1>(count, arrays, row, values);
    else
        Internal::interpolateRow<0>(count, arrays, row, values);
    for (std::size_t n = 0; n < emptyCount; ++n) {
        std::uint32_t const run = row.empty[n];
        std::fill(values + row.first(run), values + row.last[run] + 1, background_);
    }
}

/// Known tiles first, without an unpredictable branch.
template <class Traits> std::size_t VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::findTiles(
    float3 const* points, std::size_t runCount, int depth, float scale, Internal::PointRow& row)
{
    if (!knownTiles_)
        knownTiles_ = std::make_unique<Internal::KnownTiles<Traits>>();
    knownTiles_->makeRoomForHalos(runCount);
    std::size_t openCount = 0;
    for (std::size_t run = 0; run < runCount; ++run) {
        IJK const index = row.tileOfRun(run);
        Internal::KnownTile<Traits> const& known = knownTiles_->at(index, depth);
        row.values[run] = known.values[row.needsLayer[run]];
        row.open[openCount] = static_cast<std::uint32_t>(run);
        bool const isFound = known.isOf(index, depth) & (row.values[run] != nullptr);
        openCount += isFound ? 0 : 1;
    }
    std::size_t emptyCount = 0;
    for (std::size_t n = 0; n < openCount; ++n) {
        std::uint32_t const run = row.open[n];
        row.values[run] = findValues(points, run, depth, scale, row);
        row.empty[emptyCount] = run;
        emptyCount += row.values[run] == kNothing ? 1 : 0;
    }
    return emptyCount;
}

template <class Traits> float const* VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::findValues(
    float3 const* points, std::size_t run, int depth, float scale, Internal::PointRow& row)
{
    Internal::KnownTile<Traits>* known = &knownTile(row.tileOfRun(run), depth);
    if (!known->hasData)
        return kNothing;
    TileType const tile = known->tile; // the entry may be replaced
    if (tile.depth != depth) {
        placeInTile(points, run, tile, scale, row);
        // The outermost tiles begin below what 32 bits hold.
        known = &knownTile({clampedIndex(tile.i), clampedIndex(tile.j), clampedIndex(tile.k)}, tile.depth);
    }
    float const*& values = known->values[row.needsLayer[run]];
    if (!values)
        values = buildLayeredValues(tile);
    return values;
}

template <class Traits> auto VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::knownTile(IJK index, int depth)
    -> Internal::KnownTile<Traits>&
{
    Internal::KnownTile<Traits>& known = knownTiles_->at(index, depth);
    if (!known.isOf(index, depth)) {
        TileType const& tile = neighbours_.tileImpl(index.i, index.j, index.k, depth);
        float const* const values = valuesOf(tile);
        known = {index, depth, tile, values != nullptr, {tile.depth == depth ? values : nullptr, nullptr}};
    }
    return known;
}

/// The points of a run in a coarser tile than the one that was asked for.
template <class Traits> void VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::placeInTile(
    float3 const* points, std::size_t run, TileType const& tile, float scale, Internal::PointRow& row) const
{
    bool const isPositive = hasPositiveHalos();
    float const voxelsPerUnit = Traits::voxelsPerUnit(tile.depth);
    float3 const& offset = Base::voxelOffset_;
    bool isInside = true;
    auto const place = [&](float coordinate, std::int64_t begin, float shift) {
        // A float may not hold where a wide tile begins.
        auto const distance = static_cast<float>(static_cast<double>(coordinate * scale) - static_cast<double>(begin));
        float const inTile = distance * voxelsPerUnit - shift;
        isInside &= inTile < kSide - 1 && (isPositive || inTile >= 1);
        return inTile;
    };
    for (std::size_t n = row.first(run); n <= row.last[run]; ++n) {
        row.x[n] = place(points[n].x, tile.i, offset.x);
        row.y[n] = place(points[n].y, tile.j, offset.y);
        row.z[n] = place(points[n].z, tile.k, offset.z);
    }
    row.needsLayer[run] = isInside || haloChannel_ ? 0 : 1;
}

template <class Traits>
float const* VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::buildLayeredValues(TileType const& tile)
{
    auto const build = [&](auto& halos) {
        if (knownTiles_->haloCount == halos.size())
            halos.emplace_back();
        auto& halo = halos[knownTiles_->haloCount];
        fillHalo(tile, halo);
        ++knownTiles_->haloCount;
        return halo.values();
    };
    if (hasPositiveHalos())
        return build(knownTiles_->positiveHalos);
    return build(knownTiles_->fullHalos) + firstInLayer(kSide + 2);
}

/// Null if there are none that may be read.
template <class Traits>
inline float const* VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::valuesOf(TileType const& tile) const
{
    if (!tile.valid || tile.depth < minDepth_)
        return nullptr;
    return haloChannel_ ? haloChannel_->template tileData<kSide + 1>(tile.treeIndex()).values()
                        : channel_->tileData(tile.treeIndex()).values();
}

template <class Traits> void VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::fetchValues()
{
    fetchedVisit_ = Base::visit_;
    values_ = Base::hasTile() ? valuesOf(Base::currentTile()) : nullptr;
}

template <class Traits>
float VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::samplePositive(typename Base::Place const& place)
{
    auto const [i, j, k] = place.voxel;
    if (std::max({i, j, k}) + 1 < kSide)
        return interpolateFromFirst<kSide>(values_, place.voxel, place.fraction);
    auto const& halo = haloOf(Base::currentTile(), positiveHaloCache_).values;
    return interpolateFromFirst<kSide + 1>(halo.values(), place.voxel, place.fraction);
}

template <class Traits>
float VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::sampleFull(typename Base::Place const& place)
{
    auto const [i, j, k] = place.voxel;
    if (std::min({i, j, k}) > 0 && std::max({i, j, k}) + 1 < kSide)
        return interpolate<kSide>(values_, i, j, k, place.fraction);
    auto const& halo = haloOf(Base::currentTile(), fullHaloCache_).values;
    return interpolate<kSide + 2>(halo.values(), i + 1, j + 1, k + 1, place.fraction);
}

template <class Traits> template <int side> auto VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::haloOf(
    TileType const& tile, HaloCache<side>& cache) -> HaloSlot<side> const&
{
    std::uint32_t slot = findHalo(tile.index, tile.depth, cache);
    if (slot == kNoSlot)
        slot = buildHalo(tile, cache);
    return cache[slot];
}

template <class Traits> template <int side>
std::uint32_t VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::findHalo(
    std::uint64_t key, int depth, HaloCache<side>& cache)
{
    auto const slot = static_cast<std::uint32_t>(depth);
    if (lastKey_[slot] == key)
        return lastSlot_[slot];
    if (cache.empty() || cache[slot].key != key)
        return kNoSlot;
    cache[slot].stamp = stamp_;
    lastKey_[slot] = key;
    return lastSlot_[slot] = slot;
}

template <class Traits> template <int side>
std::uint32_t VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::buildHalo(
    TileType const& tile, HaloCache<side>& cache)
{
    if (cache.empty())
        cache = HaloCache<side>(Traits::kDepthCount);
    auto const number = static_cast<std::uint32_t>(tile.depth);
    HaloSlot<side>& slot = cache[number];
    slot.stamp = stamp_;
    fillHalo(tile, slot.values);
    slot.key = tile.index;
    lastKey_[number] = slot.key;
    return lastSlot_[number] = number;
}

/// Whether the parent can supply values around the tile.
template <class Traits>
bool VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::drawsOnParent(TileType const& tile) const
{
    return tile.depth != 0 && tile.parent >= 0 && tile.depth > coarsestDepth_;
}

template <class Traits> void VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::fillHalo(
    TileType const& tile, TileData<float, kSide + 1, 0>& halo)
{
    if (!drawsOnParent(tile)) {
        setHaloTile<Traits>(tile, nullptr, *channel_, PositiveHalo<Traits>(), 2, neighbours_, halo);
        return;
    }
    TileType const& parent = container_->tile(tile.parentTreeIndex());
    PositiveHalo<Traits> const& parentHalo = haloOf(parent, positiveHaloCache_).values;
    setHaloTile<Traits>(tile, &parent, *channel_, parentHalo, 2, neighbours_, halo);
}

template <class Traits> void VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::fillHalo(
    TileType const& tile, TileData<float, kSide + 2, 0>& halo)
{
    auto const own = channel_->tileData(tile.treeIndex());
    if (!own) {
        halo.clear();
        return;
    }
    if (!drawsOnParent(tile)) {
        Internal::fillHaloFromTile<Traits>(offsetType_, background_, own, halo);
        return;
    }
    Internal::FullHalo<Traits> const& parentHalo =
        haloOf(container_->tile(tile.parentTreeIndex()), fullHaloCache_).values;
    Internal::fillHaloFromNeighbours<Traits>(offsetType_, halo, tile.childIJK(), tilesAround(tile), parentHalo);
}

/// The data of the tiles of this depth at a fixed distance, which makes a wider tile its own upper neighbor: existing
/// volumes depend on it.
template <class Traits>
auto VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::tilesAround(TileType const& tile) -> TilesAround
{
    auto const isIn = [](std::int64_t begin, std::int64_t index, int depth) {
        return begin <= index && index < begin + Traits::tileWidth(depth);
    };
    TilesAround around;
    std::size_t number = 0;
    for (int dz = -1; dz <= 1; ++dz)
        for (int dy = -1; dy <= 1; ++dy)
            for (int dx = -1; dx <= 1; ++dx, ++number) {
                constexpr std::int64_t kStep = kNeighbourStep<Traits>;
                std::int64_t const i = tile.i + dx * kStep, j = tile.j + dy * kStep, k = tile.k + dz * kStep;
                // The outermost tiles reach beyond what 32 bits hold: what they hold of it is inside all the same.
                TileType const& found =
                    neighbours_.tileImpl(clampedIndex(i), clampedIndex(j), clampedIndex(k), tile.depth);
                if (found.depth == tile.depth && isIn(found.i, i, found.depth) && isIn(found.j, j, found.depth)
                    && isIn(found.k, k, found.depth))
                    around[number] = channel_->tileData(found.treeIndex());
            }
    return around;
}

template class VoxelSampler<Traits2, float, float3>;
template class VoxelSampler<Traits5, float, float3>;
template class VoxelSamplerLinear<Traits2, float, 1, float, float3, 0, 0>;
template class VoxelSamplerLinear<Traits5, float, 1, float, float3, 0, 0>;

}
