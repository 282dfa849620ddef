#include "MeshTopology.h"

#include "EdgeSides.h"

#include <tbb/parallel_sort.h>

#include <algorithm>
#include <array>
#include <bit>
#include <limits>
#include <numeric>
#include <vector>

namespace ModelingProgram {

using Tessara::Geometry::kInvalidIndex;

namespace {

    /// Disjoint sets of indices (union-find); initially each index is its own set.
    class DisjointSets {
    public:
        explicit DisjointSets(unsigned int count)
            : parents_(count)
        {
            std::iota(parents_.begin(), parents_.end(), 0u);
        }

        unsigned int find(unsigned int index)
        {
            while (parents_[index] != index)
                index = parents_[index] = parents_[parents_[index]];
            return index;
        }

        void join(unsigned int a, unsigned int b)
        {
            a = find(a);
            b = find(b);
            parents_[std::max(a, b)] = std::min(a, b);
        }

        /// Whether the index represents its set; exactly one index per set does.
        bool isRoot(unsigned int index) const { return parents_[index] == index; }

    private:
        std::vector<unsigned int> parents_;
    };

    /// The fans of faces around the points, as sets of corners at the same point.
    using Fans = DisjointSets;

    bool hasRepeatedPoint(std::span<unsigned int const> corners, std::vector<unsigned int>& scratch)
    {
        if (corners.size() == 3)
            return corners[0] == corners[1] || corners[1] == corners[2] || corners[2] == corners[0];
        scratch.assign(corners.begin(), corners.end());
        std::sort(scratch.begin(), scratch.end());
        return std::adjacent_find(scratch.begin(), scratch.end()) != scratch.end();
    }

    void countFaces(MeshArrays const& mesh, MeshTopology& topology)
    {
        std::vector<unsigned int> scratch;
        for (unsigned int face = 0; face != mesh.faceCount(); ++face) {
            std::span<unsigned int const> const corners = mesh.corners(face);
            if (corners.size() < 3)
                topology.facesBelowThreeCorners.add(face);
            else if (corners.size() == 3)
                ++topology.triangleCount;
            else
                (corners.size() == 4 ? topology.quads : topology.polygons).add(face);
            if (hasRepeatedPoint(corners, scratch))
                topology.facesWithRepeatedPoints.add(face);
        }
    }

    /// \param lower  the lower point of the edge
    /// \param sides  in ascending order
    void examineEdge(MeshArrays const& mesh, unsigned int lower, std::span<Side const> sides, MeshTopology& topology)
    {
        ++topology.edgeCount;
        if (sides.size() == 1)
            topology.boundaryEdges.add(sides[0].corner);
        if (sides.size() > 2)
            topology.nonManifoldEdges.add(sides[0].corner);

        std::array<Finding, 2> directions; // away from the lower point, and towards it
        for (Side const& side : sides)
            directions[(*mesh.faceVertex)[side.corner] == lower ? 0 : 1].add(side.corner);
        for (Finding const& direction : directions) {
            if (direction.count > 1)
                topology.windingConflicts.add(direction.first);
            if (direction.count == 2 && sides.size() == 2)
                topology.flippedEdges.add(direction.first);
        }
    }

    void joinFans(MeshArrays const& mesh, unsigned int lower, std::span<Side const> sides, Fans& fans)
    {
        unsigned int firstAtLower = kInvalidIndex;
        unsigned int firstAtHigher = kInvalidIndex;
        for (Side const& side : sides) {
            unsigned int atLower = side.corner;
            unsigned int atHigher = side.nextCorner;
            if ((*mesh.faceVertex)[atLower] != lower)
                std::swap(atLower, atHigher);
            if (firstAtLower == kInvalidIndex) {
                firstAtLower = atLower;
                firstAtHigher = atHigher;
            }
            fans.join(firstAtLower, atLower);
            fans.join(firstAtHigher, atHigher);
        }
    }

    void examineEdges(MeshArrays const& mesh, EdgeSides const& edges, Fans& fans, MeshTopology& topology)
    {
        edges.forEachEdge(0, mesh.pointCount(), [&](unsigned int lower, std::span<Side const> sides) {
            examineEdge(mesh, lower, sides, topology);
            joinFans(mesh, lower, sides, fans);
        });
    }

