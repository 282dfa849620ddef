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

    /// The mesh while its faces collapse. A removed face has `kInvalidIndex` at its first corner.
    struct CollapsingMesh {
        Orvan::Array<float3> positions;
        IndexArray faceVertex;
        Orvan::Array<Triangle> adjacency; // the faces across a face's edges
        IndexArray valence; // faces around each point; a fan that is no longer is not all around its point
        Orvan::Array<FaceVisit> visits; // one a face
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
    };

    /// An edge that may collapse, its two faces, and the faces around both of its ends, which stay.
    struct EdgeFans {
        FanFace face{}; // around `start`
        FanFace across{}; // around `end`, on the other side of the edge
        unsigned int start = 0; // the point that stays, and moves to the midpoint
        unsigned int end = 0;
        float3 midpoint{};
        std::vector<FanFace> startFan; // from behind `face` up to but excluding `across`
        std::vector<FanFace> endFan; // from behind `across` up to but excluding `face`
        std::vector<unsigned int> startRing, endRing, sharedRing; // the points around the ends, without the other end
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

    /// The first face from `face` on that has to be visited; the face count where there is none.
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
        return static_cast<unsigned int>(std::min(face, visits.size));
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
        Triangle* const neighbours = adjacency.data;
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
                    neighbours[face][edge] = twins.faceFrom(faceVertex[std::size_t{3} * face + next(edge)]);
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

    /// Which edge of `face` has `neighbour` on its other side.
    unsigned int neighbourIndex(CollapsingMesh const& mesh, unsigned int face, unsigned int neighbour)
    {
        Triangle const& neighbours = mesh.adjacency[face];
        return neighbours[0] == neighbour ? 0 : neighbours[1] == neighbour ? 1 : 2;
    }

    /// The face around the same point behind `current`. Nothing at a boundary, and where faces do not fit together.
    std::optional<FanFace> nextAround(CollapsingMesh const& mesh, FanFace const& current)
    {
        unsigned int const face = mesh.adjacency[current.face][previous(current.entry)];
        if (face == kInvalidIndex || mesh.isRemoved(face))
            return std::nullopt;
        unsigned int const entry = neighbourIndex(mesh, face, current.face);
        bool const isMutual = mesh.adjacency[face][entry] == current.face
            && mesh.corners(face)[entry] == mesh.corners(current.face)[current.entry];
        return isMutual ? std::optional<FanFace>({face, entry}) : std::nullopt;
    }

    /// Lists the faces around a point that lie between two neighbouring faces, behind `first` and before `last`.
    /// False unless the fan closes and holds all faces of the point, which it does not around boundaries and
    /// non-manifold points, and unless `accept` takes each of the listed faces: with the first that it does not the
    /// walk ends, so that collapses at a hub are refused without going all around it.
    template <class Accept> bool collectFan(CollapsingMesh const& mesh, FanFace const& first, FanFace const& last,
        Accept const& accept, std::vector<FanFace>& fan)
    {
        fan.clear();
        FanFace current = first;
        for (unsigned int left = mesh.valence[mesh.corners(first.face)[first.entry]]; left > 1; --left) {
            std::optional<FanFace> const around = nextAround(mesh, current);
            if (!around || around->face == first.face)
                return false;
            if (around->face == last.face)
                return left == 2 && mesh.adjacency[around->face][previous(around->entry)] == first.face;
            if (!accept(*around))
                return false;
            fan.push_back(*around);
            current = *around;
        }
        return false;
    }

    /// The points around an end of the edge, without the other end, ascending. The fan lacks
    /// the face that closes it.
    void collectRing(CollapsingMesh const& mesh, std::vector<FanFace> const& fan, unsigned int thirdPointOfLast,
        std::vector<unsigned int>& ring)
    {
        ring.assign(1, thirdPointOfLast);
        for (FanFace const& around : fan)
            ring.push_back(mesh.corners(around.face)[next(around.entry)]);
        std::sort(ring.begin(), ring.end());
    }

    /// Whether the ends of the edge have just the third points of its two faces in common, and are not both of valence
    /// 3: that collapse would close up a tetrahedron.
    bool collapseKeepsLink(CollapsingMesh const& mesh, EdgeFans& fans)
    {
        unsigned int const third = mesh.corners(fans.face.face)[previous(fans.face.entry)];
        unsigned int const thirdAcross = mesh.corners(fans.across.face)[previous(fans.across.entry)];
        collectRing(mesh, fans.startFan, thirdAcross, fans.startRing);
        collectRing(mesh, fans.endFan, third, fans.endRing);
        if (fans.startRing.size() == 2 && fans.endRing.size() == 2)
            return false;
        fans.sharedRing.clear();
        std::set_intersection(fans.startRing.begin(), fans.startRing.end(), fans.endRing.begin(), fans.endRing.end(),
            std::back_inserter(fans.sharedRing));
        return fans.sharedRing.size() == 2;
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

    /// Whether the edge has a face on both sides, both ends have closed fans, and no face around them turns over.
    bool collectFans(TriangleMesh const& original, CollapsingMesh const& mesh, FanFace const& face, EdgeFans& fans)
    {
        unsigned int const across = mesh.adjacency[face.face][face.entry];
        if (across == kInvalidIndex || across == face.face || mesh.isRemoved(across))
            return false;
        fans.face = face;
        fans.across = {across, neighbourIndex(mesh, across, face.face)};
        fans.start = mesh.corners(face.face)[face.entry];
        fans.end = mesh.corners(face.face)[next(face.entry)];
        bool const isMutual = mesh.adjacency[across][fans.across.entry] == face.face
            && mesh.corners(across)[fans.across.entry] == fans.end;
        if (!isMutual || fans.start == fans.end)
            return false;
        fans.midpoint = (mesh.positions[fans.start] + mesh.positions[fans.end]) * 0.5f;
        auto const keepsOrientation = [&, midpoint = fans.midpoint](FanFace const& around) {
            return faceKeepsOrientation(original, mesh, around, midpoint);
        };
        return collectFan(mesh, fans.face, fans.across, keepsOrientation, fans.startFan)
            && collectFan(mesh, fans.across, fans.face, keepsOrientation, fans.endFan);
    }

    void replaceNeighbour(unsigned int face, unsigned int from, unsigned int to, CollapsingMesh& mesh)
    {
        Triangle& neighbours = mesh.adjacency[face];
        auto const first = std::find(neighbours.begin(), neighbours.end(), from);
        if (first != neighbours.end())
            *first = to;
    }

    /// Joins the faces on both sides of the two faces that go.
    void glueHoles(EdgeFans const& fans, CollapsingMesh& mesh)
    {
        auto const [f, edge] = fans.face;
        auto const [g, edgeAcross] = fans.across;
        // All four are read before anything changes.
        unsigned int const behindEnd = mesh.adjacency[f][next(edge)];
        unsigned int const behindStart = mesh.adjacency[f][previous(edge)];
        unsigned int const acrossBehindStart = mesh.adjacency[g][next(edgeAcross)];
        unsigned int const acrossBehindEnd = mesh.adjacency[g][previous(edgeAcross)];
        replaceNeighbour(behindEnd, f, behindStart, mesh);
        replaceNeighbour(behindStart, f, behindEnd, mesh);
        replaceNeighbour(acrossBehindEnd, g, acrossBehindStart, mesh);
        replaceNeighbour(acrossBehindStart, g, acrossBehindEnd, mesh);
    }

    /// Marks a face of the edge as removed. It still has the end of the edge at a corner, which counts for the start
    /// now.
    void removeFace(unsigned int face, EdgeFans const& fans, CollapsingMesh& mesh)
    {
        unsigned int* const corners = mesh.corners(face);
        for (unsigned int k = 0; k != 3; ++k)
            --mesh.valence[corners[k] == fans.end ? fans.start : corners[k]];
        corners[0] = kInvalidIndex;
        mesh.removedFaces.push_back(face);
    }

    void collapseEdge(EdgeFans const& fans, CollapsingMesh& mesh)
    {
        mesh.positions[fans.start] = fans.midpoint;
        mesh.removedPoints.push_back(fans.end);
        for (FanFace const& around : fans.endFan)
            std::replace(mesh.corners(around.face), mesh.corners(around.face) + 3, fans.end, fans.start);
        glueHoles(fans, mesh);

        mesh.valence[fans.start] += std::exchange(mesh.valence[fans.end], 0);
        removeFace(fans.face.face, fans, mesh);
        removeFace(fans.across.face, fans, mesh);
        for (std::vector<FanFace> const* const fan : {&fans.startFan, &fans.endFan})
            for (FanFace const& around : *fan)
                mesh.visits[around.face] = FaceVisit::Changed;
    }

    void collapseSlivers(TriangleMesh const& original, float ratio, CollapsingMesh& mesh)
    {
        EdgeFans fans;
        for (unsigned int face = nextVisit(mesh.visits, 0); face != original.faceCount;
             face = nextVisit(mesh.visits, std::uint64_t{face} + 1)) {
            if (mesh.isRemoved(face))
                continue;
            EdgeLengths const lengths = measureEdges(mesh.corners(face), mesh.positions.data);
            if (isSliver(lengths, ratio) && collectFans(original, mesh, {face, lengths.shortestEdge}, fans)
                && collapseKeepsLink(mesh, fans))
                collapseEdge(fans, mesh);
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
