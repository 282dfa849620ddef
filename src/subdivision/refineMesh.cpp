#include "refineMesh.h"

#include "pointProperties.h"

#include "frame/Arrays.h"
#include "host/GeoProperties.h"

#include <Modeling/HalfEdgeDataStructure.h>
#include <Modeling/subdivisionSteps.h>
#include <TessaraGeometry/Elements.h>

#include <optional>

namespace Geometry::Mesh::Internal {

using namespace Modeling;
using Tessara::Math::float3;

namespace {

    using IndexArray = Orvan::Array<unsigned int>;

    /// What a run works on; the object keeps its own arrays until the end.
    struct RefinedMesh {
        unsigned int numPoints = 0;
        unsigned int numFaceVertices = 0;
        unsigned int numFaces = 0;
        Orvan::Array<float3> positions; // at present
        IndexArray faceVertex;
        IndexArray faceOffset;
        Orvan::Array<float3> basePositions; // where each point was made
        Orvan::Array<float3> limitPositions;
        Orvan::Array<unsigned char> vertexLevels;
        Orvan::Array<unsigned char> faceStates;
    };

    /// Nothing where an array is missing.
    std::optional<RefinedMesh> readMesh(Tessara::Object const& object)
    {
        using namespace Tessara::Geometry;
        auto const positions = readGeoPropData<float3>(object, sPointPosition);
        auto const faceVertex = readGeoPropData<unsigned int>(object, sFaceVertex);
        auto const faceOffset = readGeoPropData<unsigned int>(object, sFaceOffset);
        if (!positions || !faceVertex || !faceOffset)
            return std::nullopt;
        RefinedMesh mesh;
        mesh.numPoints = getElementCount(object, sPointComp);
        mesh.numFaceVertices = getElementCount(object, sFaceVertexComp);
        mesh.numFaces = getElementCount(object, sFaceComp);
        mesh.positions = copyOfFirst(positions->size, *positions);
        mesh.faceVertex = copyOfFirst(faceVertex->size, *faceVertex);
        mesh.faceOffset = copyOfFirst(faceOffset->size, *faceOffset);
        return mesh;
    }

    void startAtLevelZero(HalfEdgeDataStructure const& halfEdges, RefinedMesh& mesh)
    {
        mesh.basePositions = copyOfFirst(mesh.numPoints, mesh.positions);
        computePositionsInfinity(halfEdges, mesh.numPoints, mesh.positions, mesh.limitPositions);
        mesh.vertexLevels = zeroedArray<unsigned char>(mesh.numPoints);
        mesh.faceStates = zeroedArray<unsigned char>(mesh.numFaces);
    }

    void refineFaces(
        MarkFaces const& markFaces, HalfEdgeDataStructure const& halfEdges, RefinedMesh& mesh, Tessara::Object& object)
    {
        Orvan::Array<bool> marks = zeroedArray<bool>(mesh.numFaces);
        markFaces({mesh.numFaces, mesh.positions, mesh.faceVertex, mesh.faceOffset}, marks);
        subdivide(marks, halfEdges, mesh.numPoints, mesh.numFaceVertices, mesh.numFaces, mesh.basePositions,
            mesh.limitPositions, mesh.vertexLevels, mesh.faceVertex, mesh.faceOffset, mesh.faceStates, object);
    }

    void rebuild(HalfEdgeDataStructure& halfEdges, RefinedMesh& mesh)
    {
        // Neither is of use any more, and together they are a third of what is taken.
        halfEdges.clear();
        mesh.positions = {};
        HalfEdgeDataStructure rebuilt(mesh.numPoints, mesh.numFaces, mesh.faceVertex, mesh.faceOffset);
        halfEdges.swap(rebuilt);
    }

    /// Until a pass leaves the number of faces as it was.
    void runPasses(
        MarkFaces const& markFaces, HalfEdgeDataStructure& halfEdges, RefinedMesh& mesh, Tessara::Object& object)
    {
        bool hasMore = mesh.numFaces != 0;
        for (bool isFirst = true; hasMore; isFirst = false) {
            unsigned int const facesBefore = mesh.numFaces, pointsBefore = mesh.numPoints;
            refineFaces(markFaces, halfEdges, mesh, object);
            hasMore = mesh.numFaces != facesBefore;
            // As many points, and as many faces: no face has split, and all is as the pass before has left it.
            bool const isUnchanged = !hasMore && mesh.numPoints == pointsBefore;
            if (!isUnchanged)
                rebuild(halfEdges, mesh);
            if (!isUnchanged || isFirst)
                computePositions(halfEdges, mesh.numPoints, mesh.basePositions, mesh.limitPositions, mesh.vertexLevels,
                    mesh.faceStates, mesh.positions);
        }
    }

    void writeMesh(RefinedMesh&& mesh, Tessara::Object& object)
    {
        using namespace Tessara::Geometry;
        PreparedWrites writes(object);
        writes.setElementCount(sPointComp, mesh.numPoints);
        writes.setElementCount(sFaceVertexComp, mesh.numFaceVertices);
        writes.setElementCount(sFaceComp, mesh.numFaces);
        writes.writeGeoPropData(sPointPosition, Orvan::makePtr<Orvan::Array<float3>>(std::move(mesh.positions)));
        writes.writeGeoPropData(sFaceVertex, Orvan::makePtr<IndexArray>(std::move(mesh.faceVertex)));
        writes.writeGeoPropData(sFaceOffset, Orvan::makePtr<IndexArray>(std::move(mesh.faceOffset)));
        writes.commit();
    }

}

bool refineMesh(MarkFaces const& markFaces, Tessara::Object& object)
{
    stripSubdivisionProperties(object);
    std::optional<RefinedMesh> mesh = readMesh(object);
    if (!mesh)
        return false;
    HalfEdgeDataStructure halfEdges(mesh->numPoints, mesh->numFaces, mesh->faceVertex, mesh->faceOffset);
    if (halfEdges.hasBoundary(mesh->numFaces, mesh->faceVertex, mesh->faceOffset))
        return false;

    startAtLevelZero(halfEdges, *mesh);
    runPasses(markFaces, halfEdges, *mesh, object);
    writeMesh(std::move(*mesh), object);
    return true;
}

}
