#include "VolumeReport.h"

#include "shell/Progress.h"

#include <fmt/format.h>

namespace ModelingProgram {

void reportVolume(SparseVolume const& volume, float least, float most, Report& report)
{
    auto const voxelSize = static_cast<float>(volume.voxelSize);
    report.document["volume"] = {{"grid", volume.name}, {"activeVoxels", volume.activeCount()},
        {"voxelSize", numberOf(voxelSize)}, {"smallestValue", numberOf(least)}, {"largestValue", numberOf(most)},
        {"background", numberOf(volume.background)}};
    report.text += fmt::format("grid \"{}\": {} of size {}, {}background {}\n", printable(volume.name),
        countOf(volume.activeCount(), "active voxel"), voxelSize,
        volume.activeCount() == 0 ? "" : fmt::format("values from {} to {}, ", least, most), volume.background);
}

}
