#pragma once

#include <TessaraGeometryVolume/VolumeBuilder.h>
#include <TessaraMathSupport/Types.h>

#include <memory>
#include <span>

namespace Benchmarks {

/// A float grid of OpenVDB, hidden so that its headers are compiled once.
class OpenvdbGrid {
public:
    OpenvdbGrid(std::span<TSR::TileTree3D::Voxel const> voxels, float background);
    ~OpenvdbGrid();

    /// The sum of the values at points in index space, each blended of eight.
    float sumOfSamples(std::span<Tessara::Math::float3 const> points) const;

private:
    struct Grid;
    std::unique_ptr<Grid> grid_;
};

}
