#include "EdgeCollapse.h"

#include "frame/Arrays.h"
#include "frame/Assert.h"
#include "frame/Lanes.h"
#include "frame/VectorMath.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <iterator>
#include <limits>
#include <optional>
#include <utility>

namespace Modeling::Internal {

using Tessara::Geometry::kInvalidIndex;

namespace {

    IndexArray countFacesAround(PointCorners const& around)
    {
        unsigned int const* const offset = around.offsets.data;
        IndexArray valence = uninitializedArray<unsigned int>(around.offsets.size - 1);
        unsigned int* const count = valence.data;
        // Each point writes its own entry.
        parallelFor(tbb::blocked_range<std::size_t>(0, valence.size, kElementGrain), [=](auto const& points) {
            for (std::size_t point = points.begin(); point != points.end(); ++point)
                count[point] = offset[point + 1] - offset[point];
        });
        return valence;
    }

    /// Which edge of `face` has `neighbor` on its other side.
    unsigned int neighborIndex(CollapsingMesh const& mesh, unsigned int face, unsigned int neighbor)
    {
        std::array<unsigned int, 3> const& neighbors = mesh.adjacency[face];
        return neighbors[0] == neighbor ? 0 : neighbors[1] == neighbor ? 1 : 2;
    }

    /// The face that follows `current` around the same point; nullopt at a boundary or if the adjacency is not mutual
    /// there.
    std::optional<FanFace> nextAround(CollapsingMesh const& mesh, FanFace const& current)
    {
        unsigned int const face = mesh.adjacency[current.face][previousCorner(current.entry)];
        if (face == kInvalidIndex || mesh.isRemoved(face))
            return std::nullopt;
        unsigned int const entry = neighborIndex(mesh, face, current.face);
        bool const isMutual = mesh.adjacency[face][entry] == current.face
            && mesh.corners(face)[entry] == mesh.corners(current.face)[current.entry];
        return isMutual ? std::optional<FanFace>({face, entry}) : std::nullopt;
    }

    /// The face that precedes `current` around the same point; nullopt as in `nextAround`.
    std::optional<FanFace> previousAround(CollapsingMesh const& mesh, FanFace const& current)
    {
        unsigned int const face = mesh.adjacency[current.face][current.entry];
        if (face == kInvalidIndex || mesh.isRemoved(face))
            return std::nullopt;
        FanFace const before{face, nextCorner(neighborIndex(mesh, face, current.face))};
        return nextAround(mesh, before) == current ? std::optional<FanFace>(before) : std::nullopt;
    }

    /// Lists the faces around an end of the edge. The walk stops at the first face that `accept` refuses.
    /// \return whether all faces were accepted and the fan is closed and has all faces at the point, which is not the
    ///         case on boundaries and at non-manifold points
    template <class Accept> bool collectFan(CollapsingMesh const& mesh, Accept const& accept, EdgeEnd& end)
    {
        end.fan.clear();
        FanFace current = end.first;
        for (unsigned int left = mesh.valence[end.point]; left > 1; --left) {
            std::optional<FanFace> const around = nextAround(mesh, current);
            if (!around || around->face == end.first.face)
                return false;
            if (around->face == end.last.face)
                return left == 2 && mesh.adjacency[around->face][previousCorner(around->entry)] == end.first.face;
            if (!accept(*around))
                return false;
            end.fan.push_back(*around);
            current = *around;
        }
        return false;
    }

    void collectRing(CollapsingMesh const& mesh, EdgeEnd& end)
    {
        end.ring.assign(1, mesh.corners(end.last.face)[previousCorner(end.last.entry)]);
        for (FanFace const& around : end.fan)
            end.ring.push_back(mesh.corners(around.face)[nextCorner(around.entry)]);
        std::sort(end.ring.begin(), end.ring.end());
    }

    /// The link condition: the only common neighbors of the two ends are the third points of the two faces. Ends that
    /// both have valence 3 are refused too, because the surface is a tetrahedron there and would collapse to nothing.
    bool collapseKeepsLink(
        CollapsingMesh const& mesh, EdgeEnd const& smaller, EdgeEnd& larger, std::vector<unsigned int>& sharedRing)
    {
        collectRing(mesh, larger);
        if (smaller.ring.size() == 2 && larger.ring.size() == 2)
            return false;
        sharedRing.clear();
        std::set_intersection(smaller.ring.begin(), smaller.ring.end(), larger.ring.begin(), larger.ring.end(),
            std::back_inserter(sharedRing));
        return sharedRing.size() == 2;
    }

