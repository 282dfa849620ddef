#include <Modeling/VoxelSampler.h>

#include "haloTiles.h"

#include <TessaraGeometryVolume/HaloTile.h>

#include <algorithm>
#include <cmath>

namespace TSR::TileTree3D {

using Tessara::Math::float3;

namespace {

    constexpr int kWorldSpace = 2;
    constexpr float kBelowTile = 1e-5f; // voxels; what rounding can take a point below the tile that contains it

    /// How far the neighbours of a tile are looked for, in index units: at one depth its width, whatever the depth.
    template <class Traits> constexpr int kNeighbourStep = 0;
    template <> constexpr int kNeighbourStep<Traits2> = 2;
    template <> constexpr int kNeighbourStep<Traits5> = 5;

    /// What `std::floor` gives, without a call: it is most of what a sample would cost.
    float floorOf(float value)
    {
        constexpr float kAllWhole = 0x1p23f; // from here on
        if (!(std::abs(value) < kAllWhole))
            return value;
        auto const whole = static_cast<float>(static_cast<int>(value));
        return whole > value ? whole - 1 : whole;
    }

    bool fitsIndex(float coordinate)
    {
        return coordinate >= -0x1p31f && coordinate < 0x1p31f;
    }

    /// A coordinate in a tile, cut into voxel and fraction.
    struct Coordinate {
        int voxel;
        float fraction;
    };

    /// At the upper side the last voxel keeps what goes beyond. At the lower side nothing is read below the layer
    /// around a tile, wherever a wrong offset points.
    template <int side> Coordinate coordinateOf(float value)
    {
        if (value > -kBelowTile)
            value = std::max(value, 0.0f);
        float const voxel = std::min(floorOf(value), static_cast<float>(side - 1));
        return {voxel >= -1 ? static_cast<int>(voxel) : -1, value - voxel};
    }

    float blend(float from, float to, float fraction)
    {
        return (to - from) * fraction + from;
    }

