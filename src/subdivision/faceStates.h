#pragma once

#include <Modeling/HalfEdgeDataStructure.h>
#include <OrvanCore/Array.h>

#include <array>

namespace Geometry::Mesh::Internal {

// A face's byte of state; include/Modeling/subdivisionSteps.h tells what its bits mean.

inline constexpr unsigned int kMarkedBit = 1;
inline constexpr unsigned int kSplitBit = 2;

constexpr unsigned int levelOf(unsigned char state)
{
    return state >> 2;
}
/// How many whole steps made the face.
constexpr unsigned int stepOf(unsigned char state)
{
    return state >> 3;
}
/// Whether a pass may change anything at the face or around it.
constexpr bool isRequested(unsigned char state)
{
    return state & (kMarkedBit | kSplitBit);
}
constexpr bool isMarked(unsigned char state)
{
    return state & kMarkedBit;
}
constexpr bool isSplit(unsigned char state)
{
    return state & kSplitBit;
}
/// A third of a split face, with the edge that is still to turn over: its gate.
constexpr bool isThird(unsigned char state)
{
    return levelOf(state) & 1;
}
/// Whether the face gets a point in its middle.
constexpr bool isSplitAroundPoint(unsigned char state)
{
    return isSplit(state) && !isThird(state);
}

/// The finest level. A face of it takes no mark: its replacements would be of levels 63 and 64, and six bits end at 63.
///
/// No face gets beyond it, however faces meet. New faces come from marked faces of even level, at most two levels up.
/// A face of this level is not marked by its neighbors either, because only a finer neighbor marks a face of even
/// level. So it is like any face that nobody asks to split: a pass stays balanced and closed for all sets of marks. No
/// other face is held up by it, since faces wait for coarser neighbors only.
inline constexpr unsigned int kFinestLevel = 62;

constexpr bool canTakeMark(unsigned char state)
{
    return levelOf(state) < kFinestLevel;
}
/// The state of a new face.
constexpr unsigned char stateOfLevel(unsigned int level)
{
    return static_cast<unsigned char>(level << 2);
}

/// The faces across the three edges of each face, `kInvalidIndex` where there is none.
using FaceNeighbours = Orvan::Array<std::array<unsigned int, 3>>;

/// Spreads requests until neighbours agree on which faces split in this pass. The one place that looks at cancellation:
/// at the end of each sweep over the faces.
/// \return the neighbours of all faces that split; entries of others may not have been written, and the array is empty
///         where no face is requested
/// \throws std::runtime_error  when the job is cancelled; `faceStates` may then be half done
FaceNeighbours balanceFaceStates(HalfEdgeDataStructure const& halfEdges, unsigned int numFaces,
    Orvan::Array<unsigned int> const& faceVertex, Orvan::Array<unsigned int> const& faceOffset,
    Orvan::Array<unsigned char>& faceStates);

}
