#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>
#include <TessaraGeometry/Names.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <iterator>

namespace Geometry::Mesh {

/// One side of an edge: the directed edge from u to v of the face that passes it in this direction. By default the one
/// that is not there.
struct HalfEdge {
    unsigned int face = Tessara::Geometry::kInvalidIndex;
    unsigned char corner = 0; ///< which corner of that face holds v; the low 8 bits
    unsigned char faceSize = 1; ///< how many corners that face has; the low 8 bits

    friend bool operator==(HalfEdge const&, HalfEdge const&) = default;
};

/// The adjacency of a mesh: for each point the directed edges that end there, found by the point they come from.
///
/// The mesh itself stays in its flat arrays. The face across the edge from a to b of some face is the one that passes
/// from b to a: `halfEdge(a, b)`, whose `corner` holds a and, in a triangle, is followed by the corner opposite the
/// edge. On a closed manifold the points from which edges come are the neighbours of a point, and the faces of these
/// edges the faces around it, each once.
///
/// Faces may have any number of corners, though `corner` and `faceSize` are cut to 8 bits. Where several faces pass an
/// edge in the same direction, the one with the lowest number stays (within a face the lowest corner), and the others
/// are left out without a report: nothing here checks that a mesh is manifold.
///
/// Any number of threads may read one structure. Building takes linear time whatever the numbering of the points, but
/// for sorting the edges at each point, on all threads and with the same result for any number of them. Looking an edge
/// up takes a few steps, at points of high valence a bisection. Takes 8 bytes a corner and 4 a point, and 8 more a
/// corner where not all faces are triangles; while it is built, up to 8 more a corner at points of high valence, and
/// where edges repeat.
class HalfEdgeDataStructure {
public:
    struct Neighbour {
        unsigned int point; ///< where the edge comes from
        HalfEdge halfEdge;
    };
    class Iterator;
    class Neighbours;

    /// That many points, and no edges.
    /// \throws std::bad_alloc
    MODELING_EXPORT explicit HalfEdgeDataStructure(unsigned int numPoints);

    /// \param faceVertex  the point of each corner; all below `numPoints`
    /// \param faceOffset  `numFaces` + 1 entries that ascend: where the corners of each face begin. A face without
    ///                    corners has no edges.
    /// \throws std::bad_alloc
    MODELING_EXPORT HalfEdgeDataStructure(unsigned int numPoints, unsigned int numFaces,
        Orvan::Array<unsigned int> const& faceVertex, Orvan::Array<unsigned int> const& faceOffset);

    /// The directed edge that ends at `point` and comes from `other`; by default where there is none.
    HalfEdge halfEdge(unsigned int point, unsigned int other) const
    {
        std::uint64_t const* const found = find(point, other);
        return found ? recordOf(*found) : HalfEdge();
    }

    /// How many directed edges end at the point: its valence on a closed manifold. Constant time.
    std::uint64_t valence(unsigned int point) const { return offsets_[std::uint64_t{point} + 1] - offsets_[point]; }

    /// How many directed edges there are: as many as corners, unless some were left out.
    std::uint64_t size() const { return entries_.size; }

    /// The directed edges that end at the point, ascending by the points they come from.
    Neighbours neighbours(unsigned int point) const;

    /// Leaves no points and no edges: nothing may be asked about a point then.
    MODELING_EXPORT void clear() noexcept;
    MODELING_EXPORT void swap(HalfEdgeDataStructure& other) noexcept;

    /// Whether some face has an edge that no face passes in the other direction. Each face is taken for a triangle of
    /// its first three corners; one with fewer counts as an open edge.
    MODELING_EXPORT bool hasBoundary(unsigned int numFaces, Orvan::Array<unsigned int> const& faceVertex,
        Orvan::Array<unsigned int> const& faceOffset) const;

private:
    static constexpr std::ptrdiff_t kShortList = 24; // up to here looking at all is faster than a bisection

    // An entry is the point that the edge comes from above the corner at which it ends: entries in ascending order are
    // in the order of the points, and equal ones in the order of the faces.
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

    Orvan::Array<unsigned int> offsets_; // where the entries of each point begin; one more than points
    Orvan::Array<std::uint64_t> entries_;
    Orvan::Array<HalfEdge> records_; // one a corner; empty where corner c is that of a triangle c / 3
};

class HalfEdgeDataStructure::Iterator {
public:
    using iterator_category = std::input_iterator_tag;
    using value_type = Neighbour;
    using difference_type = std::ptrdiff_t;
    using pointer = void;
    using reference = Neighbour;

    Iterator() = default;

    Neighbour operator*() const { return {startOf(*entry_), edges_->recordOf(*entry_)}; }
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

/// A range for `for (auto const& [point, halfEdge] : edges.neighbours(p))`, of use while the structure lives.
class HalfEdgeDataStructure::Neighbours {
public:
    Neighbours(Iterator first, Iterator last)
        : first_(first)
        , last_(last)
    {
    }
    Iterator begin() const { return first_; }
    Iterator end() const { return last_; }

private:
    Iterator first_, last_;
};

inline HalfEdgeDataStructure::Neighbours HalfEdgeDataStructure::neighbours(unsigned int point) const
{
    return {Iterator(*this, entries_.data + offsets_[point]),
        Iterator(*this, entries_.data + offsets_[std::uint64_t{point} + 1])};
}

}
