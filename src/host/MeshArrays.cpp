#include "MeshArrays.h"

#include "frame/Assert.h"

#include <TessaraGeometry/Elements.h>

#include <utility>

namespace Modeling {

using namespace Tessara::Geometry;
using Tessara::Math::float3;

MeshArrays readMeshArrays(Tessara::Object const& object)
{
    MeshArrays mesh;
    mesh.positions = readGeoPropData<float3>(object, sPointPosition);
    mesh.faceVertex = readGeoPropData<unsigned int>(object, sFaceVertex);
    mesh.faceOffset = readGeoPropData<unsigned int>(object, sFaceOffset);
    mesh.pointCount = getElementCount(object, sPointComp);
    mesh.cornerCount = getElementCount(object, sFaceVertexComp);
    mesh.faceCount = getElementCount(object, sFaceComp);
    return mesh;
}

void writeMeshArrays(MeshArrays&& mesh, PreparedWrites& writes)
{
    if (mesh.positions) {
        MODELING_ASSERT(mesh.positions->size >= mesh.pointCount);
        writes.setElementCount(sPointComp, mesh.pointCount);
        writes.writeGeoPropData(sPointPosition, std::move(mesh.positions));
    }
    if (mesh.faceVertex) {
        MODELING_ASSERT(mesh.faceVertex->size >= mesh.cornerCount);
        writes.setElementCount(sFaceVertexComp, mesh.cornerCount);
        writes.writeGeoPropData(sFaceVertex, std::move(mesh.faceVertex));
    }
    if (mesh.faceOffset) {
        MODELING_ASSERT(mesh.faceOffset->size > mesh.faceCount);
        writes.setElementCount(sFaceComp, mesh.faceCount);
        writes.writeGeoPropData(sFaceOffset, std::move(mesh.faceOffset));
    }
}

}
