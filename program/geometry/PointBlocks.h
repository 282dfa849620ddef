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
    unsigned int pointCount() const { return pointCount_; }
    unsigned int countAt(unsigned int index) const { return offsets_[index + 1] - offsets_[index]; }
    /// In ascending order. Points are counted from the first one of the block.
    std::span<CornerAtPoint const> at(unsigned int index) const
    {
        return {corners_.data + offsets_[index], corners_.data + offsets_[index + 1]};
    }

private:
    friend class PointBlocks;

    unsigned int firstPoint_ = 0;
    unsigned int pointCount_ = 0;
    // Those of point i are `offsets_[i]` up to `offsets_[i + 1]`. While corners are added, `offsets_[i + 1]` is the place
    // of the next one; the last entry is used only then.
    std::vector<unsigned int> offsets_;
    Orvan::Array<CornerAtPoint> corners_; // may be longer
};

/// Lists the corners at the points of a mesh block by block, for one pass over all points. First the faces are
/// distributed to blocks of consecutive points, which writes to few places at a time. Then the corners at the points of
/// one block fit the cache, whereas lists for the whole mesh would be filled and read at random. Needs 4 bytes per face
/// and block in which it has corners: little more than 4 per face in most meshes, 12 per triangle at most.
class PointBlocks {
public:
    /// The mesh must outlive it.
    explicit PointBlocks(MeshArrays const& mesh);

    unsigned int count() const { return count_; }
    /// Lists the corners at the points of a block. Memory of earlier lists is used again.
    void list(unsigned int block, BlockCorners& corners) const;

private:
    /// The maximum number of parts of the faces, which are distributed in parallel.
    static constexpr unsigned int kMostParts = 64;

    unsigned int beginOfPart(std::size_t part) const
    {
        return static_cast<unsigned int>(std::uint64_t{mesh_.faceCount()} * part / partCount_);
    }
    std::span<unsigned int const> facesOf(unsigned int block, std::size_t part) const
    {
        std::size_t const entry = std::size_t{block} * partCount_ + part;
        return {faces_.data + offsets_[entry], faces_.data + offsets_[entry + 1]};
    }
    void countFaces(std::size_t part);
    void distributeFaces(std::size_t part);
    /// Calls `visit(block, first face, end)` for runs of faces of a part that have corners in a block, in ascending
    /// order. Visits each face and block with corners of it once.
    template <class Visit> void forEachRun(std::size_t part, Visit const& visit) const;
    /// Calls `visit(point, CornerAtPoint)` for the corners in a block in ascending order, and for some others.
    template <class Visit> void forEachCorner(unsigned int block, Visit const& visit) const;

    MeshArrays const& mesh_;
    unsigned int shift_; // a block has two to the power of this many points
    unsigned int count_;
    std::size_t partCount_;
    std::array<bool, kMostParts> areTriangles_{};
    // The faces of part p with corners in block b are those from entry b · parts + p to the next one.
    std::vector<unsigned int> offsets_;
    Orvan::Array<unsigned int> faces_;
};

}
