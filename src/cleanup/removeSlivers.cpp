#include <Modeling/removeSlivers.h>

#include "EdgeCollapse.h"

#include "frame/Arrays.h"
#include "frame/Assert.h"
#include "frame/VectorMath.h"

#include <algorithm>
#include <atomic>
#include <cstring>
#include <functional>
#include <limits>
#include <optional>
#include <utility>

namespace Geometry::Mesh {

using namespace Modeling;
using namespace Modeling::Internal;
using Tessara::Geometry::kInvalidIndex;

namespace {

    /// nullopt if an array is missing or too short, or if not all faces are triangles.
    std::optional<MeshArrays> readTriangleMesh(Tessara::Object const& object)
    {
        MeshArrays mesh = readMeshArrays(object);
        if (!mesh.isComplete())
            return std::nullopt;
        mesh.pointCount = static_cast<unsigned int>(mesh.positions->size); // faces may refer to any of them
        bool const fits =
            mesh.faceOffset->size > mesh.faceCount && mesh.faceVertex->size >= std::uint64_t{3} * mesh.faceCount;
        if (!fits || !isTriangleMesh(mesh.faceCount, *mesh.faceOffset))
            return std::nullopt;
        return mesh;
    }

    struct EdgeLengths {
        float shortest = std::numeric_limits<float>::max();
        float longest = -std::numeric_limits<float>::max();
        unsigned int shortestEdge = 0; // the first of equally short ones
    };

