#include "Inputs.h"

#include <pcl/filters/extract_indices.h>
#include <pcl/point_types.h>

using namespace Benchmarks;

namespace {

using Cloud = pcl::PointCloud<pcl::PointXYZRGBNormal>; // a point has 48 bytes, as its vectors are padded

Row const deletion("deletePointsInPointCloud:PCL", kPoints, [](Run& run) {
    Cloud::Ptr const cloud(new Cloud);
    cloud->resize(run.size());
    pcl::PointIndices::Ptr const picked(new pcl::PointIndices);
    Indices const indices = everySecondAtRandom(run.size());
    picked->indices.assign(indices.begin(), indices.end());
    std::size_t remaining = 0;
    timeOnCopies(run, run.size(), Cloud(), [&](Cloud& result) {
        pcl::ExtractIndices<pcl::PointXYZRGBNormal> filter;
        filter.setInputCloud(cloud);
        filter.setIndices(picked);
        filter.setNegative(true);
        filter.filter(result);
        remaining = result.size();
    });
    run.reportResult(static_cast<double>(remaining));
});

Cloud cloudOf(std::size_t count)
{
    Cloud cloud;
    cloud.resize(count);
    return cloud;
}

Row const adding("addPointsToPointCloud:PCL", kAdded, [](Run& run) {
    Cloud source = cloudOf(run.size()), added = cloudOf(run.size(1));
    std::size_t count = 0;
    timeOnCopies(run, run.size() + run.size(1), Cloud(), [&](Cloud& result) {
        result = source + added;
        count = result.size();
    });
    run.reportResult(static_cast<double>(count));
});

Row const addingInPlace("addPointsToPointCloudInPlace:PCL", kAddedInPlace, [](Run& run) {
    Cloud const added = cloudOf(run.size(1));
    auto const makeRoomy = [&] {
        Cloud cloud = cloudOf(run.size());
        cloud.reserve(run.size() + run.size(1));
        return cloud;
    };
    timeOnEach(run, run.size(1), makeRoomy, [&](Cloud& cloud) { cloud += added; });
});

}
