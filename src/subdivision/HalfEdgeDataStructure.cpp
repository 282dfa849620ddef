#include <Modeling/HalfEdgeDataStructure.h>

#include "frame/Arrays.h"
#include "frame/Assert.h"
#include "frame/FaceAdjacency.h"

#include <tbb/parallel_reduce.h>

#include <algorithm>
#include <atomic>
#include <bit>
#include <functional>
#include <limits>
#include <new>
#include <utility>
#include <vector>

namespace Geometry::Mesh {

using namespace Modeling;

namespace {

    struct Faces : FaceView {
        bool areTriangles; // as `isTriangleMesh`
    };

    /// The preconditions of the constructor.
    [[maybe_unused]] bool fitTogether(
        unsigned int pointCount, unsigned int faceCount, IndexArray const& faceVertex, IndexArray const& faceOffset)
    {
        if (faceCount == 0)
            return true;
        if (faceOffset.size <= faceCount || !isNonDecreasing(faceOffset.data, std::size_t{faceCount} + 1))
            return false;
        unsigned int const first = faceOffset[0], last = faceOffset[faceCount];
        return last <= faceVertex.size && areBelow(pointCount, faceVertex.data + first, last - first);
    }

    /// How faces are divided into blocks, and points into buckets, for a bucket sort. Directed edges are first sorted
    /// into the bucket of the point at which they end, in the order of their corners, and then by point within the
    /// bucket. So each step writes to few places at a time, however the points are numbered.
    struct Layout {
        unsigned int bucketBits; // points in the same bucket differ only in these low bits of their number
        std::size_t bucketCount;
        std::size_t facesPerBlock;
        std::size_t blockCount;

        Layout(unsigned int pointCount, unsigned int faceCount)
        {
            // A bucket and its copy fit into the cache of a core; small meshes have several buckets too, so that all
            // threads have work.
            bucketBits = std::clamp(static_cast<unsigned int>(std::bit_width(pointCount / 16)), 7u, 13u);
            bucketCount = (std::size_t{pointCount} + (std::size_t{1} << bucketBits) - 1) >> bucketBits;
            facesPerBlock = std::max<std::size_t>(std::size_t{1} << 14, faceCount / 64 + 1);
            blockCount = (faceCount + facesPerBlock - 1) / facesPerBlock;
        }
    };

    /// Whether three points are in the same bucket, as is usual if faces are stored in an order that follows the surface.
    bool areTogether(Layout const& layout, unsigned int a, unsigned int b, unsigned int c)
    {
        return ((a ^ b) | (a ^ c)) >> layout.bucketBits == 0;
    }

    /// Calls `visit(start, end, corner)` for the directed edges of a block of faces. `corner` is the corner at the end
    /// of the edge; the calls are in ascending order of it. `visit.together(a, b, c, corner)` is called instead for all
    /// edges of a triangle whose points are in the same bucket.
    template <class Visit>
    void forEachEdge(Faces const& faces, Layout const& layout, std::size_t block, Visit const& visit)
    {
        std::size_t const first = block * layout.facesPerBlock;
        std::size_t const last = std::min<std::size_t>(first + layout.facesPerBlock, faces.count);
        if (faces.areTriangles) {
            for (std::size_t face = first; face != last; ++face) {
                auto const corner = static_cast<unsigned int>(3 * face);
                unsigned int const a = faces.faceVertex[corner], b = faces.faceVertex[corner + 1],
                                   c = faces.faceVertex[corner + 2];
                if (areTogether(layout, a, b, c)) {
                    visit.together(a, b, c, corner);
                    continue;
                }
                visit(c, a, corner);
                visit(a, b, corner + 1);
                visit(b, c, corner + 2);
            }
            return;
        }
        for (std::size_t face = first; face != last; ++face) {
            unsigned int const begin = faces.offsets.begin(face), end = faces.offsets.end(face);
            for (unsigned int corner = begin; corner != end; ++corner)
                visit(faces.faceVertex[corner == begin ? end - 1 : corner - 1], faces.faceVertex[corner], corner);
        }
    }

    /// Calls `work(block)` for the blocks of faces, in parallel.
    template <class Work> void forEachBlock(Layout const& layout, Work const& work)
    {
        // `work` writes only what belongs to its block.
        parallelFor(tbb::blocked_range<std::size_t>(0, layout.blockCount, 1), [&](auto const& blocks) {
            for (std::size_t block = blocks.begin(); block != blocks.end(); ++block)
                work(block);
        });
    }

    /// Where a bucket goes on is known long before its next cache line is reached, but the processor cannot follow so many.
    void prefetchNextLine(std::uint64_t const* place)
    {
        constexpr std::uintptr_t kLine = 64; // perhaps past the end of the array, so not by arithmetic of pointers
        __builtin_prefetch(reinterpret_cast<void const*>(reinterpret_cast<std::uintptr_t>(place) + kLine), 1);
    }

    // Both count the edges of a triangle at once if they can. One by one, each would wait for the count of the one before.

