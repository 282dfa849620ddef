#include <Modeling/VoxelSampler.h>

#include "PointRow.h"
#include "haloTiles.h"

#include <TessaraGeometryVolume/HaloTile.h>

#include <algorithm>
#include <cmath>
#include <limits>

namespace TSR::TileTree3D {

using Tessara::Math::float3;

namespace {

    constexpr unsigned int kAllBits = 7; // of the three axes
    constexpr float kBelowTile = 1e-5f; // voxels; what rounding can take a point below the tile that contains it
    constexpr float kNowhere = std::numeric_limits<float>::quiet_NaN();
    constexpr float kNothing[6 * 6 * 6] = {}; // read for points without values, and then left

    /// How far the neighbours of a tile are looked for, in index units: at one depth its width, whatever the depth.
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
        if (value > -kBelowTile)
            return {0, 0};
        return {-1, value - std::floor(value)};
    }

    // Tiles that rows came to, by the upper bits of a hash. Few enough to be set up for each part of a loop.
    constexpr int kKnownTileBits = 8;

    std::size_t placeOfTile(IJK index)
    {
        auto const of = [](int coordinate, std::uint32_t factor) {
            return static_cast<std::uint32_t>(coordinate) * factor;
        };
        return (of(index.i, 0x9E3779B1u) ^ of(index.j, 0x85EBCA77u) ^ of(index.k, 0xC2B2AE3Du))
            >> (32 - kKnownTileBits);
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
    return offsetType_ == kAllBits ? samplePositive(place) : sampleFull(place);
}

template <class Traits> void VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::sampleAll(
    float3 const* points, std::size_t count, int depth, int space, float* values)
{
    std::size_t const inRows = fitsRows(readDepth(depth)) ? count & ~std::size_t{3} : 0;
    for (std::size_t first = 0; first < inRows; first += Internal::PointRow::kCapacity) {
        std::size_t const length = std::min(Internal::PointRow::kCapacity, inRows - first);
        if (haloChannel_)
            sampleRow<kSide + 1>(points + first, length, depth, space, values + first);
        else
            sampleRow<kSide>(points + first, length, depth, space, values + first);
    }
    for (std::size_t n = inRows; n < count; ++n)
        values[n] = sample(points[n], depth, space);
}

template <class Traits>
bool VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::fitsRows(int depth) const noexcept
{
    float3 const& offset = Base::voxelOffset_;
    return depth >= 0 && static_cast<float>(Traits::tileWidth(depth)) <= Internal::kWidestTile
        && std::isfinite(offset.x) && std::isfinite(offset.y) && std::isfinite(offset.z);
}

/// Points with all eight values in one array of that side take the short way.
template <class Traits> template <int side> void VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::sampleRow(
    float3 const* points, std::size_t count, int depth, int space, float* values)
{
    int const askedDepth = readDepth(depth);
    Internal::PointRow row;
    bool const isNear = Internal::placePoints(points, count, space == kWorldSpace ? Base::scale_ : 1,
        static_cast<float>(Traits::tileWidth(askedDepth)), Traits::voxelsPerUnit(askedDepth), row);
    if (!isNear) {
        for (std::size_t n = 0; n < count; ++n)
            values[n] = sample(points[n], depth, space);
        return;
    }
    std::size_t const runCount = Internal::findRuns(count, row);
    findTiles(runCount, askedDepth, row);
    constexpr bool kIsPadded = side > kSide;
    float const first = kIsPadded || offsetType_ == kAllBits ? 0 : 1;
    if (Internal::interpolateRow<side, !kIsPadded>(count, {Base::voxelOffset_, first, kSide - 1}, row, values))
        return;
    for (std::size_t n = 0; n < count; ++n)
        if (!row.hasValue[n])
            values[n] = row.values[row.run[n]] == kNothing ? background_ : sample(points[n], depth, space);
}

/// First those that are known, without a branch that could not be foretold.
template <class Traits> void VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::findTiles(
    std::size_t runCount, int depth, Internal::PointRow& row)
{
    if (knownTiles_.empty())
        knownTiles_.resize(std::size_t{1} << kKnownTileBits);
    std::size_t openCount = 0;
    for (std::size_t run = 0; run < runCount; ++run) {
        IJK const index = row.tileOfRun(run);
        KnownTile const& known = knownTiles_[placeOfTile(index)];
        row.values[run] = known.values;
        row.open[openCount] = static_cast<std::uint32_t>(run);
        bool const isFound = known.isOf(index, depth) & (known.unlike == nullptr);
        openCount += isFound ? 0 : 1;
    }
    for (std::size_t n = 0; n < openCount; ++n)
        findTile(row.open[n], depth, row);
}

template <class Traits> inline void VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::findTile(
    std::size_t run, int depth, Internal::PointRow& row)
{
    IJK const index = row.tileOfRun(run);
    KnownTile& known = knownTiles_[placeOfTile(index)];
    if (!known.isOf(index, depth)) {
        TileType const& tile = neighbours_.tileImpl(index.i, index.j, index.k, depth);
        float const* const values = valuesOf(tile);
        known = {index, depth, values ? values : kNothing, values && tile.depth == depth ? nullptr : &tile};
    }
    row.values[run] = known.values;
    if (!known.unlike)
        return;
    TileType const& tile = *known.unlike;
    if (tile.isRepeated)
        known.depth = -1; // the next look-up takes its place
    bool const isPlace =
        known.values != kNothing && static_cast<float>(Traits::tileWidth(tile.depth)) <= Internal::kWidestTile;
    for (std::size_t n = run ? row.last[run - 1] + 1 : 0; n <= row.last[run]; ++n) {
        std::size_t const at = Internal::PointRow::kFirstTile + n;
        row.tileX[at] = isPlace ? static_cast<float>(tile.i) : kNowhere;
        row.tileY[at] = isPlace ? static_cast<float>(tile.j) : 0;
        row.tileZ[at] = isPlace ? static_cast<float>(tile.k) : 0;
        row.voxelsPerUnit[n] = isPlace ? Traits::voxelsPerUnit(tile.depth) : 1;
    }
}

/// Null where there are none that may be read.
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
    slot.key = lastKey_[number] = kNoKey; // of what stood here
    slot.stamp = stamp_;
    fillHalo(tile, slot);
    slot.key = tile.index;
    lastKey_[number] = slot.key;
    return lastSlot_[number] = number;
}

