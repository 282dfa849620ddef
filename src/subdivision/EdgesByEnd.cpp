#include "EdgesByEnd.h"

#include "OrderedEdgesByEnd.h"
#include "sortEdges.h"

#include "frame/Arrays.h"

#include <atomic>
#include <bit>
#include <optional>
#include <utility>
#include <vector>

namespace Modeling::Internal {

namespace {

    /// How points are divided for a bucket sort. Directed edges are first sorted into the bucket of the point at which
    /// they end, in the order of their corners, and then by point within the bucket. So each step writes to few places
    /// at a time, however the points are numbered.
    struct Buckets {
        unsigned int bits; // points in the same bucket differ only in these low bits of their number
        std::size_t count;

        explicit Buckets(unsigned int pointCount)
            // A bucket and its copy fit into the cache of a core; small meshes have several buckets too, so that all
            // threads have work.
            : bits(std::clamp(static_cast<unsigned int>(std::bit_width(pointCount / 16)), 7u, 13u))
            , count((std::size_t{pointCount} + (std::size_t{1} << bits) - 1) >> bits)
        {
        }
    };

    /// Where a bucket goes on is known long before its next cache line is reached, but the processor cannot follow so many.
    void prefetchNextLine(std::uint64_t const* place)
    {
        constexpr std::uintptr_t kLine = 64; // perhaps past the end of the array, so not by arithmetic of pointers
        __builtin_prefetch(reinterpret_cast<void const*>(reinterpret_cast<std::uintptr_t>(place) + kLine), 1);
    }

    // Both treat the edges of a triangle at once if its points are in the same bucket. One by one, each would wait for the
    // count of the one before.

    bool areTogether(unsigned int bits, unsigned int a, unsigned int b, unsigned int c)
    {
        return ((a ^ b) | (a ^ c)) >> bits == 0;
    }

    struct CountPerBucket {
        std::size_t* count; // per bucket
        unsigned int bits;

        void edge(unsigned int, unsigned int end, unsigned int) const { ++count[end >> bits]; }
        void triangle(unsigned int a, unsigned int b, unsigned int c, unsigned int) const
        {
            if (areTogether(bits, a, b, c)) {
                count[a >> bits] += 3;
                return;
            }
            for (unsigned int const end : {a, b, c})
                ++count[end >> bits];
        }
    };

    struct MoveToBuckets {
        std::size_t* cursor; // per bucket
        unsigned int bits;
        std::uint64_t* entries;
        std::uint16_t* pointInBucket;

        void edge(unsigned int start, unsigned int end, unsigned int corner) const
        {
            std::size_t const place = cursor[end >> bits]++;
            prefetchNextLine(entries + place);
            write(place, start, end, corner);
        }
        void triangle(unsigned int a, unsigned int b, unsigned int c, unsigned int corner) const
        {
            if (!areTogether(bits, a, b, c)) {
                edge(c, a, corner);
                edge(a, b, corner + 1);
                edge(b, c, corner + 2);
                return;
            }
            std::size_t const place = cursor[a >> bits];
            cursor[a >> bits] = place + 3;
            write(place, c, a, corner);
            write(place + 1, a, b, corner + 1);
            write(place + 2, b, c, corner + 2);
        }
        void write(std::size_t place, unsigned int start, unsigned int end, unsigned int corner) const
        {
            entries[place] = edgeEntry(start, corner);
            pointInBucket[place] = static_cast<std::uint16_t>(end & ((1u << bits) - 1));
        }
    };

    /// One row per block: where it writes its first edge of each bucket. An additional last row holds where the buckets
    /// begin, and after that the number of edges.
    std::vector<std::size_t> findBlockStarts(EdgeFaces const& faces, FaceBlocks const& blocks, Buckets const& buckets)
    {
        std::size_t const width = buckets.count + 1;
        std::vector<std::size_t> starts((blocks.count + 1) * width);
        blocks.forEach([&](std::size_t block) {
            forEachEdge(faces, blocks.begin(block), blocks.end(block),
                CountPerBucket{starts.data() + block * width, buckets.bits});
        });
        std::size_t sum = 0;
        for (std::size_t bucket = 0; bucket != width; ++bucket) {
            starts[blocks.count * width + bucket] = sum;
            for (std::size_t block = 0; block != blocks.count; ++block)
                sum += std::exchange(starts[block * width + bucket], sum);
        }
        return starts;
    }

