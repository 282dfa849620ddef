#pragma once

#include "Twins.h"

#include <OrvanCore/Array.h>

namespace Geometry::Mesh::Internal {

// A face's state byte; include/Modeling/subdivisionSteps.h describes its bits.

inline constexpr unsigned int kMarkedBit = 1;
inline constexpr unsigned int kSplitBit = 2;

constexpr unsigned int levelOf(unsigned char state)
{
    return state >> 2;
}
/// The number of whole steps that led to the face.
constexpr unsigned int stepOf(unsigned char state)
{
    return state >> 3;
}
/// Whether a pass may change the face or its neighbors.
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
/// Whether the face is a third of a split face. Its edge that is still to flip is called its gate.
constexpr bool isThird(unsigned char state)
{
    return levelOf(state) & 1;
}
/// Whether the face gets a new point at its center.
constexpr bool isSplitAroundPoint(unsigned char state)
{
    return isSplit(state) && !isThird(state);
}

/// The finest level. A face of this level is never marked: its replacements would have levels 63 and 64, and six bits
/// hold at most 63.
///
/// No face exceeds it, even on non-manifold meshes. New faces come from marked faces of even level, at most two levels
/// up. Neighbors do not mark a face of this level either, because only a finer neighbor marks a face of even level. So
/// it is like any face without a request: a pass stays balanced and closed for all sets of marks. No other face waits
/// for it, since faces wait for coarser neighbors only.
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

/// Spreads requests until neighbors agree on which faces split in this pass. The only place that checks for
/// cancellation: at the end of each sweep over the faces. Asks for the twins of all faces that split.
/// \param areMutual  whether each face is a neighbor of its neighbors
/// \throws std::runtime_error  if the job is cancelled; `faceStates` may then be partly balanced
void balanceFaceStates(TwinTable& twins, bool areMutual, unsigned int numFaces, unsigned char* faceStates);

/// The check for cancellation of a pass in which no face is requested.
void checkForCancellation(unsigned int numFaces);

}
