#pragma once

namespace TSR::TileTree3D {

/// Where in its voxel a value stands: bit 0, 1, 2 of the offset type for the axes x, y, z. Set: at the lower side;
/// clear: in the middle.
class VoxelTopology {
public:
    explicit VoxelTopology(unsigned int offsetType = 7) noexcept
        : offsetType_(offsetType)
    {
    }

    unsigned int offsetType() const noexcept { return offsetType_; }

private:
    unsigned int offsetType_;
};

}
