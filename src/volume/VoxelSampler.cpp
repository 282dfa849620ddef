#include <Modeling/VoxelSampler.h>

#include "KnownTiles.h"
#include "haloCache.h"
#include "interpolate.h"
#include "locate.h"
#include "sampleRow.h"

#include <algorithm>
#include <cstdint>
#include <iterator>

namespace TSR::TileTree3D {

using Tessara::Math::float3;

namespace {

    template <class Traits> int readDepth(Internal::LinearSamplerState<Traits> const& state, int depth)
    {
        return std::min({depth, state.maxDepth, Internal::TileLayout<Traits>::kDeepest});
    }

    /// Finds the values of a tile that has just been entered. Not inlined: most samples do not need it.
    template <class Traits> [[gnu::noinline]] void fetchValues(
        Internal::TileCursor<Traits> const& cursor, Internal::LinearSamplerState<Traits>& state)
    {
        state.fetchedVisit = cursor.visit;
        state.values = cursor.hasTile() ? state.valuesOf(cursor.currentTile(), state.copies) : nullptr;
    }

    /// In a volume whose halos are on the upper sides only.
    template <class Traits> float samplePositive(
        Internal::LinearSamplerState<Traits>& state, Internal::TileOf<Traits> const& tile, Internal::Place const& place)
    {
        constexpr int kSide = Internal::TileLayout<Traits>::kSide;
        auto const [i, j, k] = place.voxel;
        if (std::max({i, j, k}) + 1 < kSide)
            return Internal::interpolateFromFirst<kSide>(state.values, place.voxel, place.fraction);
        auto const& halo = haloOf(state, tile, state.positiveHaloCache);
        return Internal::interpolateFromFirst<kSide + 1>(halo.values(), place.voxel, place.fraction);
    }

    /// In a volume whose halos are all around.
    template <class Traits> float sampleFull(
        Internal::LinearSamplerState<Traits>& state, Internal::TileOf<Traits> const& tile, Internal::Place const& place)
    {
        constexpr int kSide = Internal::TileLayout<Traits>::kSide;
        auto const [i, j, k] = place.voxel;
        if (std::min({i, j, k}) > 0 && std::max({i, j, k}) + 1 < kSide)
            return Internal::interpolate<kSide>(state.values, i, j, k, place.fraction);
        auto const& halo = haloOf(state, tile, state.fullHaloCache);
        return Internal::interpolate<kSide + 2>(halo.values(), i + 1, j + 1, k + 1, place.fraction);
    }

}

template <class Traits> VoxelSampler<Traits, float, float3>::VoxelSampler(
    ContainerType const& container, float scale, float3 const& voxelOffset) noexcept
    : cursor_(container, scale, voxelOffset)
{
}

template <class Traits> VoxelSampler<Traits, float, float3>::~VoxelSampler() = default;

template <class Traits> Orvan::String VoxelSampler<Traits, float, float3>::name() const
{
    return "kNone";
}

template <class Traits> VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::VoxelSamplerLinear(
    Container<Traits> const& container, ChannelType const& channel, VoxelTopology const& topology,
    LinearSamplerSettings const& settings, ChannelType const* haloChannel)
    : Base(container, settings.scale, settings.voxelOffset)
    , state_{.neighbors = typename Container<Traits>::ConstTileAccessor(container),
          .offsetType = topology.offsetType() & Internal::LinearSamplerState<Traits>::kAllAxes,
          .container = &container,
          .channel = &channel,
          .haloChannel = haloChannel,
          .topology = &topology,
          .background = settings.background,
          .minDepth = settings.minDepth,
          .maxDepth = settings.maxDepth,
          .coarsestDepth = channel.coarsestDepth()}
{
    std::fill(std::begin(state_.lastKey), std::end(state_.lastKey), state_.kNoKey);
    std::fill(std::begin(state_.lastSlot), std::end(state_.lastSlot), state_.kNoSlot);
}

template <class Traits>
VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::VoxelSamplerLinear(VoxelSamplerLinear const& other)
    : VoxelSamplerLinear(*other.state_.container, *other.state_.channel, *other.state_.topology,
        {other.cursor_.scale, other.cursor_.voxelOffset, other.state_.background, other.state_.minDepth,
            other.state_.maxDepth},
        other.state_.haloChannel)
{
}

template <class Traits> VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::~VoxelSamplerLinear() = default;

template <class Traits> Orvan::String VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::name() const
{
    return "kLinear";
}

template <class Traits>
float VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::sample(float3 const& point, int depth, int space)
{
    auto& cursor = Base::cursor_;
    Internal::Place const place = locate(cursor, point, readDepth(state_, depth), space == kWorldSpace);
    if (cursor.visit != state_.fetchedVisit)
        fetchValues(cursor, state_);
    if (!state_.values)
        return state_.background;
    if (state_.haloChannel)
        return Internal::interpolateFromFirst<Internal::TileLayout<Traits>::kSide + 1>(
            state_.values, place.voxel, place.fraction);
    ++state_.stamp;
    return state_.hasPositiveHalos() ? samplePositive(state_, cursor.currentTile(), place)
                                     : sampleFull(state_, cursor.currentTile(), place);
}

template <class Traits> void VoxelSamplerLinear<Traits, float, 1, float, float3, 0, 0>::sampleAll(
    float3 const* points, std::size_t count, int depth, int space, float* values)
{
    auto const sampleEach = [&](std::size_t first, std::size_t end) {
        for (std::size_t n = first; n < end; ++n)
            values[n] = sample(points[n], depth, space);
    };
    constexpr std::size_t kRowLength = Internal::PointRow::kCapacity;
    Internal::RowSettings const settings{
        readDepth(state_, depth), space == kWorldSpace ? Base::cursor_.scale : 1, Base::cursor_.voxelOffset};
    std::size_t const inRows = Internal::fitsRows<Traits>(settings) ? count & ~std::size_t{3} : 0;
    for (std::size_t first = 0; first < inRows; first += kRowLength) {
        std::size_t const length = std::min(kRowLength, inRows - first);
        if (!sampleRow(state_, settings, points + first, length, values + first))
            sampleEach(first, first + length);
    }
    sampleEach(inRows, count);
}

template class VoxelSampler<Traits2, float, float3>;
template class VoxelSampler<Traits5, float, float3>;
template class VoxelSamplerLinear<Traits2, float, 1, float, float3, 0, 0>;
template class VoxelSamplerLinear<Traits5, float, 1, float, float3, 0, 0>;

}
