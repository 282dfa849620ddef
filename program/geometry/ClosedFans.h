#pragma once

#include "CompactNormal.h"
#include "PointBlocks.h"

#include "frame/Lanes.h"

#include <array>
#include <bit>
#include <cstdint>
#include <cstring>
#include <span>

namespace ModelingProgram {

/// This many points are examined at a time.
constexpr std::size_t kFans = 4;

/// Looks at four points with equally many faces at a time: whether the faces at each of them form one closed fan in which
/// all have the same orientation, as at nearly all points. Then each edge at the point has two sides in opposite
/// directions. Not for many faces: comparing all pairs is faster than sorting only if there are few.
template <std::size_t kValence> class ClosedFans {
public:
    /// \param around  the corners at each point, `kValence` each
    ClosedFans(std::array<unsigned int, kFans> const& points, std::array<CornerAtPoint const*, kFans> const& around)
    {
        std::memcpy(&points_, &points, sizeof(points_));
        for (std::size_t face = 0; face != kValence; ++face) {
            Modeling::IntLanes corners[kFans];
            for (std::size_t i = 0; i != kFans; ++i)
                std::memcpy(&corners[i], &around[i][face], sizeof(corners[i]));
            auto const a = __builtin_shufflevector(corners[0], corners[1], 0, 4, 1, 5);
            auto const b = __builtin_shufflevector(corners[2], corners[3], 0, 4, 1, 5);
            next_[face] = __builtin_shufflevector(a, b, 0, 1, 4, 5);
            previous_[face] = __builtin_shufflevector(a, b, 2, 3, 6, 7);
        }
    }

    /// All bits of an entry are set if the faces at this point form such a fan.
    std::array<std::int32_t, kFans> areClosed() const
    {
        // Walks around each point from its first face. If each step finds one face, and the walk ends at the first face
        // after as many steps as there are faces, then it has visited all of them: in a smaller cycle, it would have
        // come to the first face before, and not have found it, as it is not looked for.
        Modeling::IntLanes areClosed = next_[0] != points_;
        for (std::size_t face = 1; face < kValence; ++face)
            areClosed &= (next_[face] != next_[0]) & (next_[face] != points_);
        Modeling::IntLanes at = previous_[0];
        for (std::size_t step = 1; step < kValence; ++step) {
            Modeling::IntLanes found{}, count{};
            for (std::size_t face = 1; face < kValence; ++face) {
                Modeling::IntLanes const isNext = next_[face] == at;
                found |= isNext & previous_[face];
                count += isNext;
            }
            areClosed &= count == -1;
            at = found;
        }
        return toArray(areClosed & (at == next_[0]));
    }

    /// The numbers of edges to higher points, if the fans are closed.
    std::array<std::int32_t, kFans> higherEdgeCounts() const
    {
        Modeling::IntLanes counts{};
        for (std::size_t face = 0; face != kValence; ++face)
            counts -= ordered(next_[face]) > ordered(points_);
        return toArray(counts);
    }

    /// The lowest of each point and the points that edges join with it, if the fans are closed.
    std::array<unsigned int, kFans> lowestPoints() const
    {
        Modeling::IntLanes lowest = ordered(points_);
        for (std::size_t face = 0; face != kValence; ++face) {
            Modeling::IntLanes const other = ordered(next_[face]);
            lowest = lowest < other ? lowest : other;
        }
        std::array<unsigned int, kFans> points;
        lowest = ordered(lowest);
        std::memcpy(&points, &lowest, sizeof(points));
        return points;
    }

private:
    static std::array<std::int32_t, kFans> toArray(Modeling::IntLanes lanes)
    {
        std::array<std::int32_t, kFans> values;
        std::memcpy(&values, &lanes, sizeof(values));
        return values;
    }

    /// Signed integers in the same order as these unsigned ones, and the other way around.
    static Modeling::IntLanes ordered(Modeling::IntLanes lanes) { return lanes ^ (Modeling::IntLanes{} + INT32_MIN); }

    Modeling::IntLanes points_;
    // One entry per face.
    std::array<Modeling::IntLanes, kValence> next_;
    std::array<Modeling::IntLanes, kValence> previous_;
};

/// The squares of upper bounds of the distances between the compact normals of the faces at four points.
template <std::size_t kValence> std::array<int, kFans> squaredSpreads(
    CompactNormal const* normals, std::array<CornerAtPoint const*, kFans> const& around)
{
    using Bytes = std::uint8_t __attribute__((vector_size(16)));
    auto const normalOf = [=](CornerAtPoint const& corner) {
        return std::bit_cast<std::int32_t>(normals[corner.face].coordinates);
    };
    Bytes lowest = Bytes{} + UINT8_MAX, highest{};
    for (std::size_t face = 0; face != kValence; ++face) {
        auto const normal = reinterpret_cast<Bytes>(Modeling::IntLanes{normalOf(around[0][face]),
            normalOf(around[1][face]), normalOf(around[2][face]), normalOf(around[3][face])});
        lowest = lowest < normal ? lowest : normal;
        highest = highest > normal ? highest : normal;
    }
    Bytes const sizes = highest - lowest;
    std::array<int, kFans> squares;
    for (std::size_t i = 0; i != squares.size(); ++i) {
        squares[i] = 0;
        for (std::size_t k = 4 * i; k != 4 * i + 4; ++k)
            squares[i] += sizes[k] * sizes[k];
    }
    return squares;
}

}
