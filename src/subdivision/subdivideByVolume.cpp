#include <Modeling/subdivideByVolume.h>

#include "faceSize.h"
#include "refineMesh.h"

#include "frame/ParallelFor.h"

#include <limits>

namespace Geometry::Mesh {

using namespace Modeling;
using Tessara::Math::float3;
using TSR::TileTree3D::LinearSampler;
using TSR::TileTree3D::Traits2;
using TSR::TileTree3D::Traits5;

namespace {

    constexpr int kWorldSpace = 2;

    /// The mean of three equal coordinates, as floats give it.
    float meanOfThree(float coordinate)
    {
        return (0 + coordinate + coordinate + coordinate) / 3.0f;
    }

    /// A loop body that is copied with each split of the range, and with it the sampler's cursors and caches: no two
    /// tasks share them.
    template <class Traits> struct MarkFacesByValue {
        mutable LinearSampler<Traits> sampler;
        float3 const* position;
        unsigned int const* corner;
        unsigned int const* offset;
        bool* mark;
        float tolerance;

        void operator()(tbb::blocked_range<unsigned int> const& faces) const
        {
            for (unsigned int face = faces.begin(); face != faces.end(); ++face) {
                unsigned int const* const c = corner + offset[face];
                // Not the middle of the face, on purpose: the value of a face does not move with its other corners.
                float3 const p = position[c[1]];
                float const value = sampler.sample(
                    {meanOfThree(p.x), meanOfThree(p.y), meanOfThree(p.z)}, Traits::kUnitDepth, kWorldSpace);
                float const localTolerance = value * tolerance;
                if (localTolerance > std::numeric_limits<float>::epsilon()
                    && Internal::longestBoxSide(position[c[0]], p, position[c[2]]) > localTolerance + localTolerance)
                    mark[face] = true;
            }
        }
    };

}

namespace Internal {

    template <class Traits> void markForSubdivision(LinearSampler<Traits> const& sampler, unsigned int numFaces,
        Orvan::Array<float3> const& positions, Orvan::Array<unsigned int> const& faceVertex,
        Orvan::Array<unsigned int> const& faceOffset, Orvan::Array<bool>& marks, float tolerance)
    {
        // Each face writes its own mark.
        MarkFacesByValue<Traits> const markFaces{
            sampler, positions.data, faceVertex.data, faceOffset.data, marks.data, tolerance};
        parallelFor(tbb::blocked_range<unsigned int>(0, numFaces, kFaceGrain), markFaces);
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