    /// Sorts the edges of a bucket by the point at which they end, and in ascending order at each point.
    class BucketSorter {
    public:
        /// \param entries     the edges of the bucket, in the order of their corners
        /// \param pointOf     for each edge, the point at which it ends, counted from the first one of the bucket
        /// \param offset      receives where the edges at each point of the bucket begin
        /// \return            whether two edges have the same start and end
        bool sort(std::uint64_t* entries, std::uint16_t const* pointOf, std::size_t edgeCount, std::size_t pointCount,
            unsigned int bucketStart, unsigned int* offset)
        {
            cursors_.assign(pointCount + 1, 0);
            for (std::size_t edge = 0; edge != edgeCount; ++edge)
                ++cursors_[pointOf[edge] + std::size_t{1}];
            for (std::size_t point = 0; point != pointCount; ++point) {
                offset[point] = bucketStart + cursors_[point];
                cursors_[point + 1] += cursors_[point];
            }
            if (byPoint_.size() < edgeCount)
                byPoint_.resize(edgeCount);
            for (std::size_t edge = 0; edge != edgeCount; ++edge)
                byPoint_[cursors_[pointOf[edge]]++] = entries[edge];

            bool hasRepeats = false;
            std::size_t first = 0;
            for (std::size_t point = 0; point != pointCount; ++point) {
                std::size_t const last = cursors_[point];
                hasRepeats |= sortEdges(byPoint_.data() + first, last - first, entries + first);
                first = last;
            }
            return hasRepeats;
        }

    private:
        std::vector<unsigned int> cursors_;
        std::vector<std::uint64_t> byPoint_;
    };

    /// For meshes in any order.
    bool listAnyEdgesByEnd(
        EdgeFaces const& faces, unsigned int pointCount, unsigned int* offset, Orvan::Array<std::uint64_t>& entries)
    {
        FaceBlocks const blocks(faces.count);
        Buckets const buckets(pointCount);
        std::vector<std::size_t> starts = findBlockStarts(faces, blocks, buckets);
        std::size_t const width = buckets.count + 1;
        std::vector<std::size_t> const bucketStarts(starts.end() - static_cast<std::ptrdiff_t>(width), starts.end());
        entries = uninitializedArray<std::uint64_t>(bucketStarts.back());
        auto const pointsInBuckets = uninitializedArray<std::uint16_t>(bucketStarts.back());
        std::uint64_t* const entry = entries.data;
        std::uint16_t* const pointInBucket = pointsInBuckets.data;
        blocks.forEach([&](std::size_t block) {
            forEachEdge(faces, blocks.begin(block), blocks.end(block),
                MoveToBuckets{starts.data() + block * width, buckets.bits, entry, pointInBucket});
        });

        std::atomic<bool> hasRepeats = false;
        // Each bucket writes its own edges, and the offsets of its own points.
        parallelFor(tbb::blocked_range<std::size_t>(0, buckets.count, 1), [&](auto const& range) {
            BucketSorter sorter;
            for (std::size_t bucket = range.begin(); bucket != range.end(); ++bucket) {
                std::size_t const first = bucketStarts[bucket], firstPoint = bucket << buckets.bits;
                std::size_t const points = std::min(std::size_t{1} << buckets.bits, pointCount - firstPoint);
                if (sorter.sort(entry + first, pointInBucket + first, bucketStarts[bucket + 1] - first, points,
                        static_cast<unsigned int>(first), offset + firstPoint))
                    hasRepeats.store(true, std::memory_order_relaxed);
            }
        });
        offset[pointCount] = static_cast<unsigned int>(bucketStarts.back());
        return hasRepeats.load(std::memory_order_relaxed);
    }

}

bool listEdgesByEnd(
    EdgeFaces const& faces, unsigned int pointCount, unsigned int* offset, Orvan::Array<std::uint64_t>& entries)
{
    std::optional<bool> const hasRepeats = listOrderedEdgesByEnd(faces, pointCount, offset, entries);
    return hasRepeats ? *hasRepeats : listAnyEdgesByEnd(faces, pointCount, offset, entries);
}

}
