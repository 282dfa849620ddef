#include "refineTopology.h"

#include "extendArray.h"
#include "pointProperties.h"
#include "positionRules.h"

#include "frame/Arrays.h"
#include "frame/Assert.h"

#include <TessaraMathSupport/Types.h>

#include <algorithm>
#include <atomic>
#include <limits>
#include <new>

namespace Geometry::Mesh::Internal {

using namespace Modeling;

namespace {

    /// \return whether any face is requested
    bool takeMarks(Orvan::Array<bool> const& marks, unsigned int numFaces, Orvan::Array<unsigned char>& faceStates)
    {
        bool const* const mark = marks.data;
        unsigned char* const state = faceStates.data;
        std::atomic<bool> isAnyRequested = false;
        // Each face writes its own state, and any of them may set the flag, which is read after the loop.
        parallelFor(tbb::blocked_range<unsigned int>(0, numFaces, kFaceGrain), [&, mark, state](auto const& faces) {
            unsigned int requests = 0;
            for (unsigned int face = faces.begin(); face != faces.end(); ++face) {
                if (mark[face] && canTakeMark(state[face]))
                    state[face] |= kMarkedBit;
                requests |= state[face];
            }
            if (isRequested(static_cast<unsigned char>(requests)))
                isAnyRequested.store(true, std::memory_order_relaxed);
        });
        return isAnyRequested.load(std::memory_order_relaxed);
    }

    /// Calls `emit(a, b, c, level)` for the triangles that replace a face that splits around its new point, in edge
    /// order.
    template <class Emit> void replaceFace(SettledFaces const& faces, unsigned int face, Emit const& emit)
    {
        unsigned int const level = levelOf(faces.states[face]);
        unsigned int const* const c = faces.corners(face);
        unsigned int const center = faces.newPoint(face);
        for (unsigned int k = 0; k != 3; ++k) {
            unsigned int const a = c[k], b = c[nextCorner(k)];
            switch (faces.fates[face].at(k)) {
            case EdgeFate::nothing:
                break;
            case EdgeFate::third:
                emit(a, b, center, level + 1);
                break;
            case EdgeFate::flip:
                emit(a, faces.newPoint(faceOfTwin(faces.twins[face][k])), center, level + 2);
                break;
            case EdgeFate::gateFlip: {
                unsigned int const beyond = faces.pointAcross(face, k);
                emit(a, beyond, center, level + 2);
                emit(b, center, beyond, level + 2);
                break;
            }
            }
        }
    }

    unsigned int sumOfCounts(std::uint64_t a, std::uint64_t b)
    {
        if (a + b > std::numeric_limits<unsigned int>::max())
            throw std::bad_alloc();
        return static_cast<unsigned int>(a + b);
    }

    struct FaceArrays {
        IndexArray faceVertex;
        IndexArray faceOffset;
        Orvan::Array<unsigned char> states;

        /// All entries are uninitialized except the first offset.
        static FaceArrays ofSize(unsigned int faceCount, unsigned int cornerCount)
        {
            FaceArrays arrays{uninitializedArray<unsigned int>(cornerCount),
                uninitializedArray<unsigned int>(std::uint64_t{faceCount} + 1),
                uninitializedArray<unsigned char>(faceCount)};
            arrays.faceOffset[0] = 0;
            return arrays;
        }
    };

    /// Copies a face with its state: a face that is marked and has not split yet remains marked.
    void keepFace(SettledFaces const& faces, unsigned int face, FaceArrays& refined)
    {
        std::uint64_t const number = faces.numbers[face];
        unsigned int const corner = faces.keptCorner(face), cornerEnd = corner + faces.size(face);
        std::copy_n(faces.corners(face), 3, refined.faceVertex.data + corner);
        // Only triangles are supported: instead of the further corners of a polygon, the entries that were at these
        // indices are kept.
        for (unsigned int further = corner + 3; further < cornerEnd; ++further)
            refined.faceVertex[further] = faces.faceVertex[further];
        refined.faceOffset[number + 1] = cornerEnd;
        refined.states[number] = faces.states[face];
    }

    /// Writes the faces that are kept, followed by those that replace the others.
    void writeFaces(SettledFaces const& faces, FaceArrays& refined)
    {
        // Each face writes at its own offsets.
        parallelFor(tbb::blocked_range<unsigned int>(0, faces.count, kFaceGrain), [&](auto const& range) {
            for (unsigned int face = range.begin(); face != range.end(); ++face) {
                if (!isSplit(faces.states[face]))
                    keepFace(faces, face, refined);
                if (!isSplitAroundPoint(faces.states[face]))
                    continue;
                std::uint64_t number = faces.firstEmitted(face, 0);
                unsigned int corner = faces.keptCornerCount + 3 * faces.emittedOffsets[faces.numbers[face]];
                replaceFace(faces, face, [&](unsigned int a, unsigned int b, unsigned int c, unsigned int level) {
                    unsigned int* const corners = refined.faceVertex.data + corner;
                    corners[0] = a;
                    corners[1] = b;
                    corners[2] = c;
                    refined.states[number++] = stateOfLevel(level);
                    refined.faceOffset[number] = corner += 3;
                });
            }
        });
    }

