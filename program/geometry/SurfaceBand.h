#pragma once

#include "MeshArrays.h"

#include <TessaraGeometryVolume/VolumeBuilder.h>
#include <TessaraMathSupport/Types.h>

#include <optional>
#include <vector>

namespace ModelingProgram {

/// A value at each point of a surface: a number per mesh point, interpolated over the triangles of the face (its fan
/// from the first corner), or the distance to a given point.
struct SurfaceValue {
    std::vector<float> pointNumbers;
    std::optional<Tessara::Math::double3> distanceTo; // takes precedence
};

/// The size of a band around a surface, estimated from the area of the surface before anything is allocated.
struct BandSize {
    double voxels = 0;
    double bytes = 0; // peak memory while the band is made or written as an OpenVDB file
};

/// Accurate to about ten percent for a surface of one sheet. An overestimate if sheets are closer together than the
/// band is wide, but never more than the bounding box of the band contains.
/// \throws Failure  as `voxelsAround` does
BandSize estimateBand(MeshArrays const& mesh, double voxelSize, double halfWidth);

/// The voxels within `halfWidth` voxels of a surface, each with the value at the nearest point of the surface (on
/// the first of several faces). Voxel (i, j, k) is at `(i, j, k) * voxelSize`. In ascending order of blocks of 8³
/// voxels. Time and memory are proportional to the number of voxels, or of faces smaller than voxels.
/// \throws Failure  if the surface is longer than 16 million voxels or more than 2 billion voxels away from the origin,
///                  or if the job is cancelled, which is checked at every row of voxels
std::vector<TSR::TileTree3D::Voxel> voxelsAround(
    MeshArrays const& mesh, SurfaceValue const& value, double voxelSize, double halfWidth);

}
