#include <Modeling/subdivideByVolume.h>

#include "faceSize.h"
#include "refineMesh.h"

#include "frame/Assert.h"
#include "frame/Lanes.h"
#include "frame/ParallelFor.h"

#include <algorithm>
#include <limits>

namespace Geometry::Mesh {

using namespace Modeling;
using Tessara::Math::float3;
using TSR::TileTree3D::LinearSampler;
using TSR::TileTree3D::Traits2;
using TSR::TileTree3D::Traits5;

namespace {

    /// Writes (p + p + p) / 3 for each point p: results depend on its rounding.
    void writeMeans(float3 const* points, std::size_t count, float3* means)
    {
        float const* const coordinate = &points->x;
        float* const mean = &means->x;
        for (std::size_t n = 0; n < 3 * count; ++n)
            mean[n] = (0 + coordinate[n] + coordinate[n] + coordinate[n]) / 3.0f;
    }

    /// Turns values of the volume into limits on the sides of a face's bounding box; infinite if the local tolerance is
    /// too small or NaN.
    void turnIntoLimits(float tolerance, std::size_t count, float* values)
    {
        auto const limitsOf = [=](Lanes four) {
            Lanes const local = four * broadcast(tolerance);
            constexpr float kNoLimit = std::numeric_limits<float>::infinity();
            return local > broadcast(std::numeric_limits<float>::epsilon()) ? local + local : broadcast(kNoLimit);
        };
        std::size_t const inFours = count & ~std::size_t{3};
        for (std::size_t n = 0; n < inFours; n += 4)
            store(limitsOf(load(values + n)), values + n);
        for (std::size_t n = inFours; n < count; ++n)
            values[n] = limitsOf(broadcast(values[n]))[0];
    }

    /// A loop body. Each call has its own copy of the sampler, because cursors and caches must not be shared by tasks.
    template <class Traits> struct SampleAtPoints {
        LinearSampler<Traits> const& original;
        float3 const* position;
        float tolerance;
        float* limit;

        void operator()(tbb::blocked_range<unsigned int> const& points) const
        {
            LinearSampler<Traits> sampler = original;
            constexpr unsigned int kAtOnce = 256;
            float3 mean[kAtOnce];
            unsigned int count = 0;
            for (unsigned int first = points.begin(); first != points.end(); first += count) {
                count = std::min(kAtOnce, points.end() - first);
                writeMeans(position + first, count, mean);
                float* const row = limit + first;
                constexpr int kDepth = TSR::TileTree3D::Internal::TileLayout<Traits>::kUnitDepth;
                sampler.sampleAll(mean, count, kDepth, TSR::TileTree3D::kWorldSpace, row);
                turnIntoLimits(tolerance, count, row);
            }
        }
    };

    /// A face has the limit of its second corner, not of its center: existing scenes depend on it.
    void markFaces(float const* limit, unsigned int faceCount, float3 const* position, unsigned int const* corner,
        unsigned int const* offset, bool* mark)
    {
        // Each face writes its own mark.
        parallelFor(tbb::blocked_range<unsigned int>(0, faceCount, kFaceGrain), [=](auto const& faces) {
            for (unsigned int face = faces.begin(); face != faces.end(); ++face) {
                unsigned int const* const c = corner + offset[face];
                if (Internal::isBoxLonger(position[c[0]], position[c[1]], position[c[2]], broadcast(limit[c[1]])))
                    mark[face] = true;
            }
        });
    }

}

namespace Internal {

    template <class Traits> void markForSubdivision(LinearSampler<Traits> const& sampler, unsigned int numFaces,
        Orvan::Array<float3> const& positions, Orvan::Array<unsigned int> const& faceVertex,
        Orvan::Array<unsigned int> const& faceOffset, Orvan::Array<bool>& marks, float tolerance)
    {
        // A point is the second corner of two faces on average: sampling per point is half of the work, and consecutive
        // points are more often in the same tile. Each point writes its own limit.
        MODELING_ASSERT(marks.size >= numFaces);
        auto const pointCount = static_cast<unsigned int>(positions.size);
        Orvan::Array<float> limits(pointCount, Orvan::kUninitialized);
        SampleAtPoints<Traits> const sampleAtPoints{sampler, positions.data, tolerance, limits.data};
        parallelFor(tbb::blocked_range<unsigned int>(0, pointCount, kSampledPointGrain), sampleAtPoints);
        markFaces(limits.data, numFaces, positions.data, faceVertex.data, faceOffset.data, marks.data);
    }

    template void markForSubdivision(LinearSampler<Traits2> const&, unsigned int, Orvan::Array<float3> const&,
        Orvan::Array<unsigned int> const&, Orvan::Array<unsigned int> const&, Orvan::Array<bool>&, float);
    template void markForSubdivision(LinearSampler<Traits5> const&, unsigned int, Orvan::Array<float3> const&,
        Orvan::Array<unsigned int> const&, Orvan::Array<unsigned int> const&, Orvan::Array<bool>&, float);

}

template <class Traits> bool subdivide(LinearSampler<Traits> const& sampler, Tessara::Object& object, float tolerance)
{
    auto const markByValue = [&](Internal::MarkableMesh const& mesh, Orvan::Array<bool>& marks) {
        Internal::markForSubdivision(
            sampler, mesh.faceCount, mesh.positions, mesh.faceVertex, mesh.faceOffset, marks, tolerance);
    };
    return Internal::refineMesh(markByValue, object);
}

template bool subdivide(LinearSampler<Traits2> const&, Tessara::Object&, float);
template bool subdivide(LinearSampler<Traits5> const&, Tessara::Object&, float);

}
