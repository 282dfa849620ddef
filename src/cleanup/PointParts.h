#pragma once

#include "host/MeshArrays.h"

#include <algorithm>
#include <cstdint>
#include <span>

namespace Modeling::Internal {

/// A division of the points into parts of consecutive ones, with the faces at the points of each part.
///
/// If one thread at a time works on a part and visits its faces in ascending order, what faces add to their points
/// needs no lock and no list of the faces at each point, and is added in the same order for any number of parts.
struct PointParts {
    unsigned int pointCount = 0;
    unsigned int pointBits = 0; // the part of a point is its index without these low bits
    IndexArray faceOffsets; // into `faces`; part count + 1
    IndexArray faces; // of each part, ascending; a face with points in several parts is listed in each of them

    std::size_t count() const { return faceOffsets.size - 1; }
    unsigned int partOf(unsigned int point) const
    {
        return static_cast<unsigned int>(std::uint64_t{point} >> pointBits);
    }
    unsigned int firstPoint(std::size_t part) const { return static_cast<unsigned int>(part << pointBits); }
    unsigned int endPoint(std::size_t part) const
    {
        return static_cast<unsigned int>(std::min<std::uint64_t>(pointCount, (part + 1) << pointBits));
    }
    std::span<unsigned int const> facesOf(std::size_t part) const
    {
        return OffsetView(faceOffsets).part<unsigned int const>(part, faces.data);
    }
};

/// Divides the points into several parts per thread, or into one if there are few points or only one thread. Takes
/// linear time, in parallel over faces.
PointParts dividePoints(FaceView const& mesh, unsigned int pointCount);

}