    struct CountEdges {
        std::size_t* count; // per bucket
        unsigned int bits;

        void operator()(unsigned int, unsigned int end, unsigned int) const { ++count[end >> bits]; }
        void together(unsigned int a, unsigned int, unsigned int, unsigned int) const { count[a >> bits] += 3; }
    };

    struct MoveEdges {
        std::size_t* cursor; // per bucket
        unsigned int bits;
        std::uint64_t* entries;
        std::uint16_t* pointInBucket;

        void operator()(unsigned int start, unsigned int end, unsigned int corner) const
        {
            std::size_t const place = cursor[end >> bits]++;
            prefetchNextLine(entries + place);
            write(place, start, end, corner);
        }
        void together(unsigned int a, unsigned int b, unsigned int c, unsigned int corner) const
        {
            std::size_t const place = cursor[a >> bits];
            cursor[a >> bits] = place + 3;
            write(place, c, a, corner);
            write(place + 1, a, b, corner + 1);
            write(place + 2, b, c, corner + 2);
        }
        void write(std::size_t place, unsigned int start, unsigned int end, unsigned int corner) const
        {
            entries[place] = std::uint64_t{start} << 32 | corner;
            pointInBucket[place] = static_cast<std::uint16_t>(end & ((1u << bits) - 1));
        }
    };

    /// One row per block: where it writes its first edge of each bucket. An additional last row holds where the buckets
    /// begin, and after that the number of edges.
    std::vector<std::size_t> findBlockStarts(Faces const& faces, Layout const& layout)
    {
        std::size_t const width = layout.bucketCount + 1;
        std::vector<std::size_t> starts((layout.blockCount + 1) * width);
        forEachBlock(layout, [&](std::size_t block) {
            forEachEdge(faces, layout, block, CountEdges{starts.data() + block * width, layout.bucketBits});
        });
        std::size_t sum = 0;
        for (std::size_t bucket = 0; bucket != width; ++bucket) {
            starts[layout.blockCount * width + bucket] = sum;
            for (std::size_t block = 0; block != layout.blockCount; ++block)
                sum += std::exchange(starts[block * width + bucket], sum);
        }
        return starts;
    }