    /// Unit vectors along the edges of a face around a point.
    struct FaceDirections {
        float3 toFirst; // from the point to the next corner
        float3 toSecond; // from the point to the corner after that
        float3 opposite; // from the next corner to the one after it
    };

    /// Four vectors, one per lane.
    struct FourVectors {
        Lanes x, y, z;

        float3 operator[](int lane) const { return {x[lane], y[lane], z[lane]}; }
    };

    FourVectors fourVectors(float3 const& a, float3 const& b, float3 const& c, float3 const& d)
    {
        return {Lanes{a.x, b.x, c.x, d.x}, Lanes{a.y, b.y, c.y, d.y}, Lanes{a.z, b.z, c.z, d.z}};
    }

    /// `safeNormalize` for each, at hardly the cost of one.
    FourVectors normalizeEach(FourVectors const& v)
    {
        Lanes const squares = (v.x * v.x + v.y * v.y) + v.z * v.z;
        Lanes const norms{std::sqrt(squares[0]), std::sqrt(squares[1]), std::sqrt(squares[2]), std::sqrt(squares[3])};
        Lanes const factors = norms > broadcast(std::numeric_limits<float>::min()) ? 1.0f / norms : broadcast(1);
        return {v.x * factors, v.y * factors, v.z * factors};
    }

    /// The normal that a face had before the first collapse: the cross product of the directions from its first corner
    /// to the other two. It is not normalized; its length is the sine of the angle between them.
    float3 originalNormal(
        MeshArrays const& original, CollapsingMesh const& mesh, FanFace const& around, FaceDirections const& now)
    {
        if (mesh.visits[around.face] == FaceVisit::Changed) {
            unsigned int const* const c = original.faceVertex->data + std::size_t{3} * around.face;
            float3 const* const position = original.positions->data;
            return cross(
                safeNormalize(position[c[1]] - position[c[0]]), safeNormalize(position[c[2]] - position[c[0]]));
        }
        // An unchanged face still has these directions to the bit, except for signs that cancel in the product.
        if (around.entry == 0)
            return cross(now.toFirst, now.toSecond);
        if (around.entry == 1)
            return cross(now.toSecond, now.opposite);
        return cross(now.toFirst, now.opposite);
    }

    bool faceKeepsOrientation(
        MeshArrays const& original, CollapsingMesh const& mesh, FanFace const& around, float3 const& midpoint)
    {
        unsigned int const* const c = mesh.corners(around.face);
        float3 const p0 = mesh.positions[c[around.entry]]; // the point that moves
        float3 const p1 = mesh.positions[c[nextCorner(around.entry)]];
        float3 const p2 = mesh.positions[c[previousCorner(around.entry)]];
        FourVectors const directions = normalizeEach(fourVectors(p1 - p0, p2 - p0, p2 - p1, p1 - midpoint));
        FaceDirections const now{directions[0], directions[1], directions[2]};

        // The midpoint must be strictly on the inner side of the opposite edge.
        float3 const normal = cross(now.toFirst, now.toSecond);
        if (dot(cross(normal, now.opposite), midpoint - p1) <= 0)
            return false;
        // The angle between the new normal and the original one must be less than 90 degrees.
        float3 const newNormal = cross(directions[3], safeNormalize(p2 - midpoint));
        return !(dot(newNormal, originalNormal(original, mesh, around, now)) <= 0);
    }

    constexpr unsigned int kHubValence = 48; // up to this valence a walk is cheaper than a look-up

    Hub walkAround(CollapsingMesh const& mesh, FanFace const& first)
    {
        Hub hub;
        std::size_t const valence = mesh.valence[mesh.corners(first.face)[first.entry]];
        hub.ring.reserve(valence);
        std::optional<FanFace> current = first;
        do {
            if (!hub.ring.insert(mesh.corners(current->face)[nextCorner(current->entry)]).second)
                return hub;
            current = nextAround(mesh, *current);
        } while (current && current != first);
        hub.fan = current && hub.ring.size() == valence ? Hub::Fan::Closed : Hub::Fan::Open;
        return hub;
    }

