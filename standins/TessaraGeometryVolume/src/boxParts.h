#pragma once

#include "VoxelRange.h"

#include <array>
#include <optional>
#include <span>
#include <vector>

/// Which tiles inside and along the sides of boxes are alike.
namespace TSR::TileTree3D::Internal {

/// The value that all voxels of a range have from boxes, which do not overlap one another. Empty if there are several,
/// if some voxel has none, and for ranges of more than 2^20 voxels along an axis with several boxes in them.
std::optional<float> commonValue(std::span<ConstantBox const* const> boxes, VoxelRange const& range);

/// Cuts the tiles of a range into parts along each axis, such that all tiles in the same three parts have the same
/// voxels in all boxes, and the same neighbors with the same voxels next to them on their upper sides.
/// \param tileSide  In voxels; the range begins and ends with tiles.
/// \param boxes     All that overlap the range, or its upper neighbors.
/// \return          Where parts begin, in tiles from the beginning of the range; ascending from 0.
std::array<std::vector<std::uint32_t>, 3> partsOf(
    VoxelRange const& range, int tileSide, std::span<ConstantBox const* const> boxes);

}
