#pragma once

#include "MeshArrays.h"
#include "shell/Report.h"

#include <TessaraGeometry/Names.h>

#include <algorithm>
#include <cstdint>
#include <optional>

namespace ModelingProgram {

/// How many there are of something, and the lowest one.
struct Finding {
    std::uint64_t count = 0;
    unsigned int first = Tessara::Geometry::kInvalidIndex;

    explicit operator bool() const { return count != 0; }
    void add(unsigned int element)
    {
        ++count;
        first = std::min(first, element);
    }
};

/// How the faces of a mesh hang together. An edge joins two different points that follow one another in a face of at
/// least three corners, and belongs to as many sides of faces as pass it, in either direction.
struct MeshTopology {
    // Faces by their number of corners. The first is the lowest face.
    std::uint64_t triangleCount = 0;
    Finding facesBelowThreeCorners;
    Finding quads;
    Finding polygons; // more than four corners
    Finding facesWithRepeatedPoints; // these visit a point more than once

    std::uint64_t edgeCount = 0;
    // The first is the lowest corner at which a side of such an edge starts.
    Finding openEdges; // one side
    Finding nonManifoldEdges; // more than two sides
    Finding windingConflicts; // edges with two or more sides in one direction; counted for each direction
    Finding flippedEdges; // edges with two sides, both in one direction

    // The first is the lowest point.
    Finding pinchedPoints; // points whose faces do not all hang together by edges at the point
    Finding isolatedPoints; // points of no face

    std::uint64_t partCount = 0; // faces that share a point are in one part
    std::optional<std::int64_t> genus; // summed over the parts; for closed manifolds

    /// Two sides with opposite directions to each edge, and one closed fan of faces around each point.
    bool isClosedManifold() const;
};

class EdgeSides;

/// Takes any valid mesh. Linear, but for sorting the edges at each point; takes up to 16 bytes per corner and 9 per point.
MeshTopology analyseTopology(MeshArrays const& mesh);
/// The same with the edges of the mesh, for those who need them further.
MeshTopology analyseTopology(MeshArrays const& mesh, EdgeSides const& edges);

/// Adds the rows "parts" and "genus" to the table of a command.
void addPartsAndGenus(MeshTopology const& topology, Json& values);

/// The points of no face.
Finding findIsolatedPoints(MeshArrays const& mesh);

/// The faces whose shortest edge is shorter than `ratio` times their longest one, as the library measures them.
std::uint64_t countSlivers(MeshArrays const& mesh, float ratio);

/// The points that lie exactly where a point before them lies: a mesh with many of them may be cut along its seams.
std::uint64_t countCoincidentPoints(MeshArrays const& mesh);

}
