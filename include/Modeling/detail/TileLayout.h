#pragma once

#include <TessaraGeometryVolume/Container.h>
#include <TessaraGeometryVolume/TileTraits.h>

#include <array>
#include <cstddef>
#include <cstdint>

namespace TSR::TileTree3D {

/// Two children per axis and four voxels.
using Traits2 = Traits<2, 4, 0, 1>;
/// Five children per axis and five voxels.
using Traits5 = Traits<5, 5, 0, 1>;

}

/// What the samplers need to know of a layout, derived from its parameters alone. Not part of the interface.
namespace TSR::TileTree3D::Internal {

template <class Traits> struct TileLayout;

template <int childrenPerAxis, int voxelsPerAxis, int a, int b>
struct TileLayout<Traits<childrenPerAxis, voxelsPerAxis, a, b>> {
    static constexpr int kSide = voxelsPerAxis; // voxels of a tile along each axis
    static constexpr int kChildCount = childrenPerAxis * childrenPerAxis * childrenPerAxis;
    /// How many voxels of its parent a tile covers along each axis.
    static constexpr int kParentVoxels = voxelsPerAxis / childrenPerAxis;
    static_assert(kParentVoxels * childrenPerAxis == voxelsPerAxis);

    /// The depth at which a tile is one index unit wide; tiles of depth 0 are as wide as 32-bit indices allow.
    static constexpr int kDeepest = [] {
        int depth = 0;
        for (std::int64_t width = childrenPerAxis; width <= INT32_MAX; width *= childrenPerAxis)
            ++depth;
        return depth;
    }();
    static constexpr int kDepthCount = kDeepest + 1;

    /// The width of a tile in index units.
    static constexpr std::int64_t tileWidth(int depth) { return kTileWidths[static_cast<std::size_t>(depth)]; }
    /// Voxels per index unit, rounded to float.
    static constexpr float voxelsPerUnit(int depth) { return kVoxelsPerUnit[static_cast<std::size_t>(depth)]; }

private:
    static constexpr auto kTileWidths = [] {
        std::array<std::int64_t, kDepthCount> widths{};
        std::int64_t width = 1;
        for (std::size_t depth = kDepthCount; depth-- > 0; width *= childrenPerAxis)
            widths[depth] = width;
        return widths;
    }();
    static constexpr auto kVoxelsPerUnit = [] {
        std::array<float, kDepthCount> voxels{};
        for (std::size_t depth = 0; depth < kDepthCount; ++depth)
            voxels[depth] = static_cast<float>(voxelsPerAxis / static_cast<double>(kTileWidths[depth]));
        return voxels;
    }();

public:
    /// The depth at which a voxel is one index unit wide.
    static constexpr int kUnitDepth = [] {
        int depth = kDeepest;
        while (kTileWidths[static_cast<std::size_t>(depth)] < voxelsPerAxis)
            --depth;
        return depth;
    }();
};

template <class Traits> using TileOf = Tile<Traits, TileLayout<Traits>::kChildCount>;

}
