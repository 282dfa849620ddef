#pragma once

#include "MeshWithSources.h"

#include <array>
#include <vector>

namespace ModelingProgram {

struct DegenerateFaces {
    unsigned int droppedCount = 0;
    unsigned int shortenedCount = 0; // faces that lost corners and were kept
};

/// Removes corners at the same point as the corner before them, and those of spikes, where a face goes to a point and
/// straight back. Faces that are left with fewer than three corners are dropped. Faces without area that have three
/// points are kept, because the faces around them would no longer be connected. Linear.
DegenerateFaces dropDegenerateFaces(MeshWithSources& mesh);

/// Two faces with the same points in opposite directions; the first is the lower one.
using Twins = std::array<unsigned int, 2>;

struct DoubledFaces {
    unsigned int droppedCount = 0;
    std::vector<Twins> twins; // ascending
};

/// Drops faces that have the same points in the same cyclic order as a lower face. Of those in opposite order the lowest
/// is kept too, because both may be needed: as walls between two solids, or as the sides of a sheet. In parallel;
/// O(n log n) at a point of n faces.
DoubledFaces dropDoubledFaces(MeshWithSources& mesh);

}
