#include "MeshTopology.h"

#include "ClosedFan.h"
#include "EdgeSides.h"
#include "connectedComponents.h"

#include <tbb/blocked_range.h>
#include <tbb/parallel_reduce.h>
#include <tbb/parallel_sort.h>

#include <algorithm>
#include <array>
#include <bit>
#include <limits>
#include <numeric>
#include <vector>

namespace ModelingProgram {

namespace {

    /// Calls `find(element, partial result)` for all elements in parallel, and adds up the partial results. Sums of counts
    /// and lowest elements do not depend on the order.
    template <class Result, class Find> Result findInAll(unsigned int count, Find const& find)
    {
        return tbb::parallel_reduce(
            tbb::blocked_range<unsigned int>(0, count, Modeling::kElementGrain), Result{},
            [&](auto const& elements, Result result) {
                for (unsigned int element = elements.begin(); element != elements.end(); ++element)
                    find(element, result);
                return result;
            },
            [](Result a, Result const& b) {
                a += b;
                return a;
            });
    }

    bool hasRepeatedPoint(std::span<unsigned int const> corners)
    {
        if (corners.size() == 3)
            return corners[0] == corners[1] || corners[1] == corners[2] || corners[2] == corners[0];
        std::vector<unsigned int> sorted(corners.begin(), corners.end());
        std::sort(sorted.begin(), sorted.end());
        return std::adjacent_find(sorted.begin(), sorted.end()) != sorted.end();
    }

    void countFace(MeshArrays const& mesh, unsigned int face, MeshTopology& topology)
    {
        std::span<unsigned int const> const corners = mesh.corners(face);
        if (corners.size() < 3)
            topology.facesBelowThreeCorners.add(face);
        else if (corners.size() == 3)
            ++topology.triangleCount;
        else
            (corners.size() == 4 ? topology.quads : topology.polygons).add(face);
        if (hasRepeatedPoint(corners))
            topology.facesWithRepeatedPoints.add(face);
    }

    /// One end of a side, as seen from the point at that end.
    struct SideEnd {
        unsigned int otherPoint;
        unsigned int startCorner; // of the side
        unsigned int corner; // the one at the point: equal to `startCorner` if the side leads away from it
        friend auto operator<=>(SideEnd const&, SideEnd const&) = default;
    };

    /// The sides at one point: which edges they form, and how these connect the corners of the faces to fans.
    class PointStar {
    public:
        PointStar(MeshArrays const& mesh, EdgeSides const& edges, unsigned int point)
            : point_(point)
        {
            unsigned int const* const pointAt = mesh.faceVertex->data;
            edges.forEachCornerAt(point, [&](CornerNeighbors const& at) {
                corners_.push_back(at.corner);
                if (pointAt[at.next] == point)
                    joined_.push_back({at.corner, at.next}); // equal consecutive points are one vertex of the face
                else
                    ends_.push_back({pointAt[at.next], at.corner, at.corner});
                if (pointAt[at.previous] != point)
                    ends_.push_back({pointAt[at.previous], at.previous, at.corner});
            });
            std::sort(ends_.begin(), ends_.end());
        }

        void examine(MeshTopology& topology)
        {
            for (auto first = ends_.begin(); first != ends_.end();) {
                auto const last = std::find_if(
                    first, ends_.end(), [=](SideEnd const& end) { return end.otherPoint != first->otherPoint; });
                if (point_ < first->otherPoint) // each edge once
                    examineEdge({first, last}, topology);
                for (SideEnd const& end : std::span(first, last))
                    joined_.push_back({first->corner, end.corner});
                first = last;
            }
            if (countFans() > 1)
                topology.nonManifoldPoints.add(point_);
        }

    private:
        static void examineEdge(std::span<SideEnd const> sides, MeshTopology& topology)
        {
            ++topology.edgeCount;
            if (sides.size() == 1)
                topology.boundaryEdges.add(sides[0].startCorner);
            if (sides.size() > 2)
                topology.nonManifoldEdges.add(sides[0].startCorner);
            std::array<Finding, 2> directions; // away from the point, and towards it
            for (SideEnd const& side : sides)
                directions[side.startCorner == side.corner ? 0 : 1].add(side.startCorner);
            for (Finding const& direction : directions) {
                if (direction.count > 1)
                    topology.windingConflicts.add(direction.first);
                if (direction.count == 2 && sides.size() == 2)
                    topology.flippedEdges.add(direction.first);
            }
        }

        /// The number of sets of corners that `joined_` connects.
        std::size_t countFans() const
        {
            std::vector<std::size_t> parents(corners_.size());
            std::iota(parents.begin(), parents.end(), std::size_t{0});
            auto const find = [&](unsigned int corner) {
                auto i = static_cast<std::size_t>(
                    std::lower_bound(corners_.begin(), corners_.end(), corner) - corners_.begin());
                while (parents[i] != i)
                    i = parents[i] = parents[parents[i]];
                return i;
            };
            std::size_t count = corners_.size();
            for (auto const& [a, b] : joined_)
                if (std::size_t const i = find(a), k = find(b); i != k) {
                    parents[std::max(i, k)] = std::min(i, k);
                    --count;
                }
            return count;
        }

        unsigned int point_;
        std::vector<unsigned int> corners_; // ascending
        std::vector<SideEnd> ends_;
        std::vector<std::array<unsigned int, 2>> joined_; // pairs of corners
    };

    void examinePoint(MeshArrays const& mesh, EdgeSides const& edges, unsigned int point, MeshTopology& topology)
    {
        if (edges.cornersAt(point).empty())
            topology.isolatedPoints.add(point);
        else if (ClosedFan const fan(mesh, edges, point); fan)
            fan.forEachHigherEdge([&](unsigned int, unsigned int) { ++topology.edgeCount; });
        else
            PointStar(mesh, edges, point).examine(topology);
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

MeshTopology& MeshTopology::operator+=(MeshTopology const& other)
{
    triangleCount += other.triangleCount;
    edgeCount += other.edgeCount;
    for (Finding MeshTopology::*const finding : {&MeshTopology::facesBelowThreeCorners, &MeshTopology::quads,
             &MeshTopology::polygons, &MeshTopology::facesWithRepeatedPoints, &MeshTopology::boundaryEdges,
             &MeshTopology::nonManifoldEdges, &MeshTopology::windingConflicts, &MeshTopology::flippedEdges,
             &MeshTopology::nonManifoldPoints, &MeshTopology::isolatedPoints})
        this->*finding += other.*finding;
    return *this;
}

MeshTopology analyzeTopology(MeshArrays const& mesh)
{
    return analyzeTopology(mesh, EdgeSides(mesh));
}

MeshTopology analyzeTopology(MeshArrays const& mesh, EdgeSides const& edges)
{
    auto topology = findInAll<MeshTopology>(
        mesh.faceCount(), [&](unsigned int face, MeshTopology& found) { countFace(mesh, face, found); });
    topology += findInAll<MeshTopology>(
        mesh.pointCount(), [&](unsigned int point, MeshTopology& found) { examinePoint(mesh, edges, point, found); });
    topology.partCount = countConnectedComponents(mesh, edges);
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
    return findInAll<std::uint64_t>(mesh.faceCount(), [&](unsigned int face, std::uint64_t& count) {
        count += isSliver(mesh.corners(face), mesh.positions->data, ratio) ? 1u : 0u;
    });
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
