#include "geometry/SurfaceBand.h"

#include "support/MeshBuilder.h"

#include <TessaraGeometry/Makers.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <map>
#include <tuple>

namespace ModelingProgram {

namespace {

    using Index = std::tuple<int, int, int>;

    std::map<Index, float> byIndex(std::vector<TSR::TileTree3D::Voxel> const& voxels)
    {
        std::map<Index, float> result;
        for (auto const& [i, j, k, value] : voxels)
            EXPECT_TRUE(result.emplace(Index(i, j, k), value).second) << "twice: " << i << " " << j << " " << k;
        return result;
    }

    /// Calls `visit` with the voxels around a square from (-20, -4, 7) to (20, 36, 7), and its nearest point.
    template <class Visit> void forEachVoxelNear(double halfWidth, Visit const& visit)
    {
        int const reach = static_cast<int>(halfWidth) + 1;
        for (int i = -20 - reach; i <= 20 + reach; ++i)
            for (int j = -4 - reach; j <= 36 + reach; ++j)
                for (int k = 7 - reach; k <= 7 + reach; ++k) {
                    int const x = std::clamp(i, -20, 20), y = std::clamp(j, -4, 36);
                    if (std::hypot(i - x, j - y, k - 7) <= halfWidth)
                        visit(Index(i, j, k), x, y);
                }
    }

}

TEST(SurfaceBand, HasTheValuesOfTheNearestPoint)
{
    constexpr double kVoxelSize = 0.5;
    // A square face, larger than the pieces that are filled separately.
    auto const mesh = Tessara::Geometry::makeMesh(
        {{-10, -2, 3.5f}, {10, -2, 3.5f}, {10, 18, 3.5f}, {-10, 18, 3.5f}}, {0, 1, 2, 3}, {0, 4});
    for (double const halfWidth : {1.0, 3.0, 5.5}) {
        SurfaceValue height; // x + 2 y, which is linear
        height.pointNumbers = {-14, 6, 46, 26};
        SurfaceValue distance;
        distance.distanceTo = {1, 2, 3.5};
        auto heights = byIndex(voxelsAround(arraysOf(*mesh), height, kVoxelSize, halfWidth));
        auto distances = byIndex(voxelsAround(arraysOf(*mesh), distance, kVoxelSize, halfWidth));
        std::size_t count = 0;
        forEachVoxelNear(halfWidth, [&](Index const& voxel, int x, int y) {
            ++count;
            ASSERT_TRUE(heights.contains(voxel) && distances.contains(voxel));
            EXPECT_NEAR(heights[voxel], x * kVoxelSize + 2 * y * kVoxelSize, 1e-4);
            EXPECT_NEAR(distances[voxel], std::hypot(x * kVoxelSize - 1, y * kVoxelSize - 2), 1e-5);
        });
        EXPECT_EQ(heights.size(), count);
        EXPECT_EQ(distances.size(), count);
    }
}

}
