#include <Modeling/removeSlivers.h>

#include "frame/Arrays.h"
#include "frame/PointCorners.h"
#include "frame/VectorMath.h"
#include "host/GeoProperties.h"

#include <TessaraGeometry/Elements.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <compare>
#include <cstring>
#include <functional>
#include <iterator>
#include <limits>
#include <optional>
#include <unordered_map>
#include <unordered_set>
#include <utility>
#include <vector>

namespace Geometry::Mesh {

using namespace Modeling;
using Tessara::Geometry::kInvalidIndex;

namespace {

    using IndexArray = Orvan::Array<unsigned int>;
    using Triangle = std::array<unsigned int, 3>;

    // Around a face: corner k, edge k from corner k to the next one, and the face across edge k.
    constexpr unsigned int next(unsigned int k)
    {
        return k == 2 ? 0 : k + 1;
    }
    constexpr unsigned int previous(unsigned int k)
    {
        return k == 0 ? 2 : k - 1;
    }

    /// The arrays as the object holds them; nobody writes them during the operation.
    struct TriangleMesh {
        Orvan::Ptr<Orvan::Array<float3>> positions;
        Orvan::Ptr<IndexArray> faceVertex;
        Orvan::Ptr<IndexArray> faceOffset;
        unsigned int pointCount = 0;
        unsigned int faceCount = 0;
    };

    /// What the sweep has to do with a face. Only slivers, and faces that a collapse has changed, can collapse.
    enum class FaceVisit : unsigned char { None = 0, Sliver = 1, Changed = 2 };

    /// What a walk around a point of many faces has found. All its spokes may be the shortest edges of slivers, and a walk
    /// for each of them would take quadratic time.
    struct Hub {
        enum class Fan : unsigned char {
            Closed, // and no point is around it twice
            Open, // at a boundary, or one of several fans
            Tangled
        };
        Fan fan = Fan::Tangled;
        std::unordered_set<unsigned int> ring; // the points around it if the fan is closed
        std::unordered_map<std::uint64_t, unsigned int> refusing; // by directions, the faces that refused to move there
    };

    /// The mesh while its faces collapse. A removed face has `kInvalidIndex` at its first corner.
    struct CollapsingMesh {
        Orvan::Array<float3> positions;
        IndexArray faceVertex;
        Orvan::Array<Triangle> adjacency; // the faces across a face's edges
        IndexArray valence; // faces around each point; a fan that is no longer is not all around its point
        Orvan::Array<FaceVisit> visits; // one per face
        std::unordered_map<unsigned int, Hub> hubs; // by their points; collapses keep them up to date
        std::vector<unsigned int> removedFaces;
        std::vector<unsigned int> removedPoints;

        unsigned int* corners(unsigned int face) { return faceVertex.data + std::size_t{3} * face; }
        unsigned int const* corners(unsigned int face) const { return faceVertex.data + std::size_t{3} * face; }
        bool isRemoved(unsigned int face) const { return corners(face)[0] == kInvalidIndex; }
    };

    /// A face around a point, which is its corner `entry`.
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
        std::vector<FanFace> fan; // the faces around the point from behind `first` up to but excluding `last`
        std::vector<unsigned int> ring; // the points around the end without the other end, ascending
    };

    struct CollapsingEdge {
        EdgeEnd start; // its point is kept, and moves to the midpoint
        EdgeEnd end; // its point is removed
        float3 midpoint{};
        std::vector<unsigned int> sharedRing;
    };

    bool hasOnlyTriangles(IndexArray const& faceOffset, unsigned int faceCount)
    {
        std::atomic<bool> areTriangles = true;
        unsigned int const* const offset = faceOffset.data;
        // Any thread may clear the flag; it is looked at after the loop.
        parallelFor(
            tbb::blocked_range<std::size_t>(0, std::size_t{faceCount} + 1, kElementGrain), [&](auto const& entries) {
                for (std::size_t entry = entries.begin(); entry != entries.end(); ++entry)
                    if (offset[entry] != 3 * entry)
                        areTriangles.store(false, std::memory_order_relaxed);
            });
        return areTriangles.load(std::memory_order_relaxed);
    }