/// Whether the tile above may know what lies around.
template <class Traits>
bool VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::drawsOnParent(TileType const& tile) const
{
    return tile.depth != 0 && tile.parent >= 0 && tile.depth > coarsestDepth_;
}

template <class Traits> void VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::fillHalo(
    TileType const& tile, HaloSlot<kSide + 1>& slot)
{
    if (!drawsOnParent(tile)) {
        setHaloTile<Traits>(tile, nullptr, *channel_, PositiveHalo<Traits>(), 2, neighbours_, slot.values);
        return;
    }
    TileType const& parent = container_->tile(tile.parentTreeIndex());
    PositiveHalo<Traits> const& parentHalo = haloOf(parent, positiveHaloCache_).values;
    setHaloTile<Traits>(tile, &parent, *channel_, parentHalo, 2, neighbours_, slot.values);
}

template <class Traits> void VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::fillHalo(
    TileType const& tile, HaloSlot<kSide + 2>& slot)
{
    auto const own = channel_->tileData(tile.treeIndex());
    if (!own) {
        slot.values.clear();
        return;
    }
    if (!drawsOnParent(tile)) {
        Internal::fillHaloFromTile<Traits>(offsetType_, background_, own, slot.values);
        return;
    }
    Internal::FullHalo<Traits> const& parentHalo =
        haloOf(container_->tile(tile.parentTreeIndex()), fullHaloCache_).values;
    Internal::fillHaloFromNeighbours<Traits>(offsetType_, slot.values, tile.childIJK(), tilesAround(tile), parentHalo);
}

/// The data of the tiles of this depth at a fixed distance, on purpose: where tiles are wider than that, the tile is
/// its own upper neighbour.
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
