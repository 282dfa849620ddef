#include "cutQuads.h"

#include "PolygonPlane.h"

#include <TessaraSpatial/SpatialQuery.h>

#include <array>
#include <bit>
#include <cstdint>
#include <cstring>

namespace Modeling::Internal {

namespace {

    constexpr unsigned int kNone = 4;

    constexpr unsigned int next(unsigned int corner)
    {
        return (corner + 1) % 4;
    }
    constexpr unsigned int opposite(unsigned int corner)
    {
        return (corner + 2) % 4;
    }
    constexpr unsigned int previous(unsigned int corner)
    {
        return (corner + 3) % 4;
    }

    IntLanes lanesOf(unsigned int value)
    {
        return IntLanes{} + static_cast<std::int32_t>(value);
    }

    // One value per corner; each lane belongs to one quad.
    template <class T> using PerCorner = std::array<T, 4>;

    /// Corners of four quads that have one number.
    LaneVectors cornersOf(float3 const* corners)
    {
        Lanes const a = load(corners[0]), b = load(corners[4]), c = load(corners[8]), d = load(corners[12]);
        Lanes const abXY = __builtin_shufflevector(a, b, 0, 4, 1, 5), cdXY = __builtin_shufflevector(c, d, 0, 4, 1, 5);
        Lanes const abZ = __builtin_shufflevector(a, b, 2, 6, 3, 7), cdZ = __builtin_shufflevector(c, d, 2, 6, 3, 7);
        return {__builtin_shufflevector(abXY, cdXY, 0, 1, 4, 5), __builtin_shufflevector(abXY, cdXY, 2, 3, 6, 7),
            __builtin_shufflevector(abZ, cdZ, 0, 1, 4, 5)};
    }

    LaneVectors select(IntLanes mask, LaneVectors const& a, LaneVectors const& b)
    {
        return {mask ? a.x : b.x, mask ? a.y : b.y, mask ? a.z : b.z};
    }
    LanePoints select(IntLanes mask, LanePoints const& a, LanePoints const& b)
    {
        return {mask ? a.x : b.x, mask ? a.y : b.y};
    }

    /// For each quad, the value of the corner that is `steps` after `corner`.
    template <class T> T valueAfter(IntLanes corner, unsigned int steps, PerCorner<T> const& values)
    {
        IntLanes const isOdd = (corner & 1) != 0, isHigh = (corner & 2) != 0;
        auto const at = [&](unsigned int i) -> T const& { return values[(i + steps) % 4]; };
        return select(isHigh, select(isOdd, at(3), at(2)), select(isOdd, at(1), at(0)));
    }

    /// Points of four quads in memory, for the host's predicates, which take one at a time.
    struct StoredPoints {
        float x[4], y[4];

        explicit StoredPoints(LanePoints const& points)
        {
            store(points.x, x);
            store(points.y, y);
        }
        float2 operator[](unsigned int quad) const { return {x[quad], y[quad]}; }
    };

    /// The sharpness of corners b if the path from a via b to c makes a strict counter-clockwise turn, otherwise `kNoEar`.
    Lanes sharpnessOfTurns(Lanes sharpness, StoredPoints const& a, StoredPoints const& b, StoredPoints const& c)
    {
        float values[4];
        store(sharpness, values);
        for (unsigned int quad = 0; quad != 4; ++quad) // compilers use lanes if the host's predicate is inline
            values[quad] = isCounterClockwise(a[quad], b[quad], c[quad]) ? values[quad] : kNoEar;
        return load(values);
    }

    /// The quads in which p is in the bounding box of the triangle a, b, c.
    IntLanes areInBox(LanePoints const& p, LanePoints const& a, LanePoints const& b, LanePoints const& c)
    {
        return (p.x >= min(min(a.x, b.x), c.x)) & (p.x <= max(max(a.x, b.x), c.x)) & (p.y >= min(min(a.y, b.y), c.y))
            & (p.y <= max(max(a.y, b.y), c.y));
    }

    /// The sharpest corners, up to `kSharper` in favor of earlier ones.
    struct Sharpest {
        IntLanes corner = lanesOf(kNone); // `kNone` if no corner is an ear
        PerCorner<IntLanes> wasBest; // at some time of the search: other corners have no influence on the result

        explicit Sharpest(PerCorner<Lanes> const& sharpness)
        {
            Lanes sharpest = broadcast(kNoEar);
            for (unsigned int i = 0; i != 4; ++i) {
                wasBest[i] = sharpest > sharpness[i] + kSharper;
                sharpest = wasBest[i] ? sharpness[i] : sharpest;
                corner = wasBest[i] ? lanesOf(i) : corner;
            }
        }
    };

    /// For an ear and the second ear to be cut, the corners of both triangles.
    using Cut = std::array<unsigned int, 6>;
    constexpr std::array<Cut, 16> kCuts = [] {
        std::array<Cut, 16> cuts{};
        for (unsigned int ear = 0; ear != 4; ++ear)
            for (unsigned int last = 0; last != 4; ++last) {
                unsigned int const before = previous(ear), after = next(ear);
                cuts[4 * ear + last] = {before, ear, after, previous(last) == ear ? before : previous(last), last,
                    next(last) == ear ? after : next(last)};
            }
        return cuts;
    }();