    EdgeLengths measureEdges(unsigned int const* corners, float3 const* position)
    {
        EdgeLengths lengths;
        for (unsigned int edge = 0; edge != 3; ++edge) {
            float const edgeLength = length(position[corners[nextCorner(edge)]] - position[corners[edge]]);
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

    /// Recognizes most faces that are no slivers by their squared lengths, without square roots.
    ///
    /// Let D and s be the longest and the shortest squared length and r the ratio. If the sum of the squares is finite
    /// and s >= D * limit, `isSliver` is false:
    /// - No square is NaN or infinite, so that the lengths are the rounded roots of D and s.
    /// - r is finite, because the limit is NaN or infinite otherwise, and no finite s reaches D times that.
    /// - If r <= 0 or D = 0, the product longest * r is not positive.
    /// - Otherwise D * limit is a normal double, so that s > 0 and sqrt(s) >= sqrt(D) * r * (1 + 2^-22). Each root is a
    ///   normal float, rounded by a factor within 1 +- 2^-24. The product does not overflow, because it is about
    ///   sqrt(s) at most. If it is a normal float, it is rounded by such a factor too: all three together stay within
    ///   the margin. If not, it is at most 2^-126, and the shortest length is at least 2^-75.
    class PlainFaces {
    public:
        explicit PlainFaces(float ratio)
            : limit_(double{ratio} * double{ratio} * (1 + 0x1p-20))
        {
        }

        bool contain(unsigned int const* corners, float3 const* position) const
        {
            float3 const &a = position[corners[0]], &b = position[corners[1]], &c = position[corners[2]];
            float const ab = squaredLength(b - a), bc = squaredLength(c - b), ca = squaredLength(a - c);
            float const shortest = std::min(ab, std::min(bc, ca)), longest = std::max(ab, std::max(bc, ca));
            return (ab + bc) + ca < std::numeric_limits<float>::infinity()
                && double{shortest} >= double{longest} * limit_;
        }

    private:
        static float squaredLength(float3 const& v) { return dot(v, v); }

        double limit_;
    };

    Slivers findSlivers(MeshArrays const& mesh, float ratio)
    {
        Slivers slivers{uninitializedArray<FaceVisit>(mesh.faceCount), zeroedArray<unsigned char>(mesh.pointCount)};
        unsigned int const* const corner = mesh.faceVertex->data;
        float3 const* const position = mesh.positions->data;
        PlainFaces const plainFaces(ratio);
        // Each face writes its own entry. Several may mark a point, with the same value.
        parallelFor(tbb::blocked_range<unsigned int>(0, mesh.faceCount, kFaceGrain),
            [=, visit = slivers.visits.data, isEnd = slivers.isEnd.data](auto const& faces) {
                for (unsigned int face = faces.begin(); face != faces.end(); ++face) {
                    unsigned int const* const corners = corner + std::size_t{3} * face;
                    visit[face] = FaceVisit::None;
                    if (plainFaces.contain(corners, position))
                        continue;
                    EdgeLengths const lengths = measureEdges(corners, position);
                    if (!isSliver(lengths, ratio))
                        continue;
                    visit[face] = FaceVisit::Sliver;
                    for (unsigned int const end : {lengths.shortestEdge, nextCorner(lengths.shortestEdge)})
                        std::atomic_ref(isEnd[corners[end]]).store(1, std::memory_order_relaxed);
                }
            });
        return slivers;
    }

    /// The first face from `face` on that must be visited; the face count if there is none.
    unsigned int nextVisit(Orvan::Array<FaceVisit> const& visits, std::uint64_t face)
    {
        // Most faces need no visit, so they are skipped eight at a time.
        for (std::uint64_t eight = 0; face + sizeof eight <= visits.size; face += sizeof eight) {
            std::memcpy(&eight, visits.data + face, sizeof eight);
            if (eight != 0)
                break;
        }
        while (face < visits.size && visits[face] == FaceVisit::None)
            ++face;
        return static_cast<unsigned int>(face);
    }

    /// On one thread, because each collapse changes what later faces are measured and judged by. Steps that do not touch
    /// what another one writes commute, so in principle they can run in parallel with the same result. Measured from
    /// what each step reads and writes, it does not pay:
    /// - Needles spread over a sphere, 5 % of the faces, give 5 levels of dependent steps: the sweep has work for any
    ///   number of threads. But finding the independent steps takes walks around both ends of all needles that are left:
    ///   0.7 of the time of the sweep to reserve their faces and as much to check the reservations, for two fifths of
    ///   the needles in the first round. By that, two threads would take 1.3 times as long as one.
    /// - Reservations do not give the same result either: one collapse in 15 is of a face that an earlier collapse has
    ///   changed, and such a chain may reach a needle that has gone ahead.
    /// - If all faces are slivers and numbered along the surface, one chain has 97 % of the work. Numbered at random,
    ///   faces have to wait for 20 rounds on average, each with walks that take twice as long as the sweep. Around hubs,
    ///   the walks take quadratic time.
    ///
    /// Measuring and adjacency, which are the larger part if needles are few, run in parallel anyway.
    void collapseSlivers(MeshArrays const& original, float ratio, CollapsingMesh& mesh)
    {
        CollapsingEdge edge;
        PlainFaces const plainFaces(ratio);
        for (unsigned int face = nextVisit(mesh.visits, 0); face != original.faceCount;
             face = nextVisit(mesh.visits, std::uint64_t{face} + 1)) {
            if (mesh.isRemoved(face) || plainFaces.contain(mesh.corners(face), mesh.positions.data))
                continue;
            EdgeLengths const lengths = measureEdges(mesh.corners(face), mesh.positions.data);
            if (isSliver(lengths, ratio) && canCollapse(original, {face, lengths.shortestEdge}, mesh, edge))
                collapseEdge(edge, mesh);
        }
    }

    /// Moves points from the end into the holes. Entry p of the result is the new index of point p, or `kInvalidIndex`
    /// if it has been removed.
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

    /// Moves faces from the end into the holes. Holes are filled in descending order, so that no removed face is
    /// moved.
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

    void writeTriangleMesh(MeshArrays const& original, CollapsingMesh&& mesh, Tessara::Object& object)
    {
        MeshArrays collapsed;
        collapsed.pointCount = static_cast<unsigned int>(mesh.positions.size);
        collapsed.cornerCount = static_cast<unsigned int>(mesh.faceVertex.size);
        collapsed.faceCount = collapsed.cornerCount / 3;
        collapsed.positions = Orvan::makePtr<Orvan::Array<float3>>(std::move(mesh.positions));
        collapsed.faceVertex = Orvan::makePtr<IndexArray>(std::move(mesh.faceVertex));
        // The offsets of triangles are 0, 3, 6, ..., so those of fewer triangles are a prefix of the original ones.
        collapsed.faceOffset =
            Orvan::makePtr<IndexArray>(copyOfFirst(std::uint64_t{collapsed.faceCount} + 1, *original.faceOffset));
        PreparedWrites writes(object);
        writeMeshArrays(std::move(collapsed), writes);
        writes.commit();
    }

}

bool removeSlivers(float ratio, Tessara::Object& mesh)
{
    std::optional<MeshArrays> const original = readTriangleMesh(mesh);
    if (!original)
        return true;
    MODELING_ASSERT(areBelow(original->pointCount, original->faceVertex->data, std::size_t{3} * original->faceCount));
    Slivers slivers = findSlivers(*original, ratio);
    if (nextVisit(slivers.visits, 0) == original->faceCount)
        return true;

    CollapsingMesh collapsing = prepareCollapses(*original, std::move(slivers));
    collapseSlivers(*original, ratio, collapsing);
    if (collapsing.removedFaces.empty())
        return true;
    MODELING_ASSERT(collapsing.removedFaces.size() == 2 * collapsing.removedPoints.size());

    compactAfterCollapse(collapsing);
    MODELING_ASSERT(areBelow(collapsing.positions.size, collapsing.faceVertex.data, collapsing.faceVertex.size));
    writeTriangleMesh(*original, std::move(collapsing), mesh);
    return true;
}

}
