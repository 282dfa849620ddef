#pragma once

#include <array>
#include <cstddef>
#include <cstdint>

namespace TSR::TileTree3D {

namespace Internal {

    constexpr std::int64_t floorDivide(std::int64_t dividend, std::int64_t divisor)
    {
        return dividend / divisor - (dividend % divisor < 0 ? 1 : 0);
    }

    /// The depth at which a tile is one index unit wide, if tiles of depth 0 are as wide as 32-bit indices allow.
    constexpr int deepestDepth(int childrenPerAxis)
    {
        int depth = 0;
        for (std::int64_t width = childrenPerAxis; width <= INT32_MAX; width *= childrenPerAxis)
            ++depth;
        return depth;
    }

    template <int childrenPerAxis> constexpr auto tileWidths()
    {
        std::array<std::int64_t, deepestDepth(childrenPerAxis) + 1> widths{};
        std::int64_t width = 1;
        for (std::size_t depth = widths.size(); depth-- > 0; width *= childrenPerAxis)
            widths[depth] = width;
        return widths;
    }

    template <int childrenPerAxis, int voxelsPerAxis> constexpr auto voxelsPerUnit()
    {
        constexpr auto kWidths = tileWidths<childrenPerAxis>();
        std::array<float, kWidths.size()> voxels{};
        for (std::size_t depth = 0; depth < voxels.size(); ++depth)
            voxels[depth] = static_cast<float>(voxelsPerAxis / static_cast<double>(kWidths[depth]));
        return voxels;
    }

}

/// The layout of a tree of tiles. Space is measured in index units along three axes. A tile is a cube of `kSide`³
/// voxels; the next depth divides it into `kChildrenPerAxis`³ children, each of `kSide`³ voxels again. The last two
/// parameters are not used here.
template <int childrenPerAxis, int voxelsPerAxis, int, int> struct Traits {
    static constexpr int kChildrenPerAxis = childrenPerAxis;
    static constexpr int kChildCount = childrenPerAxis * childrenPerAxis * childrenPerAxis;
    static constexpr int kSide = voxelsPerAxis;
    static constexpr int kVoxelCount = kSide * kSide * kSide;
    /// How many voxels of its parent a tile covers along each axis.
    static constexpr int kParentVoxels = kSide / kChildrenPerAxis;
    static_assert(kParentVoxels * kChildrenPerAxis == kSide);

    /// The depth at which a tile is one index unit wide. Depth 0 has the widest tiles that 32-bit indices allow.
    static constexpr int kDeepest = Internal::deepestDepth(kChildrenPerAxis);
    static constexpr int kDepthCount = kDeepest + 1;
    static constexpr auto kTileWidths = Internal::tileWidths<kChildrenPerAxis>();
    /// The depth at which a voxel is one index unit wide.
    static constexpr int kUnitDepth = [] {
        int depth = kDeepest;
        while (kTileWidths[static_cast<std::size_t>(depth)] < kSide)
            --depth;
        return depth;
    }();

    /// The width of a tile in index units.
    static constexpr std::int64_t tileWidth(int depth) { return kTileWidths[static_cast<std::size_t>(depth)]; }

    /// Voxels per index unit, rounded to float; below 1 at depths coarser than `kUnitDepth`.
    static constexpr float voxelsPerUnit(int depth) { return kVoxelsPerUnit[static_cast<std::size_t>(depth)]; }
    static constexpr auto kVoxelsPerUnit = Internal::voxelsPerUnit<kChildrenPerAxis, kSide>();
};

/// Two children per axis and four voxels: resolution changes gradually.
using Traits2 = Traits<2, 4, 0, 1>;
/// Five children per axis and five voxels: a flat tree.
using Traits5 = Traits<5, 5, 0, 1>;

/// Identifies a tile by its number among those of its depth. All bits are set if there is none.
struct TreeIndex {
    std::uint64_t index = ~std::uint64_t{0};
    std::uint32_t depth = ~std::uint32_t{0};

    bool isValid() const noexcept { return *this != TreeIndex(); }
    friend bool operator==(TreeIndex const&, TreeIndex const&) = default;
};

/// A position along the three axes.
struct IJK {
    int i, j, k;
    friend bool operator==(IJK const&, IJK const&) = default;
};

}
