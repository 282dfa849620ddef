#include "refineMesh.h"

#include "pointProperties.h"
#include "positionRules.h"
#include "refineTopology.h"

#include "frame/Arrays.h"
#include "frame/Assert.h"
#include "host/MeshArrays.h"

#include <Modeling/HalfEdgeDataStructure.h>
#include <Modeling/subdivisionSteps.h>

#include <cstdint>
#include <optional>

namespace Geometry::Mesh::Internal {

using namespace Modeling;
using Tessara::Math::float3;

namespace {

    /// The arrays of a run. The object keeps its own arrays until the end.
    struct RefinedMesh {
        unsigned int numPoints = 0;
        unsigned int numFaceVertices = 0;
        unsigned int numFaces = 0;
        Orvan::Array<float3> positions; // smoothed
        IndexArray faceVertex;
        IndexArray faceOffset;
        Orvan::Array<float3> basePositions; // where each point was created
        Orvan::Array<float3> limitPositions;
        Orvan::Array<unsigned char> vertexLevels;
        Orvan::Array<unsigned char> faceStates;
    };

    /// nullopt if an array is missing.
    std::optional<RefinedMesh> readMesh(Tessara::Object const& object)
    {
        MeshArrays const original = readMeshArrays(object);
        if (!original.isComplete())
            return std::nullopt;
        RefinedMesh mesh;
        mesh.numPoints = original.pointCount;
        mesh.numFaceVertices = original.cornerCount;
        mesh.numFaces = original.faceCount;
        mesh.positions = copyOfFirst(original.positions->size, *original.positions);
        mesh.faceVertex = copyOfFirst(original.faceVertex->size, *original.faceVertex);
        mesh.faceOffset = copyOfFirst(original.faceOffset->size, *original.faceOffset);
        return mesh;
    }

    void startAtLevelZero(HalfEdgeDataStructure const& halfEdges, RefinedMesh& mesh)
    {
        mesh.basePositions = copyOfFirst(mesh.numPoints, mesh.positions);
        computePositionsInfinity(halfEdges, mesh.numPoints, mesh.positions, mesh.limitPositions);
        mesh.vertexLevels = zeroedArray<unsigned char>(mesh.numPoints);
        mesh.faceStates = zeroedArray<unsigned char>(mesh.numFaces);
    }

    /// What is known of how faces are connected: the adjacency that follows from the pass before or, if the mesh allows
    /// none, half-edges, which are found anew.
    struct Connections {
        std::optional<ClosedAdjacency> adjacency;
        std::optional<HalfEdgeDataStructure> halfEdges;
    };

    Connections findConnections(RefinedMesh const& mesh)
    {
        Connections connections;
        connections.halfEdges.emplace(mesh.numPoints, mesh.numFaces, mesh.faceVertex, mesh.faceOffset);
        if (isTriangleMesh(mesh.numFaces, mesh.faceOffset))
            connections.adjacency = findClosedAdjacency(
                *connections.halfEdges, {mesh.faceVertex.data, mesh.faceOffset, mesh.numFaces}, mesh.numPoints);
        return connections;
    }

    void refineFaces(MarkFaces const& markFaces, Connections& connections, RefinedMesh& mesh, Tessara::Object& object)
    {
        Orvan::Array<bool> marks = zeroedArray<bool>(mesh.numFaces);
        markFaces({mesh.numFaces, mesh.positions, mesh.faceVertex, mesh.faceOffset}, marks);
        if (connections.adjacency)
            subdivide(marks, *connections.adjacency,
                {mesh.numPoints, mesh.numFaceVertices, mesh.numFaces, mesh.basePositions, mesh.limitPositions,
                    mesh.vertexLevels, mesh.faceVertex, mesh.faceOffset, mesh.faceStates},
                object);
        else
            subdivide(marks, *connections.halfEdges, mesh.numPoints, mesh.numFaceVertices, mesh.numFaces,
                mesh.basePositions, mesh.limitPositions, mesh.vertexLevels, mesh.faceVertex, mesh.faceOffset,
                mesh.faceStates, object);
    }