    void countNonManifoldPoints(MeshArrays const& mesh, Fans& fans, MeshTopology& topology)
    {
        unsigned int const* const point = mesh.faceVertex->data;
        std::vector<bool> hasFan(mesh.pointCount());
        std::vector<bool> isNonManifold(mesh.pointCount());
        forEachSide(mesh, [&](unsigned int corner, unsigned int next) {
            if (point[corner] == point[next]) // equal consecutive points are one vertex of the face
                fans.join(corner, next);
        });
        forEachSide(mesh, [&](unsigned int corner, unsigned int) {
            if (!fans.isRoot(corner))
                return;
            if (hasFan[point[corner]])
                isNonManifold[point[corner]] = true;
            hasFan[point[corner]] = true;
        });
        for (unsigned int p = 0; p != mesh.pointCount(); ++p)
            if (isNonManifold[p])
                topology.nonManifoldPoints.add(p);
    }

    void countParts(MeshArrays const& mesh, MeshTopology& topology)
    {
        DisjointSets parts(mesh.pointCount());
        for (unsigned int face = 0; face != mesh.faceCount(); ++face)
            for (unsigned int const point : mesh.corners(face))
                parts.join(mesh.corners(face)[0], point);
        for (unsigned int point = 0; point != mesh.pointCount(); ++point)
            topology.partCount += parts.isRoot(point) ? 1u : 0u;
        topology.isolatedPoints = findIsolatedPoints(mesh);
        topology.partCount -= topology.isolatedPoints.count; // each of them is a set of its own
    }

    bool isSliver(std::span<unsigned int const> corners, float3 const* position, float ratio)
    {
        float shortest = std::numeric_limits<float>::max();
        float longest = 0;
        for (std::size_t k = 0; k != corners.size(); ++k) {
            float const edge =
                edgeLengthInFloats(position[corners[k]], position[corners[k + 1 == corners.size() ? 0 : k + 1]]);
            shortest = std::min(shortest, edge);
            longest = std::max(longest, edge);
        }
        return longest * ratio > shortest;
    }

}

bool MeshTopology::isClosedManifold() const
{
    return !facesBelowThreeCorners && !boundaryEdges && !nonManifoldEdges && !windingConflicts && !nonManifoldPoints;
}

MeshTopology analyzeTopology(MeshArrays const& mesh)
{
    return analyzeTopology(mesh, EdgeSides(mesh));
}

MeshTopology analyzeTopology(MeshArrays const& mesh, EdgeSides const& edges)
{
    MeshTopology topology;
    countFaces(mesh, topology);
    {
        Fans fans(mesh.cornerCount());
        examineEdges(mesh, edges, fans, topology);
        countNonManifoldPoints(mesh, fans, topology);
    }
    countParts(mesh, topology);
    if (topology.isClosedManifold()) {
        auto const points = static_cast<std::int64_t>(mesh.pointCount() - topology.isolatedPoints.count);
        std::int64_t const eulerCharacteristic =
            points - static_cast<std::int64_t>(topology.edgeCount) + std::int64_t{mesh.faceCount()};
        topology.genus = static_cast<std::int64_t>(topology.partCount) - eulerCharacteristic / 2;
    }
    return topology;
}

void addPartsAndGenus(MeshTopology const& topology, Json& values)
{
    values["parts"] = topology.partCount;
    values["genus"] = topology.genus ? Json(static_cast<std::uint64_t>(*topology.genus)) : Json();
}

Finding findIsolatedPoints(MeshArrays const& mesh)
{
    std::vector<bool> isUsed(mesh.pointCount());
    for (unsigned int face = 0; face != mesh.faceCount(); ++face)
        for (unsigned int const point : mesh.corners(face))
            isUsed[point] = true;
    Finding isolated;
    for (unsigned int point = 0; point != mesh.pointCount(); ++point)
        if (!isUsed[point])
            isolated.add(point);
    return isolated;
}

std::uint64_t countSlivers(MeshArrays const& mesh, float ratio)
{
    std::uint64_t count = 0;
    for (unsigned int face = 0; face != mesh.faceCount(); ++face)
        if (isSliver(mesh.corners(face), mesh.positions->data, ratio))
            ++count;
    return count;
}

std::uint64_t countCoincidentPoints(MeshArrays const& mesh)
{
    // Bits are totally ordered, unlike floats with NaN. Adding 0 turns -0 into 0.
    std::vector<std::array<std::uint32_t, 3>> keys;
    keys.reserve(mesh.pointCount());
    for (float3 const& p : *mesh.positions)
        keys.push_back({std::bit_cast<std::uint32_t>(p.x + 0.0f), std::bit_cast<std::uint32_t>(p.y + 0.0f),
            std::bit_cast<std::uint32_t>(p.z + 0.0f)});
    tbb::parallel_sort(keys.begin(), keys.end());
    return static_cast<std::uint64_t>(keys.end() - std::unique(keys.begin(), keys.end()));
}

}
