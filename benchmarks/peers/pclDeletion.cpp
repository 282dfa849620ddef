#include "deletions.h"

#include <pcl/filters/extract_indices.h>
#include <pcl/point_types.h>

#include <memory>

namespace Benchmarks {

PeerDeletion pclDeletion(std::size_t pointCount, Orvan::Array<unsigned int> const& indices)
{
    using Cloud = pcl::PointCloud<pcl::PointXYZRGBNormal>;
    Cloud::Ptr const cloud(new Cloud);
    cloud->resize(pointCount);
    pcl::PointIndices::Ptr const picked(new pcl::PointIndices);
    picked->indices.assign(indices.begin(), indices.end());
    auto const result = std::make_shared<Cloud>();
    return {[=] { *result = Cloud(); },
        [=] {
            pcl::ExtractIndices<pcl::PointXYZRGBNormal> filter;
            filter.setInputCloud(cloud);
            filter.setIndices(picked);
            filter.setNegative(true);
            filter.filter(*result);
        },
        [=] { return result->size(); }};
}

}
