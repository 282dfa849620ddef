#include "PointBlocks.h"

#include "TriangleBatch.h"
#include "sumOverBlocks.h"

#include <tbb/parallel_for.h>

#include <algorithm>
#include <bit>
#include <functional>
#include <numeric>
#include <type_traits>
#include <utility>

namespace ModelingProgram {

namespace {

    // The corners of a block fit the cache of a core.
    constexpr unsigned int kCornersPerBlock = 1 << 16;
    // Distributing fewer faces takes no longer than starting a task.
    constexpr unsigned int kFacesPerPart = 4096;

    // Each block reads all corners of its faces, so there are fewer blocks if large faces would be read more often.
    constexpr std::uint64_t kMostReads = 8; // of a corner, on average

    std::uint64_t blockCount(MeshArrays const& mesh, unsigned int shift)
    {
        return (std::uint64_t{mesh.pointCount()} + (std::uint64_t{1} << shift) - 1) >> shift;
    }

    /// An upper bound of how often blocks read corners.
    std::uint64_t countReads(MeshArrays const& mesh, std::uint64_t blocks)
    {
        unsigned int const* const offset = mesh.faceOffset->data;
        return sumOverBlocks<std::uint64_t>(mesh.faceCount(), [=](std::size_t begin, std::size_t end) {
            std::uint64_t reads = 0;
            for (std::size_t face = begin; face != end; ++face) {
                std::uint64_t const corners = offset[face + 1] - offset[face];
                reads += corners * std::min(corners, blocks);
            }
            return reads;
        });
    }

    unsigned int shiftOfBlocks(MeshArrays const& mesh, bool areTriangles)
    {
        std::uint64_t const points = std::max(mesh.pointCount(), 1u), corners = std::max(mesh.cornerCount(), 1u);
        auto shift = static_cast<unsigned int>(std::bit_width(kCornersPerBlock * points / (corners + points) + 1));
        if (!areTriangles && blockCount(mesh, shift) > kMostReads
            && countReads(mesh, blockCount(mesh, shift)) > kMostReads * mesh.cornerCount())
            while (blockCount(mesh, shift) > kMostReads)
                ++shift;
        return shift;
    }

