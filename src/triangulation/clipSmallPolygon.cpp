#include "clipSmallPolygon.h"

#include "frame/Assert.h"

#include <TessaraGeometry/Names.h>
#include <TessaraSpatial/SpatialQuery.h>

#include <algorithm>
#include <bit>
#include <cstdint>

namespace Modeling::Internal {

using Tessara::Geometry::kInvalidIndex;

namespace {

    /// A set of corners: bit i for corner i.
    using Corners = std::uint32_t;

    /// One value per corner in a ring: the entry before the first corner is that of the last one, and the entry behind
    /// the last corner is that of the first. So loops over all corners find both neighbors without branches.
    template <class T> class RingValues {
    public:
        T& operator[](std::size_t corner) { return entries_[corner + 1]; }
        T const& operator[](std::size_t corner) const { return entries_[corner + 1]; }
        T const* previous() const { return entries_; }
        T const* current() const { return entries_ + 1; }
        T const* next() const { return entries_ + 2; }

        void close(std::size_t count)
        {
            entries_[0] = entries_[count];
            entries_[count + 1] = entries_[1];
        }

    private:
        T entries_[kSmallPolygon + 2 + 4]; // lanes may begin at the last one
    };

    struct RingVectors {
        RingValues<float> x, y, z;

        void close(std::size_t count)
        {
            x.close(count);
            y.close(count);
            z.close(count);
        }
    };

    LaneVectors loadVectors(float const* x, float const* y, float const* z)
    {
        return {load(x), load(y), load(z)};
    }

    class SmallPolygon {
    public:
        SmallPolygon(std::span<float3 const> positions, Quaternion const& rotation)
            : positions_(positions)
            , count_(static_cast<unsigned int>(positions.size()))
            , live_((Corners{1} << count_) - 1)
        {
            project(rotation);
            measureCorners();
            for (unsigned int i = 0; i != count_; ++i) {
                previous_[i] = (i == 0 ? count_ : i) - 1;
                next_[i] = i + 1 == count_ ? 0 : i + 1;
                others_[i] = live_;
            }
        }

        bool run(std::span<unsigned int> triangles)
        {
            for (std::size_t triangle = 0;; ++triangle) {
                unsigned int const ear = nextEar();
                if (ear == kInvalidIndex)
                    return false;
                triangles[3 * triangle] = previous_[ear];
                triangles[3 * triangle + 1] = ear;
                triangles[3 * triangle + 2] = next_[ear];
                if (triangle + 3 == count_)
                    return true;
                clip(ear);
            }
        }

    private:
        float2 projected(unsigned int i) const { return {projectedX_[i], projectedY_[i]}; }

        void project(Quaternion const& rotation)
        {
            RingVectors positions{}; // in spare lanes, arithmetic on other values might be slow
            for (unsigned int i = 0; i != count_; ++i) {
                positions.x[i] = positions_[i].x;
                positions.y[i] = positions_[i].y;
                positions.z[i] = positions_[i].z;
            }
            positions.close(count_);
            BasicQuaternion<Lanes> const rotations{
                broadcast(rotation.x), broadcast(rotation.y), broadcast(rotation.z), broadcast(rotation.w)};
            for (unsigned int i = 0; i < count_; i += 4) {
                LaneVectors const current = loadVectors(&positions.x[i], &positions.y[i], &positions.z[i]);
                LaneVectors const next = loadVectors(&positions.x[i + 1], &positions.y[i + 1], &positions.z[i + 1]);
                auto const points = rotateAndDropZ<LanePoints>(rotations, current);
                store(points.x, &projectedX_[i]);
                store(points.y, &projectedY_[i]);
                LaneVectors const directions = safeNormalize(next - current);
                store(directions.x, &toNext_.x[i]);
                store(directions.y, &toNext_.y[i]);
                store(directions.z, &toNext_.z[i]);
            }
            projectedX_.close(count_);
            projectedY_.close(count_);
            toNext_.close(count_);
        }

        void measureCorners()
        {
            for (unsigned int i = 0; i < count_; i += 4) {
                LaneVectors const entering =
                    loadVectors(toNext_.x.previous() + i, toNext_.y.previous() + i, toNext_.z.previous() + i);
                LaneVectors const leaving =
                    loadVectors(toNext_.x.current() + i, toNext_.y.current() + i, toNext_.z.current() + i);
                store(sharpnessBetween(entering, leaving), sharpness_ + i);
            }
            float const *const x = projectedX_.previous(), *const y = projectedY_.previous();
            for (unsigned int i = 0; i != count_; ++i) {
                bool const isTurn = isCounterClockwise({x[i], y[i]}, {x[i + 1], y[i + 1]}, {x[i + 2], y[i + 2]});
                sharpness_[i] = isTurn ? sharpness_[i] : kNoEar;
            }
            std::fill(sharpness_ + count_, sharpness_ + kSmallPolygon, kNoEar);
        }

