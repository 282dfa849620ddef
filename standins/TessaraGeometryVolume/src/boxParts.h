#pragma once

#include "VoxelRange.h"

#include <array>
#include <optional>
#include <span>
#include <vector>

/// Finds equal tiles inside boxes and along their sides.
namespace TSR::TileTree3D::Internal {

/// The value that boxes, which must not overlap one another, give to all voxels of a range. Empty if there are several
/// values, if some voxel is in no box, or if a range of more than 2^20 voxels along an axis overlaps several boxes.
std::optional<float> commonValue(std::span<ConstantBox const* const> boxes, VoxelRange const& range);

/// Cuts the tiles of a range into parts along each axis, such that all tiles in the same three parts have the same
/// voxels in each box, counted from the tile's lower corner, and so do their upper neighbors.
/// \param tileSide  In voxels; the range begins and ends with tiles.
/// \param boxes     All boxes that overlap the range or its upper neighbors.
/// \return          The first tile of each part, counted from the beginning of the range; ascending from 0.
std::array<std::vector<std::uint32_t>, 3> partsOf(
    VoxelRange const& range, int tileSide, std::span<ConstantBox const* const> boxes);

}
