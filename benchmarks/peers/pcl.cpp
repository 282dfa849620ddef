#include "Inputs.h"

#include <pcl/filters/extract_indices.h>
#include <pcl/point_types.h>

using namespace Benchmarks;

namespace {

/// A point has 48 bytes here, as its vectors are padded.
Row const deletion("deletePointsInPointCloud:PCL", kPoints, [](Run& run) {
    using Cloud = pcl::PointCloud<pcl::PointXYZRGBNormal>;
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
    run.report("remaining", static_cast<double>(remaining));
});

}