    /// Four quads whose ears are being clipped.
    class Quads {
    public:
        explicit Quads(std::span<float3 const, 16> corners)
        {
            for (unsigned int i = 0; i != 4; ++i)
                positions_[i] = cornersOf(&corners[i]);
            LaneVectors const normal = newellNormal(std::span<LaneVectors const>(positions_));
            Lanes const squaredLength = dot(normal, normal);
            isFlat_ = broadcast(kFlat) > squaredLength;
            BasicQuaternion<Lanes> const rotation = rotationOf(normal, squaredLength);
            // The processor computes the directions while it waits for the roots and quotients of the rotation.
            for (unsigned int i = 0; i != 4; ++i)
                directions_[i] = safeNormalize(positions_[next(i)] - positions_[i]);
            for (unsigned int i = 0; i != 4; ++i)
                projected_[i] = rotateAndDropZ<LanePoints>(rotation, positions_[i]);
        }

        unsigned int cut(std::span<unsigned int, 24> triangles) const
        {
            PerCorner<Lanes> const sharpness = measureCorners();
            Sharpest const first(sharpness);
            Sharpest const second(measureRest(first.corner, sharpness));

            IntLanes const pair = first.corner * 4 + second.corner;
            for (unsigned int quad = 0; quad != 4; ++quad)
                std::memcpy(&triangles[6 * quad], &kCuts[static_cast<unsigned int>(pair[quad]) % 16], sizeof(Cut));
            IntLanes const isCut = (first.corner < lanesOf(kNone)) & (second.corner < lanesOf(kNone)) & ~isFlat_;
            return bitsOf(isCut) & ~findBlocked(first, second);
        }

    private:
        /// The sharpness of each corner, if it makes a counter-clockwise turn; it may contain the opposite corner.
        PerCorner<Lanes> measureCorners() const
        {
            PerCorner<StoredPoints> const points{StoredPoints(projected_[0]), StoredPoints(projected_[1]),
                StoredPoints(projected_[2]), StoredPoints(projected_[3])};
            PerCorner<Lanes> sharpness;
            for (unsigned int i = 0; i != 4; ++i)
                sharpness[i] = sharpnessOfTurns(sharpnessBetween(directions_[previous(i)], directions_[i]),
                    points[previous(i)], points[i], points[next(i)]);
            return sharpness;
        }

        /// The sharpness of the corners of the triangles that remain without the ears. The corner opposite the ear has
        /// kept its neighbors, so its sharpness still holds.
        PerCorner<Lanes> measureRest(IntLanes ear, PerCorner<Lanes> const& sharpness) const
        {
            LaneVectors const cut = safeNormalize(valueAfter(ear, 1, positions_) - valueAfter(ear, 3, positions_));
            StoredPoints const after(valueAfter(ear, 1, projected_)), across(valueAfter(ear, 2, projected_)),
                before(valueAfter(ear, 3, projected_));
            Lanes const sharpnessBefore =
                sharpnessOfTurns(sharpnessBetween(valueAfter(ear, 2, directions_), cut), across, before, after);
            Lanes const sharpnessAfter =
                sharpnessOfTurns(sharpnessBetween(cut, valueAfter(ear, 1, directions_)), before, after, across);
            PerCorner<Lanes> rest;
            for (unsigned int i = 0; i != 4; ++i) {
                Lanes const ofNeighbors = ear == lanesOf(next(i)) ? sharpnessBefore : sharpnessAfter;
                Lanes const ofEarAndOpposite = ear == lanesOf(i) ? broadcast(kNoEar) : sharpness[i];
                rest[i] = (ear & 1) == lanesOf(i % 2) ? ofEarAndOpposite : ofNeighbors;
            }
            return rest;
        }

        /// Bit q is set if in quad q, a corner that has influenced the result contains its opposite, and so is no ear.
        unsigned int findBlocked(Sharpest const& first, Sharpest const& second) const
        {
            unsigned int doubtful = 0; // bit 4 i + q: corner i of quad q
            for (unsigned int i = 0; i != 4; ++i) {
                IntLanes const hasInfluence =
                    first.wasBest[i] | (second.wasBest[i] & (first.corner == lanesOf(opposite(i))));
                doubtful |= bitsOf(hasInfluence
                                & areInBox(projected_[opposite(i)], projected_[previous(i)], projected_[i],
                                    projected_[next(i)]))
                    << 4 * i;
            }
            unsigned int blocked = 0;
            for (; doubtful != 0; doubtful &= doubtful - 1) {
                auto const bit = static_cast<unsigned int>(std::countr_zero(doubtful));
                blocked |= static_cast<unsigned int>(containsOpposite(bit / 4, bit % 4)) << bit % 4;
            }
            return blocked;
        }

        bool containsOpposite(unsigned int corner, unsigned int quad) const
        {
            auto const point = [&](unsigned int i) { return float2{projected_[i].x[quad], projected_[i].y[quad]}; };
            float u, v, w;
            return Tessara::SpatialQuery::pointInTriangle(
                point(opposite(corner)), point(previous(corner)), point(corner), point(next(corner)), u, v, w, nullptr);
        }

        PerCorner<LaneVectors> positions_, directions_;
        PerCorner<LanePoints> projected_;
        IntLanes isFlat_;
    };

}

unsigned int cutQuads(std::span<float3 const, 16> corners, std::span<unsigned int, 24> triangles)
{
    return Quads(corners).cut(triangles);
}

}
