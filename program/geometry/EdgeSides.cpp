#include "EdgeSides.h"

#include <tbb/blocked_range.h>
#include <tbb/parallel_for.h>

#include <numeric>

namespace ModelingProgram {

EdgeSides::EdgeSides(MeshArrays const& mesh)
    : offsets_(std::size_t{mesh.pointCount()} + 1)
{
    // On one thread: the points of a face are scattered in memory, and atomic increments would stall on each of them.
    unsigned int const* const point = mesh.faceVertex->data;
    forEachSide(mesh, [&](unsigned int corner, unsigned int next) {
        if (point[corner] != point[next])
            ++offsets_[std::min(point[corner], point[next])];
    });
    std::inclusive_scan(offsets_.begin(), offsets_.end(), offsets_.begin());
    sides_.resize(offsets_.back());
    // Filling each range from its end turns the end offsets into start offsets.
    forEachSide(mesh, [&](unsigned int corner, unsigned int next) {
        auto const [lower, higher] = std::minmax(point[corner], point[next]);
        if (lower != higher)
            sides_[--offsets_[lower]] = {higher, corner, next};
    });
    // Each point sorts its own sides.
    tbb::parallel_for(tbb::blocked_range<std::size_t>(0, mesh.pointCount(), 1000), [&](auto const& points) {
        for (std::size_t p = points.begin(); p != points.end(); ++p)
            std::sort(sides_.begin() + offsets_[p], sides_.begin() + offsets_[p + 1]);
    });
}

}