    /// How many of the first triangles have all corners in the same block as a point.
    unsigned int countInside(unsigned int const* corner, unsigned int faceCount, unsigned int point, unsigned int shift)
    {
        constexpr unsigned int kChunk = 8; // so many are compared by SIMD instructions
        auto const areInside = [=]<unsigned int kCount>(
                                   unsigned int first, std::integral_constant<unsigned int, kCount>) {
            unsigned int differences = 0;
            for (unsigned int i = 0; i != 3 * kCount; ++i)
                differences |= corner[3 * first + i] ^ point;
            return differences >> shift == 0;
        };
        std::integral_constant<unsigned int, kChunk> const aChunk;
        std::integral_constant<unsigned int, 1> const one;
        unsigned int inside = 0;
        if (faceCount == 0 || !areInside(0, one)) // as where blocks alternate
            return 0;
        while (inside + kChunk <= faceCount && areInside(inside, aChunk))
            inside += kChunk;
        while (inside != faceCount && areInside(inside, one))
            ++inside;
        return inside;
    }

}

PointBlocks::PointBlocks(MeshArrays const& mesh)
    : mesh_(mesh)
    , partCount_(std::clamp(mesh.faceCount() / kFacesPerPart, 1u, kMostParts))
{
    // Parts have entries of their own, here and below.
    auto const forEachPart = [this](auto const& work) { tbb::parallel_for(std::size_t{0}, partCount_, work); };
    forEachPart([this](std::size_t part) {
        areTriangles_[part] = areTriangles(mesh_, beginOfPart(part), beginOfPart(part + 1));
    });
    areAllTriangles_ = std::all_of(areTriangles_.begin(), areTriangles_.begin() + partCount_, std::identity());
    shift_ = shiftOfBlocks(mesh, areAllTriangles_);
    count_ = static_cast<unsigned int>(blockCount(mesh, shift_));
    offsets_.resize(std::size_t{count_} * partCount_ + 1);
    forEachPart([this](std::size_t part) { countWords(part); });
    std::exclusive_scan(offsets_.begin(), offsets_.end(), offsets_.begin(), 0u);
    words_ = Orvan::Array<unsigned int>(offsets_.back(), Orvan::kUninitialized);
    forEachPart([this](std::size_t part) { writeRuns(part); });
}

template <class Put> std::vector<PointBlocks::OpenRun> PointBlocks::encodeRuns(std::size_t part, Put const& put) const
{
    std::vector<OpenRun> open(count_);
    unsigned int const firstFace = beginOfPart(part);
    forEachRun(part, [&](unsigned int block, unsigned int faceBegin, unsigned int faceEnd) {
        unsigned int const begin = faceBegin - firstFace, end = faceEnd - firstFace;
        OpenRun& run = open[block];
        if (run.wordCount != 0 && begin == run.end) {
            if (run.isSingle)
                put(block, run.wordCount++ - 1, (begin - 1) | kLonger);
            run.isSingle = false;
            put(block, run.wordCount - 1, end);
        } else {
            run.isSingle = end - begin == 1;
            put(block, run.wordCount++, begin | (run.isSingle ? 0 : kLonger));
            if (!run.isSingle)
                put(block, run.wordCount++, end);
        }
        run.end = end;
    });
    return open;
}

void PointBlocks::countWords(std::size_t part)
{
    std::vector<OpenRun> const found = encodeRuns(part, [](unsigned int, unsigned int, unsigned int) {});
    for (unsigned int block = 0; block != count_; ++block)
        offsets_[std::size_t{block} * partCount_ + part] = found[block].wordCount;
}

void PointBlocks::writeRuns(std::size_t part)
{
    encodeRuns(part, [=, this](unsigned int block, unsigned int word, unsigned int value) {
        words_[offsets_[std::size_t{block} * partCount_ + part] + word] = value;
    });
}

template <class Visit> void PointBlocks::forEachRun(std::size_t part, Visit const& visit) const
{
    unsigned int const* const offset = mesh_.faceOffset->data;
    unsigned int const* corner = mesh_.faceVertex->data + offset[beginOfPart(part)];
    unsigned int const begin = beginOfPart(part), end = beginOfPart(part + 1);
    if (areTriangles_[part]) {
        for (unsigned int face = begin; face != end;) {
            // Most faces have all corners in the block of the face before.
            unsigned int const a = corner[0] >> shift_, b = corner[1] >> shift_, c = corner[2] >> shift_;
            if (unsigned int const inside = countInside(corner, end - face, corner[0], shift_); inside != 0) {
                visit(a, face, face + inside);
                face += inside;
                corner += 3 * std::size_t{inside};
                continue;
            }
            visit(a, face, face + 1);
            if (b != a)
                visit(b, face, face + 1);
            if (c != a && c != b)
                visit(c, face, face + 1);
            ++face;
            corner += 3;
        }
        return;
    }
    std::vector<unsigned int> lastFaces(count_, end); // that were visited
    for (unsigned int face = begin; face != end; ++face)
        for (; corner != mesh_.faceVertex->data + offset[face + 1]; ++corner)
            if (unsigned int const block = *corner >> shift_; lastFaces[block] != face) {
                lastFaces[block] = face;
                visit(block, face, face + 1);
            }
}

template <class Visit> void PointBlocks::forEachFace(unsigned int block, std::size_t part, Visit const& visit) const
{
    std::size_t const entry = std::size_t{block} * partCount_ + part;
    for (unsigned int word = offsets_[entry]; word != offsets_[entry + 1];) {
        unsigned int const first = words_[word++], begin = first & ~kLonger;
        unsigned int const end = first == begin ? begin + 1 : words_[word++];
        for (unsigned int face = begin; face != end; ++face)
            visit(face);
    }
}

template <class Visit> void PointBlocks::forEachCorner(unsigned int block, Visit const& visit) const
{
    unsigned int const* const pointAt = mesh_.faceVertex->data;
    unsigned int const* const offset = mesh_.faceOffset->data;
    for (std::size_t part = 0; part != partCount_; ++part)
        if (areTriangles_[part]) {
            unsigned int const firstFace = beginOfPart(part), firstCorner = offset[firstFace];
            forEachFace(block, part, [=, &visit](unsigned int faceOfPart) {
                unsigned int const face = firstFace + faceOfPart, corner = firstCorner + 3 * faceOfPart;
                unsigned int const a = pointAt[corner], b = pointAt[corner + 1], c = pointAt[corner + 2];
                visit(a, CornerAtPoint{b, c, corner, face});
                visit(b, CornerAtPoint{c, a, corner + 1, face});
                visit(c, CornerAtPoint{a, b, corner + 2, face});
            });
        } else
            forEachFace(block, part, [=, this, &visit](unsigned int faceOfPart) {
                unsigned int const face = beginOfPart(part) + faceOfPart;
                unsigned int const first = offset[face], end = offset[face + 1];
                bool const hasSides = end - first >= 3;
                for (unsigned int corner = first; corner != end; ++corner) {
                    unsigned int const next = !hasSides ? corner : corner + 1 == end ? first : corner + 1;
                    unsigned int const previous = !hasSides ? corner : corner == first ? end - 1 : corner - 1;
                    visit(pointAt[corner], CornerAtPoint{pointAt[next], pointAt[previous], corner, face});
                }
            });
}

void PointBlocks::list(unsigned int block, BlockCorners& corners) const
{
    unsigned int const first = block << shift_;
    unsigned int const count = std::min(mesh_.pointCount() - first, 1u << shift_);
    corners.clear(first, count);
    forEachCorner(block, [=, &corners](unsigned int point, CornerAtPoint const& corner) {
        if (point - first < count) // also false if point < first
            corners.add(point - first, corner);
    });
    corners.joinLists();
}

void BlockCorners::clear(unsigned int firstPoint, unsigned int pointCount)
{
    firstPoint_ = firstPoint;
    counts_.assign(pointCount, 0);
    if (slots_.size < std::size_t{pointCount} * kSlots)
        slots_ = Orvan::Array<CornerAtPoint>(std::size_t{pointCount} * kSlots, Orvan::kUninitialized);
    late_.clear();
}

void BlockCorners::joinLists()
{
    if (late_.empty())
        return;
    longPlaces_.resize(counts_.size());
    unsigned int total = 0;
    for (unsigned int index = 0; index != counts_.size(); ++index)
        if (counts_[index] > kSlots)
            longPlaces_[index] = std::exchange(total, total + counts_[index]);
    long_.resize(total);
    // Each place is moved along the list, and back to its beginning.
    for (LateCorner const& late : late_)
        long_[longPlaces_[late.index]++ + kSlots] = late.corner;
    for (unsigned int index = 0; index != counts_.size(); ++index)
        if (counts_[index] > kSlots) {
            longPlaces_[index] -= counts_[index] - kSlots;
            std::copy_n(slots_.data + std::size_t{index} * kSlots, kSlots, long_.data() + longPlaces_[index]);
        }
}

}
