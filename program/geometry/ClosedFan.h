#pragma once

#include "EdgeSides.h"

#include <array>
#include <bit>
#include <cstdint>

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
        edges.forEachCornerAt(point, [&](CornerNeighbors const& at) {
            corners_[valence_] = at.corner;
            next_[valence_] = pointAt[at.next];
            previous_[valence_++] = pointAt[at.previous];
        });
        isClosed_ = valence_ != 0 && findFollowers();
    }

    /// Whether the faces form such a fan.
    explicit operator bool() const { return isClosed_; }

    /// Calls `visit(corner, other corner)` for each edge to a higher point, with the corners at this point of the two
    /// faces. The edge leads from the first corner to the next one in its face.
    template <class Visit> void forEachHigherEdge(Visit const& visit) const
    {
        for (unsigned int face = 0; face != valence_; ++face)
            if (next_[face] > point_)
                visit(corners_[face], corners_[follower_[face]]);
    }

private:
    static constexpr unsigned int kMaxValence = 16;

    /// Finds the face that follows each face around the point: it has the next point of the face as its previous one.
    /// \return whether there is exactly one each time, and all faces form one cycle
    bool findFollowers()
    {
        unsigned int face = 0;
        for (unsigned int step = 1; step <= valence_; ++step) {
            std::uint32_t matches = 0;
            for (unsigned int other = 0; other != valence_; ++other)
                matches |= (previous_[other] == next_[face] ? 1u : 0u) << other;
            auto const follower = static_cast<unsigned int>(std::countr_zero(matches));
            if (!std::has_single_bit(matches) || next_[face] == point_ || (follower == 0) != (step == valence_))
                return false;
            follower_[face] = follower;
            face = follower;
        }
        return true;
    }

    unsigned int point_;
    unsigned int valence_ = 0;
    bool isClosed_ = false;
    // One entry per face; the others are not set.
    std::array<unsigned int, kMaxValence> corners_;
    std::array<unsigned int, kMaxValence> next_;
    std::array<unsigned int, kMaxValence> previous_;
    std::array<unsigned int, kMaxValence> follower_;
};

}
