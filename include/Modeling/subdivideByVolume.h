#pragma once

#include <Modeling/Export.h>
#include <Modeling/VoxelSampler.h>
#include <OrvanCore/Array.h>
#include <TessaraObject/Object.h>

namespace Geometry::Mesh {

/// Refines a closed triangle mesh by adaptive √3-subdivision, as `subdivide` does, with a tolerance that varies in
/// space: the tolerance of a face is `tolerance` times the value of a volume at the face's second corner. So the volume
/// controls where the mesh is coarse and where it is fine.
///
/// If the product is not above 1.1920929e-7, as for a value of 0 or below and a positive `tolerance`, the face splits
/// only as far as its neighbors require. If values fall to 0 along a curve, faces there split until memory runs out; if
/// they fall to 0 in isolated places only, faces there reach the limit of 31 steps and are left as they are. Each pass
/// samples the volume at the smoothed mesh of the pass before. `Internal::markForSubdivision` with the same sampler
/// finds the faces of a result that are still too large.
///
/// \param sampler    The volume. A constant volume gives the result of `subdivide` with its value times `tolerance`.
///                   Only copies of the sampler are used.
/// \param object     As for `subdivide`: what is read, rewritten, removed and refused.
/// \param tolerance  In scene units, for a value of 1.
/// \return, \throws  As `subdivide`, also if an enclosing oneTBB task group is cancelled.
///
/// Runs in parallel, with the same result for any number of threads. Allocates 4 bytes per point more than `subdivide`,
/// and per task what `LinearSampler::sampleAll` allocates. The volume is sampled once per point and pass. That is
/// fastest if the sampler has a `haloChannel`: otherwise each task builds halos around the tiles that it reads.
///
/// Method: as `subdivide`; the volume is interpolated trilinearly.
template <class Traits>
bool subdivide(TSR::TileTree3D::LinearSampler<Traits> const& sampler, Tessara::Object& object, float tolerance);

extern template MODELING_EXPORT bool subdivide(
    TSR::TileTree3D::LinearSampler<TSR::TileTree3D::Traits2> const&, Tessara::Object&, float);
extern template MODELING_EXPORT bool subdivide(
    TSR::TileTree3D::LinearSampler<TSR::TileTree3D::Traits5> const&, Tessara::Object&, float);

namespace Internal {

    /// Marks the faces of a pass, like the function of this name in `subdivisionSteps.h` for a constant tolerance: sets
    /// the marks of faces that do not fit into twice their tolerance along every axis, and clears none. Samples the
    /// volume at all of `positions`.
    /// \pre  `marks` has at least `numFaces` entries.
    /// \throws std::bad_alloc  before any mark is set, unless oneTBB itself runs out of memory while faces are marked
    template <class Traits> void markForSubdivision(TSR::TileTree3D::LinearSampler<Traits> const& sampler,
        unsigned int numFaces, Orvan::Array<Tessara::Math::float3> const& positions,
        Orvan::Array<unsigned int> const& faceVertex, Orvan::Array<unsigned int> const& faceOffset,
        Orvan::Array<bool>& marks, float tolerance);

    extern template MODELING_EXPORT void markForSubdivision(
        TSR::TileTree3D::LinearSampler<TSR::TileTree3D::Traits2> const&, unsigned int,
        Orvan::Array<Tessara::Math::float3> const&, Orvan::Array<unsigned int> const&,
        Orvan::Array<unsigned int> const&, Orvan::Array<bool>&, float);
    extern template MODELING_EXPORT void markForSubdivision(
        TSR::TileTree3D::LinearSampler<TSR::TileTree3D::Traits5> const&, unsigned int,
        Orvan::Array<Tessara::Math::float3> const&, Orvan::Array<unsigned int> const&,
        Orvan::Array<unsigned int> const&, Orvan::Array<bool>&, float);

}

}
