#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>
#include <TessaraGeometry/Names.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <iterator>

namespace Geometry::Mesh {

/// One side of an edge: the directed edge from u to v of the face that has it in this direction. The default value
/// stands for an edge that does not exist.
struct HalfEdge {
    unsigned int face = Tessara::Geometry::kInvalidIndex;
    unsigned char corner = 0; ///< the corner of that face that is at v; low 8 bits only
    unsigned char faceSize = 1; ///< the number of corners of that face; low 8 bits only

    friend bool operator==(HalfEdge const&, HalfEdge const&) = default;
};

/// Half-edge adjacency of a polygon mesh: for each point, the directed edges (half-edges) that end there, looked up by
/// the point at which they start.
///
/// The mesh itself stays in its flat arrays. The face across an edge from a to b is the one with the edge from b to a:
/// `halfEdge(a, b)`. Its `corner` is at a and, in a triangle, is followed by the corner opposite the edge. On a closed
/// manifold, the start points of the edges that end at a point are its neighbors, and the faces of these edges are the
/// faces around it, each once.
///
/// Faces may have any number of corners, although `corner` and `faceSize` are truncated to 8 bits. If several faces
/// have the same directed edge, only that of the face with the lowest number is kept (within a face, that of the lowest
/// corner), and the others are ignored silently: manifoldness is not checked.
///
/// Any number of threads may read a structure concurrently. Building runs in parallel with the same result for any
/// number of threads. It takes linear time however the points are numbered, plus the time to sort the edges at each
/// point. Looking up an edge is a short linear search, or a binary search at points of high valence. Memory: 8 bytes
/// per corner and 4 per point, and 8 more per corner if not all faces are triangles. During construction: about 4 more
/// per point if faces that are stored close together have points that are, otherwise 2 per corner; and up to 8 more per
/// corner for points of high valence and repeated edges.
class HalfEdgeDataStructure {
public:
    struct Neighbor {
        unsigned int point; ///< where the edge starts
        HalfEdge halfEdge;
    };
    class Iterator;
    class Neighbors;

    /// `numPoints` points and no edges.
    /// \throws std::bad_alloc
    MODELING_EXPORT explicit HalfEdgeDataStructure(unsigned int numPoints);

    /// \param faceVertex  the point of each corner; all below `numPoints`
    /// \param faceOffset  `numFaces` + 1 non-decreasing entries: the first corner of each face, and the end of the last
    ///                    one. A face without corners has no edges.
    /// \throws std::bad_alloc
    MODELING_EXPORT HalfEdgeDataStructure(unsigned int numPoints, unsigned int numFaces,
        Orvan::Array<unsigned int> const& faceVertex, Orvan::Array<unsigned int> const& faceOffset);

    /// The directed edge from `other` to `point`; a default `HalfEdge` if there is none.
    /// \pre  `point` is below the number of points, here and below.
    HalfEdge halfEdge(unsigned int point, unsigned int other) const
    {
        std::uint64_t const* const found = find(point, other);
        return found ? recordOf(*found) : HalfEdge();
    }

    /// The number of directed edges that end at the point: its valence on a closed manifold. Constant time.
    std::uint64_t valence(unsigned int point) const { return offsets_[std::uint64_t{point} + 1] - offsets_[point]; }

    /// The number of directed edges: one per corner of a face, less the repeated edges that were ignored.
    std::uint64_t size() const { return entries_.size; }

    /// The directed edges that end at the point, in ascending order of the points at which they start.
    Neighbors neighbors(unsigned int point) const;

    /// Removes all points and edges, and releases the memory of the edges. No point may be queried afterwards.
    MODELING_EXPORT void clear() noexcept;
    MODELING_EXPORT void swap(HalfEdgeDataStructure& other) noexcept;

    /// Whether some face has an edge that no face has in the opposite direction. Takes the arrays of the constructor,
    /// and considers only the triangle of the first three corners of each face; a face with fewer corners counts as a
    /// boundary. Runs in parallel over faces.
    MODELING_EXPORT bool hasBoundary(unsigned int numFaces, Orvan::Array<unsigned int> const& faceVertex,
        Orvan::Array<unsigned int> const& faceOffset) const;

private:
    static constexpr std::ptrdiff_t kShortList = 24; // up to this length a linear search is faster than a binary search

    // An entry holds the start point of the edge in its high half, and the corner at the end of the edge in its low
    // half. So sorted entries are in the order of their start points, and repeated edges in the order of their faces.
    static unsigned int startOf(std::uint64_t entry) { return static_cast<unsigned int>(entry >> 32); }
    static unsigned int cornerOf(std::uint64_t entry) { return static_cast<unsigned int>(entry); }

    HalfEdge recordOf(std::uint64_t entry) const
    {
        unsigned int const corner = cornerOf(entry);
        if (!records_.empty())
            return records_[corner];
        return {corner / 3, static_cast<unsigned char>(corner % 3), 3};
    }

    std::uint64_t const* find(unsigned int point, unsigned int other) const
    {
        std::uint64_t const* first = entries_.data + offsets_[point];
        std::uint64_t const* const last = entries_.data + offsets_[std::uint64_t{point} + 1];
        if (last - first > kShortList)
            first = std::lower_bound(first, last, std::uint64_t{other} << 32);
        else
            while (first != last && startOf(*first) < other)
                ++first;
        return first != last && startOf(*first) == other ? first : nullptr;
    }

    void dropRepeatedEdges();

    Orvan::Array<unsigned int> offsets_; // point count + 1: where the entries of each point begin
    Orvan::Array<std::uint64_t> entries_;
    Orvan::Array<HalfEdge> records_; // one per corner; empty if corner c belongs to triangle c / 3
};

class HalfEdgeDataStructure::Iterator {
public:
    using iterator_category = std::input_iterator_tag;
    using value_type = Neighbor;
    using difference_type = std::ptrdiff_t;
    using pointer = void;
    using reference = Neighbor;

    Iterator() = default;

    Neighbor operator*() const { return {startOf(*entry_), edges_->recordOf(*entry_)}; }
    Iterator& operator++()
    {
        ++entry_;
        return *this;
    }
    Iterator operator++(int)
    {
        Iterator const before = *this;
        ++entry_;
        return before;
    }
    friend bool operator==(Iterator const& a, Iterator const& b) { return a.entry_ == b.entry_; }

private:
    friend class HalfEdgeDataStructure;
    Iterator(HalfEdgeDataStructure const& edges, std::uint64_t const* entry)
        : edges_(&edges)
        , entry_(entry)
    {
    }

    HalfEdgeDataStructure const* edges_ = nullptr;
    std::uint64_t const* entry_ = nullptr;
};

/// A range for `for (auto const& [point, halfEdge] : edges.neighbors(p))`; the structure has to outlive it.
class HalfEdgeDataStructure::Neighbors {
public:
    Neighbors(Iterator first, Iterator last)
        : first_(first)
        , last_(last)
    {
    }
    Iterator begin() const { return first_; }
    Iterator end() const { return last_; }

private:
    Iterator first_, last_;
};

inline HalfEdgeDataStructure::Neighbors HalfEdgeDataStructure::neighbors(unsigned int point) const
{
    return {Iterator(*this, entries_.data + offsets_[point]),
        Iterator(*this, entries_.data + offsets_[std::uint64_t{point} + 1])};
}

}
