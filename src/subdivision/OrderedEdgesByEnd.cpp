#include "OrderedEdgesByEnd.h"

#include "sortEdges.h"

#include "frame/Arrays.h"

#include <atomic>
#include <numeric>
#include <utility>
#include <vector>

// A counting sort. Each block of faces counts its edges at the points that it has, so that all blocks can write at once:
// the edges of a point are those of the first block, then those of the second, and so on. Counters for all points per
// block would take too much memory, so a block has them only for the pages (runs of consecutive points) that it touches.

namespace Modeling::Internal {

namespace {

    constexpr unsigned int kPageSize = 1024; // points

    /// How many edges of a block of faces end at each point, later where the next of them goes.
    class PageCounters {
    public:
        PageCounters() = default;
        explicit PageCounters(std::size_t pageCount)
            : pages_(pageCount, nullptr)
        {
        }

        /// The counters of each page; null if the block has no point there.
        std::vector<unsigned int*> const& pages() const { return pages_; }
        std::size_t count() const { return count_; }

        unsigned int& at(unsigned int point)
        {
            unsigned int* page = pages_[point / kPageSize];
            if (!page)
                page = addPage(point / kPageSize);
            return page[point % kPageSize];
        }

    private:
        static constexpr std::size_t kPagesPerChunk = 8;

        [[gnu::noinline]] unsigned int* addPage(std::size_t page)
        {
            std::size_t const place = count_ % kPagesPerChunk * kPageSize;
            if (place == 0)
                chunks_.push_back(uninitializedArray<unsigned int>(kPagesPerChunk * kPageSize));
            ++count_;
            return pages_[page] = std::fill_n(chunks_.back().data + place, kPageSize, 0) - kPageSize;
        }

        std::vector<unsigned int*> pages_;
        std::vector<Orvan::Array<unsigned int>> chunks_;
        std::size_t count_ = 0;
    };

    struct CountEnds {
        PageCounters* counters;

        void edge(unsigned int, unsigned int end, unsigned int) const { ++counters->at(end); }
        void triangle(unsigned int a, unsigned int b, unsigned int c, unsigned int) const
        {
            ++counters->at(a);
            ++counters->at(b);
            ++counters->at(c);
        }
    };

    struct WriteEdges {
        unsigned int* const* pages;
        std::uint64_t* entries;

        void edge(unsigned int start, unsigned int end, unsigned int corner) const
        {
            entries[pages[end / kPageSize][end % kPageSize]++] = edgeEntry(start, corner);
        }
        void triangle(unsigned int a, unsigned int b, unsigned int c, unsigned int corner) const
        {
            edge(c, a, corner);
            edge(a, b, corner + 1);
            edge(b, c, corner + 2);
        }
    };

    /// Counts the edges of each block at its points.
    /// \return whether the mesh is in order
    bool countEdges(EdgeFaces const& faces, FaceBlocks const& blocks, std::size_t pageCount,
        std::vector<PageCounters>& countersOfBlocks)
    {
        // A block of a mesh in order has its share of the points, and some that it has in common with other blocks.
        std::size_t const maxPages = 4 * (pageCount / blocks.count) + 16;
        std::atomic<bool> isOrdered = true;
        blocks.forEach([&](std::size_t block) {
            constexpr std::size_t kStep = 256; // faces, until the next look at what has been found
            PageCounters counters(pageCount);
            for (std::size_t face = blocks.begin(block); face < blocks.end(block); face += kStep) {
                if (!isOrdered.load(std::memory_order_relaxed))
                    return;
                forEachEdge(faces, face, std::min(face + kStep, blocks.end(block)), CountEnds{&counters});
                if (counters.count() > maxPages)
                    isOrdered.store(false, std::memory_order_relaxed);
            }
            countersOfBlocks[block] = std::move(counters);
        });
        return isOrdered.load(std::memory_order_relaxed);
    }

