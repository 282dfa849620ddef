#pragma once

#include <TessaraGeometryVolume/TileTraits.h>
#include <TessaraMathSupport/Types.h>

#include <algorithm>

namespace TSR::TileTree3D::Internal {

using Tessara::Math::float3;

inline float blend(float from, float to, float fraction)
{
    return (to - from) * fraction + from;
}

/// Trilinear interpolation between the eight values from voxel (i, j, k) to (i + 1, j + 1, k + 1) of an array of
/// `side`³ values: along x, then y, then z.
template <int side> inline float interpolate(float const* values, int i, int j, int k, float3 const& fraction)
{
    constexpr int kNextRow = side, kNextLayer = side * side;
    float const* const v = values + (i + (j + k * side) * side);
    float const near =
        blend(blend(v[0], v[1], fraction.x), blend(v[kNextRow], v[kNextRow + 1], fraction.x), fraction.y);
    float const far = blend(blend(v[kNextLayer], v[kNextLayer + 1], fraction.x),
        blend(v[kNextLayer + kNextRow], v[kNextLayer + kNextRow + 1], fraction.x), fraction.y);
    return blend(near, far, fraction.z);
}

/// For arrays without a layer below the tile: a place below it reads the first voxels.
template <int side> inline float interpolateFromFirst(float const* values, IJK voxel, float3 const& fraction)
{
    return interpolate<side>(values, std::max(voxel.i, 0), std::max(voxel.j, 0), std::max(voxel.k, 0), fraction);
}

/// The index of voxel (0, 0, 0) in an array of `side`³ values that includes a layer all around.
constexpr int firstInLayer(int side)
{
    return 1 + (1 + side) * side;
}

}
