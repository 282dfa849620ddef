#include <Modeling/subdivisionSteps.h>

#include "SettledFaces.h"
#include "pointProperties.h"
#include "positionRules.h"

#include "frame/Arrays.h"
#include "frame/Assert.h"

#include <TessaraMathSupport/Types.h>

#include <algorithm>
#include <limits>
#include <new>

namespace Geometry::Mesh::Internal {

using namespace Modeling;
using Tessara::Geometry::kInvalidIndex;
using Tessara::Math::float3;

namespace {

    void takeMarks(Orvan::Array<bool> const& marks, unsigned int numFaces, Orvan::Array<unsigned char>& faceStates)
    {
        bool const* const mark = marks.data;
        unsigned char* const state = faceStates.data;
        // Each face writes its own state.
        parallelFor(tbb::blocked_range<unsigned int>(0, numFaces, kFaceGrain), [=](auto const& faces) {
            for (unsigned int face = faces.begin(); face != faces.end(); ++face)
                if (mark[face] && canTakeMark(state[face]))
                    state[face] |= kMarkedBit;
        });
    }

    /// Which faces are kept, and how many new faces and points there are: entry f of each array counts those of the
    /// faces before f, and the last entry is the total.
    struct Numbering {
        IndexArray newPointOffsets;
        IndexArray keptFaceOffsets;
        IndexArray keptCornerOffsets;
        IndexArray emittedOffsets;

        unsigned int newPointCount() const { return newPointOffsets[newPointOffsets.size - 1]; }
        unsigned int keptFaceCount() const { return keptFaceOffsets[keptFaceOffsets.size - 1]; }
        unsigned int keptCornerCount() const { return keptCornerOffsets[keptCornerOffsets.size - 1]; }
        unsigned int emittedCount() const { return emittedOffsets[emittedOffsets.size - 1]; }
    };

    /// Calls `emit(a, b, c, level)` for the triangles that replace a face that splits around its new point, in edge
    /// order.
    template <class Emit> void replaceFace(SettledFaces const& faces, unsigned int face, Emit const& emit)
    {
        unsigned int const level = levelOf(faces.states[face]);
        unsigned int const* const c = faces.corners(face);
        for (unsigned int k = 0; k != 3; ++k) {
            unsigned int const across = faces.neighbors[face][k];
            if (across == kInvalidIndex)
                continue;
            unsigned int const a = c[k], b = c[nextCorner(k)];
            unsigned char const other = faces.states[across];
            unsigned int const center = faces.newPoint(face);
            if (!isSplit(other)) {
                emit(a, b, center, level + 1); // a third, whose gate is the edge
            } else if (levelOf(other) > level) {
                // The edge is the gate of a third and flips. The third itself emits nothing.
                unsigned int const beyond = faces.pointAcross(face, k);
                emit(a, beyond, center, level + 2);
                emit(b, center, beyond, level + 2);
            } else if (levelOf(other) == level) {
                // The edge flips; each of the two faces emits the side of its own corner a.
                emit(a, faces.newPoint(across), center, level + 2);
            } // Nothing next to a coarser face: a balanced mesh has none here.
        }
    }

    /// The number of triangles that `replaceFace` emits.
    unsigned int countReplacements(SettledFaces const& faces, unsigned int face)
    {
        unsigned int const level = levelOf(faces.states[face]);
        unsigned int count = 0;
        for (unsigned int const across : faces.neighbors[face])
            if (across != kInvalidIndex) {
                unsigned char const other = faces.states[across];
                count += !isSplit(other) || levelOf(other) == level ? 1 : levelOf(other) > level ? 2 : 0;
            }
        return count;
    }