    /// Turns the counts at the points of a page into places where edges go, counted from the first one of the page.
    /// \return the number of edges of the page
    unsigned int placeEdges(std::size_t page, std::size_t points, std::vector<PageCounters> const& countersOfBlocks,
        std::vector<unsigned int*>& counters, unsigned int* offset)
    {
        counters.clear();
        for (PageCounters const& ofBlock : countersOfBlocks)
            if (unsigned int* const ofPage = ofBlock.pages()[page])
                counters.push_back(ofPage);
        unsigned int place = 0;
        for (std::size_t point = 0; point != points; ++point) {
            offset[point] = place;
            for (unsigned int* const counter : counters)
                place += std::exchange(counter[point], place);
        }
        return place;
    }

    /// Adds the number of edges before each page to its counters.
    void addStarts(std::vector<unsigned int> const& starts, PageCounters const& counters)
    {
        for (std::size_t page = 0; page != counters.pages().size(); ++page)
            if (unsigned int* const counter = counters.pages()[page])
                for (std::size_t point = 0; point != kPageSize; ++point)
                    counter[point] += starts[page];
    }

    /// Sorts the edges at each point of a page, whose offsets are counted from the first edge of the page until then.
    /// \return whether two edges have the same start and end
    bool sortPage(
        unsigned int begin, unsigned int end, std::size_t points, unsigned int* offset, std::uint64_t* entries)
    {
        bool hasRepeats = false;
        for (std::size_t point = 0; point != points; ++point) {
            unsigned int const first = begin + offset[point];
            unsigned int const last = point + 1 == points ? end : begin + offset[point + 1];
            offset[point] = first;
            hasRepeats |= sortEdges(entries + first, last - first, entries + first);
        }
        return hasRepeats;
    }

    struct Pages {
        std::size_t pointCount;
        std::size_t count = (pointCount + kPageSize - 1) / kPageSize;

        std::size_t begin(std::size_t page) const { return page * kPageSize; }
        std::size_t size(std::size_t page) const { return std::min<std::size_t>(kPageSize, pointCount - begin(page)); }
    };

}

std::optional<bool> listOrderedEdgesByEnd(
    EdgeFaces const& faces, unsigned int pointCount, unsigned int* offset, Orvan::Array<std::uint64_t>& entries)
{
    FaceBlocks const blocks(faces.count);
    Pages const pages{pointCount};
    std::vector<PageCounters> counters(blocks.count);
    if (blocks.count == 0 || !countEdges(faces, blocks, pages.count, counters))
        return std::nullopt;

    std::vector<unsigned int> starts(pages.count + 1); // there are less than 2^32 edges, as offsets of corners say
    // Each page writes the counters and the offsets of its own points.
    parallelFor(tbb::blocked_range<std::size_t>(0, pages.count, 1), [&](auto const& range) {
        std::vector<unsigned int*> ofPage;
        for (std::size_t page = range.begin(); page != range.end(); ++page)
            starts[page] = placeEdges(page, pages.size(page), counters, ofPage, offset + pages.begin(page));
    });
    std::exclusive_scan(starts.begin(), starts.end(), starts.begin(), 0U);

    entries = uninitializedArray<std::uint64_t>(starts.back());
    blocks.forEach([&](std::size_t block) {
        addStarts(starts, counters[block]);
        forEachEdge(
            faces, blocks.begin(block), blocks.end(block), WriteEdges{counters[block].pages().data(), entries.data});
    });

    std::atomic<bool> hasRepeats = false;
    // Each page sorts its own edges.
    parallelFor(tbb::blocked_range<std::size_t>(0, pages.count, 1), [&](auto const& range) {
        for (std::size_t page = range.begin(); page != range.end(); ++page)
            if (sortPage(starts[page], starts[page + 1], pages.size(page), offset + pages.begin(page), entries.data))
                hasRepeats.store(true, std::memory_order_relaxed);
    });
    offset[pointCount] = starts.back();
    return hasRepeats.load(std::memory_order_relaxed);
}

}