    /// Whether the two faces of the edge are adjacent around this end, and each has its point at one corner only.
    bool fitsHub(CollapsingMesh const& mesh, EdgeEnd const& end, EdgeEnd const& other)
    {
        auto const hasOnce = [&](unsigned int face) {
            return std::count(mesh.corners(face), mesh.corners(face) + 3, end.point) == 1;
        };
        return mesh.corners(end.first.face)[nextCorner(end.first.entry)] == other.point && hasOnce(end.first.face)
            && hasOnce(end.last.face) && nextAround(mesh, {end.last.face, nextCorner(end.last.entry)}) == end.first;
    }

    /// What is known about `end`. Null if its point has few faces, or if a walk around it could have a different
    /// outcome for this edge than for others, which happens in non-manifold meshes.
    Hub* findHub(EdgeEnd const& end, EdgeEnd const& other, CollapsingMesh& mesh)
    {
        bool const isHub = mesh.valence[end.point] > kHubValence && fitsHub(mesh, end, other)
            && std::adjacent_find(other.ring.begin(), other.ring.end()) == other.ring.end();
        if (!isHub)
            return nullptr;
        auto entry = mesh.hubs.find(end.point);
        if (entry == mesh.hubs.end())
            entry = mesh.hubs.emplace(end.point, walkAround(mesh, end.first)).first;
        return entry->second.fan == Hub::Fan::Tangled ? nullptr : &entry->second;
    }

    /// The link condition. A hub has more than three faces, so it needs no check for a tetrahedron.
    bool hubKeepsLink(Hub const& hub, EdgeEnd const& other)
    {
        auto const isShared = [&](unsigned int point) { return point != other.point && hub.ring.contains(point); };
        return hub.fan == Hub::Fan::Closed && std::count_if(other.ring.begin(), other.ring.end(), isShared) == 2;
    }

    /// The key of the cell that contains a direction, in a grid with 2^(level + 1) cells per axis.
    std::uint64_t directionCell(float3 const& direction, unsigned int level)
    {
        std::uint64_t cell = level;
        for (float const coordinate : {direction.x, direction.y, direction.z}) {
            float const atMost1 = coordinate >= -1 && coordinate < 1 ? coordinate : 1; // also if it is NaN
            cell = cell << 18 | static_cast<std::uint64_t>((atMost1 + 1) * static_cast<float>(1U << level));
        }
        return cell;
    }

    constexpr unsigned int kFinestLevel = 16;
    constexpr unsigned int kLevelStep = 2;

    /// The face that refused the move of the hub in the most similar direction; `otherwise` if none is known.
    FanFace findRefusing(
        CollapsingMesh const& mesh, Hub const& hub, unsigned int point, float3 const& direction, FanFace otherwise)
    {
        for (unsigned int level = kFinestLevel + kLevelStep; level != 0 && !hub.refusing.empty();) {
            level -= kLevelStep;
            auto const found = hub.refusing.find(directionCell(direction, level));
            if (found == hub.refusing.end() || mesh.isRemoved(found->second))
                continue;
            unsigned int const* const corners = mesh.corners(found->second);
            auto const entry = static_cast<unsigned int>(std::find(corners, corners + 3, point) - corners);
            if (entry != 3)
                return {found->second, entry};
        }
        return otherwise;
    }

    /// As `collectFan`, for a hub whose fan is closed, but in another order: starts at the face that is most likely to
    /// refuse and continues on both sides of it, because moves in similar directions are refused by nearby faces.
    template <class Accept> bool collectFanOfHub(
        CollapsingMesh const& mesh, Accept const& accept, float3 const& midpoint, Hub& hub, EdgeEnd& end)
    {
        constexpr unsigned int kNear = 8; // a face that is found sooner is not worth remembering
        float3 const direction = safeNormalize(midpoint - mesh.positions[end.point]);
        std::optional<FanFace> ahead = findRefusing(mesh, hub, end.point, direction, end.first);
        std::optional<FanFace> behind = previousAround(mesh, *ahead);
        end.fan.clear();
        unsigned int const valence = mesh.valence[end.point];
        for (unsigned int visited = 0; visited != valence; ++visited) {
            bool const isAhead = visited % 2 == 0;
            std::optional<FanFace>& side = isAhead ? ahead : behind;
            if (!side)
                return collectFan(mesh, accept, end); // only if two faces share two edges
            FanFace const current = *side;
            if (current.face != end.first.face && current.face != end.last.face) {
                if (!accept(current)) {
                    for (unsigned int level = 0; visited > kNear && level <= kFinestLevel; level += kLevelStep)
                        hub.refusing[directionCell(direction, level)] = current.face;
                    return false;
                }
                end.fan.push_back(current);
            }
            side = isAhead ? nextAround(mesh, current) : previousAround(mesh, current);
        }
        return true;
    }

