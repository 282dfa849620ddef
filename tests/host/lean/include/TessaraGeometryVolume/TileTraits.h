#pragma once

#include <cstdint>

namespace TSR::TileTree3D {

template <int childrenPerAxis, int voxelsPerAxis, int, int> struct Traits {
};

/// All bits are set if there is no tile.
struct TreeIndex {
    std::uint64_t index;
    std::uint32_t depth;
};

struct IJK {
    int i, j, k;
};

}