    /// What each pass does once faces are numbered and memory for the faces is there.
    void replaceFaces(SettledFaces const& faces, unsigned int const* valences, FaceArrays& refined,
        RefinedArrays const& mesh, Tessara::Object& object)
    {
        unsigned int const newPoints = faces.pointCount + faces.newPointCount();
        extendArray(newPoints, mesh.basePositions);
        extendArray(newPoints, mesh.limitPositions);
        extendArray(newPoints, mesh.vertexLevels);
        computeNewPoints(faces, valences, {mesh.basePositions.data, mesh.limitPositions.data, mesh.vertexLevels.data});
        transferPointProperties(faces, newPoints, object);
        writeFaces(faces, refined);
        MODELING_ASSERT(areOffsets(refined.faceOffset.data, refined.states.size, refined.faceVertex.size));
        MODELING_ASSERT(areBelow(newPoints, refined.faceVertex.data, refined.faceVertex.size));
    }

    /// True if all faces are triangles and no directed edge is repeated, as on closed manifolds; judged by the counts.
    bool areNeighborsMutual(HalfEdgeDataStructure const& halfEdges, RefinedArrays const& mesh)
    {
        std::uint64_t const corners = std::uint64_t{3} * mesh.numFaces;
        return mesh.faceOffset[mesh.numFaces] == corners && halfEdges.size() == corners;
    }

    Orvan::Array<unsigned int> valencesOf(HalfEdgeDataStructure const& halfEdges, unsigned int pointCount)
    {
        auto valences = uninitializedArray<unsigned int>(pointCount);
        // Each point writes its own entry.
        parallelFor(tbb::blocked_range<unsigned int>(0, pointCount, kElementGrain), [&](auto const& points) {
            for (unsigned int point = points.begin(); point != points.end(); ++point)
                valences[point] = static_cast<unsigned int>(halfEdges.valence(point));
        });
        return valences;
    }

    /// Whether there are no other corners than those of the faces.
    bool belongsToFaces(Orvan::Array<unsigned int> const& faceVertex, FaceView const& faces)
    {
        return faceVertex.size == (faces.count == 0 ? 0 : faces.offsets.begin(faces.count) - faces.offsets.begin(0));
    }

    /// \param halfEdges, adjacency  one of them is null
    void runPass(Orvan::Array<bool> const& marks, HalfEdgeDataStructure const* halfEdges, ClosedAdjacency* adjacency,
        RefinedArrays const& mesh, Tessara::Object& object)
    {
        MODELING_ASSERT(marks.size >= mesh.numFaces && mesh.faceStates.size >= mesh.numFaces);
        MODELING_ASSERT(areOffsets(mesh.faceOffset.data, mesh.numFaces, mesh.faceVertex.size));
        bool const isAnyRequested = takeMarks(marks, mesh.numFaces, mesh.faceStates);
        FaceView const view{mesh.faceVertex.data, mesh.faceOffset, mesh.numFaces};
        TwinTable twins = adjacency ? TwinTable(view, adjacency->twins)
            : isAnyRequested        ? TwinTable(*halfEdges, view)
                                    : TwinTable(view, {});
        if (isAnyRequested)
            balanceFaceStates(
                twins, adjacency || areNeighborsMutual(*halfEdges, mesh), mesh.numFaces, mesh.faceStates.data);
        else
            checkForCancellation(mesh.numFaces);

        SettledFaces faces{view, halfEdges, mesh.faceStates.data, twins.data(), mesh.numPoints};
        bool const isUnchanged = !isAnyRequested && belongsToFaces(mesh.faceVertex, view);
        if (!isUnchanged)
            numberFaces(faces);
        unsigned int const newPoints = sumOfCounts(mesh.numPoints, faces.newPointCount());
        unsigned int const newFaces = sumOfCounts(faces.keptFaceCount, faces.emittedCount);
        unsigned int const newCorners = sumOfCounts(faces.keptCornerCount, std::uint64_t{3} * faces.emittedCount);
        if (isUnchanged
            || (newPoints == mesh.numPoints && newFaces == mesh.numFaces && newCorners == mesh.faceVertex.size)) {
            transferPointProperties(faces, mesh.numPoints, object); // cuts or fills data of another length
            return; // nothing splits, and the arrays remain as they are
        }

        // Allocate the standard arrays before data of the object changes.
        FaceArrays refined = FaceArrays::ofSize(newFaces, newCorners);
        Orvan::Array<unsigned int> const valences =
            adjacency ? Orvan::Array<unsigned int>() : valencesOf(*halfEdges, mesh.numPoints);
        replaceFaces(faces, adjacency ? adjacency->valences.data : valences.data, refined, mesh, object);
        if (adjacency)
            refineAdjacency(faces, *adjacency);

        mesh.numPoints = newPoints;
        mesh.numFaceVertices = newCorners;
        mesh.numFaces = newFaces;
        mesh.faceVertex.swap(refined.faceVertex);
        mesh.faceOffset.swap(refined.faceOffset);
        mesh.faceStates.swap(refined.states);
    }

}

void subdivide(
    Orvan::Array<bool> const& marks, ClosedAdjacency& adjacency, RefinedArrays const& mesh, Tessara::Object& object)
{
    runPass(marks, nullptr, &adjacency, mesh, object);
}

void subdivide(Orvan::Array<bool> const& marks, HalfEdgeDataStructure const& halfEdges, unsigned int& numPoints,
    unsigned int& numFaceVertices, unsigned int& numFaces, Orvan::Array<Tessara::Math::float3>& basePositions,
    Orvan::Array<Tessara::Math::float3>& limitPositions, Orvan::Array<unsigned char>& vertexLevels,
    Orvan::Array<unsigned int>& faceVertex, Orvan::Array<unsigned int>& faceOffset,
    Orvan::Array<unsigned char>& faceStates, Tessara::Object& object)
{
    RefinedArrays const mesh{numPoints, numFaceVertices, numFaces, basePositions, limitPositions, vertexLevels,
        faceVertex, faceOffset, faceStates};
    runPass(marks, &halfEdges, nullptr, mesh, object);
}

}
