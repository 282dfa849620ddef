#include <Modeling/subdivisionSteps.h>

#include "faceStates.h"

#include "frame/Arrays.h"
#include "frame/Assert.h"

#include <TessaraGeometryVolume/Canceller.h>

#include <tbb/parallel_reduce.h>

#include <algorithm>
#include <atomic>
#include <limits>

namespace Geometry::Mesh::Internal {

using namespace Modeling;
using Tessara::Geometry::kInvalidIndex;

namespace {

    constexpr unsigned int kCancelPlace = 4; // the host's number for this loop

    /// The new state of a face, from its own state and those of its neighbors. Bits are only ever set, so the sweeps
    /// terminate.
    unsigned char settledState(unsigned char state, Twins const& twins, unsigned char const* states)
    {
        unsigned int const level = levelOf(state);
        unsigned int marked = isMarked(state), split = isSplit(state);
        unsigned int lowestLevel = std::numeric_limits<unsigned int>::max(); // above any level
        for (unsigned int const twin : twins) {
            if (twin == kInvalidIndex)
                continue;
            unsigned char const other = states[faceOfTwin(twin)];
            unsigned int const otherLevel = levelOf(other);
            lowestLevel = std::min(lowestLevel, otherLevel);
            // A whole face takes over the marks of finer neighbors only; a third must flip together with the face at
            // its gate.
            if (isMarked(other) && (isThird(state) ? otherLevel != level : level < otherLevel))
                marked = 1;
            if (isSplit(other) && isThird(state) && otherLevel < level)
                split = 1;
        }
        // A whole face waits for coarser neighbors, which take over its mark by the rule above.
        if (!isThird(state) && marked && level <= lowestLevel)
            split = 1;
        return static_cast<unsigned char>(level << 2 | split << 1 | marked);
    }

    void announceCancelPlace()
    {
        TSR::Canceller::ID place{kCancelPlace};
        TSR::Canceller::cancelID(place);
    }

    /// The sweeps of one pass. A sweep visits only faces that may change, and looks up the neighbors of these alone:
    /// most passes affect few of the faces.
    class Balance {
    public:
        /// \param areMutual  whether each face is a neighbor of its neighbors. If not, a face whose state changes
        ///                   cannot tell which faces read it, so each sweep visits all faces.
        Balance(TwinTable& twins, bool areMutual, unsigned int faceCount, unsigned char* states)
            : twins_(twins)
            , faceCount_(faceCount)
            , settled_(states)
            , isAlwaysDue_(!areMutual)
            , current_(uninitializedArray<unsigned char>(faceCount_))
            , isDue_(filledArray<unsigned char>(faceCount_, isAlwaysDue_))
            , isDueNext_(filledArray<unsigned char>(faceCount_, isAlwaysDue_))
        {
            copyElements(settled_, faceCount_, current_.data);
        }

        /// Requested faces and their neighbors are due in the first sweep.
        void prepare()
        {
            // Each face looks up its own neighbors; any of them may set flags, which are read after the loop.
            parallelFor(tbb::blocked_range<unsigned int>(0, faceCount_, kFaceGrain), [this](auto const& faces) {
                for (unsigned int face = faces.begin(); face != faces.end(); ++face)
                    if (isRequested(current_[face]))
                        markDue(face, isDue_.data);
            });
        }

        /// \return whether a state has changed
        bool sweep()
        {
            std::atomic<bool> isChanged = false;
            // Each face reads the states of the previous sweep and writes its own; any of them may set flags, which are
            // read after the loop. The loop is not isolated, so that it checks for cancellation of the job.
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

        [[maybe_unused]] bool knowsTwinsOfSplitFaces() const
        {
            for (unsigned int face = 0; face != faceCount_; ++face)
                if (isSplit(settled_[face]) && !twins_.knows(face))
                    return false;
            return true;
        }

    private:
        bool settleFaces(unsigned int first, unsigned int last)
        {
            bool isChanged = false;
            for (unsigned int face = first; face != last; ++face) {
                if (!isDue_[face])
                    continue;
                isDue_[face] = isAlwaysDue_; // `isDue_` becomes `isDueNext_` of the next sweep
                unsigned char const state = settledState(current_[face], twins_.of(face), current_.data);
                if (state == current_[face])
                    continue;
                settled_[face] = state;
                markDue(face, isDueNext_.data);
                isChanged = true;
            }
            return isChanged;
        }

        /// Makes a face and its neighbors due.
        void markDue(unsigned int face, unsigned char* isDue)
        {
            setFlag(isDue[face]);
            for (unsigned int const twin : twins_.of(face))
                if (twin != kInvalidIndex)
                    setFlag(isDue[faceOfTwin(twin)]);
        }

        static void setFlag(unsigned char& isDue)
        {
            std::atomic_ref<unsigned char> const flag(isDue);
            if (!flag.load(std::memory_order_relaxed))
                flag.store(true, std::memory_order_relaxed);
        }

        TwinTable& twins_;
        unsigned int faceCount_;
        unsigned char* settled_;
        bool isAlwaysDue_;
        Orvan::Array<unsigned char> current_; // of the previous sweep
        Orvan::Array<unsigned char> isDue_, isDueNext_; // faces to visit
    };

}

void balanceFaceStates(TwinTable& twins, bool areMutual, unsigned int numFaces, unsigned char* faceStates)
{
    Balance balance(twins, areMutual, numFaces, faceStates);
    balance.prepare();
    while (balance.sweep()) { }
    MODELING_ASSERT(balance.knowsTwinsOfSplitFaces());
}

void checkForCancellation(unsigned int numFaces)
{
    parallelFor(
        tbb::blocked_range<unsigned int>(0, numFaces, kFaceGrain), [](auto const&) { announceCancelPlace(); }, false);
}

bool isBalanced(HalfEdgeDataStructure const& halfEdges, unsigned int numFaces,
    Orvan::Array<unsigned int> const& faceVertex, Orvan::Array<unsigned int> const& faceOffset,
    Orvan::Array<unsigned char> const& faceStates)
{
    auto const largestDifference = [&](tbb::blocked_range<unsigned int> const& faces, unsigned int largest) {
        for (unsigned int face = faces.begin(); face != faces.end(); ++face) {
            unsigned int const level = levelOf(faceStates[face]);
            for (unsigned int const twin : findTwins(halfEdges, faceVertex.data + faceOffset[face])) {
                if (twin == kInvalidIndex)
                    continue;
                unsigned int const other = levelOf(faceStates[faceOfTwin(twin)]);
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
