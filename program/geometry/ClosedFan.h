#pragma once

#include "EdgeSides.h"

#include "frame/Lanes.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstring>

namespace ModelingProgram {

/// The faces at a point if they form one closed fan in which all have the same orientation, as at nearly all points.
/// Then each edge at the point has two sides in opposite directions. Not recognized if there are many faces: comparing
/// all pairs is faster than sorting only if there are few.
class ClosedFan {
public:
    ClosedFan(MeshArrays const& mesh, EdgeSides const& edges, unsigned int point)
        : point_(point)
    {
        if (edges.cornersAt(point).size() > kMaxValence)
            return;
        unsigned int const* const pointAt = mesh.faceVertex->data;
        previous_.fill(Tessara::Geometry::kInvalidIndex);
        bool repeatsPoint = false;
        edges.forEachCornerAt(point, [&](CornerNeighbors const& at) {
            corners_[valence_] = at.corner;
            next_[valence_] = pointAt[at.next];
            previous_[valence_] = pointAt[at.previous];
            repeatsPoint |= next_[valence_] == point;
            lowestNeighbor_ = std::min(lowestNeighbor_, next_[valence_++]);
        });
        isClosed_ = valence_ != 0 && !repeatsPoint && (valence_ <= 8 ? isOneCycle<2>() : isOneCycle<4>());
    }

    /// Whether the faces form such a fan.
    explicit operator bool() const { return isClosed_; }

    /// The lowest point that an edge joins with this point.
    unsigned int lowestNeighbor() const { return lowestNeighbor_; }

    /// The number of edges to higher points.
    unsigned int higherEdgeCount() const
    {
        unsigned int count = 0;
        for (unsigned int face = 0; face != valence_; ++face)
            count += next_[face] > point_ ? 1u : 0u;
        return count;
    }

    /// One corner per face.
    std::span<unsigned int const> corners() const { return {corners_.data(), valence_}; }

    /// Calls `visit(corner, other corner)` for each edge to a higher point, with the corners at this point of the two
    /// faces. The edge leads from the first corner to the next one in its face.
    template <class Visit> void forEachHigherEdge(Visit const& visit) const
    {
        for (unsigned int face = 0; face != valence_; ++face)
            if (previous_[face] > point_)
                visit(corners_[before_[face]], corners_[face]);
    }

private:
    static constexpr unsigned int kMaxValence = 16;

    /// Finds the face before each face: the one whose next point is the previous point of the face.
    /// \return whether there is exactly one each time, and all faces form one cycle
    template <unsigned int kVectors> bool isOneCycle()
    {
        // Compares one face with four others at a time. Each lane is negative before its match, the index of the matching
        // face after it, and at least `kMatch` after another one.
        constexpr std::int32_t kMatch = 1 << 8;
        Modeling::IntLanes previous[kVectors], before[kVectors];
        std::memcpy(previous, previous_.data(), sizeof(previous));
        std::fill_n(before, kVectors, Modeling::IntLanes{} - kMatch);
        for (unsigned int face = 0; face != valence_; ++face)
            for (unsigned int i = 0; i != kVectors; ++i)
                before[i] += (previous[i] == static_cast<std::int32_t>(next_[face]))
                    & (Modeling::IntLanes{} + (kMatch + static_cast<std::int32_t>(face)));
        std::memcpy(before_.data(), before, sizeof(before));

        unsigned int face = before_[0];
        for (unsigned int step = 1; step != valence_; face = before_[face], ++step)
            if (face - 1 >= valence_ - 1) // 0, or not an index
                return false;
        return face == 0;
    }

    unsigned int point_;
    unsigned int lowestNeighbor_ = Tessara::Geometry::kInvalidIndex;
    unsigned int valence_ = 0;
    bool isClosed_ = false;
    // One entry per face; the others are not set, except those of `previous_`.
    std::array<unsigned int, kMaxValence> corners_;
    std::array<unsigned int, kMaxValence> next_;
    std::array<unsigned int, kMaxValence> previous_;
    std::array<unsigned int, kMaxValence> before_; // indices into these arrays
};

}