    bool isNeighborOnce(CollapsingMesh const& mesh, unsigned int face, unsigned int neighbor)
    {
        return std::count(mesh.adjacency[face].begin(), mesh.adjacency[face].end(), neighbor) == 1;
    }

    /// Whether the face across an edge of `face` has that edge in the opposite direction, and the two share no other
    /// edge.
    bool fitsAcross(CollapsingMesh const& mesh, unsigned int face, unsigned int edge)
    {
        unsigned int const across = mesh.adjacency[face][edge];
        unsigned int const entry = neighborIndex(mesh, across, face);
        return mesh.corners(across)[entry] == mesh.corners(face)[nextCorner(edge)]
            && mesh.corners(across)[nextCorner(entry)] == mesh.corners(face)[edge] && isNeighborOnce(mesh, face, across)
            && isNeighborOnce(mesh, across, face);
    }

    /// Whether the two faces that are joined when a face is removed will share only the edge along which they are
    /// joined.
    bool joinsPlainly(CollapsingMesh const& mesh, FanFace const& removed)
    {
        auto const [face, edge] = removed;
        std::array<unsigned int, 3> const& beyond = mesh.adjacency[mesh.adjacency[face][nextCorner(edge)]];
        return fitsAcross(mesh, face, edge) && fitsAcross(mesh, face, nextCorner(edge))
            && fitsAcross(mesh, face, previousCorner(edge))
            && std::find(beyond.begin(), beyond.end(), mesh.adjacency[face][previousCorner(edge)]) == beyond.end();
    }

    /// Brings what is known about hubs up to date for a collapse that is about to happen: the kept point becomes the
    /// hub of the larger end, and a hub around faces that will share two edges is forgotten.
    void updateHubs(CollapsingEdge const& edge, CollapsingMesh& mesh)
    {
        if (mesh.hubs.empty())
            return;
        unsigned int const kept = edge.start.point, removed = edge.end.point;
        for (FanFace const& face : {edge.start.first, edge.end.first})
            if (!joinsPlainly(mesh, face))
                for (unsigned int const side : {nextCorner(face.entry), previousCorner(face.entry)}) {
                    unsigned int const* const corners = mesh.corners(mesh.adjacency[face.face][side]);
                    std::for_each(corners, corners + 3, [&](unsigned int point) { mesh.hubs.erase(point); });
                }
        for (FanFace const& around : edge.end.fan)
            for (unsigned int const entry : {nextCorner(around.entry), previousCorner(around.entry)}) {
                auto const hub = mesh.hubs.find(mesh.corners(around.face)[entry]);
                if (hub != mesh.hubs.end() && hub->second.ring.erase(removed) != 0)
                    hub->second.ring.insert(kept);
            }

        bool const isStartLarger = mesh.valence[kept] > mesh.valence[removed];
        EdgeEnd const& larger = isStartLarger ? edge.start : edge.end;
        EdgeEnd const& smaller = isStartLarger ? edge.end : edge.start;
        auto joined = mesh.hubs.extract(larger.point);
        mesh.hubs.erase(smaller.point);
        if (joined.empty() || joined.mapped().fan != Hub::Fan::Closed)
            return;
        joined.key() = kept;
        joined.mapped().ring.erase(smaller.point);
        joined.mapped().ring.insert(smaller.ring.begin(), smaller.ring.end());
        mesh.hubs.insert(std::move(joined));
    }

    void replaceNeighbor(unsigned int face, unsigned int from, unsigned int to, CollapsingMesh& mesh)
    {
        std::array<unsigned int, 3>& neighbors = mesh.adjacency[face];
        auto const first = std::find(neighbors.begin(), neighbors.end(), from);
        if (first != neighbors.end())
            *first = to;
    }

    /// Makes the outer neighbors of each removed face neighbors of each other.
    void glueHoles(CollapsingEdge const& collapse, CollapsingMesh& mesh)
    {
        auto const [f, edge] = collapse.start.first;
        auto const [g, edgeAcross] = collapse.end.first;
        // All four are read before anything changes.
        unsigned int const behindEnd = mesh.adjacency[f][nextCorner(edge)];
        unsigned int const behindStart = mesh.adjacency[f][previousCorner(edge)];
        unsigned int const acrossBehindStart = mesh.adjacency[g][nextCorner(edgeAcross)];
        unsigned int const acrossBehindEnd = mesh.adjacency[g][previousCorner(edgeAcross)];
        replaceNeighbor(behindEnd, f, behindStart, mesh);
        replaceNeighbor(behindStart, f, behindEnd, mesh);
        replaceNeighbor(acrossBehindEnd, g, acrossBehindStart, mesh);
        replaceNeighbor(acrossBehindStart, g, acrossBehindEnd, mesh);
    }

