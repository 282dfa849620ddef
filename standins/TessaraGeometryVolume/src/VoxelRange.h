#pragma once

#include <TessaraGeometryVolume/VolumeBuilder.h>

#include <algorithm>
#include <cstdint>

namespace TSR::TileTree3D::Internal {

struct Index {
    std::int64_t i, j, k;
};

/// A range of voxels of one depth; `end` is excluded.
struct VoxelRange {
    Index first, end;

    bool isEmpty() const { return first.i >= end.i || first.j >= end.j || first.k >= end.k; }
    VoxelRange overlapWith(VoxelRange const& other) const
    {
        return {{std::max(first.i, other.first.i), std::max(first.j, other.first.j), std::max(first.k, other.first.k)},
            {std::min(end.i, other.end.i), std::min(end.j, other.end.j), std::min(end.k, other.end.k)}};
    }
    VoxelRange boundsWith(VoxelRange const& other) const
    {
        return {{std::min(first.i, other.first.i), std::min(first.j, other.first.j), std::min(first.k, other.first.k)},
            {std::max(end.i, other.end.i), std::max(end.j, other.end.j), std::max(end.k, other.end.k)}};
    }
    bool overlaps(VoxelRange const& other) const { return !overlapWith(other).isEmpty(); }
    bool contains(VoxelRange const& other) const
    {
        return first.i <= other.first.i && first.j <= other.first.j && first.k <= other.first.k && other.end.i <= end.i
            && other.end.j <= end.j && other.end.k <= end.k;
    }
    /// \pre  not empty, and at most 2^20 along each axis
    std::int64_t voxelCount() const { return (end.i - first.i) * (end.j - first.j) * (end.k - first.k); }
    std::int64_t longestSide() const { return std::max({end.i - first.i, end.j - first.j, end.k - first.k}); }
};

inline VoxelRange rangeOf(ConstantBox const& box)
{
    return {{box.first.i, box.first.j, box.first.k}, {box.end.i, box.end.j, box.end.k}};
}

}
