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
    double sum = 0;
    timeRuns(run, points.size(), [&] {
        auto const accessor = grid->getConstAccessor();
        sum = 0;
        for (auto const& p : points)
            sum += openvdb::tools::BoxSampler::sample(accessor, openvdb::Vec3R(p.x, p.y, p.z));
        DoNotOptimize(sum);
    });
    run.reportResult(sum);
}
Row const padded("samplePaddedVolume:OpenVDB", kSampled, measureSampling);
Row const layered("sampleVolume:OpenVDB", kSampled, measureSampling);

Row const building("buildVolume:OpenVDB", kRadii, [](Run& run) {
    std::vector<Voxel> const voxels = bandOfVoxels(run.size());
    timeRuns(run, voxels.size(), [&] { DoNotOptimize(gridOf(voxels)); });
    double sum = 0;
    auto const grid = gridOf(voxels);
    for (auto const& voxel : voxels)
        sum += static_cast<double>(grid->tree().getValue({voxel.i, voxel.j, voxel.k}));
    run.reportResult(sum);
});

}