    Numbering numberPointsAndFaces(SettledFaces& faces)
    {
        Numbering numbering;
        numbering.newPointOffsets = offsetsFromCounts(
            faces.count, [&](std::size_t face) { return isSplitAroundPoint(faces.states[face]) ? 1u : 0u; });
        faces.newPointOffsets = numbering.newPointOffsets.data;
        numbering.keptFaceOffsets =
            offsetsFromCounts(faces.count, [&](std::size_t face) { return isSplit(faces.states[face]) ? 0u : 1u; });
        numbering.keptCornerOffsets = offsetsFromCounts(
            faces.count, [&](std::size_t face) { return isSplit(faces.states[face]) ? 0u : faces.size(face); });
        numbering.emittedOffsets = offsetsFromCounts(faces.count, [&](std::size_t face) {
            auto const number = static_cast<unsigned int>(face);
            return isSplitAroundPoint(faces.states[face]) ? countReplacements(faces, number) : 0u;
        });
        return numbering;
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
    void keepFace(SettledFaces const& faces, unsigned int face, Numbering const& numbering, FaceArrays& refined)
    {
        unsigned int const corner = numbering.keptCornerOffsets[face];
        unsigned int const cornerEnd = numbering.keptCornerOffsets[face + std::uint64_t{1}];
        unsigned int const number = numbering.keptFaceOffsets[face];
        std::copy_n(faces.corners(face), 3, refined.faceVertex.data + corner);
        // Only triangles are supported: instead of the further corners of a polygon, the entries that were at these
        // indices are kept.
        for (unsigned int further = corner + 3; further < cornerEnd; ++further)
            refined.faceVertex[further] = faces.faceVertex[further];
        refined.faceOffset[number + std::uint64_t{1}] = cornerEnd;
        refined.states[number] = faces.states[face];
    }

    /// Writes the faces that are kept, followed by those that replace the others.
    void writeFaces(SettledFaces const& faces, Numbering const& numbering, FaceArrays& refined)
    {
        unsigned int const keptFaces = numbering.keptFaceCount(), keptCorners = numbering.keptCornerCount();
        // Each face writes at its own offsets.
        parallelFor(tbb::blocked_range<unsigned int>(0, faces.count, kFaceGrain), [&](auto const& range) {
            for (unsigned int face = range.begin(); face != range.end(); ++face) {
                if (!isSplit(faces.states[face]))
                    keepFace(faces, face, numbering, refined);
                if (!isSplitAroundPoint(faces.states[face]))
                    continue;
                std::uint64_t number = keptFaces + std::uint64_t{numbering.emittedOffsets[face]};
                unsigned int corner = keptCorners + 3 * numbering.emittedOffsets[face];
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

}

void subdivide(Orvan::Array<bool> const& marks, HalfEdgeDataStructure const& halfEdges, unsigned int& numPoints,
    unsigned int& numFaceVertices, unsigned int& numFaces, Orvan::Array<float3>& basePositions,
    Orvan::Array<float3>& limitPositions, Orvan::Array<unsigned char>& vertexLevels, IndexArray& faceVertex,
    IndexArray& faceOffset, Orvan::Array<unsigned char>& faceStates, Tessara::Object& object)
{
    MODELING_ASSERT(marks.size >= numFaces && faceStates.size >= numFaces);
    MODELING_ASSERT(areOffsets(faceOffset.data, numFaces, faceVertex.size));
    takeMarks(marks, numFaces, faceStates);
    FaceAdjacency const neighbors = balanceFaceStates(halfEdges, numFaces, faceVertex, faceOffset, faceStates);

    SettledFaces faces{
        {faceVertex.data, faceOffset, numFaces}, halfEdges, faceStates.data, neighbors.data, numPoints, nullptr};
    Numbering const numbering = numberPointsAndFaces(faces);
    unsigned int const newPoints = sumOfCounts(numPoints, numbering.newPointCount());
    unsigned int const newFaces = sumOfCounts(numbering.keptFaceCount(), numbering.emittedCount());
    unsigned int const newCorners =
        sumOfCounts(numbering.keptCornerCount(), std::uint64_t{3} * numbering.emittedCount());

    if (newPoints == numPoints && newFaces == numFaces && newCorners == faceVertex.size) {
        transferPointProperties(faces, newPoints, object); // cuts or fills data that does not have one value per point
        return; // nothing splits, and the arrays remain as they are
    }

    // Allocate the standard arrays before data of the object changes.
    FaceArrays refined = FaceArrays::ofSize(newFaces, newCorners);
    basePositions.resize(newPoints, Orvan::kUninitialized);
    limitPositions.resize(newPoints, Orvan::kUninitialized);
    vertexLevels.resize(newPoints, Orvan::kUninitialized);
    computeNewPoints(faces, {basePositions.data, limitPositions.data, vertexLevels.data});
    transferPointProperties(faces, newPoints, object);
    writeFaces(faces, numbering, refined);
    MODELING_ASSERT(areOffsets(refined.faceOffset.data, newFaces, newCorners));
    MODELING_ASSERT(areBelow(newPoints, refined.faceVertex.data, newCorners));

    numPoints = newPoints;
    numFaceVertices = newCorners;
    numFaces = newFaces;
    faceVertex.swap(refined.faceVertex);
    faceOffset.swap(refined.faceOffset);
    faceStates.swap(refined.states);
}

}
