#include "PartialAdjacency.h"

#include "frame/Arrays.h"
#include "frame/Assert.h"

#include <TessaraGeometry/Names.h>

#include <algorithm>
#include <atomic>
#include <optional>
#include <span>

namespace Modeling::Internal {

using Tessara::Geometry::kInvalidIndex;

namespace {

    // The corners after and before a corner of a triangle, all numbered through.

    unsigned int cornerAfter(unsigned int corner)
    {
        return corner % 3 == 2 ? corner - 2 : corner + 1;
    }
    unsigned int cornerBefore(unsigned int corner)
    {
        return corner % 3 == 0 ? corner + 2 : corner - 1;
    }

    /// The lowest face that has the half-edge at a corner in the opposite direction. It is searched for at that end of
    /// the edge that has fewer corners; nullopt if these are too many for a search per edge.
    std::optional<unsigned int> faceAcross(
        unsigned int corner, unsigned int const* faceVertex, PointCorners const& around)
    {
        constexpr std::size_t kLongList = 32;
        auto const cornersAt = [&](unsigned int point) {
            return OffsetView(around.offsets).part<unsigned int const>(point, around.corners.data);
        };
        unsigned int const start = faceVertex[corner], end = faceVertex[cornerAfter(corner)];
        std::span<unsigned int const> const atStart = cornersAt(start), atEnd = cornersAt(end);
        bool const isStartShorter = atStart.size() < atEnd.size();
        if (std::min(atStart.size(), atEnd.size()) > kLongList)
            return std::nullopt;
        auto const isAcross = [&](unsigned int other) {
            return isStartShorter ? faceVertex[cornerBefore(other)] == end : faceVertex[cornerAfter(other)] == start;
        };
        std::span<unsigned int const> const searched = isStartShorter ? atStart : atEnd;
        auto const found = std::find_if(searched.begin(), searched.end(), isAcross);
        return found == searched.end() ? kInvalidIndex : *found / 3;
    }

    bool areMostMarked(Orvan::Array<unsigned char> const& isMarked)
    {
        auto const marked = static_cast<std::size_t>(std::count(isMarked.begin(), isMarked.end(), 1));
        return marked > isMarked.size / 4; // these have most of the faces
    }

}

PartialAdjacency::PartialAdjacency(
    MeshArrays const& mesh, Orvan::Array<unsigned char> const& isMarked, PointCorners const& around)
    : mesh_(&mesh)
{
    if (!areMostMarked(isMarked) && findAtMarked(isMarked, around))
        return;
    neighbors_ = FaceAdjacency(); // releases its memory first
    neighbors_ = buildFaceAdjacency(mesh.faces(), around);
}

/// \return false if some edge has both its ends at points with many faces
bool PartialAdjacency::findAtMarked(Orvan::Array<unsigned char> const& isMarked, PointCorners const& around)
{
    neighbors_ = uninitializedArray<std::array<unsigned int, 3>>(mesh_->faceCount);
    unsigned int const* const faceVertex = mesh_->faceVertex->data;
    std::atomic<bool> areFound = true;
    // Each face writes its own entry. Any thread may clear the flag, which is read after the loop.
    parallelFor(tbb::blocked_range<unsigned int>(0, mesh_->faceCount, kFaceGrain), [&](auto const& faces) {
        for (unsigned int face = faces.begin(); face != faces.end(); ++face) {
            neighbors_[face].fill(kUnknown);
            unsigned int const corner = 3 * face;
            if (!(isMarked[faceVertex[corner]] | isMarked[faceVertex[corner + 1]] | isMarked[faceVertex[corner + 2]]))
                continue;
            for (unsigned int edge = 0; edge != 3; ++edge) {
                std::optional<unsigned int> const across = faceAcross(corner + edge, faceVertex, around);
                if (!across)
                    return areFound.store(false, std::memory_order_relaxed);
                neighbors_[face][edge] = *across;
            }
        }
    });
    return areFound.load(std::memory_order_relaxed);
}

void PartialAdjacency::findAll() const
{
    FaceView const faces = mesh_->faces();
    FaceAdjacency const all =
        buildFaceAdjacency(faces, cornersByPoint(mesh_->pointCount, faces.faceVertex, std::size_t{3} * faces.count));
    // Each face writes its own entry.
    parallelFor(tbb::blocked_range<unsigned int>(0, faces.count, kElementGrain),
        [neighbors = neighbors_.data, found = all.data](auto const& range) {
            for (unsigned int face = range.begin(); face != range.end(); ++face)
                if (neighbors[face][0] == kUnknown)
                    neighbors[face] = found[face];
        });
}

}
