#include "SurfaceVolume.h"

#include "Geometry.h"
#include "shell/Failure.h"

#include <fmt/format.h>

#include <algorithm>
#include <cmath>

namespace ModelingProgram {

using Tessara::Object;

namespace {

    /// Maps the values linearly, so that the smallest one becomes `from` and the largest one `to`.
    void mapValues(float from, float to, std::vector<TSR::TileTree3D::Voxel>& voxels)
    {
        auto const [least, most] = valueRange(voxels);
        double const width = double{most} - least;
        for (auto& voxel : voxels) {
            double const t = width > 0 ? (double{voxel.value} - least) / width : 0;
            voxel.value = static_cast<float>((1 - t) * from + t * to);
        }
    }

    void requireFiniteValues(SparseVolume const& volume)
    {
        if (!std::all_of(volume.voxels.begin(), volume.voxels.end(),
                [](TSR::TileTree3D::Voxel const& voxel) { return std::isfinite(voxel.value); }))
            throw Failure(ExitCode::Refused, "the values of the volume are too large for single precision");
    }

}

void requireFiniteSurface(MeshArrays const& mesh, std::string const& source)
{
    if (!std::all_of(mesh.positions->begin(), mesh.positions->end(), [](float3 const& p) { return isFinite(p); }))
        throw Failure(ExitCode::Refused, fmt::format("a coordinate in {} is not finite", source));
}

void requireFiniteNumbers(std::vector<float> const& numbers, std::string const& what)
{
    if (!std::all_of(numbers.begin(), numbers.end(), [](float number) { return std::isfinite(number); }))
        throw Failure(ExitCode::Refused, fmt::format("the {} are not all finite", what));
}

double voxelSizeFor(unsigned int voxels, Object const& mesh, std::string const& source)
{
    auto const box = boundingBoxOf(mesh);
    if (!box)
        return 1; // any size, since there are no voxels
    double const longest =
        std::max({double{box->max.x} - box->min.x, double{box->max.y} - box->min.y, double{box->max.z} - box->min.z});
    if (!(longest > 0))
        throw Failure(ExitCode::Refused,
            fmt::format("all points of {} are at the same position, so --voxel-size is required", source));
    return longest / voxels;
}

std::pair<float, float> valueRange(std::vector<TSR::TileTree3D::Voxel> const& voxels)
{
    auto const [least, most] = std::minmax_element(
        voxels.begin(), voxels.end(), [](auto const& a, auto const& b) { return a.value < b.value; });
    return least == voxels.end() ? std::pair<float, float>() : std::pair(least->value, most->value);
}

void fillBand(MeshArrays const& mesh, SurfaceValue const& value, double halfWidth,
    std::optional<std::pair<float, float>> const& mapTo, SparseVolume& volume)
{
    volume.voxels = voxelsAround(mesh, value, volume.voxelSize, halfWidth);
    if (mapTo)
        mapValues(mapTo->first, mapTo->second, volume.voxels);
    requireFiniteValues(volume);
}

}
