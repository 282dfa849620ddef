#include "PointCorners.h"

#include "Arrays.h"
#include "Assert.h"

#include <tbb/task_arena.h>

#include <algorithm>
#include <functional>
#include <new>

namespace Modeling {

namespace {

    /// Calls `work(first, last)` for parts of the points in parallel. Each part walks all corners in the same order and
    /// writes only what belongs to its points. So there are no atomics and nothing to sort, and the result does not
    /// depend on the number of parts.
    template <class Work> void forEachPartOfPoints(unsigned int pointCount, Work const& work)
    {
        auto const threads = static_cast<unsigned int>(tbb::this_task_arena::max_concurrency());
        unsigned int const parts = pointCount <= kFewPoints ? 1 : std::min(threads, kMostPointParts);
        parallelFor(tbb::blocked_range<std::size_t>(0, parts, kCoarseGrain), [&, parts, pointCount](auto const& range) {
            for (std::uint64_t part = range.begin(); part != range.end(); ++part)
                work(static_cast<unsigned int>(pointCount * part / parts),
                    static_cast<unsigned int>(pointCount * (part + 1) / parts));
        });
    }

    /// Replaces counts by their inclusive prefix sums.
    void sumUp(unsigned int pointCount, unsigned int* const count)
    {
        auto const addUp = [count](tbb::blocked_range<std::size_t> const& points, unsigned int sum, bool isFinal) {
            for (std::size_t point = points.begin(); point != points.end(); ++point) {
                sum += count[point];
                if (isFinal)
                    count[point] = sum;
            }
            return sum;
        };
        tbb::blocked_range<std::size_t> const all(0, pointCount, kElementGrain);
        if (pointCount <= kFewPoints)
            addUp(all, 0, true);
        else if (!runIsolated([&] { tbb::parallel_scan(all, 0u, addUp, std::plus<>()); }))
            throw std::bad_alloc(); // some counts may already be sums, so they cannot be summed up again
    }

}

PointCorners cornersByPoint(unsigned int pointCount, unsigned int const* faceVertex, std::size_t cornerCount)
{
    PointCorners lists{uninitializedArray<unsigned int>(std::uint64_t{pointCount} + 1), {}};
    unsigned int* const offset = lists.offsets.data;
    forEachPartOfPoints(pointCount, [=](unsigned int first, unsigned int last) {
        std::fill(offset + first, offset + last, 0u);
        // One unsigned comparison tests first <= point < last, here and below.
        for (std::size_t corner = 0; corner != cornerCount; ++corner)
            if (unsigned int const point = faceVertex[corner]; point - first < last - first)
                ++offset[point];
    });
    sumUp(pointCount, offset);
    offset[pointCount] = pointCount == 0 ? 0 : offset[pointCount - 1];

    lists.corners = uninitializedArray<unsigned int>(offset[pointCount]);
    unsigned int* const entry = lists.corners.data;
    // Filled from the last corner to the first, so that each list ascends and its offset ends up at its first entry.
    forEachPartOfPoints(pointCount, [=](unsigned int first, unsigned int last) {
        for (std::size_t corner = cornerCount; corner-- != 0;)
            if (unsigned int const point = faceVertex[corner]; point - first < last - first)
                entry[--offset[point]] = static_cast<unsigned int>(corner);
    });
    MODELING_ASSERT(areOffsets(offset, pointCount, lists.corners.size));
    return lists;
}

}
