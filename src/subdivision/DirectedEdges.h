#pragma once

#include "frame/FaceAdjacency.h"
#include "frame/ParallelFor.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>

namespace Modeling::Internal {

struct EdgeFaces : FaceView {
    bool areTriangles; // as `isTriangleMesh`
};

/// An edge among those that end at the same point: they are sorted by their starts, and then by their corners.
constexpr std::uint64_t edgeEntry(unsigned int start, unsigned int corner)
{
    return std::uint64_t{start} << 32 | corner;
}

/// Blocks of consecutive faces, which are worked on in parallel.
struct FaceBlocks {
    std::size_t faceCount;
    std::size_t perBlock;
    std::size_t count;

    explicit FaceBlocks(unsigned int faces)
        : faceCount(faces)
        , perBlock(std::max<std::size_t>(std::size_t{1} << 14, faceCount / 64 + 1))
        , count((faceCount + perBlock - 1) / perBlock)
    {
    }
    std::size_t begin(std::size_t block) const { return block * perBlock; }
    std::size_t end(std::size_t block) const { return std::min(faceCount, begin(block) + perBlock); }

    /// Calls `work(block)` for all blocks, in parallel.
    template <class Work> void forEach(Work const& work) const
    {
        // `work` writes only what belongs to its block.
        parallelFor(tbb::blocked_range<std::size_t>(0, count, 1), [&](auto const& blocks) {
            for (std::size_t block = blocks.begin(); block != blocks.end(); ++block)
                work(block);
        });
    }
};

/// Calls `visit.edge(start, end, corner)` for the directed edges of some faces. `corner` is the corner at the end of the
/// edge; the calls are in ascending order of it. If all faces are triangles, calls `visit.triangle(a, b, c, corner)`
/// instead for the three edges that end at points a, b, and c, from the first corner of the face on.
template <class Visit> void forEachEdge(EdgeFaces const& faces, std::size_t first, std::size_t last, Visit const& visit)
{
    if (faces.areTriangles) {
        for (std::size_t face = first; face != last; ++face) {
            auto const corner = static_cast<unsigned int>(3 * face);
            unsigned int const* const points = faces.faceVertex + corner;
            visit.triangle(points[0], points[1], points[2], corner);
        }
        return;
    }
    for (std::size_t face = first; face != last; ++face) {
        unsigned int const begin = faces.offsets.begin(face), end = faces.offsets.end(face);
        for (unsigned int corner = begin; corner != end; ++corner)
            visit.edge(faces.faceVertex[corner == begin ? end - 1 : corner - 1], faces.faceVertex[corner], corner);
    }
}

}
