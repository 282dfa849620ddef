#pragma once

namespace TSR::TileTree3D {

/// Where in its voxel each value is: bits 0, 1, 2 of the offset type are for the axes x, y, z. Set: at the lower side;
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
