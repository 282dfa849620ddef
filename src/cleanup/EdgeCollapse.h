#pragma once

#include "PartialAdjacency.h"

#include <TessaraGeometry/Names.h>

#include <cstdint>
#include <unordered_map>
#include <unordered_set>
#include <vector>

namespace Modeling::Internal {

using Tessara::Math::float3;

/// Whether the sweep over the faces must visit a face: only slivers, and faces changed by a collapse, can collapse.
enum class FaceVisit : unsigned char { None = 0, Sliver = 1, Changed = 2 };

/// The faces that are slivers before the first collapse.
struct Slivers {
    Orvan::Array<FaceVisit> visits; // one per face
    Orvan::Array<unsigned char> isEnd; // for each point whether the shortest edge of a sliver ends there: 1 or 0
};

/// What a walk around a point with many faces has found. All spokes of such a hub may be the shortest edges of slivers,
/// and one walk per spoke would take quadratic time.
struct Hub {
    enum class Fan : unsigned char {
        Closed, // and no neighbor occurs twice
        Open, // the point is on a boundary or has several fans
        Tangled // a neighbor occurs twice: the outcome of a walk depends on where it starts
    };
    Fan fan = Fan::Tangled;
    std::unordered_set<unsigned int> ring; // the neighbors of the point if the fan is closed
    // By direction cell, a face that refused a move of the point.
    std::unordered_map<std::uint64_t, unsigned int> refusing;
};

/// The mesh while its edges collapse. A removed face has `kInvalidIndex` at its first corner.
struct CollapsingMesh {
    Orvan::Array<float3> positions;
    IndexArray faceVertex;
    PartialAdjacency adjacency; // known at first around the ends of the slivers' shortest edges
    IndexArray valence; // number of faces around each point; if a closed fan has fewer, the point has other fans
    Orvan::Array<FaceVisit> visits; // one per face
    std::unordered_map<unsigned int, Hub> hubs; // by point; collapses keep them up to date
    std::vector<unsigned int> removedFaces;
    std::vector<unsigned int> removedPoints;

    unsigned int* corners(unsigned int face) { return faceVertex.data + std::size_t{3} * face; }
    unsigned int const* corners(unsigned int face) const { return faceVertex.data + std::size_t{3} * face; }
    bool isRemoved(unsigned int face) const { return corners(face)[0] == Tessara::Geometry::kInvalidIndex; }
};

/// A face around a point; the point is corner `entry` of the face.
struct FanFace {
    unsigned int face;
    unsigned int entry;
    friend bool operator==(FanFace const&, FanFace const&) = default;
};

/// One end of an edge that may collapse. `first` and `last` are the two faces of the edge, which are removed.
struct EdgeEnd {
    FanFace first{};
    FanFace last{}; // its entry is the other end
    unsigned int point = 0;
    std::vector<FanFace> fan; // the faces around the point, those after `first` and before `last`
    std::vector<unsigned int> ring; // the neighbors of the point except the other end, ascending; not set for a hub
};

struct CollapsingEdge {
    EdgeEnd start; // its point is kept and moves to the midpoint
    EdgeEnd end; // its point is removed
    float3 midpoint{};
    std::vector<unsigned int> sharedRing; // the points in both rings; scratch memory of `canCollapse`
};

/// Copies the mesh and finds its adjacency.
/// \param mesh     triangles; `pointCount` positions. Must outlive the result.
/// \param slivers  which faces the sweep must visit
CollapsingMesh prepareCollapses(MeshArrays const& mesh, Slivers&& slivers);

/// Whether edge `entry` of the face can collapse: it has a face on both sides, both ends have closed fans, no face
/// around them turns over, and the surface remains manifold. Takes time linear in the valences of both ends; if the
/// answer is no, mostly in the smaller one.
/// \param original  the mesh before the first collapse
/// \param edge      describes the edge if the answer is yes; reused from call to call to allocate less
bool canCollapse(MeshArrays const& original, FanFace const& face, CollapsingMesh& mesh, CollapsingEdge& edge);

/// Moves the start of the edge to the midpoint, and removes the end and the two faces of the edge.
/// \pre  `canCollapse` has described the edge, and the mesh has not changed since
void collapseEdge(CollapsingEdge const& edge, CollapsingMesh& mesh);

}