    /// Sorts the edges that end at one point.
    /// \return whether two have the same start
    bool sortEdges(std::uint64_t const* edges, std::size_t count, std::uint64_t* sorted)
    {
        auto const startOf = [](std::uint64_t edge) { return edge >> 32 << 32; };
        constexpr std::size_t kFew = 16; // up to here, comparing all with all is faster, as no branch is unpredictable
        if (count <= kFew) {
            std::size_t sumOfRanks = 0;
            for (std::size_t edge = 0; edge != count; ++edge) {
                std::size_t rank = 0;
                for (std::size_t other = 0; other != count; ++other)
                    rank += edges[other] < startOf(edges[edge]);
                sorted[rank] = edges[edge];
                sumOfRanks += rank;
            }
            if (2 * sumOfRanks == count * (count - 1)) // each pair counts, unless both have the same start
                return false;
        }
        std::copy_n(edges, count, sorted);
        std::sort(sorted, sorted + count);
        return std::adjacent_find(sorted, sorted + count, [=](std::uint64_t a, std::uint64_t b) {
            return startOf(a) == startOf(b);
        }) != sorted + count;
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

    /// Lists the directed edges by the points at which they end, ascending.
    /// \return whether two edges have the same start and end
    bool listEdges(
        Faces const& faces, unsigned int pointCount, unsigned int* offset, Orvan::Array<std::uint64_t>& entries)
    {
        Layout const layout(pointCount, faces.count);
        std::vector<std::size_t> starts = findBlockStarts(faces, layout);
        std::size_t const width = layout.bucketCount + 1;
        std::vector<std::size_t> const bucketStarts(starts.end() - static_cast<std::ptrdiff_t>(width), starts.end());
        if (bucketStarts.back() > std::numeric_limits<unsigned int>::max())
            throw std::bad_alloc();

        entries = uninitializedArray<std::uint64_t>(bucketStarts.back());
        auto const pointsInBuckets = uninitializedArray<std::uint16_t>(bucketStarts.back());
        std::uint64_t* const entry = entries.data;
        std::uint16_t* const pointInBucket = pointsInBuckets.data;
        forEachBlock(layout, [&](std::size_t block) {
            forEachEdge(faces, layout, block,
                MoveEdges{starts.data() + block * width, layout.bucketBits, entry, pointInBucket});
        });

        std::atomic<bool> hasRepeats = false;
        // Each bucket writes its own edges, and the offsets of its own points.
        parallelFor(tbb::blocked_range<std::size_t>(0, layout.bucketCount, 1), [&](auto const& buckets) {
            BucketSorter sorter;
            for (std::size_t bucket = buckets.begin(); bucket != buckets.end(); ++bucket) {
                std::size_t const first = bucketStarts[bucket], firstPoint = bucket << layout.bucketBits;
                std::size_t const points = std::min(std::size_t{1} << layout.bucketBits, pointCount - firstPoint);
                if (sorter.sort(entry + first, pointInBucket + first, bucketStarts[bucket + 1] - first, points,
                        static_cast<unsigned int>(first), offset + firstPoint))
                    hasRepeats.store(true, std::memory_order_relaxed);
            }
        });
        offset[pointCount] = static_cast<unsigned int>(bucketStarts.back());
        return hasRepeats.load(std::memory_order_relaxed);
    }

    /// For each corner the directed edge that ends at it.
    Orvan::Array<HalfEdge> describeCorners(Faces const& faces, std::size_t cornerCount)
    {
        Orvan::Array<HalfEdge> records(cornerCount); // corners that belong to no face keep the default
        HalfEdge* const record = records.data;
        OffsetView const offset = faces.offsets;
        // Each face writes the entries of its corners.
        parallelFor(tbb::blocked_range<unsigned int>(0, faces.count, kFaceGrain), [=](auto const& range) {
            for (unsigned int face = range.begin(); face != range.end(); ++face)
                for (unsigned int corner = offset.begin(face); corner != offset.end(face); ++corner)
                    record[corner] = {face, static_cast<unsigned char>(corner - offset.begin(face)),
                        static_cast<unsigned char>(offset.size(face))};
        });
        return records;
    }

}

HalfEdgeDataStructure::HalfEdgeDataStructure(unsigned int numPoints)
    : offsets_(zeroedArray<unsigned int>(std::uint64_t{numPoints} + 1))
{
}

HalfEdgeDataStructure::HalfEdgeDataStructure(
    unsigned int numPoints, unsigned int numFaces, IndexArray const& faceVertex, IndexArray const& faceOffset)
    : offsets_(uninitializedArray<unsigned int>(std::uint64_t{numPoints} + 1))
{
    MODELING_ASSERT(fitTogether(numPoints, numFaces, faceVertex, faceOffset));
    Faces const faces{{faceVertex.data, faceOffset, numFaces}, numFaces == 0 || isTriangleMesh(numFaces, faceOffset)};
    bool const hasRepeats = listEdges(faces, numPoints, offsets_.data, entries_);
    MODELING_ASSERT(areOffsets(offsets_.data, numPoints, entries_.size));
    if (!faces.areTriangles)
        records_ = describeCorners(faces, faceVertex.size);
    if (hasRepeats)
        dropRepeatedEdges();
}

void HalfEdgeDataStructure::dropRepeatedEdges()
{
    unsigned int const* const offset = offsets_.data;
    std::uint64_t const* const entry = entries_.data;
    auto const isRepeat = [=](unsigned int edge, unsigned int first) {
        return edge != first && startOf(entry[edge]) == startOf(entry[edge - 1]);
    };
    IndexArray newOffsets = offsetsFromCounts(offsets_.size - 1, [=](std::size_t point) {
        unsigned int count = 0;
        for (unsigned int edge = offset[point]; edge != offset[point + 1]; ++edge)
            count += !isRepeat(edge, offset[point]);
        return count;
    });
    auto newEntries = uninitializedArray<std::uint64_t>(newOffsets[newOffsets.size - 1]);
    // Each point writes its own entries.
    parallelFor(tbb::blocked_range<std::size_t>(0, offsets_.size - 1, kElementGrain), [&](auto const& points) {
        for (std::size_t point = points.begin(); point != points.end(); ++point) {
            std::uint64_t* target = newEntries.data + newOffsets[point];
            for (unsigned int edge = offset[point]; edge != offset[point + 1]; ++edge)
                if (!isRepeat(edge, offset[point]))
                    *target++ = entry[edge];
        }
    });
    offsets_.swap(newOffsets);
    entries_.swap(newEntries);
}

void HalfEdgeDataStructure::clear() noexcept
{
    offsets_.clear();
    entries_ = {};
    records_ = {};
}

void HalfEdgeDataStructure::swap(HalfEdgeDataStructure& other) noexcept
{
    offsets_.swap(other.offsets_);
    entries_.swap(other.entries_);
    records_.swap(other.records_);
}

bool HalfEdgeDataStructure::hasBoundary(
    unsigned int numFaces, IndexArray const& faceVertex, IndexArray const& faceOffset) const
{
    FaceView const mesh{faceVertex.data, faceOffset, numFaces};
    auto const isOpenIn = [&, mesh](tbb::blocked_range<unsigned int> const& faces, bool found) {
        for (unsigned int face = faces.begin(); !found && face != faces.end(); ++face) {
            if (mesh.size(face) < 3)
                return true;
            unsigned int const* const c = mesh.corners(face);
            found = !find(c[0], c[1]) || !find(c[1], c[2]) || !find(c[2], c[0]);
        }
        return found;
    };
    tbb::blocked_range<unsigned int> const all(0, numFaces);
    bool isOpen = false;
    bool const isDone = runIsolated(
        [&] { isOpen = tbb::parallel_reduce(all, false, isOpenIn, std::logical_or<>(), tbb::auto_partitioner()); });
    return isDone ? isOpen : isOpenIn(all, false);
}

}
