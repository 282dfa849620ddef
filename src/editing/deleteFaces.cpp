#include <Modeling/deleteFaces.h>

#include "Deletion.h"
#include "frame/Arrays.h"
#include "host/GeoProperties.h"

#include <Modeling/computeDeletedComponentMapping.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Prototypes.h>

#include <algorithm>
#include <optional>

namespace Tessara::GeometryAlgorithms {

using namespace Modeling;
using namespace Tessara::Geometry;
using Internal::Deletion;
using Internal::IndexArray;
using Internal::KeptElements;

namespace {

    /// What goes and stays together with the faces.
    struct FaceElements {
        KeptElements corners;
        Orvan::Array<bool> unusedPoints;
    };

    bool fitsCounts(Object const& mesh, IndexArray const* faceOffset, IndexArray const* faceVertex)
    {
        return faceOffset && faceVertex && faceOffset->size == std::uint64_t{getElementCount(mesh, sFaceComp)} + 1
            && faceVertex->size >= getElementCount(mesh, sFaceVertexComp)
            && getGeoPropTargetName(mesh, sFaceOffset) == sFaceComp
            && getGeoPropTargetName(mesh, sFaceVertex) == sFaceVertexComp;
    }

    /// Calls `visit(first, end)` for the corners of each face that stays. The calls ascend and do not overlap, whatever
    /// the offsets are.
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

    /// A point goes unless a corner that stays uses it.
    Orvan::Array<bool> findUnusedPoints(
        KeptElements const& corners, IndexArray const& faceVertex, unsigned int pointCount)
    {
        Orvan::Array<bool> isUnused = filledArray<bool>(pointCount, true);
        for (unsigned int const corner : corners.sources)
            if (faceVertex[corner] < pointCount)
                isUnused[faceVertex[corner]] = false;
        return isUnused;
    }

    /// Nothing where the index arrays do not fit the mesh.
    std::optional<FaceElements> findFaceElements(Orvan::Array<bool> const& deleted, Object const& mesh)
    {
        auto const faceOffset = readGeoPropData<unsigned int>(mesh, sFaceOffset);
        auto const faceVertex = readGeoPropData<unsigned int>(mesh, sFaceVertex);
        if (!fitsCounts(mesh, faceOffset.get(), faceVertex.get()))
            return std::nullopt;
        FaceElements elements;
        elements.corners = findKeptCorners(deleted, *faceOffset, getElementCount(mesh, sFaceVertexComp));
        elements.unusedPoints = findUnusedPoints(elements.corners, *faceVertex, getElementCount(mesh, sPointComp));
        return elements;
    }

    /// Points, then corners, then faces. An index array is renumbered when its component is prepared as a whole.
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
