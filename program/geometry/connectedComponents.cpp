#include "connectedComponents.h"

#include "sumOverBlocks.h"

#include "frame/grains.h"

#include <tbb/blocked_range.h>
#include <tbb/parallel_for.h>
#include <tbb/parallel_reduce.h>

#include <algorithm>
#include <atomic>
#include <functional>
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

        /// The number of indices that represent a set.
        std::uint64_t count() const
        {
            return sumOverBlocks<std::uint64_t>(parents_.size, [this](std::size_t begin, std::size_t end) {
                std::uint64_t count = 0;
                for (std::size_t index = begin; index != end; ++index)
                    count += parents_[index] == index ? 1u : 0u;
                return count;
            });
        }

        /// Lets each index refer to the representative of its set, and counts the sets.
        std::uint64_t flatten()
        {
            return tbb::parallel_reduce(
                tbb::blocked_range<unsigned int>(0, static_cast<unsigned int>(parents_.size), Modeling::kElementGrain),
                std::uint64_t{0},
                [&](auto const& indices, std::uint64_t count) {
                    for (unsigned int index = indices.begin(); index != indices.end(); ++index) {
                        unsigned int const representative = find(index);
                        count += representative == index ? 1u : 0u;
                        at(index).store(representative, std::memory_order_relaxed);
                    }
                    return count;
                },
                std::plus<>());
        }

        /// Whether two indices are known to be in the same set, without a search.
        bool haveSameParent(unsigned int a, unsigned int b) { return parentOf(a) == parentOf(b); }

    private:
        std::atomic_ref<unsigned int> at(unsigned int index)
        {
            return std::atomic_ref<unsigned int>(parents_.data[index]);
        }
        unsigned int parentOf(unsigned int index) { return at(index).load(std::memory_order_relaxed); }

        Orvan::Array<unsigned int> parents_;
    };

    void joinFace(std::span<unsigned int const> corners, DisjointSets& sets)
    {
        for (std::size_t i = 1; i < corners.size(); ++i)
            if (!sets.haveSameParent(corners[i - 1], corners[i]))
                sets.join(corners[i - 1], corners[i]);
    }

}

std::uint64_t countConnectedComponents(
    MeshArrays const& mesh, Orvan::Array<unsigned int> lowerInParts, std::uint64_t isolatedPointCount)
{
    // One face of several joins most of a mesh.
    constexpr unsigned int kSampled = 8;
    DisjointSets sets(std::move(lowerInParts));
    std::uint64_t count = sets.count() - isolatedPointCount;
    if (count > 1)
        sets.flatten();
    for (unsigned int const step : {kSampled, 1u}) {
        if (count <= 1)
            return count;
        tbb::parallel_for(tbb::blocked_range<unsigned int>(0, mesh.faceCount() / step + 1, Modeling::kElementGrain),
            [&](auto const& range) {
                for (unsigned int i = range.begin(); i != range.end(); ++i)
                    if (std::uint64_t const face = std::uint64_t{i} * step; face < mesh.faceCount())
                        joinFace(mesh.corners(static_cast<unsigned int>(face)), sets);
            });
        count = sets.flatten() - isolatedPointCount;
    }
    return count;
}

}