        /// The sharpest ear, up to `kSharper` in favor of earlier ones; `kInvalidIndex` if there is none.
        unsigned int nextEar()
        {
            for (;;) {
                float const sharpest = lowestSharpness();
                if (sharpest == kNoEar)
                    return kInvalidIndex;
                // The search in order ends at the sharpest ear if all others are displaced by it.
                Corners const candidates = cornersUpTo(sharpest + kSharper);
                if ((candidates & (candidates - 1)) != 0) // more than one
                    return nextEarInOrder();
                auto const corner = static_cast<unsigned int>(std::countr_zero(candidates));
                if (isEar(corner))
                    return corner;
            }
        }

        unsigned int nextEarInOrder()
        {
            unsigned int best = kInvalidIndex;
            float sharpest = kNoEar;
            for (unsigned int i = 0; i != count_; ++i)
                // Corners that are not sharper would not change the result, whether they are ears or not.
                if (sharpest > sharpness_[i] + kSharper && isEar(i)) {
                    sharpest = sharpness_[i];
                    best = i;
                }
            return best;
        }

        float lowestSharpness() const
        {
            Lanes lowest = load(sharpness_);
            for (unsigned int i = 4; i < count_; i += 4)
                lowest = min(lowest, load(sharpness_ + i));
            lowest = min(lowest, __builtin_shufflevector(lowest, lowest, 2, 3, 0, 1));
            return std::min(lowest[0], lowest[1]);
        }

        Corners cornersUpTo(float bound) const
        {
            Corners corners = 0;
            for (unsigned int i = 0; i < count_; i += 4)
                corners |= bitsOf(load(sharpness_ + i) <= broadcast(bound)) << i;
            return corners;
        }

        /// Whether a corner with a counter-clockwise turn contains no other one. If it contains one, it remains no ear
        /// until it gets another neighbor.
        bool isEar(unsigned int i)
        {
            if ((ears_ >> i & 1) != 0)
                return true;
            unsigned int const before = previous_[i], after = next_[i];
            float2 const a = projected(before), b = projected(i), c = projected(after);
            Corners others =
                others_[i] & cornersInBox(a, b, c) & ~(Corners{1} << before | Corners{1} << i | Corners{1} << after);
            for (; others != 0; others &= others - 1) {
                float u, v, w;
                if (Tessara::SpatialQuery::pointInTriangle(
                        projected(static_cast<unsigned int>(std::countr_zero(others))), a, b, c, u, v, w, nullptr)) {
                    sharpness_[i] = kNoEar;
                    return false;
                }
            }
            ears_ |= Corners{1} << i;
            return true;
        }

        /// The corners in the bounding box of a triangle, and some beyond the last one.
        Corners cornersInBox(float2 const& a, float2 const& b, float2 const& c) const
        {
            Lanes const minX = broadcast(std::min({a.x, b.x, c.x})), maxX = broadcast(std::max({a.x, b.x, c.x}));
            Lanes const minY = broadcast(std::min({a.y, b.y, c.y})), maxY = broadcast(std::max({a.y, b.y, c.y}));
            Corners corners = 0;
            for (unsigned int i = 0; i < count_; i += 4) {
                Lanes const x = load(projectedX_.current() + i), y = load(projectedY_.current() + i);
                corners |= bitsOf((x >= minX) & (x <= maxX) & (y >= minY) & (y <= maxY)) << i;
            }
            return corners;
        }

        void clip(unsigned int ear)
        {
            unsigned int const before = previous_[ear], after = next_[ear];
            next_[before] = after;
            previous_[after] = before;
            live_ &= ~(Corners{1} << ear);
            sharpness_[ear] = kNoEar;
            float3 const cut = safeNormalize(positions_[after] - positions_[before]);
            toNext_.x[before] = cut.x;
            toNext_.y[before] = cut.y;
            toNext_.z[before] = cut.z;
            updateCorner(before, toNext(previous_[before]), cut);
            updateCorner(after, cut, toNext(after));
        }

        float3 toNext(unsigned int i) const { return {toNext_.x[i], toNext_.y[i], toNext_.z[i]}; }

        /// After one of its neighbors has been clipped.
        void updateCorner(unsigned int i, float3 const& entering, float3 const& leaving)
        {
            bool const isTurn = isCounterClockwise(projected(previous_[i]), projected(i), projected(next_[i]));
            float const sharpness = sharpnessBetween(entering, leaving);
            sharpness_[i] = isTurn ? sharpness : kNoEar;
            others_[i] = live_;
            ears_ &= ~(Corners{1} << i);
        }

        std::span<float3 const> const positions_;
        unsigned int const count_;
        Corners live_;
        Corners ears_ = 0; // corners that are known to be ears
        RingValues<float> projectedX_, projectedY_;
        RingVectors toNext_; // unit vectors along the edges to the next live corners
        // 1 minus the cosine of the angle; infinite for corners that are clipped or known not to be ears.
        alignas(16) float sharpness_[kSmallPolygon];
        unsigned int previous_[kSmallPolygon], next_[kSmallPolygon]; // live corners
        // The corners that were live when the corner got its neighbors: those decide whether it is an ear, even if they
        // have been clipped since.
        Corners others_[kSmallPolygon];
    };

}

bool clipSmallPolygon(std::span<float3 const> corners, Quaternion const& rotation, std::span<unsigned int> triangles)
{
    MODELING_ASSERT(corners.size() > 3 && corners.size() <= kSmallPolygon);
    return SmallPolygon(corners, rotation).run(triangles);
}

}
