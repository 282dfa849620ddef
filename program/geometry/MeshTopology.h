#pragma once

#include "MeshArrays.h"
#include "shell/Report.h"

#include <TessaraGeometry/Names.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <optional>
#include <span>
#include <vector>

namespace ModelingProgram {

/// The number of elements that have some property, and the lowest of them.
struct Finding {
    std::uint64_t count = 0;
    unsigned int first = Tessara::Geometry::kInvalidIndex;

    explicit operator bool() const { return count != 0; }
    void add(unsigned int element)
    {
        ++count;
        first = std::min(first, element);
    }
    Finding& operator+=(Finding const& other)
    {
        count += other.count;
        first = std::min(first, other.first);
        return *this;
    }
};

/// How the faces of a mesh are connected. An edge joins two different points that are consecutive in a face of at least
/// three corners. It has one side for each time that a face traverses it, in either direction.
struct MeshTopology {
    // Faces by their number of corners. `first` is the lowest face.
    std::uint64_t triangleCount = 0;
    Finding facesBelowThreeCorners;
    Finding quads;
    Finding polygons; // more than four corners
    Finding facesWithRepeatedPoints; // faces with the same point at several corners

    std::uint64_t edgeCount = 0;
    // `first` is the lowest corner at which a side of such an edge starts.
    Finding boundaryEdges; // edges with one side
    Finding nonManifoldEdges; // edges with more than two sides
    Finding windingConflicts; // edges with two or more sides in the same direction; counted per direction
    Finding flippedEdges; // edges with two sides, both in the same direction
    std::array<std::uint64_t, 2> sharpEdgeCounts{}; // edges with two sides that are creases, of each kind looked for

    // `first` is the lowest point.
    Finding nonManifoldPoints; // non-manifold vertices: their faces are not all connected by edges at the point
    Finding isolatedPoints; // points that no face uses

    std::uint64_t partCount = 0; // connected components: faces that share a point are in the same one
    std::optional<std::int64_t> genus; // summed over the parts; for closed manifolds

    /// True if all faces have at least three corners, each edge has two sides in opposite directions, and the faces at
    /// each point form one fan. Isolated points do not matter.
    bool isClosedManifold() const;

    /// Adds what was found among other faces or points; not `partCount` and `genus`, which concern the whole mesh.
    MeshTopology& operator+=(MeshTopology const& other);
};

struct CreasesWithNormals;

/// Accepts any valid mesh. Runs in parallel, with the same result for any number of threads. Linear, except for sorting
/// the edges at each point. Needs 4 bytes per point if nearby faces use points with nearby numbers, otherwise also up to
/// 8 per corner and 4 per point.
/// \param creases  up to two kinds, whose sharp edges are counted. They may be about other positions than those of the mesh
MeshTopology analyzeTopology(MeshArrays const& mesh, std::span<CreasesWithNormals const> creases = {});

/// Adds the rows "parts" and "genus" to the table of a command.
void addPartsAndGenus(MeshTopology const& topology, Json& values);

/// The points that no face uses.
Finding findIsolatedPoints(MeshArrays const& mesh);

/// The number of points at exactly the same position as an earlier point: many of them suggest that the mesh is split
/// along seams.
std::uint64_t countCoincidentPoints(MeshArrays const& mesh);

}
