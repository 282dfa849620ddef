#include "ClosedAdjacency.h"

#include "extendArray.h"

#include "frame/Arrays.h"
#include "frame/Assert.h"

#include <algorithm>
#include <atomic>

namespace Geometry::Mesh::Internal {

using namespace Modeling;
using Tessara::Geometry::kInvalidIndex;

namespace {

    bool areThree(unsigned int a, unsigned int b, unsigned int c)
    {
        return a != b && b != c && c != a;
    }

    bool isClosedTriangle(unsigned int const* c, Twins const& twins)
    {
        return std::find(twins.begin(), twins.end(), kInvalidIndex) == twins.end() && areThree(c[0], c[1], c[2])
            && areThree(faceOfTwin(twins[0]), faceOfTwin(twins[1]), faceOfTwin(twins[2]));
    }

    void raiseTo(unsigned char step, unsigned char& finest)
    {
        std::atomic_ref<unsigned char> const shared(finest);
        unsigned char known = shared.load(std::memory_order_relaxed);
        while (known < step && !shared.compare_exchange_weak(known, step, std::memory_order_relaxed)) { }
    }

    void add(unsigned int summand, unsigned int& valence)
    {
        std::atomic_ref<unsigned int>(valence).fetch_add(summand, std::memory_order_relaxed);
    }

    /// Writes the adjacency after a pass.
    ///
    /// An old edge of a face whose point is c leads from point a to point b. What is emitted at it begins with a, and its
    /// first triangle has the edge from c to a as its last one.
    class Refinement {
    public:
        Refinement(SettledFaces const& faces, Twins* newTwins, ClosedAdjacency& adjacency)
            : faces_(faces)
            , newTwins_(newTwins)
            , valences_(adjacency.valences.data)
            , finestSteps_(adjacency.finestSteps.data)
        {
        }

        void keep(unsigned int face) const
        {
            Twins const& twins = faces_.twins[face];
            newTwins_[faces_.numbers[face]] = {edgeAfter(twins[0]), edgeAfter(twins[1]), edgeAfter(twins[2])};
        }

        /// Writes the twins of what a face emits.
        void replace(unsigned int face) const
        {
            EdgeFates const fates = faces_.fates[face];
            unsigned int first = faces_.firstEmitted(face, 0);
            unsigned int const firsts[3] = {first, first + fates.emittedBefore(1), first + fates.emittedBefore(2)};
            for (unsigned int edge = 0; edge != 3; ++edge) {
                unsigned int const twin = faces_.twins[face][edge];
                unsigned int const fromPoint = 3 * firsts[nextCorner(edge)] + 2;
                Twins& twins = newTwins_[firsts[edge]];
                twins[2] = edgeToPoint(face, previousCorner(edge), firsts[previousCorner(edge)]);
                switch (fates.at(edge)) {
                case EdgeFate::third:
                    twins[0] = edgeAfter(twin);
                    twins[1] = fromPoint;
                    break;
                case EdgeFate::flip:
                    twins[0] = 3 * faces_.firstEmitted(faceOfTwin(twin), nextCorner(edgeOfTwin(twin))) + 2;
                    twins[1] = 3 * faces_.firstEmitted(faceOfTwin(twin), edgeOfTwin(twin)) + 1;
                    break;
                case EdgeFate::gateFlip: {
                    Twins const& third = faces_.twins[faceOfTwin(twin)];
                    twins[0] = edgeAfter(third[1]);
                    twins[1] = 3 * firsts[edge] + 4;
                    newTwins_[firsts[edge] + 1] = {fromPoint, 3 * firsts[edge] + 1, edgeAfter(third[2])};
                    break;
                }
                case EdgeFate::nothing:
                    break; // never on a closed mesh
                }
            }
        }

        /// Counts the edges at points, and finds the finest faces around them.
        void updatePoints(unsigned int face) const
        {
            unsigned int const* const c = faces_.corners(face);
            EdgeFates const fates = faces_.fates[face];
            unsigned int const step = stepOf(faces_.states[face]);
            auto const flippedStep = static_cast<unsigned char>(step + 1);
            unsigned int flipCount = 0;
            for (unsigned int edge = 0; edge != 3; ++edge) {
                unsigned int const a = c[edge], b = c[nextCorner(edge)];
                if (fates.at(edge) == EdgeFate::third) {
                    add(1, valences_[a]); // the new point
                    continue;
                }
                ++flipCount;
                raiseTo(flippedStep, finestSteps_[a]); // it has the new point as a neighbor instead of b
                if (fates.at(edge) == EdgeFate::gateFlip) {
                    unsigned int const beyond = faces_.pointAcross(face, edge);
                    add(1, valences_[beyond]);
                    add(~0u, valences_[b]);
                    raiseTo(flippedStep, finestSteps_[b]);
                    raiseTo(flippedStep, finestSteps_[beyond]);
                }
            }
            unsigned int const point = faces_.newPoint(face);
            valences_[point] = 3 + flipCount;
            finestSteps_[point] = flipCount == 0 ? static_cast<unsigned char>(step) : flippedStep;
        }

