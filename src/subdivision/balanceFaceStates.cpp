#include <Modeling/subdivisionSteps.h>

#include "faceStates.h"

#include "frame/Arrays.h"

#include <TessaraGeometryVolume/Canceller.h>

#include <tbb/parallel_reduce.h>

#include <algorithm>
#include <atomic>
#include <limits>

namespace Geometry::Mesh::Internal {

using namespace Modeling;
using Tessara::Geometry::kInvalidIndex;

namespace {

    constexpr unsigned int kCancelPlace = 4; // what the host knows this loop by

    /// What a face and those around it make of its state. Bits are only ever set, so repeating this comes to an end.
    unsigned char settledState(
        unsigned char state, std::array<unsigned int, 3> const& across, unsigned char const* states)
    {
        unsigned int const level = levelOf(state);
        unsigned int marked = isMarked(state), split = isSplit(state);
        unsigned int lowestLevel = std::numeric_limits<unsigned int>::max(); // above any level
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

    std::array<unsigned int, 3> facesAcross(HalfEdgeDataStructure const& halfEdges, unsigned int const* c)
    {
        return {halfEdges.halfEdge(c[0], c[1]).face, halfEdges.halfEdge(c[1], c[2]).face,
            halfEdges.halfEdge(c[2], c[0]).face};
    }

    void announceCancelPlace()
    {
        TSR::Canceller::ID place{kCancelPlace};
        TSR::Canceller::cancelID(place);
    }

    /// The sweeps of one pass. A sweep works only on faces at which something may change, and looks up what is across
    /// the edges of these alone: mostly a pass has to do with few of the faces.
    class Balance {
    public:
        /// \param areMutual  whether the neighbours of a face are those whose neighbour it is. Otherwise a face cannot
        ///                   tell whom it concerns when its state changes, and all are looked at in each sweep.
        Balance(HalfEdgeDataStructure const& halfEdges, bool areMutual, unsigned int faceCount,
            unsigned int const* faceVertex, unsigned int const* faceOffset, unsigned char* states)
            : halfEdges_(halfEdges)
            , faceVertex_(faceVertex)
            , faceOffset_(faceOffset)
            , faceCount_(faceCount)
            , settled_(states)
            , isAlwaysDue_(!areMutual)
            , current_(uninitializedArray<unsigned char>(faceCount))
            , isDue_(filledArray<unsigned char>(faceCount, isAlwaysDue_))
            , isDueNext_(filledArray<unsigned char>(faceCount, isAlwaysDue_))
            , hasNeighbours_(zeroedArray<unsigned char>(faceCount))
            , neighbours_(uninitializedArray<std::array<unsigned int, 3>>(faceCount))
        {
            copyElements(settled_, faceCount_, current_.data);
        }

        /// Requested faces and those around them are due in the first sweep.
        void prepare()
        {
            // Each face looks up its own neighbours; any may set flags, which are looked at after the loop.
            parallelFor(tbb::blocked_range<unsigned int>(0, faceCount_, kFaceGrain), [this](auto const& faces) {
                for (unsigned int face = faces.begin(); face != faces.end(); ++face)
                    if (isRequested(current_[face]))
                        callUp(face, isDue_.data);
            });
        }

        /// \return whether a state has changed
        bool sweep()
        {
            std::atomic<bool> isChanged = false;
            // Each face reads what the sweep before has left and writes its own state; any may set flags, which are
            // looked at after the loop.
            parallelFor(
                tbb::blocked_range<unsigned int>(0, faceCount_, kFaceGrain),
                [&, this](auto const& faces) {
                    announceCancelPlace();
                    if (settleFaces(faces.begin(), faces.end()))
                        isChanged.store(true, std::memory_order_relaxed);
                },
                false);
            copyElements(settled_, faceCount_, current_.data);
            isDue_.swap(isDueNext_);
            return isChanged.load(std::memory_order_relaxed);
        }

        FaceNeighbours takeNeighbours() { return std::move(neighbours_); }

    private:
        bool settleFaces(unsigned int first, unsigned int last)
        {
            bool isChanged = false;
            for (unsigned int face = first; face != last; ++face) {
                if (!isDue_[face])
                    continue;
                isDue_[face] = isAlwaysDue_; // for the sweep after the next one
                lookAround(face);
                unsigned char const state = settledState(current_[face], neighbours_[face], current_.data);
                if (state == current_[face])
                    continue;
                settled_[face] = state;
                callUp(face, isDueNext_.data);
                isChanged = true;
            }
            return isChanged;
        }

        void lookAround(unsigned int face)
        {
            if (hasNeighbours_[face])
                return;
            hasNeighbours_[face] = true;
            neighbours_[face] = facesAcross(halfEdges_, faceVertex_ + faceOffset_[face]);
        }

        /// A face and those around it are due.
        void callUp(unsigned int face, unsigned char* isDue)
        {
            lookAround(face);
            callUpFace(isDue[face]);
            for (unsigned int const neighbour : neighbours_[face])
                if (neighbour != kInvalidIndex)
                    callUpFace(isDue[neighbour]);
        }

        static void callUpFace(unsigned char& isDue)
        {
            std::atomic_ref<unsigned char> const flag(isDue);
            if (!flag.load(std::memory_order_relaxed))
                flag.store(true, std::memory_order_relaxed);
        }

        HalfEdgeDataStructure const& halfEdges_;
        unsigned int const* faceVertex_;
        unsigned int const* faceOffset_;
        unsigned int faceCount_;
        unsigned char* settled_;
        bool isAlwaysDue_;
        Orvan::Array<unsigned char> current_; // as the sweep before has left them
        Orvan::Array<unsigned char> isDue_, isDueNext_; // faces to look at
        Orvan::Array<unsigned char> hasNeighbours_;
        FaceNeighbours neighbours_;
    };

    /// On closed meshes of triangles without repeated directed edges they are.
    bool areNeighboursMutual(
        HalfEdgeDataStructure const& halfEdges, unsigned int faceCount, Orvan::Array<unsigned int> const& faceOffset)
    {
        std::uint64_t const corners = std::uint64_t{3} * faceCount;
        return faceOffset[faceCount] == corners && halfEdges.size() == corners;
    }

    bool isAnyRequested(Orvan::Array<unsigned char> const& states, unsigned int faceCount)
    {
        return std::any_of(states.data, states.data + faceCount, isRequested);
    }

}

FaceNeighbours balanceFaceStates(HalfEdgeDataStructure const& halfEdges, unsigned int numFaces,
    Orvan::Array<unsigned int> const& faceVertex, Orvan::Array<unsigned int> const& faceOffset,
    Orvan::Array<unsigned char>& faceStates)
{
    if (!isAnyRequested(faceStates, numFaces)) {
        // There is nothing to spread, but this is where a pass can be cancelled.
        parallelFor(
            tbb::blocked_range<unsigned int>(0, numFaces, kFaceGrain), [](auto const&) { announceCancelPlace(); },
            false);
        return {};
    }
    Balance balance(halfEdges, areNeighboursMutual(halfEdges, numFaces, faceOffset), numFaces, faceVertex.data,
        faceOffset.data, faceStates.data);
    balance.prepare();
    while (balance.sweep()) { }
    return balance.takeNeighbours();
}

bool isBalanced(HalfEdgeDataStructure const& halfEdges, unsigned int numFaces,
    Orvan::Array<unsigned int> const& faceVertex, Orvan::Array<unsigned int> const& faceOffset,
    Orvan::Array<unsigned char> const& faceStates)
{
    auto const largestDifference = [&](tbb::blocked_range<unsigned int> const& faces, unsigned int largest) {
        for (unsigned int face = faces.begin(); face != faces.end(); ++face) {
            unsigned int const level = levelOf(faceStates[face]);
            for (unsigned int const neighbour : facesAcross(halfEdges, faceVertex.data + faceOffset[face])) {
                if (neighbour == kInvalidIndex)
                    continue;
                unsigned int const other = levelOf(faceStates[neighbour]);
                largest = std::max(largest, level < other ? other - level : level - other);
            }
        }
        return largest;
    };
    tbb::blocked_range<unsigned int> const all(0, numFaces);
    unsigned int largest = 0;
    bool const isDone = runIsolated([&] {
        largest = tbb::parallel_reduce(
            all, 0u, largestDifference, [](unsigned int a, unsigned int b) { return std::max(a, b); },
            tbb::auto_partitioner());
    });
    return (isDone ? largest : largestDifference(all, 0)) < 2;
}

}