    /// Nothing where an array is missing or the faces are not all triangles.
    std::optional<TriangleMesh> readTriangleMesh(Tessara::Object const& object)
    {
        using namespace Tessara::Geometry;
        TriangleMesh mesh;
        mesh.positions = readGeoPropData<float3>(object, sPointPosition);
        mesh.faceVertex = readGeoPropData<unsigned int>(object, sFaceVertex);
        mesh.faceOffset = readGeoPropData<unsigned int>(object, sFaceOffset);
        if (!mesh.positions || !mesh.faceVertex || !mesh.faceOffset)
            return std::nullopt;
        mesh.pointCount = static_cast<unsigned int>(mesh.positions->size);
        mesh.faceCount = getElementCount(object, sFaceComp);
        bool const fits =
            mesh.faceOffset->size > mesh.faceCount && mesh.faceVertex->size >= std::uint64_t{3} * mesh.faceCount;
        if (!fits || !hasOnlyTriangles(*mesh.faceOffset, mesh.faceCount))
            return std::nullopt;
        return mesh;
    }

    struct EdgeLengths {
        float shortest = std::numeric_limits<float>::max();
        float longest = -std::numeric_limits<float>::max();
        unsigned int shortestEdge = 0; // of equal ones the first
    };

    EdgeLengths measureEdges(unsigned int const* corners, float3 const* position)
    {
        EdgeLengths lengths;
        for (unsigned int edge = 0; edge != 3; ++edge) {
            float const edgeLength = length(position[corners[next(edge)]] - position[corners[edge]]);
            if (lengths.shortest > edgeLength) {
                lengths.shortest = edgeLength;
                lengths.shortestEdge = edge;
            }
            if (lengths.longest < edgeLength)
                lengths.longest = edgeLength;
        }
        return lengths;
    }

    bool isSliver(EdgeLengths const& lengths, float ratio)
    {
        return lengths.longest * ratio > lengths.shortest;
    }

    /// Tells the faces that are slivers as they stand.
    Orvan::Array<FaceVisit> findSlivers(TriangleMesh const& mesh, float ratio)
    {
        Orvan::Array<FaceVisit> visits = uninitializedArray<FaceVisit>(mesh.faceCount);
        FaceVisit* const visit = visits.data;
        unsigned int const* const corner = mesh.faceVertex->data;
        float3 const* const position = mesh.positions->data;
        // Each face writes its own entry.
        parallelFor(tbb::blocked_range<unsigned int>(0, mesh.faceCount, kFaceGrain), [=](auto const& faces) {
            for (unsigned int face = faces.begin(); face != faces.end(); ++face) {
                bool const isFound = isSliver(measureEdges(corner + std::size_t{3} * face, position), ratio);
                visit[face] = isFound ? FaceVisit::Sliver : FaceVisit::None;
            }
        });
        return visits;
    }

    /// The first face from `face` on that has to be visited; the face count if there is none.
    unsigned int nextVisit(Orvan::Array<FaceVisit> const& visits, std::uint64_t face)
    {
        // Mostly there is nothing to do: eight faces at a time.
        for (std::uint64_t eight = 0; face + sizeof eight <= visits.size; face += sizeof eight) {
            std::memcpy(&eight, visits.data + face, sizeof eight);
            if (eight != 0)
                break;
        }
        while (face < visits.size && visits[face] == FaceVisit::None)
            ++face;
        return static_cast<unsigned int>(face);
    }

    /// A half-edge into the point at hand: where it comes from, and its face.
    struct Incoming {
        unsigned int start;
        unsigned int face;
        friend auto operator<=>(Incoming const&, Incoming const&) = default;
    };

    /// Finds the twins of the half-edges that leave one point, among those that enter it.
    class TwinFinder {
    public:
        void gather(unsigned int const* corners, std::size_t count, unsigned int const* faceVertex)
        {
            incoming_.resize(count);
            for (std::size_t i = 0; i != count; ++i) {
                unsigned int const face = corners[i] / 3;
                incoming_[i] = {faceVertex[std::size_t{3} * face + previous(corners[i] % 3)], face};
            }
            isSorted_ = count > kShortList;
            if (isSorted_)
                std::sort(incoming_.begin(), incoming_.end());
        }

