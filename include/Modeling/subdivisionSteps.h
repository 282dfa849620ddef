#pragma once

#include <Modeling/Export.h>
#include <Modeling/HalfEdgeDataStructure.h>
#include <OrvanCore/Array.h>
#include <TessaraMathSupport/Types.h>
#include <TessaraObject/Object.h>

/// The steps of adaptive √3-subdivision (`subdivide.h`), for callers that run the passes themselves. A pass is: mark
/// faces, `subdivide`, rebuild the half-edges, `computePositions`.
///
/// All take triangle meshes in the flat arrays that `subdivide.h` describes. `faceStates` has one byte per face and
/// `vertexLevels` one per point; all are 0 in the coarse mesh. Of a state
/// - bit 0 (marked) means that a requested refinement is pending,
/// - bit 1 (split) means that the current pass removes the face,
/// - bits 2 to 7 are the level, two per step. A face of odd level is a third of a split face whose outer edge has not
///   flipped yet, because the face across that edge has not split. A face of level 62 cannot be marked and never
///   splits, since the levels of its replacements would not fit.
/// A point's level is the step that created it.
///
/// Nothing is checked: if arrays do not fit together, the behavior is undefined. All run in parallel, with the same
/// result for any number of threads.
namespace Geometry::Mesh::Internal {

/// Sets the marks of faces that do not fit into twice `tolerance` along every axis, and clears none. Sets none if the
/// tolerance is NaN or not above 1.1920929e-7. A difference of coordinates that is NaN counts as 0.
/// \pre  `marks` has at least `numFaces` entries.
MODELING_EXPORT void markForSubdivision(float tolerance, unsigned int numFaces,
    Orvan::Array<Tessara::Math::float3> const& positions, Orvan::Array<unsigned int> const& faceVertex,
    Orvan::Array<unsigned int> const& faceOffset, Orvan::Array<bool>& marks);

/// Whether the levels of the two faces at every edge differ by less than 2.
MODELING_EXPORT bool isBalanced(HalfEdgeDataStructure const& halfEdges, unsigned int numFaces,
    Orvan::Array<unsigned int> const& faceVertex, Orvan::Array<unsigned int> const& faceOffset,
    Orvan::Array<unsigned char> const& faceStates);

/// One pass: balances marks across neighbors to find which faces split, replaces these faces, and adds their points. On
/// return the counts, the arrays and the point data of `object` describe the refined mesh, but `halfEdges` still
/// describes the one before. The standard properties of `object` and the counts of its components are not modified.
/// \throws std::runtime_error  if the job is cancelled; only `faceStates` may have changed
/// \throws std::bad_alloc      also if a count does not fit 32 bits. The counts, `faceVertex` and `faceOffset` then
///                             describe the mesh before the pass; `faceStates` may have changed, and the arrays of
///                             points and the point data of `object` may be longer than before.
MODELING_EXPORT void subdivide(Orvan::Array<bool> const& marks, HalfEdgeDataStructure const& halfEdges,
    unsigned int& numPoints, unsigned int& numFaceVertices, unsigned int& numFaces,
    Orvan::Array<Tessara::Math::float3>& basePositions, Orvan::Array<Tessara::Math::float3>& limitPositions,
    Orvan::Array<unsigned char>& vertexLevels, Orvan::Array<unsigned int>& faceVertex,
    Orvan::Array<unsigned int>& faceOffset, Orvan::Array<unsigned char>& faceStates, Tessara::Object& object);

/// Computes the limit positions of the coarse mesh's points: where they are after infinitely many steps. Resizes
/// `limitPositions`. A point without a face becomes NaN.
MODELING_EXPORT void computePositionsInfinity(HalfEdgeDataStructure const& halfEdges, unsigned int numPoints,
    Orvan::Array<Tessara::Math::float3> const& positions, Orvan::Array<Tessara::Math::float3>& limitPositions);

/// Computes where each point is at the step of the finest face around it: between its base position, where it was
/// created, and its limit position. Resizes `positions`.
MODELING_EXPORT void computePositions(HalfEdgeDataStructure const& halfEdges, unsigned int numPoints,
    Orvan::Array<Tessara::Math::float3> const& basePositions, Orvan::Array<Tessara::Math::float3> const& limitPositions,
    Orvan::Array<unsigned char> const& vertexLevels, Orvan::Array<unsigned char> const& faceStates,
    Orvan::Array<Tessara::Math::float3>& positions);

}