    /// Marks a face of the edge as removed. One of its corners is still the removed end, whose faces now count for the
    /// start.
    void removeFace(unsigned int face, CollapsingEdge const& edge, CollapsingMesh& mesh)
    {
        unsigned int* const corners = mesh.corners(face);
        for (unsigned int k = 0; k != 3; ++k)
            --mesh.valence[corners[k] == edge.end.point ? edge.start.point : corners[k]];
        corners[0] = kInvalidIndex;
        mesh.removedFaces.push_back(face);
    }

}

CollapsingMesh prepareCollapses(MeshArrays const& mesh, Slivers&& slivers)
{
    CollapsingMesh collapsing;
    {
        PointCorners const around =
            cornersByPoint(mesh.pointCount, mesh.faceVertex->data, std::size_t{3} * mesh.faceCount);
        collapsing.adjacency = PartialAdjacency(mesh, slivers.isEnd, around);
        collapsing.valence = countFacesAround(around);
    }
    collapsing.positions = copyOfFirst(mesh.pointCount, *mesh.positions);
    collapsing.faceVertex = copyOfFirst(std::uint64_t{3} * mesh.faceCount, *mesh.faceVertex);
    collapsing.visits = std::move(slivers.visits);
    return collapsing;
}

bool canCollapse(MeshArrays const& original, FanFace const& face, CollapsingMesh& mesh, CollapsingEdge& edge)
{
    unsigned int const across = mesh.adjacency[face.face][face.entry];
    if (across == kInvalidIndex || across == face.face || mesh.isRemoved(across))
        return false;
    auto& [start, end, midpoint, sharedRing] = edge;
    start.first = end.last = face;
    start.last = end.first = {across, neighborIndex(mesh, across, face.face)};
    start.point = mesh.corners(face.face)[face.entry];
    end.point = mesh.corners(face.face)[nextCorner(face.entry)];
    bool const isMutual =
        mesh.adjacency[across][start.last.entry] == face.face && mesh.corners(across)[start.last.entry] == end.point;
    if (!isMutual || start.point == end.point)
        return false;
    midpoint = (mesh.positions[start.point] + mesh.positions[end.point]) * 0.5f;
    auto const keepsOrientation = [&, middle = midpoint](FanFace const& around) {
        return faceKeepsOrientation(original, mesh, around, middle);
    };
    // The end with fewer faces first: most refused collapses then cost only the walk around that end.
    bool const isStartLarger = mesh.valence[start.point] > mesh.valence[end.point];
    EdgeEnd& smaller = isStartLarger ? end : start;
    EdgeEnd& larger = isStartLarger ? start : end;
    if (!collectFan(mesh, keepsOrientation, smaller))
        return false;
    collectRing(mesh, smaller);
    if (Hub* const hub = findHub(larger, smaller, mesh))
        return hubKeepsLink(*hub, smaller) && collectFanOfHub(mesh, keepsOrientation, midpoint, *hub, larger);
    return collectFan(mesh, keepsOrientation, larger) && collapseKeepsLink(mesh, smaller, larger, sharedRing);
}

void collapseEdge(CollapsingEdge const& edge, CollapsingMesh& mesh)
{
    unsigned int const kept = edge.start.point, removed = edge.end.point;
    updateHubs(edge, mesh);
    mesh.positions[kept] = edge.midpoint;
    mesh.removedPoints.push_back(removed);
    for (FanFace const& around : edge.end.fan)
        std::replace(mesh.corners(around.face), mesh.corners(around.face) + 3, removed, kept);
    glueHoles(edge, mesh);

    mesh.valence[kept] += std::exchange(mesh.valence[removed], 0);
    removeFace(edge.start.first.face, edge, mesh);
    removeFace(edge.end.first.face, edge, mesh);
    MODELING_ASSERT(mesh.valence[kept] == edge.start.fan.size() + edge.end.fan.size());
    for (EdgeEnd const* const end : {&edge.start, &edge.end})
        for (FanFace const& around : end->fan)
            mesh.visits[around.face] = FaceVisit::Changed;
}

}