        /// The lowest face whose half-edge comes from `start`.
        unsigned int faceFrom(unsigned int start) const
        {
            auto const from = isSorted_
                ? std::lower_bound(incoming_.begin(), incoming_.end(), Incoming{start, 0})
                : std::find_if(incoming_.begin(), incoming_.end(), [=](Incoming const& i) { return i.start == start; });
            return from != incoming_.end() && from->start == start ? from->face : kInvalidIndex;
        }

    private:
        static constexpr std::size_t kShortList = 24; // up to here looking at all is faster than sorting
        std::vector<Incoming> incoming_;
        bool isSorted_ = false;
    };

    /// For each edge of each face the face on its other side, of several the lowest; `kInvalidIndex` at a boundary.
    Orvan::Array<Triangle> buildFaceAdjacency(TriangleMesh const& mesh, PointCorners const& around)
    {
        Orvan::Array<Triangle> adjacency = uninitializedArray<Triangle>(mesh.faceCount);
        Triangle* const neighbors = adjacency.data;
        unsigned int const* const faceVertex = mesh.faceVertex->data;
        unsigned int const* const offset = around.offsets.data;
        unsigned int const* const corners = around.corners.data;
        // Each half-edge leaves one point, whose iteration writes its entry.
        parallelFor(tbb::blocked_range<unsigned int>(0, mesh.pointCount, kFaceGrain), [=](auto const& points) {
            TwinFinder twins;
            for (unsigned int point = points.begin(); point != points.end(); ++point) {
                twins.gather(corners + offset[point], offset[point + 1] - offset[point], faceVertex);
                for (unsigned int i = offset[point]; i != offset[point + 1]; ++i) {
                    unsigned int const face = corners[i] / 3;
                    unsigned int const edge = corners[i] % 3;
                    neighbors[face][edge] = twins.faceFrom(faceVertex[std::size_t{3} * face + next(edge)]);
                }
            }
        });
        return adjacency;
    }

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

    CollapsingMesh prepareCollapses(TriangleMesh const& mesh, Orvan::Array<FaceVisit> slivers)
    {
        CollapsingMesh collapsing;
        {
            PointCorners const around =
                cornersByPoint(mesh.pointCount, mesh.faceVertex->data, std::size_t{3} * mesh.faceCount);
            collapsing.adjacency = buildFaceAdjacency(mesh, around);
            collapsing.valence = countFacesAround(around);
        }
        collapsing.positions = copyOfFirst(mesh.pointCount, *mesh.positions);
        collapsing.faceVertex = copyOfFirst(std::uint64_t{3} * mesh.faceCount, *mesh.faceVertex);
        collapsing.visits = std::move(slivers);
        return collapsing;
    }

    /// Which edge of `face` has `neighbor` on its other side.
    unsigned int neighborIndex(CollapsingMesh const& mesh, unsigned int face, unsigned int neighbor)
    {
        Triangle const& neighbors = mesh.adjacency[face];
        return neighbors[0] == neighbor ? 0 : neighbors[1] == neighbor ? 1 : 2;
    }

    /// The face around the same point behind `current`. Nothing at a boundary, and where faces do not fit together.
    std::optional<FanFace> nextAround(CollapsingMesh const& mesh, FanFace const& current)
    {
        unsigned int const face = mesh.adjacency[current.face][previous(current.entry)];
        if (face == kInvalidIndex || mesh.isRemoved(face))
            return std::nullopt;
        unsigned int const entry = neighborIndex(mesh, face, current.face);
        bool const isMutual = mesh.adjacency[face][entry] == current.face
            && mesh.corners(face)[entry] == mesh.corners(current.face)[current.entry];
        return isMutual ? std::optional<FanFace>({face, entry}) : std::nullopt;
    }

    /// The face around the same point before `current`.
    std::optional<FanFace> previousAround(CollapsingMesh const& mesh, FanFace const& current)
    {
        unsigned int const face = mesh.adjacency[current.face][current.entry];
        if (face == kInvalidIndex || mesh.isRemoved(face))
            return std::nullopt;
        FanFace const before{face, next(neighborIndex(mesh, face, current.face))};
        return nextAround(mesh, before) == current ? std::optional<FanFace>(before) : std::nullopt;
    }

