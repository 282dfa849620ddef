#include <Modeling/deleteFaces.h>

#include "Deletion.h"
#include "frame/Arrays.h"
#include "host/GeoProperties.h"

#include <Modeling/computeDeletedComponentMapping.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Prototypes.h>

#include <algorithm>

namespace Tessara::GeometryAlgorithms {

using namespace Modeling;
using namespace Tessara::Geometry;
using Internal::Deletion;
using Internal::IndexArray;

namespace {

    /// What goes together with the faces.
    struct UnusedElements {
        Orvan::Array<bool> points;
        Orvan::Array<bool> corners;
    };

    bool fitsCounts(Object const& mesh, IndexArray const* faceOffset, IndexArray const* faceVertex)
    {
        return faceOffset && faceOffset->size == std::uint64_t{getElementCount(mesh, sFaceComp)} + 1
            && getGeoPropTargetName(mesh, sFaceOffset) == sFaceComp //
            && faceVertex && faceVertex->size >= getElementCount(mesh, sFaceVertexComp)
            && getGeoPropTargetName(mesh, sFaceVertex) == sFaceVertexComp;
    }

    /// Everything is unused until a face that stays is seen to use it.
    UnusedElements findUnused(Orvan::Array<bool> const& deleted, Object const& mesh, IndexArray const& faceOffset,
        IndexArray const& faceVertex)
    {
        unsigned int const pointCount = getElementCount(mesh, sPointComp);
        unsigned int const cornerCount = getElementCount(mesh, sFaceVertexComp);
        UnusedElements unused{filledArray<bool>(pointCount, true), filledArray<bool>(cornerCount, true)};
        for (std::uint64_t face = 0; face != deleted.size; ++face) {
            if (deleted[face])
                continue;
            unsigned int const end = std::min(faceOffset[face + 1], cornerCount);
            for (unsigned int corner = faceOffset[face]; corner < end; ++corner) {
                unused.corners[corner] = false;
                if (faceVertex[corner] < pointCount)
                    unused.points[faceVertex[corner]] = false;
            }
        }
        return unused;
    }

    struct Remaps {
        IndexArray points;
        IndexArray corners;
        unsigned int newCornerCount;
    };

    Remaps numberRemaining(UnusedElements const& unused)
    {
        auto const newCornerCount = std::count(unused.corners.begin(), unused.corners.end(), false);
        return {computeDeletedComponentMapping(unused.points), computeDeletedComponentMapping(unused.corners),
            static_cast<unsigned int>(newCornerCount)};
    }

    /// Points, then corners, then faces. An index array is renumbered when its component has been prepared as a whole.
    bool prepareDeletion(
        Orvan::Array<bool> const& deleted, UnusedElements const& unused, Remaps const& remaps, Deletion& deletion)
    {
        if (!deletion.prepare(sPointComp, unused.points) || !deletion.prepare(sFaceVertexComp, unused.corners))
            return false;
        deletion.renumber(sFaceVertex, {&remaps.points, kInvalidIndex});
        if (!deletion.prepare(sFaceComp, deleted))
            return false;
        deletion.renumber(sFaceOffset, {&remaps.corners, remaps.newCornerCount});
        deletion.close(sFaceOffset, remaps.newCornerCount); // which was cut off as the entry beyond the faces
        return true;
    }

}

bool deleteFaces(Orvan::Array<bool> const& deleted, Object& mesh)
{
    if (!Object::isA(mesh, *getMeshPrototype()) || deleted.size != getElementCount(mesh, sFaceComp))
        return false;
    UnusedElements unused;
    {
        auto const faceOffset = readGeoPropData<unsigned int>(mesh, sFaceOffset);
        auto const faceVertex = readGeoPropData<unsigned int>(mesh, sFaceVertex);
        if (!fitsCounts(mesh, faceOffset.get(), faceVertex.get()))
            return false;
        unused = findUnused(deleted, mesh, *faceOffset, *faceVertex);
    }
    Remaps const remaps = numberRemaining(unused);
    Deletion deletion(mesh);
    bool const isDone = prepareDeletion(deleted, unused, remaps, deletion);
    deletion.commit();
    return isDone;
}

}
