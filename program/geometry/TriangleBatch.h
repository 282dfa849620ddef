#pragma once

#include "MeshArrays.h"

#include "frame/Lanes.h"

#include <algorithm>
#include <array>
#include <cstddef>

namespace ModelingProgram {

/// The coordinates of some triangles, each in an array of its own, so that loops over the triangles compile to SIMD
/// instructions. Their results have the same bits as those for one triangle after the other.
struct TriangleBatch {
    static constexpr std::size_t kSize = 64; // a multiple of 4
    template <class T> using Values = std::array<T, kSize>;

    /// One coordinate of each of the three corners.
    using Coordinate = std::array<Values<float>, 3>;
    Coordinate x, y, z;

    /// \param count  from 1 to `kSize`. The triangles after these are equal to the last one.
    void gather(MeshArrays const& mesh, unsigned int firstFace, std::size_t count)
    {
        unsigned int const* const corners = mesh.corners(firstFace).data();
        float3 const* const position = mesh.positions->data;
        for (std::size_t i = 0; i != kSize; i += 4)
            for (std::size_t k = 0; k != 3; ++k) {
                auto const at = [&](std::size_t face) {
                    return Modeling::load(position[corners[3 * std::min(face, count - 1) + k]]);
                };
                Modeling::Lanes const a = at(i), b = at(i + 1), c = at(i + 2), d = at(i + 3);
                auto const ab = __builtin_shufflevector(a, b, 0, 4, 1, 5),
                           cd = __builtin_shufflevector(c, d, 0, 4, 1, 5);
                Modeling::store(__builtin_shufflevector(ab, cd, 0, 1, 4, 5), &x[k][i]);
                Modeling::store(__builtin_shufflevector(ab, cd, 2, 3, 6, 7), &y[k][i]);
                Modeling::store(Modeling::Lanes{a[2], b[2], c[2], d[2]}, &z[k][i]);
            }
    }

    /// The squared lengths of the shortest and the longest edges, as `squaredEdgeRange` computes them.
    void findEdgeRanges(Values<float>& shortest, Values<float>& longest) const
    {
        shortest.fill(EdgeRange().shortest);
        longest.fill(EdgeRange().longest);
        for (std::size_t k = 0, previous = 2; k != 3; previous = k++)
            for (std::size_t i = 0; i != kSize; ++i) {
                float const dx = x[k][i] - x[previous][i], dy = y[k][i] - y[previous][i], dz = z[k][i] - z[previous][i];
                float const edge = (dx * dx + dy * dy) + dz * dz;
                shortest[i] = edge < shortest[i] ? edge : shortest[i];
                longest[i] = edge > longest[i] ? edge : longest[i];
            }
    }
};

/// Whether all of some consecutive faces are triangles.
inline bool areTriangles(MeshArrays const& mesh, unsigned int begin, unsigned int end)
{
    unsigned int const* const offset = mesh.faceOffset->data;
    unsigned int others = 0;
    for (unsigned int face = begin; face != end; ++face)
        others |= (offset[face + 1] - offset[face]) ^ 3u;
    return others == 0;
}

}
