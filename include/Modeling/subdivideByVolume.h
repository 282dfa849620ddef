#pragma once

#include <Modeling/Export.h>
#include <Modeling/VoxelSampler.h>
#include <OrvanCore/Array.h>
#include <TessaraObject/Object.h>

namespace Geometry::Mesh {

/// Refines a closed triangle mesh as `subdivide` does, by a tolerance that varies in space: that of a face is
/// `tolerance` times the value of a volume at the face's second corner. So the volume paints where the mesh stays
/// coarse and where it gets fine.
///
/// Where the product is not above 1.1920929e-7, as where the volume is 0 or below and `tolerance` is not, faces are
/// left alone, but for those next to ones that split. If values fall to 0 along a curve, faces there split until memory
/// ends; if they do so near a single place only, faces there come to the limit of 31 steps, and are left as they are.
/// The volume is looked up in each pass anew, where the smoothed mesh then is. `Internal::markForSubdivision` with the
/// same sampler finds the faces of a result that are still too large.
///
/// \param sampler    The volume; a constant one does what `subdivide` does with its value times `tolerance`. Only
///                   copies of it are used.
/// \param object     As for `subdivide`: what it reads, rewrites and drops, and what it refuses.
/// \param tolerance  In scene units, for a value of 1.
/// \return, \throws  As `subdivide`, also if an enclosing oneTBB group is cancelled.
///
/// The same result for any number of threads. Allocates 4 bytes per point more than `subdivide`, and per thread what
/// `LinearSampler::sampleAll` does. The volume is read once per point and pass. That is fastest if the sampler has a
/// padded channel: otherwise each thread builds a layer around the tiles that it comes to.
template <class Traits>
bool subdivide(TSR::TileTree3D::LinearSampler<Traits> const& sampler, Tessara::Object& object, float tolerance);

extern template MODELING_EXPORT bool subdivide(
    TSR::TileTree3D::LinearSampler<TSR::TileTree3D::Traits2> const&, Tessara::Object&, float);
extern template MODELING_EXPORT bool subdivide(
    TSR::TileTree3D::LinearSampler<TSR::TileTree3D::Traits5> const&, Tessara::Object&, float);

namespace Internal {

    /// The marking of a pass, as `subdivisionSteps.h` has it for one length: sets the marks of faces that do not fit
    /// into twice their tolerance along every axis, and clears none. Reads the volume at all of `positions`.
    /// \throws std::bad_alloc  before any mark is set
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
