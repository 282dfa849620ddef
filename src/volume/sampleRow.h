#pragma once

#include "PointRow.h"

#include <Modeling/detail/VoxelSamplerState.h>

#include <cstddef>

namespace TSR::TileTree3D::Internal {

using Tessara::Math::float3;

/// Where the points of a row are read.
struct RowSettings {
    int depth; // of the tiles
    float scale; // index units per unit of the points
    float3 voxelOffset;
};

/// Whether rows can be sampled with these settings at all.
template <class Traits> bool fitsRows(RowSettings const& settings) noexcept;

/// Samples a row of up to `PointRow::kCapacity` points.
/// \pre     fitsRows(settings), and `count` is a multiple of 4
/// \return  false if some point is NaN or too far away; no value has been written then
template <class Traits> bool sampleRow(LinearSamplerState<Traits>& state, RowSettings const& settings,
    float3 const* points, std::size_t count, float* values);

}
