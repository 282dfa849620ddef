#include <Modeling/subdivisionSteps.h>

#include "faceStates.h"

#include "frame/Arrays.h"

#include <TessaraGeometryVolume/Canceller.h>

#include <tbb/parallel_reduce.h>

#include <algorithm>
#include <atomic>

namespace Geometry::Mesh::Internal {

using namespace Modeling;
using Tessara::Geometry::kInvalidIndex;

namespace {

    constexpr unsigned int kCancelPlace = 4; // what the host knows this loop by

    constexpr unsigned int nextCorner(unsigned int k)
    {
        return k == 2 ? 0 : k + 1;
    }

    /// What a face and those around it make of its state. Bits are only ever set, so repeating this comes to an end.
    unsigned char settledState(
        unsigned char state, std::array<unsigned int, 3> const& across, unsigned char const* states)
    {
        unsigned int const level = levelOf(state);
        unsigned int marked = isMarked(state), split = isSplit(state);
        unsigned int lowestLevel = kInvalidIndex;
        for (unsigned int const neighbour : across) {
            if (neighbour == kInvalidIndex)
                continue;
            unsigned char const other = states[neighbour];
            unsigned int const otherLevel = levelOf(other);
            lowestLevel = std::min(lowestLevel, otherLevel);
            // A whole face follows finer neighbours only; a third has to go with whoever is at its gate.
            if (isMarked(other) && (isThird(state) ? otherLevel != level : level < otherLevel))
                marked = 1;
            if (isSplit(other) && isThird(state) && otherLevel < level)
                split = 1;
        }
        // A whole face waits for coarser neighbours, which have got its mark by now.
        if (!isThird(state) && marked && level <= lowestLevel)
            split = 1;
        return static_cast<unsigned char>(level << 2 | split << 1 | marked);
    }

}

FaceNeighbours findFaceNeighbours(HalfEdgeDataStructure const& halfEdges, unsigned int numFaces,
    Orvan::Array<unsigned int> const& faceVertex, Orvan::Array<unsigned int> const& faceOffset)
{
    FaceNeighbours neighbours = uninitializedArray<std::array<unsigned int, 3>>(numFaces);
    std::array<unsigned int, 3>* const across = neighbours.data;
    // Each face writes its own entry.
    parallelFor(tbb::blocked_range<unsigned int>(0, numFaces, kFaceGrain), [&, across](auto const& faces) {
        for (unsigned int face = faces.begin(); face != faces.end(); ++face) {
            unsigned int const* const c = faceVertex.data + faceOffset[face];
            for (unsigned int k = 0; k != 3; ++k)
                across[face][k] = halfEdges.halfEdge(c[k], c[nextCorner(k)]).face;
        }
    });
    return neighbours;
}

void balanceFaceStates(FaceNeighbours const& neighbours, Orvan::Array<unsigned char>& faceStates)
{
    auto const faceCount = static_cast<unsigned int>(faceStates.size);
    Orvan::Array<unsigned char> current = copyOfFirst(faceCount, faceStates);
    std::array<unsigned int, 3> const* const across = neighbours.data;
    unsigned char const* const state = current.data;
    unsigned char* const settled = faceStates.data;
    std::atomic<bool> isChanged;
    do {
        isChanged.store(false, std::memory_order_relaxed);
        // Each face reads what the sweep before has left and writes its own state; any may set the flag, which is looked at
        // after the loop.
        parallelFor(
            tbb::blocked_range<unsigned int>(0, faceCount, kFaceGrain),
            [&isChanged, across, state, settled](auto const& faces) {
                TSR::Canceller::ID place{kCancelPlace};
                TSR::Canceller::cancelID(place);
                if (!across)
                    return;
                bool hasChanged = false;
                for (unsigned int face = faces.begin(); face != faces.end(); ++face)
                    if (unsigned char const next = settledState(state[face], across[face], state);
                        next != state[face]) {
                        settled[face] = next;
                        hasChanged = true;
                    }
                if (hasChanged)
                    isChanged.store(true, std::memory_order_relaxed);
            },
            false);
        if (isChanged.load(std::memory_order_relaxed))
            copyElements(faceStates.data, faceCount, current.data);
    } while (isChanged.load(std::memory_order_relaxed));
}

bool isBalanced(HalfEdgeDataStructure const& halfEdges, unsigned int numFaces,
    Orvan::Array<unsigned int> const& faceVertex, Orvan::Array<unsigned int> const& faceOffset,
    Orvan::Array<unsigned char> const& faceStates)
{
    auto const largestDifference = [&](tbb::blocked_range<unsigned int> const& faces, unsigned int largest) {
        for (unsigned int face = faces.begin(); face != faces.end(); ++face) {
            unsigned int const* const c = faceVertex.data + faceOffset[face];
            unsigned int const level = levelOf(faceStates[face]);
            for (unsigned int k = 0; k != 3; ++k) {
                unsigned int const neighbour = halfEdges.halfEdge(c[k], c[nextCorner(k)]).face;
                if (neighbour == kInvalidIndex)
                    continue;
                unsigned int const other = levelOf(faceStates[neighbour]);
                largest = std::max(largest, level < other ? other - level : level - other);
            }
        }
        return largest;
    };
    unsigned int largest = 0;
    runIsolated([&] {
        largest = tbb::parallel_reduce(
            tbb::blocked_range<unsigned int>(0, numFaces), 0u, largestDifference,
            [](unsigned int a, unsigned int b) { return std::max(a, b); }, tbb::auto_partitioner());
    });
    return largest < 2;
}

}
