#pragma once

#include "Vectors.h"

#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <TessaraObject/Object.h>

#include <algorithm>
#include <cmath>
#include <limits>
#include <span>

namespace ModelingProgram {

/// A snapshot of the standard arrays of a mesh: as long as it shares them, edits of the mesh copy them first.
struct MeshArrays {
    Orvan::Ptr<Orvan::Array<float3>> positions;
    Orvan::Ptr<Orvan::Array<unsigned int>> faceVertex;
    Orvan::Ptr<Orvan::Array<unsigned int>> faceOffset;

    unsigned int pointCount() const { return static_cast<unsigned int>(positions->size); }
    unsigned int cornerCount() const { return static_cast<unsigned int>(faceVertex->size); }
    unsigned int faceCount() const { return static_cast<unsigned int>(faceOffset->size - 1); }
    std::span<unsigned int const> corners(unsigned int face) const
    {
        unsigned int const first = faceOffset->data[face];
        return {faceVertex->data + first, faceOffset->data[face + 1] - first};
    }
    unsigned int faceOf(unsigned int corner) const;
    /// The corner after this one in its face.
    unsigned int nextCorner(unsigned int corner) const;
};

/// \pre  the mesh is valid
MeshArrays arraysOf(Tessara::Object const& mesh);

/// Whether both have the same points at the same positions, bit by bit, and the same faces.
bool areIdentical(MeshArrays const& a, MeshArrays const& b);

/// The vector area of a polygon times two: it points along the normal, and its length is twice the polygon's area.
template <std::size_t kCount> double3 areaVector(std::span<unsigned int const, kCount> corners, float3 const* position)
{
    double3 area{0, 0, 0};
    for (std::size_t i = 2; i < corners.size(); ++i)
        area = area
            + cross(inDoubles(position[corners[i - 1]]) - inDoubles(position[corners[0]]),
                inDoubles(position[corners[i]]) - inDoubles(position[corners[0]]));
    return area;
}

/// The squared lengths of the shortest and the longest edge of a face. Edges of length NaN are ignored.
struct EdgeRange {
    float shortest = std::numeric_limits<float>::infinity();
    float longest = 0;
};

template <std::size_t kCount>
EdgeRange squaredEdgeRange(std::span<unsigned int const, kCount> corners, float3 const* position)
{
    auto [shortest, longest] = EdgeRange();
    for (std::size_t i = 0, previous = corners.size() - 1; i != corners.size(); previous = i++) {
        float const edge = squaredEdgeLengthInFloats(position[corners[previous]], position[corners[i]]);
        shortest = edge < shortest ? edge : shortest; // not std::min(): this compiles to code without branches
        longest = edge > longest ? edge : longest;
    }
    return {shortest, longest};
}

/// Whether the shortest edge is so much longer than `ratio` times the longest edge that no rounding matters.
inline bool isNoSliverByFar(EdgeRange const& squared, float ratio)
{
    return (squared.shortest > 1e-30f) & (squared.shortest > squared.longest * ratio * ratio * 1.001f);
}

/// Whether the shortest edge is shorter than `ratio` times the longest edge, with lengths rounded exactly as in the
/// library, so that both find the same slivers.
inline bool isSliver(EdgeRange const& squared, float ratio)
{
    if (isNoSliverByFar(squared, ratio))
        return false;
    float const shortest = std::min(std::sqrt(squared.shortest), std::numeric_limits<float>::max());
    return std::sqrt(squared.longest) * ratio > shortest;
}

}