    template <int side> float interpolate(float const* values, int i, int j, int k, float3 const& fraction)
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
    template <int side> float interpolateFromFirst(float const* values, IJK voxel, float3 const& fraction)
    {
        return interpolate<side>(values, std::max(voxel.i, 0), std::max(voxel.j, 0), std::max(voxel.k, 0), fraction);
    }

}

template <class Traits> VoxelSampler<Traits, float, float3>::VoxelSampler(
    ContainerType const& container, float scale, float3 const& voxelOffset) noexcept
    : cursor_(container)
    , scale_(scale)
    , voxelOffset_(voxelOffset)
    , tile_(&noTile_)
{
}

template <class Traits> VoxelSampler<Traits, float, float3>::VoxelSampler(VoxelSampler const& other) noexcept
    : cursor_(other.cursor_)
    , scale_(other.scale_)
    , voxelOffset_(other.voxelOffset_)
    , tile_(&noTile_)
{
}

template <class Traits> VoxelSampler<Traits, float, float3>::~VoxelSampler() = default;

template <class Traits> Orvan::String VoxelSampler<Traits, float, float3>::name() const
{
    return "kNone";
}

template <class Traits> auto VoxelSampler<Traits, float, float3>::locate(float3 const& point, int depth, int space)
    -> Place
{
    float3 const p = space == kWorldSpace ? float3{point.x * scale_, point.y * scale_, point.z * scale_} : point;
    if (!(fitsIndex(p.x) && fitsIndex(p.y) && fitsIndex(p.z)))
        return {TreeIndex(), {}, {}};
    TileType const& tile = cursor_.tileImpl(
        static_cast<int>(floorOf(p.x)), static_cast<int>(floorOf(p.y)), static_cast<int>(floorOf(p.z)), depth);
    tile_ = &tile;
    if (!tile.valid)
        return {TreeIndex(), {}, {}};
    float const perUnit = Traits::voxelsPerUnit(tile.depth);
    Coordinate const x = coordinateOf<Traits::kSide>((p.x - static_cast<float>(tile.i)) * perUnit - voxelOffset_.x);
    Coordinate const y = coordinateOf<Traits::kSide>((p.y - static_cast<float>(tile.j)) * perUnit - voxelOffset_.y);
    Coordinate const z = coordinateOf<Traits::kSide>((p.z - static_cast<float>(tile.k)) * perUnit - voxelOffset_.z);
    return {tile.treeIndex(), {x.voxel, y.voxel, z.voxel}, {x.fraction, y.fraction, z.fraction}};
}

template <class Traits> VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::VoxelSamplerLinear(
    Container<Traits> const& container, ChannelType const& channel, VoxelTopology const& topology,
    LinearSamplerSettings const& settings, ChannelType const* haloChannel)
    : Base(container, settings.scale, settings.voxelOffset)
    , neighbours_(container)
    , offsetType_(topology.offsetType())
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
    : Base(other)
    , neighbours_(*other.container_)
    , offsetType_(other.offsetType_)
    , container_(other.container_)
    , channel_(other.channel_)
    , haloChannel_(other.haloChannel_)
    , topology_(other.topology_)
    , background_(other.background_)
    , minDepth_(other.minDepth_)
    , maxDepth_(other.maxDepth_)
    , coarsestDepth_(other.coarsestDepth_)
{
    std::fill(std::begin(lastKey_), std::end(lastKey_), kNoKey);
    std::fill(std::begin(lastSlot_), std::end(lastSlot_), kNoSlot);
}

template <class Traits> VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::~VoxelSamplerLinear() = default;

template <class Traits> Orvan::String VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::name() const
{
    return "kLinear";
}

template <class Traits>
float VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::sample(float3 const& point, int depth, int space)
{
    typename Base::Place const place = Base::locate(point, std::min(maxDepth_, depth), space);
    if (!place.tile.isValid() || static_cast<int>(place.tile.depth) < minDepth_)
        return background_;
    if (haloChannel_) {
        auto const padded = haloChannel_->template tileData<kSide + 1>(place.tile);
        return padded ? interpolateFromFirst<kSide + 1>(padded.values(), place.voxel, place.fraction) : background_;
    }
    ++stamp_;
    return offsetType_ == 7 ? samplePositive(place) : sampleFull(place);
}

template <class Traits>
float VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::samplePositive(typename Base::Place const& place)
{
    auto const data = channel_->tileData(place.tile);
    if (!data)
        return background_;
    auto const [i, j, k] = place.voxel;
    if (i + 1 < kSide && j + 1 < kSide && k + 1 < kSide)
        return interpolateFromFirst<kSide>(data.values(), place.voxel, place.fraction);
    auto const& halo = haloOf(Base::currentTile(), positiveHaloCache_).values;
    return interpolateFromFirst<kSide + 1>(halo.values(), place.voxel, place.fraction);
}

template <class Traits>
float VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::sampleFull(typename Base::Place const& place)
{
    auto const data = channel_->tileData(place.tile);
    if (!data)
        return background_;
    auto const [i, j, k] = place.voxel;
    if (std::min({i, j, k}) > 0 && std::max({i, j, k}) + 1 < kSide)
        return interpolate<kSide>(data.values(), i, j, k, place.fraction);
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

/// The data of the tiles of this depth at a fixed distance, on purpose: where tiles are wider than that, the tile is its
/// own upper neighbour.
template <class Traits>
auto VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::tilesAround(TileType const& tile) -> TilesAround
{
    TilesAround around;
    std::size_t number = 0;
    for (int dz = -1; dz <= 1; ++dz)
        for (int dy = -1; dy <= 1; ++dy)
            for (int dx = -1; dx <= 1; ++dx, ++number) {
                constexpr std::int64_t kStep = kNeighbourStep<Traits>;
                std::int64_t const i = tile.i + dx * kStep, j = tile.j + dy * kStep, k = tile.k + dz * kStep;
                if (std::min({i, j, k}) < INT32_MIN || std::max({i, j, k}) > INT32_MAX)
                    continue;
                TileType const& neighbour =
                    neighbours_.tileImpl(static_cast<int>(i), static_cast<int>(j), static_cast<int>(k), tile.depth);
                if (neighbour.depth == tile.depth)
                    around[number] = channel_->tileData(neighbour.treeIndex());
            }
    return around;
}

template class VoxelSampler<Traits2, float, float3>;
template class VoxelSampler<Traits5, float, float3>;
template class VoxelSamplerLinear<Traits2, float, 1, float, float3, 0, 0>;
template class VoxelSamplerLinear<Traits5, float, 1, float, float3, 0, 0>;

}
