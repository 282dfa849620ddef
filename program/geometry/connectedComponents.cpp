#include "connectedComponents.h"

#include <tbb/blocked_range.h>
#include <tbb/parallel_for.h>
#include <tbb/parallel_reduce.h>

#include <algorithm>
#include <atomic>
#include <functional>
#include <map>
#include <numeric>
#include <utility>

namespace ModelingProgram {

namespace {

    /// Disjoint sets of indices (union-find without locks). All threads may join sets at the same time. The lowest index
    /// of a set represents it, whatever the order of the joins.
    class DisjointSets {
    public:
        /// \param parents  for each index itself or a lower one in the same set
        explicit DisjointSets(Orvan::Array<unsigned int> parents)
            : parents_(std::move(parents))
        {
        }

        unsigned int find(unsigned int index)
        {
            for (unsigned int parent = parentOf(index); parent != index;) {
                unsigned int const grandparent = parentOf(parent);
                // Shortens the path. Another thread may have set a nearer ancestor of the set: either one is right.
                if (grandparent != parent)
                    at(index).store(grandparent, std::memory_order_relaxed);
                index = parent;
                parent = grandparent;
            }
            return index;
        }

        bool isRepresentative(unsigned int index) { return parentOf(index) == index; }

        void join(unsigned int a, unsigned int b)
        {
            for (;;) {
                a = find(a);
                b = find(b);
                if (a == b)
                    return;
                unsigned int const lower = std::min(a, b);
                unsigned int higher = std::max(a, b);
                if (at(higher).compare_exchange_strong(higher, lower, std::memory_order_relaxed))
                    return;
            }
        }

        /// Calls `visit(index)` for all indices in parallel.
        template <class Visit> void forEachIndex(Visit const& visit)
        {
            auto const count = static_cast<unsigned int>(parents_.size);
            tbb::parallel_for(
                tbb::blocked_range<unsigned int>(0, count, Modeling::kElementGrain), [&](auto const& indices) {
                    for (unsigned int index = indices.begin(); index != indices.end(); ++index)
                        visit(index);
                });
        }

        /// The representative of most of a sample of the indices: that of the largest set, if one is large.
        unsigned int findLikelyLargest()
        {
            constexpr std::size_t kSampleCount = 1024;
            std::map<unsigned int, unsigned int> counts;
            for (std::uint64_t i = 0; i < parents_.size; i += std::max<std::uint64_t>(1, parents_.size / kSampleCount))
                ++counts[find(static_cast<unsigned int>(i))];
            auto const isRarer = [](auto const& a, auto const& b) { return a.second < b.second; };
            auto const most = std::max_element(counts.begin(), counts.end(), isRarer);
            return most == counts.end() ? 0 : most->first;
        }

    private:
        std::atomic_ref<unsigned int> at(unsigned int index)
        {
            return std::atomic_ref<unsigned int>(parents_.data[index]);
        }
        unsigned int parentOf(unsigned int index) { return at(index).load(std::memory_order_relaxed); }

        Orvan::Array<unsigned int> parents_;
    };

}

std::uint64_t countConnectedComponents(MeshArrays const& mesh, EdgeSides const& edges)
{
    Orvan::Array<unsigned int> parents(mesh.pointCount(), Orvan::kUninitialized);
    std::iota(parents.begin(), parents.end(), 0u);
    return countConnectedComponents(mesh, edges, std::move(parents));
}

std::uint64_t countConnectedComponents(
    MeshArrays const& mesh, EdgeSides const& edges, Orvan::Array<unsigned int> lowerInParts)
{
    DisjointSets sets(std::move(lowerInParts));
    auto const countSets = [&] {
        return tbb::parallel_reduce(
            tbb::blocked_range<unsigned int>(0, mesh.pointCount(), Modeling::kElementGrain), std::uint64_t{0},
            [&](auto const& points, std::uint64_t count) {
                for (unsigned int point = points.begin(); point != points.end(); ++point)
                    count += sets.isRepresentative(point) && !edges.cornersAt(point).empty() ? 1u : 0u;
                return count;
            },
            std::plus<>());
    };
    if (std::uint64_t const count = countSets(); count <= 1)
        return count;
    auto const joinFace = [&](unsigned int point, unsigned int corner) {
        std::span<unsigned int const> const corners = mesh.corners(edges.faceOf(corner));
        // The neighbors in the face are enough: its other points do the same.
        unsigned int const* const at = mesh.faceVertex->data + corner;
        sets.join(point, at == &corners.back() ? corners.front() : at[1]);
        sets.join(point, at == &corners.front() ? corners.back() : at[-1]);
    };
    // One face of some points joins most of a mesh. What has become one large set need not be joined again: wherever it
    // meets another set, the points of that set join the two.
    sets.forEachIndex([&](unsigned int point) {
        if (std::span<unsigned int const> const corners = edges.cornersAt(point); !corners.empty() && point % 4 == 0)
            joinFace(point, corners[0]);
    });
    unsigned int const largest = sets.findLikelyLargest();
    sets.forEachIndex([&](unsigned int point) {
        if (sets.find(point) != sets.find(largest))
            for (unsigned int const corner : edges.cornersAt(point))
                joinFace(point, corner);
    });
    return countSets();
}

}
