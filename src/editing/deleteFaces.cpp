#include <Modeling/deleteFaces.h>

#include "Deletion.h"
#include "frame/Arrays.h"
#include "frame/Assert.h"
#include "host/MeshArrays.h"

#include <Modeling/computeDeletedComponentMapping.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Prototypes.h>

#include <algorithm>
#include <optional>

namespace Tessara::GeometryAlgorithms {

using namespace Modeling;
using namespace Tessara::Geometry;
using Modeling::Internal::Deletion;
using Modeling::Internal::KeptElements;

namespace {

    /// What the deletion of faces means for the other elements: the corners that are kept, and the points that are not.
    struct FaceElements {
        KeptElements corners;
        Orvan::Array<bool> unusedPoints;
    };

    bool fitsCounts(MeshArrays const& arrays, Object const& mesh)
    {
        return arrays.faceOffset && arrays.faceVertex && arrays.faceOffset->size == std::uint64_t{arrays.faceCount} + 1
            && arrays.faceVertex->size >= arrays.cornerCount && getGeoPropTargetName(mesh, sFaceOffset) == sFaceComp
            && getGeoPropTargetName(mesh, sFaceVertex) == sFaceVertexComp;
    }

    /// Calls `visit(first, end)` for the corners of each kept face. The ranges ascend and do not overlap, even if the
    /// offsets do.
    template <class Visit> void forEachCornerRange(
        Orvan::Array<bool> const& deleted, IndexArray const& faceOffset, unsigned int cornerCount, Visit const& visit)
    {
        unsigned int lastEnd = 0;
        for (std::uint64_t face = 0; face != deleted.size; ++face) {
            if (deleted[face])
                continue;
            unsigned int const first = std::max(faceOffset[face], lastEnd);
            unsigned int const end = std::min(faceOffset[face + 1], cornerCount);
            if (first < end) {
                visit(first, end);
                lastEnd = end;
            }
        }
    }

    KeptElements findKeptCorners(
        Orvan::Array<bool> const& deleted, IndexArray const& faceOffset, unsigned int cornerCount)
    {
        std::uint64_t keptCount = 0;
        forEachCornerRange(
            deleted, faceOffset, cornerCount, [&](unsigned int first, unsigned int end) { keptCount += end - first; });
        KeptElements kept{cornerCount, uninitializedArray<unsigned int>(keptCount)};
        unsigned int* source = kept.sources.data;
        forEachCornerRange(deleted, faceOffset, cornerCount, [&](unsigned int first, unsigned int end) {
            for (unsigned int corner = first; corner != end; ++corner)
                *source++ = corner;
        });
        return kept;
    }

    /// Marks the points that no kept corner uses.
    Orvan::Array<bool> findUnusedPoints(
        KeptElements const& corners, IndexArray const& faceVertex, unsigned int pointCount)
    {
        Orvan::Array<bool> isUnused = filledArray<bool>(pointCount, true);
        for (unsigned int const corner : corners.sources)
            if (faceVertex[corner] < pointCount)
                isUnused[faceVertex[corner]] = false;
        return isUnused;
    }

    /// Whether the point of every kept corner is kept.
    [[maybe_unused]] bool keepsPointsOfCorners(FaceElements const& elements, IndexArray const& faceVertex)
    {
        Orvan::Array<bool> const& isUnused = elements.unusedPoints;
        return std::all_of(elements.corners.sources.begin(), elements.corners.sources.end(),
            [&](unsigned int corner) { return faceVertex[corner] >= isUnused.size || !isUnused[faceVertex[corner]]; });
    }

    /// Returns nullopt if the index arrays do not fit the mesh.
    std::optional<FaceElements> findFaceElements(Orvan::Array<bool> const& deleted, Object const& mesh)
    {
        MeshArrays const arrays = readMeshArrays(mesh); // released before the deletion, which may then edit in place
        if (!fitsCounts(arrays, mesh))
            return std::nullopt;
        FaceElements elements;
        elements.corners = findKeptCorners(deleted, *arrays.faceOffset, arrays.cornerCount);
        elements.unusedPoints = findUnusedPoints(elements.corners, *arrays.faceVertex, arrays.pointCount);
        MODELING_ASSERT(keepsPointsOfCorners(elements, *arrays.faceVertex));
        return elements;
    }

    /// Prepares points, then corners, then faces. An index array is renumbered only after its whole component has been
    /// prepared: if that is refused, the array keeps its old indices.
    bool prepareDeletion(Orvan::Array<bool> const& deleted, FaceElements const& elements, IndexArray const& pointRemap,
        Deletion& deletion)
    {
        if (!deletion.prepare(sPointComp, elements.unusedPoints)
            || !deletion.prepare(sFaceVertexComp, elements.corners))
            return false;
        deletion.renumber(sFaceVertex, pointRemap);
        if (!deletion.prepare(sFaceComp, deleted))
            return false;
        deletion.renumberOffsets(sFaceOffset, elements.corners);
        return true;
    }

}

bool deleteFaces(Orvan::Array<bool> const& deleted, Object& mesh)
{
    if (!Object::isA(mesh, *getMeshPrototype()) || deleted.size != getElementCount(mesh, sFaceComp))
        return false;
    std::optional<FaceElements> const elements = findFaceElements(deleted, mesh);
    if (!elements)
        return false;
    IndexArray const pointRemap = computeDeletedComponentMapping(elements->unusedPoints);
    Deletion deletion(mesh);
    bool const isDone = prepareDeletion(deleted, *elements, pointRemap, deletion);
    deletion.commit();
    return isDone;
}

}