    /// Lists the faces around an end of the edge. False unless the fan closes and holds all faces of the point, which it
    /// does not around boundaries and non-manifold points, and unless `accept` takes each of the listed faces. The walk
    /// ends with the first face that it does not take.
    template <class Accept> bool collectFan(CollapsingMesh const& mesh, Accept const& accept, EdgeEnd& end)
    {
        end.fan.clear();
        FanFace current = end.first;
        for (unsigned int left = mesh.valence[end.point]; left > 1; --left) {
            std::optional<FanFace> const around = nextAround(mesh, current);
            if (!around || around->face == end.first.face)
                return false;
            if (around->face == end.last.face)
                return left == 2 && mesh.adjacency[around->face][previous(around->entry)] == end.first.face;
            if (!accept(*around))
                return false;
            end.fan.push_back(*around);
            current = *around;
        }
        return false;
    }

    void collectRing(CollapsingMesh const& mesh, EdgeEnd& end)
    {
        end.ring.assign(1, mesh.corners(end.last.face)[previous(end.last.entry)]);
        for (FanFace const& around : end.fan)
            end.ring.push_back(mesh.corners(around.face)[next(around.entry)]);
        std::sort(end.ring.begin(), end.ring.end());
    }

    /// Whether the ends of the edge have just the third points of its two faces in common, and are not both of valence
    /// 3: that collapse would close up a tetrahedron.
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

    /// Unit vectors along the edges of a face around a point, which is its corner `entry`.
    struct FaceDirections {
        float3 toFirst; // from the point to the next corner
        float3 toSecond; // from the point to the corner after that
        float3 opposite; // from the one to the other
    };

    /// The normal of a face from before the first collapse: the cross product of the directions from its first corner
    /// to the other two. Its length is the sine of the angle, on purpose.
    float3 originalNormal(
        TriangleMesh const& original, CollapsingMesh const& mesh, FanFace const& around, FaceDirections const& now)
    {
        if (mesh.visits[around.face] == FaceVisit::Changed) {
            unsigned int const* const c = original.faceVertex->data + std::size_t{3} * around.face;
            float3 const* const position = original.positions->data;
            return cross(
                safeNormalize(position[c[1]] - position[c[0]]), safeNormalize(position[c[2]] - position[c[0]]));
        }
        // An unchanged face has the same directions, to the bit up to their signs, which leave a product as it is.
        if (around.entry == 0)
            return cross(now.toFirst, now.toSecond);
        if (around.entry == 1)
            return cross(now.toSecond, now.opposite);
        return cross(now.toFirst, now.opposite);
    }

    bool faceKeepsOrientation(
        TriangleMesh const& original, CollapsingMesh const& mesh, FanFace const& around, float3 const& midpoint)
    {
        unsigned int const* const c = mesh.corners(around.face);
        float3 const p0 = mesh.positions[c[around.entry]]; // the point that moves
        float3 const p1 = mesh.positions[c[next(around.entry)]];
        float3 const p2 = mesh.positions[c[previous(around.entry)]];
        FaceDirections const now{safeNormalize(p1 - p0), safeNormalize(p2 - p0), safeNormalize(p2 - p1)};

        // The midpoint has to lie strictly on the inner side of the opposite edge,
        float3 const normal = cross(now.toFirst, now.toSecond);
        if (dot(cross(normal, now.opposite), midpoint - p1) <= 0)
            return false;
        // and the new face may not look away from where the original face looked.
        float3 const newNormal = cross(safeNormalize(p1 - midpoint), safeNormalize(p2 - midpoint));
        return !(dot(newNormal, originalNormal(original, mesh, around, now)) <= 0);
    }

    constexpr unsigned int kHubValence = 48; // up to here a walk is cheaper than looking up what is known

    Hub walkAround(CollapsingMesh const& mesh, FanFace const& first)
    {
        Hub hub;
        std::size_t const valence = mesh.valence[mesh.corners(first.face)[first.entry]];
        hub.ring.reserve(valence);
        std::optional<FanFace> current = first;
        do {
            if (!hub.ring.insert(mesh.corners(current->face)[next(current->entry)]).second)
                return hub;
            current = nextAround(mesh, *current);
        } while (current && current != first);
        hub.fan = current && hub.ring.size() == valence ? Hub::Fan::Closed : Hub::Fan::Open;
        return hub;
    }

