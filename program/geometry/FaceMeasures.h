#pragma once

#include "CompactNormal.h"
#include "MeshArrays.h"

#include <cstdint>
#include <vector>

namespace ModelingProgram {

/// Sums over the faces of a mesh. Faces with more than three corners count as the fan of triangles from their first
/// corner for the volume, and are projected to their plane for the area.
struct FaceMeasures {
    double area = 0;
    double volume = 0; // signed
    std::uint64_t sliverCount = 0;

    FaceMeasures& operator+=(FaceMeasures const& other)
    {
        area += other.area;
        volume += other.volume;
        sliverCount += other.sliverCount;
        return *this;
    }
};

/// Measures the faces in parallel and in double precision. Sums are accumulated over fixed blocks of faces in order, so
/// they are bitwise identical for any number of threads.
/// \param origin   inside or near the mesh: far away, the signed volumes of faces would suffer from cancellation
/// \param normals  one per face; are set
FaceMeasures measureFaces(MeshArrays const& mesh, double3 const& origin, float sliverRatio, CompactNormal* normals);

/// The numbers of slivers for several ratios. A sliver is a face whose shortest edge is shorter than the ratio times its
/// longest edge, with edge lengths rounded as in the library.
std::vector<std::uint64_t> countSlivers(MeshArrays const& mesh, std::vector<float> const& ratios);

}
