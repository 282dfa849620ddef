#pragma once

#include "PointCorners.h"

#include "host/MeshArrays.h"

#include <array>

namespace Modeling {

// Triangle meshes. Edge k of a face leads from its corner k to its corner nextCorner(k).

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

/// Whether all faces are triangles whose corners follow one another: the first `faceCount` + 1 offsets are 0, 3, 6, ...
bool isTriangleMesh(unsigned int faceCount, IndexArray const& faceOffset);

/// Finds the faces that share an edge with opposite directions. If several faces have the opposite edge, the lowest one
/// is taken. Runs in parallel; the result is the same for any number of threads.
/// \param around  the corners at each point, of all corners of the mesh
/// \pre           `isTriangleMesh`
FaceAdjacency buildFaceAdjacency(FaceView const& faces, PointCorners const& around);

}
