#pragma once

#include "PointCorners.h"

#include "host/MeshArrays.h"

#include <array>

namespace Modeling {

// For triangle meshes. Edge k of a face leads from its corner k to its corner nextCorner(k).

constexpr unsigned int nextCorner(unsigned int k)
{
    return k == 2 ? 0 : k + 1;
}
constexpr unsigned int previousCorner(unsigned int k)
{
    return k == 0 ? 2 : k - 1;
}

/// For each face the faces across its edges; `kInvalidIndex` at a boundary.
using FaceAdjacency = Orvan::Array<std::array<unsigned int, 3>>;

/// Whether all faces are triangles, stored without gaps: the first `faceCount` + 1 offsets are 0, 3, 6, ...
bool isTriangleMesh(unsigned int faceCount, IndexArray const& faceOffset);

/// Finds the face across each edge: the one that has this edge in the opposite direction, or the lowest of several.
/// Runs in parallel; the result is the same for any number of threads.
/// \param around  the corners at each point; contains every corner of the mesh
/// \pre           `isTriangleMesh`
FaceAdjacency buildFaceAdjacency(FaceView const& faces, PointCorners const& around);

}
