#pragma once

#include "MeshArrays.h"

#include <TessaraGeometryVolume/VolumeBuilder.h>
#include <TessaraMathSupport/Types.h>

#include <optional>
#include <vector>

namespace ModelingProgram {

/// What holds at each place of a surface: a number of the points, blended over the triangles of the face (its fan from
/// the first corner), or the distance to a place.
struct SurfaceValue {
    std::vector<float> pointNumbers;
    std::optional<Tessara::Math::double3> distanceTo; // goes first
};

/// What a band around a surface takes, estimated from the area of the surface before anything is allocated.
struct BandSize {
    double voxels = 0;
    double bytes = 0; // at the peak, which is while the band is made or while it is written as an OpenVDB file
};

/// Within some ten percent for a surface of one sheet. Too large where sheets lie closer together than the band is wide,
/// but never more than the box around mesh and band holds.
/// \throws Failure  as `voxelsAround`
BandSize estimateBand(MeshArrays const& mesh, double voxelSize, double halfWidth);

/// The voxels within `halfWidth` voxels of a surface, each with what holds at the place of the surface that is nearest to
/// it; of several the one in the first face. Voxel (i, j, k) stands at `(i, j, k) * voxelSize`. In ascending order of
/// blocks of 8³ voxels. Time and memory go with the voxels, and with the faces where these are smaller.
/// \throws Failure  for a surface that is longer than 16 million voxels, or lies farther from the origin than 2 billion;
///                  and once the job is cancelled, which is looked at in every row of voxels
std::vector<TSR::TileTree3D::Voxel> voxelsAround(
    MeshArrays const& mesh, SurfaceValue const& value, double voxelSize, double halfWidth);

}
