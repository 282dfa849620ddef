#pragma once

#include "MeshTopology.h"

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

/// The voxels within `halfWidth` voxels of a surface, each with what holds at the place of the surface that is nearest to
/// it; of several the one in the first face. Voxel (i, j, k) stands at `(i, j, k) * voxelSize`. In ascending order of
/// blocks of 8³ voxels. Time and memory go with the voxels, and with the faces where these are smaller.
/// \throws Failure  for a surface that is longer than 16 million voxels, or lies farther from the origin than 2 billion
std::vector<TSR::TileTree3D::Voxel> voxelsAround(
    MeshArrays const& mesh, SurfaceValue const& value, double voxelSize, double halfWidth);

}
