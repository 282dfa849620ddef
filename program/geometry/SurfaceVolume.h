#pragma once

#include "SurfaceBand.h"
#include "files/VdbFile.h"

#include <TessaraObject/Object.h>

#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace ModelingProgram {

// The parts of making a volume around a mesh, whose values come from its surface. All refuse with `Failure`.

/// \param source  where the mesh comes from, here and below: a file in most cases
void requireFiniteSurface(MeshArrays const& mesh, std::string const& source);
/// \param what  start of the message: "values of ..."
void requireFiniteNumbers(std::vector<float> const& numbers, std::string const& what);

/// The size of voxels of which the given number fits along the longest side of the mesh.
double voxelSizeFor(unsigned int voxels, Tessara::Object const& mesh, std::string const& source);

/// The smallest and the largest value; zeros if there are no voxels.
std::pair<float, float> valueRange(std::vector<TSR::TileTree3D::Voxel> const& voxels);

/// Gives the volume the voxels within `halfWidth` voxels of the surface.
/// \param mapTo   what the smallest and the largest value become; the others are mapped linearly
/// \param volume  its voxel size is given
void fillBand(MeshArrays const& mesh, SurfaceValue const& value, double halfWidth,
    std::optional<std::pair<float, float>> const& mapTo, SparseVolume& volume);

}
