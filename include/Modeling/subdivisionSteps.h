#pragma once

#include <Modeling/Export.h>
#include <Modeling/HalfEdgeDataStructure.h>
#include <OrvanCore/Array.h>
#include <TessaraMathSupport/Types.h>
#include <TessaraObject/Object.h>

/// What `Geometry::Mesh::subdivide` is made of, for whoever drives the passes in another way. A pass is: mark faces,
/// `subdivide`, build the half-edges anew, `computePositions`.
///
/// All take triangle meshes in the flat arrays that `subdivide.h` describes. `faceStates` holds a byte a face and
/// `vertexLevels` one a point; both are 0 in the coarse mesh. Of a state
/// - bit 0 is set while refinement is asked for and has not come yet,
/// - bit 1 says that the pass at hand removes the face,
/// - bits 2 to 7 are the level, two to a step. A face of an odd level is a third of a split face whose outer edge has
///   not turned over yet, because the face behind that edge has not split. A face of level 62 takes no mark and never
///   splits, since the levels of its replacements would not fit.
/// A point's level is the step at which it was made.
///
/// Nothing is checked: arrays that do not fit together are undefined. Results are the same for any number of threads.
namespace Geometry::Mesh::Internal {

/// Sets the marks of faces that do not fit into twice `tolerance` along every axis, and clears none. Sets none where
/// the tolerance is not above 1.1920929e-7. Coordinates that are no numbers count as no distance.
MODELING_EXPORT void markForSubdivision(float tolerance, unsigned int numFaces,
    Orvan::Array<Tessara::Math::float3> const& positions, Orvan::Array<unsigned int> const& faceVertex,
    Orvan::Array<unsigned int> const& faceOffset, Orvan::Array<bool>& marks);

/// Whether the levels of faces on both sides of an edge differ by less than 2 everywhere.
MODELING_EXPORT bool isBalanced(HalfEdgeDataStructure const& halfEdges, unsigned int numFaces,
    Orvan::Array<unsigned int> const& faceVertex, Orvan::Array<unsigned int> const& faceOffset,
    Orvan::Array<unsigned char> const& faceStates);

/// One pass: settles across neighbours which faces split, replaces these, and adds their points. On return the counts,
/// the arrays and the point data of `object` describe the refined mesh, and `halfEdges` the mesh before it. Neither the
/// standard properties of `object` nor its counts are touched.
/// \throws std::runtime_error  when the job is cancelled, with changed `faceStates` and nothing else changed
/// \throws std::bad_alloc      also when a count no longer fits 32 bits. The counts, `faceVertex` and `faceOffset` then
///                             describe the mesh before the pass; `faceStates` may have changed, those of points and
///                             the data of `object` may be longer.
MODELING_EXPORT void subdivide(Orvan::Array<bool> const& marks, HalfEdgeDataStructure const& halfEdges,
    unsigned int& numPoints, unsigned int& numFaceVertices, unsigned int& numFaces,
    Orvan::Array<Tessara::Math::float3>& basePositions, Orvan::Array<Tessara::Math::float3>& limitPositions,
    Orvan::Array<unsigned char>& vertexLevels, Orvan::Array<unsigned int>& faceVertex,
    Orvan::Array<unsigned int>& faceOffset, Orvan::Array<unsigned char>& faceStates, Tessara::Object& object);

/// Where the points of the coarse mesh go on the limit surface. Resizes `limitPositions`. NaN for a point without a
/// face.
MODELING_EXPORT void computePositionsInfinity(HalfEdgeDataStructure const& halfEdges, unsigned int numPoints,
    Orvan::Array<Tessara::Math::float3> const& positions, Orvan::Array<Tessara::Math::float3>& limitPositions);

/// Where each point is at the step of the finest face around it: between its base position, where it was made, and its
/// limit position. Resizes `positions`.
MODELING_EXPORT void computePositions(HalfEdgeDataStructure const& halfEdges, unsigned int numPoints,
    Orvan::Array<Tessara::Math::float3> const& basePositions, Orvan::Array<Tessara::Math::float3> const& limitPositions,
    Orvan::Array<unsigned char> const& vertexLevels, Orvan::Array<unsigned char> const& faceStates,
    Orvan::Array<Tessara::Math::float3>& positions);

}
