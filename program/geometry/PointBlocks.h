#pragma once

#include "MeshArrays.h"

#include <array>
#include <cstdint>
#include <span>
#include <vector>

namespace ModelingProgram {

/// A corner at some point: the next and the previous point of its face, and where it is. In a face with fewer than three
/// corners, the point itself is the next and the previous one.
struct CornerAtPoint {
    unsigned int next;
    unsigned int previous;
    unsigned int corner;
    unsigned int face;
};

/// The corners at consecutive points.
class BlockCorners {
public:
    unsigned int firstPoint() const { return firstPoint_; }
    unsigned int pointCount() const { return static_cast<unsigned int>(counts_.size()); }
    unsigned int countAt(unsigned int index) const { return counts_[index]; }
    /// In ascending order. Points are counted from the first one of the block.
    std::span<CornerAtPoint const> at(unsigned int index) const
    {
        unsigned int const count = counts_[index];
        return {count <= kSlots ? slots_.data + std::size_t{index} * kSlots : long_.data() + longPlaces_[index], count};
    }

private:
    friend class PointBlocks;

    /// Most points have at most this many corners, which are listed in one pass over the faces.
    static constexpr unsigned int kSlots = 8;

    struct LateCorner {
        unsigned int index; // of the point
        CornerAtPoint corner;
    };

    void clear(unsigned int firstPoint, unsigned int pointCount);
    void add(unsigned int index, CornerAtPoint const& corner)
    {
        if (unsigned int const count = counts_[index]++; count < kSlots)
            slots_[std::size_t{index} * kSlots + count] = corner;
        else
            addLate({index, corner});
    }
    [[gnu::noinline]] void addLate(LateCorner const& corner) { late_.push_back(corner); } // keeps the loop above short
    /// After all corners have been added.
    void joinLists();

    unsigned int firstPoint_ = 0;
    std::vector<unsigned int> counts_; // one entry per point
    Orvan::Array<CornerAtPoint> slots_; // `kSlots` entries per point; may be longer
    // The corners that found no slot, and the complete lists of their points. Other points have no place there.
    std::vector<LateCorner> late_;
    std::vector<CornerAtPoint> long_;
    std::vector<unsigned int> longPlaces_;
};

/// Lists the corners at the points of a mesh block by block, for one pass over all points. First the faces are
/// distributed to blocks of consecutive points, which writes to few places at a time. Then the corners at the points of
/// one block fit the cache, whereas lists for the whole mesh would be filled and read at random. Needs 8 bytes per run of
/// consecutive faces with corners in the same block, 4 if it is one face: nearly nothing in most meshes, 12 per triangle
/// at most.
class PointBlocks {
public:
    /// The mesh must outlive it.
    explicit PointBlocks(MeshArrays const& mesh);

    unsigned int count() const { return count_; }
    /// Whether all faces are triangles.
    bool areAllTriangles() const { return areAllTriangles_; }
    /// Lists the corners at the points of a block. Memory of earlier lists is used again.
    void list(unsigned int block, BlockCorners& corners) const;

private:
    /// The maximum number of parts of the faces, which are distributed in parallel.
    static constexpr unsigned int kMostParts = 64;

    unsigned int beginOfPart(std::size_t part) const
    {
        return static_cast<unsigned int>(std::uint64_t{mesh_.faceCount()} * part / partCount_);
    }
    /// What a part has found so far for a block.
    struct OpenRun {
        unsigned int end = 0; // of the last run, relative to the part
        bool isSingle = false; // whether that run is one face
        unsigned int wordCount = 0; // of all runs
    };
    /// Calls `put(block, word, value)` for the words of the runs of a part. Words that are put again are replaced.
    /// \return  one entry per block
    template <class Put> std::vector<OpenRun> encodeRuns(std::size_t part, Put const& put) const;
    void countWords(std::size_t part);
    void writeRuns(std::size_t part);
    /// Calls `visit(block, first face, end)` for runs of faces of a part that have corners in a block, in ascending
    /// order. Visits each face and block with corners of it once. Runs may follow each other closely.
    template <class Visit> void forEachRun(std::size_t part, Visit const& visit) const;
    /// Calls `visit(face)` for the faces of a part with corners in a block in ascending order, relative to the part.
    template <class Visit> void forEachFace(unsigned int block, std::size_t part, Visit const& visit) const;
    /// Calls `visit(point, CornerAtPoint)` for the corners in a block in ascending order, and for some others.
    template <class Visit> void forEachCorner(unsigned int block, Visit const& visit) const;

    MeshArrays const& mesh_;
    std::size_t partCount_;
    std::array<bool, kMostParts> areTriangles_{};
    bool areAllTriangles_ = false;
    unsigned int shift_ = 0; // a block has two to the power of this many points
    unsigned int count_ = 0;
    // The runs of part p with corners in block b are in the words from entry b · parts + p to the next one: the first
    // face relative to the part, and also the end if the first word has the bit `kLonger`.
    static constexpr unsigned int kLonger = 1u << 31; // a part has fewer faces
    std::vector<unsigned int> offsets_;
    Orvan::Array<unsigned int> words_;
};

}