    void placePoints(Connections const& connections, RefinedMesh& mesh)
    {
        if (auto const& adjacency = connections.adjacency)
            computePositions(mesh.numPoints, adjacency->valences.data, adjacency->finestSteps.data, mesh.basePositions,
                mesh.limitPositions, mesh.vertexLevels, mesh.positions);
        else
            computePositions(*connections.halfEdges, mesh.numPoints, mesh.basePositions, mesh.limitPositions,
                mesh.vertexLevels, mesh.faceStates, mesh.positions);
    }

    /// What each pass preserves if the adjacency is known.
    [[maybe_unused]] bool isClosedAndBalanced(RefinedMesh const& mesh)
    {
        HalfEdgeDataStructure const halfEdges(mesh.numPoints, mesh.numFaces, mesh.faceVertex, mesh.faceOffset);
        return !halfEdges.hasBoundary(mesh.numFaces, mesh.faceVertex, mesh.faceOffset)
            && isBalanced(halfEdges, mesh.numFaces, mesh.faceVertex, mesh.faceOffset, mesh.faceStates);
    }

    /// Runs passes until the number of faces no longer changes.
    void runPasses(MarkFaces const& markFaces, Connections& connections, RefinedMesh& mesh, Tessara::Object& object)
    {
        bool hasMore = mesh.numFaces != 0;
        if (connections.adjacency)
            connections.halfEdges.reset();
        for (bool isFirst = true; hasMore; isFirst = false) {
            unsigned int const facesBefore = mesh.numFaces, pointsBefore = mesh.numPoints;
            refineFaces(markFaces, connections, mesh, object);
            hasMore = mesh.numFaces != facesBefore;
            // The counts are the same: no face has split, and nothing has changed since the pass before.
            bool const isUnchanged = !hasMore && mesh.numPoints == pointsBefore;
            if (!isUnchanged) {
                // First release what is no longer needed.
                mesh.positions = {};
                connections.halfEdges.reset();
                if (!connections.adjacency)
                    connections.halfEdges.emplace(mesh.numPoints, mesh.numFaces, mesh.faceVertex, mesh.faceOffset);
            }
            MODELING_ASSERT(!connections.adjacency || isClosedAndBalanced(mesh));
            // Also if the first pass splits nothing: points without a face become NaN in all cases.
            if (!isUnchanged || isFirst)
                placePoints(connections, mesh);
        }
    }

    void writeMesh(RefinedMesh&& mesh, Tessara::Object& object)
    {
        MeshArrays refined{Orvan::makePtr<Orvan::Array<float3>>(std::move(mesh.positions)),
            Orvan::makePtr<IndexArray>(std::move(mesh.faceVertex)),
            Orvan::makePtr<IndexArray>(std::move(mesh.faceOffset)), mesh.numPoints, mesh.numFaceVertices,
            mesh.numFaces};
        PreparedWrites writes(object);
        writeMeshArrays(std::move(refined), writes);
        writes.commit();
    }

}

bool refineMesh(MarkFaces const& markFaces, Tessara::Object& object)
{
    stripSubdivisionProperties(object);
    std::optional<RefinedMesh> mesh = readMesh(object);
    if (!mesh)
        return false;
    MODELING_ASSERT(mesh->positions.size >= mesh->numPoints && mesh->faceOffset.size > mesh->numFaces);
    MODELING_ASSERT(areOffsets(mesh->faceOffset.data, mesh->numFaces, mesh->faceVertex.size));
    MODELING_ASSERT(areBelow(mesh->numPoints, mesh->faceVertex.data, mesh->faceVertex.size));
    Connections connections = findConnections(*mesh);
    if (!connections.adjacency
        && connections.halfEdges->hasBoundary(mesh->numFaces, mesh->faceVertex, mesh->faceOffset))
        return false;

    startAtLevelZero(*connections.halfEdges, *mesh);
    runPasses(markFaces, connections, *mesh, object);
    writeMesh(std::move(*mesh), object);
    return true;
}

}
