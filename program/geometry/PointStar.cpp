#include "PointStar.h"

#include <algorithm>
#include <array>
#include <numeric>

namespace ModelingProgram {

void PointStar::examine(MeshArrays const& mesh, std::span<CornerAtPoint const> around, unsigned int point,
    std::span<CreasesWithNormals const> creases, MeshTopology& topology)
{
    if (around.empty())
        topology.isolatedPoints.add(point);
    collect(mesh, around, point, topology);
    for (auto first = ends_.begin(); first != ends_.end();) {
        auto const last =
            std::find_if(first, ends_.end(), [=](SideEnd const& end) { return end.otherPoint != first->otherPoint; });
        if (point < first->otherPoint) // each edge once
            examineEdge({first, last}, around, creases, topology);
        for (SideEnd const& end : std::span(first, last))
            join(first->index, end.index);
        first = last;
    }
    if (fanCount_ > 1)
        topology.nonManifoldPoints.add(point);
}

void PointStar::collect(
    MeshArrays const& mesh, std::span<CornerAtPoint const> around, unsigned int point, MeshTopology& topology)
{
    ends_.clear();
    parents_.resize(around.size());
    std::iota(parents_.begin(), parents_.end(), 0u);
    fanCount_ = 0;
    unsigned int const* const offset = mesh.faceOffset->data;
    for (unsigned int index = 0; index != around.size(); ++index) {
        auto const [next, previous, corner, face] = around[index];
        unsigned int const first = offset[face], last = offset[face + 1] - 1;
        if (last - first < 2)
            continue;
        ++fanCount_;
        if (next == point) { // equal consecutive points are one vertex of the face
            if (last - first == 2 && (previous != point || corner == first)) // each triangle once
                topology.facesWithRepeatedPoints.add(face);
            auto const isBefore = [](CornerAtPoint const& a, unsigned int b) { return a.corner < b; };
            auto const other =
                std::lower_bound(around.begin(), around.end(), corner == last ? first : corner + 1, isBefore);
            join(index, static_cast<unsigned int>(other - around.begin()));
        } else
            ends_.push_back({next, corner, index});
        if (previous != point)
            ends_.push_back({previous, corner == first ? last : corner - 1, index});
    }
    std::sort(ends_.begin(), ends_.end());
}

void PointStar::examineEdge(std::span<SideEnd const> sides, std::span<CornerAtPoint const> around,
    std::span<CreasesWithNormals const> creases, MeshTopology& topology)
{
    ++topology.edgeCount;
    if (sides.size() == 1)
        topology.boundaryEdges.add(sides[0].startCorner);
    if (sides.size() > 2)
        topology.nonManifoldEdges.add(sides[0].startCorner);
    std::array<Finding, 2> directions; // away from the point, and towards it
    for (SideEnd const& side : sides)
        directions[side.startCorner == around[side.index].corner ? 0 : 1].add(side.startCorner);
    for (Finding const& direction : directions) {
        if (direction.count > 1)
            topology.windingConflicts.add(direction.first);
        if (direction.count == 2 && sides.size() == 2)
            topology.flippedEdges.add(direction.first);
    }
    if (sides.size() == 2)
        for (std::size_t k = 0; k != creases.size(); ++k)
            topology.sharpEdgeCounts[k] += creases[k].creases.isSharp(around[sides[0].index].face,
                                               around[sides[1].index].face, directions[0].count == 1)
                ? 1u
                : 0u;
}

void PointStar::join(unsigned int index, unsigned int otherIndex)
{
    auto const find = [this](unsigned int i) {
        while (parents_[i] != i)
            i = parents_[i] = parents_[parents_[i]];
        return i;
    };
    unsigned int const a = find(index), b = find(otherIndex);
    if (a == b)
        return;
    parents_[std::max(a, b)] = std::min(a, b);
    --fanCount_;
}

}