    private:
        /// The new edge that leads from point b to the new point of the face.
        unsigned int edgeToPoint(unsigned int face, unsigned int edge, unsigned int first) const
        {
            switch (faces_.fates[face].at(edge)) {
            case EdgeFate::gateFlip:
                return 3 * first + 3;
            case EdgeFate::flip: {
                unsigned int const twin = faces_.twins[face][edge];
                return 3 * faces_.firstEmitted(faceOfTwin(twin), edgeOfTwin(twin));
            }
            default:
                return 3 * first + 1;
            }
        }

        /// The new number of an edge that does not flip.
        unsigned int edgeAfter(unsigned int oldEdge) const
        {
            unsigned int const face = faceOfTwin(oldEdge), edge = edgeOfTwin(oldEdge);
            unsigned char const state = faces_.states[face];
            if (!isSplit(state))
                return 3 * faces_.numbers[face] + edge;
            if (!isThird(state))
                return 3 * faces_.firstEmitted(face, edge);
            // The gate of a third is its first edge, across which its other edges have become the first and the last
            // one of two triangles.
            unsigned int const gate = faces_.twins[face][0];
            unsigned int const first = faces_.firstEmitted(faceOfTwin(gate), edgeOfTwin(gate));
            return edge == 1 ? 3 * first : 3 * first + 5;
        }

        SettledFaces const& faces_;
        Twins* newTwins_;
        unsigned int* valences_;
        unsigned char* finestSteps_;
    };

    [[maybe_unused]] bool areMutual(Orvan::Array<Twins> const& twins)
    {
        for (unsigned int face = 0; face != twins.size; ++face)
            for (unsigned int edge = 0; edge != 3; ++edge) {
                unsigned int const twin = twins[face][edge];
                if (faceOfTwin(twin) >= twins.size || twins[faceOfTwin(twin)][edgeOfTwin(twin)] != 3 * face + edge)
                    return false;
            }
        return true;
    }

}

std::optional<ClosedAdjacency> findClosedAdjacency(
    HalfEdgeDataStructure const& halfEdges, FaceView const& faces, unsigned int pointCount)
{
    if (halfEdges.size() != std::uint64_t{3} * faces.count)
        return std::nullopt;
    ClosedAdjacency adjacency{uninitializedArray<Twins>(faces.count), uninitializedArray<unsigned int>(pointCount),
        zeroedArray<unsigned char>(pointCount)};
    std::atomic<bool> isClosed = true;
    // Each face writes its own entry, and any of them may clear the flag, which is read after the loop.
    parallelFor(tbb::blocked_range<unsigned int>(0, faces.count, kFaceGrain), [&](auto const& range) {
        for (unsigned int face = range.begin(); face != range.end(); ++face) {
            adjacency.twins[face] = findTwins(halfEdges, faces.corners(face));
            if (!isClosedTriangle(faces.corners(face), adjacency.twins[face]))
                return isClosed.store(false, std::memory_order_relaxed);
        }
    });
    if (!isClosed.load(std::memory_order_relaxed))
        return std::nullopt;
    // Each point writes its own entry.
    parallelFor(tbb::blocked_range<unsigned int>(0, pointCount, kElementGrain), [&](auto const& points) {
        for (unsigned int point = points.begin(); point != points.end(); ++point)
            adjacency.valences[point] = static_cast<unsigned int>(halfEdges.valence(point));
    });
    MODELING_ASSERT(areMutual(adjacency.twins));
    return adjacency;
}

void refineAdjacency(SettledFaces const& faces, ClosedAdjacency& adjacency)
{
    auto newTwins = uninitializedArray<Twins>(faces.keptFaceCount + std::uint64_t{faces.emittedCount});
    extendArray(faces.pointCount + std::uint64_t{faces.newPointCount()}, adjacency.valences);
    extendArray(faces.pointCount + std::uint64_t{faces.newPointCount()}, adjacency.finestSteps);
    Refinement const refinement(faces, newTwins.data, adjacency);
    // Each face writes the twins of the faces that replace it.
    parallelFor(tbb::blocked_range<unsigned int>(0, faces.count, kFaceGrain), [&](auto const& range) {
        for (unsigned int face = range.begin(); face != range.end(); ++face) {
            if (!isSplit(faces.states[face]))
                refinement.keep(face);
            else if (isSplitAroundPoint(faces.states[face]))
                refinement.replace(face);
        }
    });
    // Each face writes the entries of its own new point, and atomically those of old points.
    parallelFor(tbb::blocked_range<unsigned int>(0, faces.newPointCount(), kFaceGrain), [&](auto const& ranks) {
        for (unsigned int rank = ranks.begin(); rank != ranks.end(); ++rank)
            refinement.updatePoints(faces.splitFaces[rank]);
    });
    adjacency.twins.swap(newTwins);
    MODELING_ASSERT(areMutual(adjacency.twins));
}

}
