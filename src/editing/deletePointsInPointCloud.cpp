#include <Modeling/deletePointsInPointCloud.h>

#include "Deletion.h"
#include "frame/Arrays.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Prototypes.h>

#include <atomic>

namespace Tessara::GeometryAlgorithms {

using namespace Modeling;
using namespace Tessara::Geometry;

namespace {

    template <class Index> Orvan::Array<bool> markPoints(Orvan::Array<Index> const& indices, unsigned int pointCount)
    {
        Orvan::Array<bool> marks = zeroedArray<bool>(pointCount);
        bool* const mark = marks.data;
        Index const* const index = indices.data;
        // Several threads may mark the same point, and all of them store the same value.
        parallelFor(tbb::blocked_range<std::size_t>(0, indices.size, kScatterGrain), [=](auto const& range) {
            for (std::size_t i = range.begin(); i != range.end(); ++i) {
                auto const point = static_cast<std::uint64_t>(index[i]); // negative indices become large
                if (point < pointCount)
                    std::atomic_ref<bool>(mark[point]).store(true, std::memory_order_relaxed);
            }
        });
        return marks;
    }

    template <class Index> bool deletePoints(Orvan::Array<Index> const& indices, Object& object)
    {
        if (!Object::isA(object, *getPointCloudPrototype()))
            return false;
        Modeling::Internal::Deletion deletion(object);
        bool const isDone = deletion.prepare(sPointComp, markPoints(indices, getElementCount(object, sPointComp)));
        deletion.commit();
        return isDone;
    }

}

bool deletePointsInPointCloud(Orvan::Array<unsigned int> const& indices, Object& object, Orvan::RuntimeServices const*)
{
    return deletePoints(indices, object);
}

bool deletePointsInPointCloud(Orvan::Array<long long> const& indices, Object& object, Orvan::RuntimeServices const*)
{
    return deletePoints(indices, object);
}

}
