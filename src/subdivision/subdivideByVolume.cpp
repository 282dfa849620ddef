#include <Modeling/subdivideByVolume.h>

#include "faceSize.h"
#include "refineMesh.h"

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

    /// The mean of three equal points, as floats give it.
    float3 meanOfThree(float3 const& point)
    {
        Lanes const p = lanesOf(point), mean = (everyLane(0) + p + p + p) / everyLane(3);
        return {mean[0], mean[1], mean[2]};
    }

    /// A loop body that is copied with each split of the range, and with it the sampler's cursors and caches: no two
    /// tasks share them.
    template <class Traits> struct SampleAtPoints {
        mutable LinearSampler<Traits> sampler;
        float3 const* position;
        float* value;

        void operator()(tbb::blocked_range<unsigned int> const& points) const
        {
            constexpr unsigned int kAtOnce = 256;
            float3 mean[kAtOnce];
            unsigned int count = 0;
            for (unsigned int first = points.begin(); first != points.end(); first += count) {
                count = std::min(kAtOnce, points.end() - first);
                for (unsigned int n = 0; n < count; ++n)
                    mean[n] = meanOfThree(position[first + n]);
                sampler.sampleAll(mean, count, Traits::kUnitDepth, TSR::TileTree3D::kWorldSpace, value + first);
            }
        }
    };

    /// Each face has the value at its second corner. Not in its middle, on purpose: it does not move with the others.
    void markFaces(float const* value, float tolerance, unsigned int faceCount, float3 const* position,
        unsigned int const* corner, unsigned int const* offset, bool* mark)
    {
        // Each face writes its own mark.
        parallelFor(tbb::blocked_range<unsigned int>(0, faceCount, kFaceGrain), [=](auto const& faces) {
            for (unsigned int face = faces.begin(); face != faces.end(); ++face) {
                unsigned int const* const c = corner + offset[face];
                float const localTolerance = value[c[1]] * tolerance;
                if (localTolerance > std::numeric_limits<float>::epsilon()
                    && Internal::longestBoxSide(position[c[0]], position[c[1]], position[c[2]])
                        > localTolerance + localTolerance)
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
        // Points are the second corners of two faces on average: to look each up once is half of the work, and they
        // come in an order that stays in a tile for longer. Each point writes its own value.
        auto const pointCount = static_cast<unsigned int>(positions.size);
        Orvan::Array<float> values(pointCount, Orvan::kUninitialized);
        SampleAtPoints<Traits> const sampleAtPoints{sampler, positions.data, values.data};
        parallelFor(tbb::blocked_range<unsigned int>(0, pointCount, kFaceGrain), sampleAtPoints);
        markFaces(values.data, tolerance, numFaces, positions.data, faceVertex.data, faceOffset.data, marks.data);
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
