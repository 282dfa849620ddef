#pragma once

#include "GeometryFile.h"

#include <TessaraGeometryVolume/VolumeBuilder.h>

#include <array>
#include <bit>
#include <cstdint>
#include <functional>
#include <vector>

namespace ModelingProgram {

/// A float grid of an OpenVDB file: values at the active points of a cubic lattice, and a background everywhere else.
/// Voxel (i, j, k) is at `(i, j, k) * voxelSize + translation`.
struct SparseVolume {
    std::string name;
    double voxelSize = 1;
    std::array<double, 3> translation{};
    float background = 0;
    std::vector<TSR::TileTree3D::Voxel> voxels;
    // Volumes that are read use cubes, which need a quarter of the memory.
    std::vector<TSR::TileTree3D::VoxelCube> cubes;
    std::vector<float> cubeValues;
    std::vector<TSR::TileTree3D::ConstantBox> boxes; // do not overlap each other or contain other voxels

    /// The number of voxels, including those in boxes.
    std::uint64_t activeCount() const;

    /// Calls `visit(i, j, k, value)` for all voxels outside the boxes.
    template <class Visit> void forEachVoxel(Visit const& visit) const
    {
        for (auto const& [i, j, k, value] : voxels)
            visit(i, j, k, value);
        for (auto const& [first, active, firstValue] : cubes) {
            float const* value = cubeValues.data() + firstValue;
            for (int k = 0; k != 8; ++k)
                for (std::uint64_t left = active[static_cast<std::size_t>(k)]; left != 0; left &= left - 1) {
                    int const place = std::countr_zero(left);
                    visit(first.i + place % 8, first.j + place / 8, first.k + k, *value++);
                }
        }
    }
};

struct VdbGrid {
    std::string name; // "density", or "density[1]" if an earlier grid has that name
    std::string type; // "float", "vec3s", ...
};

/// The size of a grid in memory.
struct VdbGridSize {
    std::uint64_t activeVoxels = 0; // without constant regions, which become boxes
    std::uint64_t treeBytes = 0; // of the tree that OpenVDB reads, before it is converted
};

/// The grids of an OpenVDB file, in its order.
/// \throws FileError  if it is not such a file
std::vector<VdbGrid> listVdbGrids(std::filesystem::path const& file);

/// Reads a grid of the type "float", which may be stored in half precision.
/// \param grid        index in the result of `listVdbGrids`
/// \throws FileError  if the grid is cut off or broken, has a value that is not finite, or voxels that are not cubes
///                    along the axes
/// \param onSize      called before values are read; may throw to refuse the grid
/// \throws std::bad_alloc, and what `onSize` throws
SparseVolume readVdbGrid(
    std::filesystem::path const& file, std::size_t grid,
    std::function<void(VdbGridSize const&)> const& onSize = [](VdbGridSize const&) {});

/// Writes a volume as an OpenVDB file with one grid; the same bytes for the same volume. The file appears under its
/// name only when it is complete.
/// \throws FileError  if the file cannot be written; an existing file is then unchanged
void writeVdbFile(SparseVolume const& volume, std::filesystem::path const& file, Existing existing = Existing::Replace);

}
