#include "Inputs.h"

#include <openvdb/openvdb.h>
#include <openvdb/tools/Interpolation.h>

using namespace Benchmarks;

namespace {

openvdb::FloatGrid::Ptr gridOf(std::vector<Voxel> const& voxels)
{
    auto const grid = openvdb::FloatGrid::create(1);
    auto accessor = grid->getAccessor();
    for (auto const& voxel : voxels)
        accessor.setValue({voxel.i, voxel.j, voxel.k}, voxel.value);
    return grid;
}

void measureSampling(Run& run)
{
    std::vector<float3> const points = pointsInBand(run.size(), kRadius);
    auto const grid = gridOf(bandOfVoxels(kRadius));
    timeRuns(run, points.size(), [&] {
        auto const accessor = grid->getConstAccessor();
        float sum = 0;
        for (auto const& p : points)
            sum += openvdb::tools::BoxSampler::sample(accessor, openvdb::Vec3R(p.x, p.y, p.z));
        DoNotOptimize(sum);
    });
}
Row const padded("samplePaddedVolume:openvdb", kSampled, measureSampling);
Row const layered("sampleVolume:openvdb", kSampled, measureSampling);

Row const building("buildVolume:openvdb", kRadii, [](Run& run) {
    std::vector<Voxel> const voxels = bandOfVoxels(run.size());
    timeRuns(run, voxels.size(), [&] { DoNotOptimize(gridOf(voxels)); });
});

}