    /// Whether the two faces of the edge follow each other around the end, and have it at one corner only.
    bool fitsHub(CollapsingMesh const& mesh, EdgeEnd const& end, EdgeEnd const& other)
    {
        auto const hasOnce = [&](unsigned int face) {
            return std::count(mesh.corners(face), mesh.corners(face) + 3, end.point) == 1;
        };
        return mesh.corners(end.first.face)[next(end.first.entry)] == other.point && hasOnce(end.first.face)
            && hasOnce(end.last.face) && nextAround(mesh, {end.last.face, next(end.last.entry)}) == end.first;
    }

    /// What is known about the end of an edge with more faces. Null if that has few faces, or if a walk around it could
    /// find something else for this edge than for others, which happens in meshes that are not manifold.
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

    bool hubKeepsLink(Hub const& hub, EdgeEnd const& other)
    {
        auto const isShared = [&](unsigned int point) { return point != other.point && hub.ring.contains(point); };
        return hub.fan == Hub::Fan::Closed && std::count_if(other.ring.begin(), other.ring.end(), isShared) == 2;
    }

    /// The cell of a direction among 8, 128, ... up to 2^35 of them.
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

    /// The face that refused the move of the hub into the most similar direction; `otherwise` if there is none.
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

    /// Lists the faces around a hub whose fan closes as `collectFan` does, in another order: from the face that will
    /// probably refuse on both sides, because collapses into similar directions are refused by faces that are close.
    template <class Accept> bool collectFanOfHub(
        CollapsingMesh const& mesh, Accept const& accept, float3 const& midpoint, Hub& hub, EdgeEnd& end)
    {
        constexpr unsigned int kNear = 8;
        float3 const direction = safeNormalize(midpoint - mesh.positions[end.point]);
        std::optional<FanFace> ahead = findRefusing(mesh, hub, end.point, direction, end.first);
        std::optional<FanFace> behind = previousAround(mesh, *ahead);
        end.fan.clear();
        unsigned int const valence = mesh.valence[end.point];
        for (unsigned int visited = 0; visited != valence; ++visited) {
            bool const isAhead = visited % 2 == 0;
            std::optional<FanFace>& side = isAhead ? ahead : behind;
            if (!side)
                return collectFan(mesh, accept, end); // two faces that have two edges in common
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

    /// Whether the edge has a face on both sides, both ends have closed fans, no face around them turns over, and the
    /// surface stays manifold.
    bool canCollapse(TriangleMesh const& original, FanFace const& face, CollapsingMesh& mesh, CollapsingEdge& edge)
    {
        unsigned int const across = mesh.adjacency[face.face][face.entry];
        if (across == kInvalidIndex || across == face.face || mesh.isRemoved(across))
            return false;
        auto& [start, end, midpoint, sharedRing] = edge;
        start.first = end.last = face;
        start.last = end.first = {across, neighborIndex(mesh, across, face.face)};
        start.point = mesh.corners(face.face)[face.entry];
        end.point = mesh.corners(face.face)[next(face.entry)];
        bool const isMutual = mesh.adjacency[across][start.last.entry] == face.face
            && mesh.corners(across)[start.last.entry] == end.point;
        if (!isMutual || start.point == end.point)
            return false;
        midpoint = (mesh.positions[start.point] + mesh.positions[end.point]) * 0.5f;
        auto const keepsOrientation = [&, middle = midpoint](FanFace const& around) {
            return faceKeepsOrientation(original, mesh, around, middle);
        };
        // The end with fewer faces first: most collapses that are refused cost no more than a walk around that.
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

    bool isNeighborOnce(CollapsingMesh const& mesh, unsigned int face, unsigned int neighbor)
    {
        return std::count(mesh.adjacency[face].begin(), mesh.adjacency[face].end(), neighbor) == 1;
    }

    /// Whether the face across an edge of `face` has that edge reversed, and the two have no other edge in common.
    bool fitsAcross(CollapsingMesh const& mesh, unsigned int face, unsigned int edge)
    {
        unsigned int const across = mesh.adjacency[face][edge];
        unsigned int const entry = neighborIndex(mesh, across, face);
        return mesh.corners(across)[entry] == mesh.corners(face)[next(edge)]
            && mesh.corners(across)[next(entry)] == mesh.corners(face)[edge] && isNeighborOnce(mesh, face, across)
            && isNeighborOnce(mesh, across, face);
    }

    /// Whether the two faces behind a face that is removed will have just the edge in common along which they are joined.
    bool joinsPlainly(CollapsingMesh const& mesh, FanFace const& removed)
    {
        auto const [face, edge] = removed;
        Triangle const& beyond = mesh.adjacency[mesh.adjacency[face][next(edge)]];
        return fitsAcross(mesh, face, edge) && fitsAcross(mesh, face, next(edge))
            && fitsAcross(mesh, face, previous(edge))
            && std::find(beyond.begin(), beyond.end(), mesh.adjacency[face][previous(edge)]) == beyond.end();
    }

    /// Carries what is known about hubs over the collapse that comes next.
    void updateHubs(CollapsingEdge const& edge, CollapsingMesh& mesh)
    {
        if (mesh.hubs.empty())
            return;
        unsigned int const kept = edge.start.point, removed = edge.end.point;
        for (FanFace const& face : {edge.start.first, edge.end.first})
            if (!joinsPlainly(mesh, face))
                for (unsigned int const side : {next(face.entry), previous(face.entry)}) {
                    unsigned int const* const corners = mesh.corners(mesh.adjacency[face.face][side]);
                    std::for_each(corners, corners + 3, [&](unsigned int point) { mesh.hubs.erase(point); });
                }
        for (FanFace const& around : edge.end.fan)
            for (unsigned int const entry : {next(around.entry), previous(around.entry)}) {
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
        Triangle& neighbors = mesh.adjacency[face];
        auto const first = std::find(neighbors.begin(), neighbors.end(), from);
        if (first != neighbors.end())
            *first = to;
    }

    /// Joins the faces on both sides of the two faces that are removed.
    void glueHoles(CollapsingEdge const& collapse, CollapsingMesh& mesh)
    {
        auto const [f, edge] = collapse.start.first;
        auto const [g, edgeAcross] = collapse.end.first;
        // All four are read before anything changes.
        unsigned int const behindEnd = mesh.adjacency[f][next(edge)];
        unsigned int const behindStart = mesh.adjacency[f][previous(edge)];
        unsigned int const acrossBehindStart = mesh.adjacency[g][next(edgeAcross)];
        unsigned int const acrossBehindEnd = mesh.adjacency[g][previous(edgeAcross)];
        replaceNeighbor(behindEnd, f, behindStart, mesh);
        replaceNeighbor(behindStart, f, behindEnd, mesh);
        replaceNeighbor(acrossBehindEnd, g, acrossBehindStart, mesh);
        replaceNeighbor(acrossBehindStart, g, acrossBehindEnd, mesh);
    }

    /// Marks a face of the edge as removed. It still has the end of the edge at a corner, which counts for the start
    /// now.
    void removeFace(unsigned int face, CollapsingEdge const& edge, CollapsingMesh& mesh)
    {
        unsigned int* const corners = mesh.corners(face);
        for (unsigned int k = 0; k != 3; ++k)
            --mesh.valence[corners[k] == edge.end.point ? edge.start.point : corners[k]];
        corners[0] = kInvalidIndex;
        mesh.removedFaces.push_back(face);
    }

    void collapse(CollapsingEdge const& edge, CollapsingMesh& mesh)
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
        for (EdgeEnd const* const end : {&edge.start, &edge.end})
            for (FanFace const& around : end->fan)
                mesh.visits[around.face] = FaceVisit::Changed;
    }

    void collapseSlivers(TriangleMesh const& original, float ratio, CollapsingMesh& mesh)
    {
        CollapsingEdge edge;
        for (unsigned int face = nextVisit(mesh.visits, 0); face != original.faceCount;
             face = nextVisit(mesh.visits, std::uint64_t{face} + 1)) {
            if (mesh.isRemoved(face))
                continue;
            EdgeLengths const lengths = measureEdges(mesh.corners(face), mesh.positions.data);
            if (isSliver(lengths, ratio) && canCollapse(original, {face, lengths.shortestEdge}, mesh, edge))
                collapse(edge, mesh);
        }
    }

    /// Fills the holes among the points from the end. Entry p of the result is the new index of point p.
    IndexArray compactPoints(CollapsingMesh& mesh)
    {
        IndexArray pointRemap = uninitializedArray<unsigned int>(mesh.positions.size);
        unsigned int* const remap = pointRemap.data;
        // Each point writes its own entry.
        parallelFor(tbb::blocked_range<std::size_t>(0, pointRemap.size, kElementGrain), [=](auto const& points) {
            for (std::size_t point = points.begin(); point != points.end(); ++point)
                remap[point] = static_cast<unsigned int>(point);
        });
        for (unsigned int const point : mesh.removedPoints)
            remap[point] = kInvalidIndex;
        std::sort(mesh.removedPoints.begin(), mesh.removedPoints.end());
        std::uint64_t const remaining = mesh.positions.size - mesh.removedPoints.size();
        std::uint64_t last = mesh.positions.size - 1;
        for (unsigned int const hole : mesh.removedPoints) {
            if (hole >= remaining)
                break;
            while (remap[last] == kInvalidIndex)
                --last;
            remap[last] = hole;
            mesh.positions[hole] = mesh.positions[last];
            --last;
        }
        mesh.positions.resize(remaining);
        return pointRemap;
    }

    /// Fills the holes among the faces from the end, the last hole first.
    void compactFaces(CollapsingMesh& mesh)
    {
        std::sort(mesh.removedFaces.begin(), mesh.removedFaces.end(), std::greater<>());
        std::uint64_t faceCount = mesh.faceVertex.size / 3;
        for (unsigned int const hole : mesh.removedFaces) {
            --faceCount;
            if (hole != faceCount)
                std::copy_n(mesh.corners(static_cast<unsigned int>(faceCount)), 3, mesh.corners(hole));
        }
        mesh.faceVertex.resize(3 * faceCount);
    }

    void compactAfterCollapse(CollapsingMesh& mesh)
    {
        IndexArray const pointRemap = compactPoints(mesh);
        compactFaces(mesh);
        unsigned int const* const remap = pointRemap.data;
        unsigned int* const corner = mesh.faceVertex.data;
        // Each corner writes its own entry.
        parallelFor(tbb::blocked_range<std::size_t>(0, mesh.faceVertex.size, kElementGrain), [=](auto const& corners) {
            for (std::size_t c = corners.begin(); c != corners.end(); ++c)
                corner[c] = remap[corner[c]];
        });
    }

    void writeTriangleMesh(TriangleMesh const& original, CollapsingMesh&& mesh, Tessara::Object& object)
    {
        using namespace Tessara::Geometry;
        auto const cornerCount = static_cast<unsigned int>(mesh.faceVertex.size);
        unsigned int const faceCount = cornerCount / 3;
        PreparedWrites writes(object);
        writes.setElementCount(sPointComp, static_cast<unsigned int>(mesh.positions.size));
        writes.setElementCount(sFaceVertexComp, cornerCount);
        writes.setElementCount(sFaceComp, faceCount);
        writes.writeGeoPropData(sPointPosition, Orvan::makePtr<Orvan::Array<float3>>(std::move(mesh.positions)));
        writes.writeGeoPropData(sFaceVertex, Orvan::makePtr<IndexArray>(std::move(mesh.faceVertex)));
        // The offsets of triangles are 0, 3, 6 and so on, however many there are.
        writes.writeGeoPropData(
            sFaceOffset, Orvan::makePtr<IndexArray>(copyOfFirst(std::uint64_t{faceCount} + 1, *original.faceOffset)));
        writes.commit();
    }

}

bool removeSlivers(float ratio, Tessara::Object& mesh)
{
    std::optional<TriangleMesh> const original = readTriangleMesh(mesh);
    if (!original)
        return true;
    Orvan::Array<FaceVisit> slivers = findSlivers(*original, ratio);
    if (nextVisit(slivers, 0) == original->faceCount)
        return true;

    CollapsingMesh collapsing = prepareCollapses(*original, std::move(slivers));
    collapseSlivers(*original, ratio, collapsing);
    if (collapsing.removedFaces.empty())
        return true;

    compactAfterCollapse(collapsing);
    writeTriangleMesh(*original, std::move(collapsing), mesh);
    return true;
}

}
