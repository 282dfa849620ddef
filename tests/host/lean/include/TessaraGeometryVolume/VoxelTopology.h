#pragma once

namespace TSR::TileTree3D {

class VoxelTopology {
public:
    explicit VoxelTopology(unsigned int offsetType)
        : offsetType_(offsetType)
    {
    }
    unsigned int offsetType() const { return offsetType_; }

private:
    unsigned int offsetType_;
};

}
