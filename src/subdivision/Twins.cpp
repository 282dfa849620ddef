#include "Twins.h"

#include "frame/Arrays.h"

namespace Geometry::Mesh::Internal {

using namespace Modeling;
using Tessara::Geometry::kInvalidIndex;

namespace {

    unsigned int twinOf(HalfEdgeDataStructure const& halfEdges, unsigned int start, unsigned int end)
    {
        HalfEdge const twin = halfEdges.halfEdge(start, end);
        if (twin.face == kInvalidIndex)
            return kInvalidIndex;
        return 3 * twin.face + (twin.faceSize == 3 ? (twin.corner + 2u) % 3 : 0);
    }

}

Twins findTwins(HalfEdgeDataStructure const& halfEdges, unsigned int const* corners)
{
    return {twinOf(halfEdges, corners[0], corners[1]), twinOf(halfEdges, corners[1], corners[2]),
        twinOf(halfEdges, corners[2], corners[0])};
}

TwinTable::TwinTable(HalfEdgeDataStructure const& halfEdges, FaceView const& faces)
    : halfEdges_(&halfEdges)
    , faces_(faces)
    , isFound_(zeroedArray<unsigned char>(faces.count))
    , found_(uninitializedArray<Twins>(faces.count))
    , twins_(found_.data)
{
}

void TwinTable::find(unsigned int face)
{
    found_[face] = findTwins(*halfEdges_, faces_.corners(face));
    isFound_[face] = true;
}

}
