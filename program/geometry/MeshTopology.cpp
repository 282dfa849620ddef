#include "MeshTopology.h"

#include "ClosedFan.h"
#include "Creases.h"
#include "EdgeSides.h"
#include "connectedComponents.h"

#include <tbb/blocked_range.h>
#include <tbb/parallel_reduce.h>
#include <tbb/parallel_sort.h>

#include <algorithm>
#include <array>
#include <bit>
#include <functional>
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

    /// The sides at one point: which edges they form, and how these connect the corners of the faces to fans. Can be used
    /// for one point after the other, which saves allocations.
    class PointStar {
    public:
        void examine(MeshArrays const& mesh, EdgeSides const& edges, unsigned int point, MeshTopology& topology)
        {
            collect(mesh, edges, point);
            for (auto first = ends_.begin(); first != ends_.end();) {
                auto const last = std::find_if(
                    first, ends_.end(), [=](SideEnd const& end) { return end.otherPoint != first->otherPoint; });
                if (point < first->otherPoint) // each edge once
                    examineEdge({first, last}, topology);
                for (SideEnd const& end : std::span(first, last))
                    joined_.push_back({first->corner, end.corner});
                first = last;
            }
            if (countFans() > 1)
                topology.nonManifoldPoints.add(point);
        }

    private:
        void collect(MeshArrays const& mesh, EdgeSides const& edges, unsigned int point)
        {
            corners_.clear();
            ends_.clear();
            joined_.clear();
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
        std::size_t countFans()
        {
            parents_.resize(corners_.size());
            std::iota(parents_.begin(), parents_.end(), std::size_t{0});
            auto const find = [&](unsigned int corner) {
                auto i = static_cast<std::size_t>(
                    std::lower_bound(corners_.begin(), corners_.end(), corner) - corners_.begin());
                while (parents_[i] != i)
                    i = parents_[i] = parents_[parents_[i]];
                return i;
            };
            std::size_t count = corners_.size();
            for (auto const& [a, b] : joined_)
                if (std::size_t const i = find(a), k = find(b); i != k) {
                    parents_[std::max(i, k)] = std::min(i, k);
                    --count;
                }
            return count;
        }

        std::vector<unsigned int> corners_; // ascending
        std::vector<SideEnd> ends_;
        std::vector<std::array<unsigned int, 2>> joined_; // pairs of corners
        std::vector<std::size_t> parents_; // of the indices of corners, in sets of joined ones
    };

    /// What was found at some points, and scratch memory for the next one.
    struct PointFindings {
        MeshTopology topology;
        PointStar star;
        PointFindings& operator+=(PointFindings const& other)
        {
            topology += other.topology;
            return *this;
        }
    };

    /// \return a point of the same component, not higher than this one
    unsigned int examinePoint(MeshArrays const& mesh, EdgeSides const& edges, Creases const* creases,
        unsigned int point, PointFindings& found)
    {
        if (ClosedFan const fan(mesh, edges, point); fan) {
            found.topology.edgeCount += fan.higherEdgeCount();
            found.topology.sharpEdgeCount += creases ? creases->countHigherAt(fan) : 0;
            return std::min(fan.lowestNeighbor(), point);
        }
        if (edges.cornersAt(point).empty())
            found.topology.isolatedPoints.add(point);
        found.star.examine(mesh, edges, point, found.topology);
        found.topology.sharpEdgeCount += creases ? creases->countHigherAt(point) : 0;
        return point;
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
    sharpEdgeCount += other.sharpEdgeCount;
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

MeshTopology analyzeTopology(MeshArrays const& mesh, EdgeSides const& edges, Creases const* creases)
{
    auto topology = findInAll<MeshTopology>(
        mesh.faceCount(), [&](unsigned int face, MeshTopology& found) { countFace(mesh, face, found); });
    Orvan::Array<unsigned int> lowerInParts(mesh.pointCount(), Orvan::kUninitialized);
    topology += findInAll<PointFindings>(mesh.pointCount(), [&](unsigned int point, PointFindings& found) {
        lowerInParts.data[point] = examinePoint(mesh, edges, creases, point, found);
    }).topology;
    topology.partCount = countConnectedComponents(mesh, edges, std::move(lowerInParts));
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

std::vector<std::uint64_t> countSlivers(MeshArrays const& mesh, std::vector<float> const& ratios)
{
    struct Counts : std::vector<std::uint64_t> {
        Counts& operator+=(Counts const& other)
        {
            resize(std::max(size(), other.size()));
            std::transform(other.begin(), other.end(), begin(), begin(), std::plus<>());
            return *this;
        }
    };
    Counts counts = findInAll<Counts>(mesh.faceCount(), [&](unsigned int face, Counts& found) {
        std::span<unsigned int const> const corners = mesh.corners(face);
        EdgeRange const edges = corners.size() == 3 ? squaredEdgeRange(corners.first<3>(), mesh.positions->data)
                                                    : squaredEdgeRange(corners, mesh.positions->data);
        for (std::size_t i = 0; i != ratios.size(); ++i)
            if (isSliver(edges, ratios[i])) {
                found.resize(ratios.size());
                ++found[i];
            }
    });
    counts.resize(ratios.size());
    return counts;
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
