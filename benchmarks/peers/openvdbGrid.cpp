#include "openvdbGrid.h"

#include <openvdb/openvdb.h>
#include <openvdb/tools/Interpolation.h>

namespace Benchmarks {

struct OpenvdbGrid::Grid {
    openvdb::FloatGrid::Ptr grid;
};

OpenvdbGrid::OpenvdbGrid(std::span<TSR::TileTree3D::Voxel const> voxels, float background)
    : grid_(std::make_unique<Grid>())
{
    grid_->grid = openvdb::FloatGrid::create(background);
    auto accessor = grid_->grid->getAccessor();
    for (auto const& voxel : voxels)
        accessor.setValue({voxel.i, voxel.j, voxel.k}, voxel.value);
}

OpenvdbGrid::~OpenvdbGrid() = default;

float OpenvdbGrid::sumOfSamples(std::span<Tessara::Math::float3 const> points) const
{
    auto const accessor = grid_->grid->getConstAccessor();
    float sum = 0;
    for (auto const& p : points)
        sum += openvdb::tools::BoxSampler::sample(accessor, openvdb::Vec3R(p.x, p.y, p.z));
    return sum;
}

}
