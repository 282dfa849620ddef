#include "positionRules.h"

#include <Modeling/subdivisionSteps.h>

#include "frame/Arrays.h"
#include "frame/Assert.h"
#include "frame/VectorMath.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <cmath>

namespace Geometry::Mesh {

using namespace Modeling;
using Tessara::Geometry::kInvalidIndex;

namespace Internal {

    namespace {

        // One step moves a point p of valence n to (1 - β) p + β m, where m is the mean of its neighbors and β the
        // `smoothingWeight`. This multiplies its distance to its limit by λ = 2/3 - β. The limit is (1 - γ) p + γ m,
        // where γ is the `limitWeight`. Both take the cosine of 2π / n.

        float smoothingWeight(float cosine)
        {
            return (4 - (cosine + cosine)) / 9;
        }

        float limitWeight(float cosine)
        {
            float const t = smoothingWeight(cosine) * 3;
            return t / (t + 1);
        }

        float cosineOfSector(float valence)
        {
            return std::cos(6.2831855f / valence);
        }

        /// λ to the power of a number of steps. If the point is younger than the step in question, the number is
        /// negative and wraps around. As λ is below 1/2, the power is then 0: the point is at its limit.
        float remainingWeight(std::uint64_t valence, unsigned int steps)
        {
            constexpr unsigned int kWrapped = 1u << 31;
            if (steps == 0)
                return 1; // the power of any λ, even NaN, without computing λ
            if (steps >= kWrapped && valence != 0)
                return 0;
            float const lambda = 0.6666667f - smoothingWeight(cosineOfSector(static_cast<float>(valence)));
            return std::pow(lambda, static_cast<float>(steps));
        }

        /// Values that are computed when they are first needed, because cosines and powers take longer than everything
        /// else at a point. Threads share a table: all of them would store the same bits.
        template <std::size_t kSize> class LazyTable {
        public:
            LazyTable()
            {
                for (std::atomic<float>& value : values_)
                    value.store(kUnknown, std::memory_order_relaxed);
            }

            template <class Compute> float at(std::size_t index, Compute const& compute)
            {
                float value = values_[index].load(std::memory_order_relaxed);
                if (value == kUnknown) {
                    value = compute();
                    values_[index].store(value, std::memory_order_relaxed);
                }
                return value;
            }

        private:
            static constexpr float kUnknown = 2; // no weight exceeds 1
            std::array<std::atomic<float>, kSize> values_;
        };

        /// `remainingWeight`, from a table for usual valences.
        class RemainingWeights {
        public:
            float at(std::uint64_t valence, unsigned int steps)
            {
                if (valence >= kValences || steps >= kSteps)
                    return remainingWeight(valence, steps);
                return table_.at(valence * kSteps + steps, [=] { return remainingWeight(valence, steps); });
            }

        private:
            static constexpr std::size_t kValences = 16, kSteps = 32;
            LazyTable<kValences * kSteps> table_;
        };

        /// Points at any step, from their base and limit positions.
        struct PointsInTime {
            unsigned int const* valences; // null if they are passed
            float3 const* basePositions;
            float3 const* limitPositions;
            unsigned char const* levels;
            RemainingWeights& weights;

            /// The position a number of steps after the point was created.
            float3 after(unsigned int point, std::uint64_t valence, unsigned int steps) const
            {
                float const weight = weights.at(valence, steps);
                return limitPositions[point] * (1 - weight) + basePositions[point] * weight;
            }
            float3 after(unsigned int point, unsigned int steps) const { return after(point, valences[point], steps); }
            /// Unsigned, so that it wraps around: see `remainingWeight`.
            unsigned int stepsAt(unsigned int point, unsigned int step) const { return step - levels[point]; }
            float3 at(unsigned int point, unsigned int step) const { return after(point, stepsAt(point, step)); }

            float3 center(unsigned int const* corners, unsigned int step) const
            {
                float3 sum{0, 0, 0};
                for (unsigned int k = 0; k != 3; ++k)
                    sum = sum + at(corners[k], step);
                return {sum.x / 3.0f, sum.y / 3.0f, sum.z / 3.0f};
            }
        };

        bool splitsAtStep(unsigned char state, unsigned int step)
        {
            return isSplitAroundPoint(state) && stepOf(state) == step;
        }

        /// The sum of the one-ring that a new point will have after its step: the corners of its face and, across each
        /// edge, the center of the neighbor or, if that is a third, its corner opposite the gate.
        float3 sumOfFutureNeighbors(SettledFaces const& faces, PointsInTime const& points, unsigned int face)
        {
            unsigned int const step = stepOf(faces.states[face]);
            float3 sum{0, 0, 0};
            for (unsigned int k = 0; k != 3; ++k) {
                unsigned int const point = faces.corners(face)[k];
                sum = sum + points.after(point, points.stepsAt(point, step) + 1);
                unsigned int const twin = faces.twins[face][k];
                if (twin == kInvalidIndex)
                    continue;
                unsigned int const across = faceOfTwin(twin);
                if (isThird(faces.states[across]))
                    sum = sum + points.at(faces.pointAcross(face, k), step);
                else if (splitsAtStep(faces.states[across], step))
                    sum = sum + points.basePositions[faces.newPoint(across)]; // the same center
                else
                    sum = sum + points.center(faces.corners(across), step);
            }
            return sum;
        }

        /// γ for valence 6, which all new points have. The cosine is computed at run time, like all others, because
        /// compilers round constants differently.
        float limitWeightOfNewPoint()
        {
            float const volatile sector = 1.0471976f;
            return limitWeight(std::cos(sector));
        }

        /// Calls `work(face, newPoint)` for the faces that get a new point.
        template <class Work> void forEachSplitFace(SettledFaces const& faces, Work const& work)
        {
            // Each face writes the entries of its own new point.
            parallelFor(tbb::blocked_range<unsigned int>(0, faces.newPointCount(), kFaceGrain), [&](auto const& ranks) {
                for (unsigned int rank = ranks.begin(); rank != ranks.end(); ++rank)
                    work(faces.splitFaces[rank], faces.pointCount + rank);
            });
        }

    }

    void computeNewPoints(SettledFaces const& faces, unsigned int const* valences, RefinedPoints const& refined)
    {
        RemainingWeights weights;
        PointsInTime const points{valences, refined.basePositions, refined.limitPositions, refined.levels, weights};
        forEachSplitFace(faces, [&](unsigned int face, unsigned int newPoint) {
            refined.basePositions[newPoint] = points.center(faces.corners(face), stepOf(faces.states[face]));
        });

        // Limit positions need the base positions of adjacent new points, so they take a second loop.
        float const weight = limitWeightOfNewPoint();
        forEachSplitFace(faces, [&](unsigned int face, unsigned int newPoint) {
            unsigned int const* const c = faces.corners(face);
            refined.limitPositions[newPoint] = refined.basePositions[newPoint] * (1 - weight)
                + sumOfFutureNeighbors(faces, points, face) * (weight / 6);
            unsigned int const newest = std::max({refined.levels[c[0]], refined.levels[c[1]], refined.levels[c[2]]});
            refined.levels[newPoint] = static_cast<unsigned char>(newest + 1);
        });
    }

    void computePositions(unsigned int numPoints, unsigned int const* valences, unsigned char const* finestSteps,
        Orvan::Array<float3> const& basePositions, Orvan::Array<float3> const& limitPositions,
        Orvan::Array<unsigned char> const& vertexLevels, Orvan::Array<float3>& positions)
    {
        positions.resize(numPoints, Orvan::kUninitialized);
        RemainingWeights weights;
        PointsInTime const points{valences, basePositions.data, limitPositions.data, vertexLevels.data, weights};
        float3* const position = positions.data;
        // Each point writes its own entry.
        parallelFor(tbb::blocked_range<unsigned int>(0, numPoints, kElementGrain), [&, position](auto const& range) {
            for (unsigned int point = range.begin(); point != range.end(); ++point)
                position[point] = points.at(point, finestSteps[point]);
        });
    }

    void computePositionsInfinity(HalfEdgeDataStructure const& halfEdges, unsigned int numPoints,
        Orvan::Array<float3> const& positions, Orvan::Array<float3>& limitPositions)
    {
        MODELING_ASSERT(positions.size >= numPoints);
        limitPositions.resize(numPoints, Orvan::kUninitialized);
        float3 const* const position = positions.data;
        float3* const limit = limitPositions.data;
        constexpr std::size_t kValences = 32;
        LazyTable<kValences> weights;
        auto const weightOf = [&](std::uint64_t valence) {
            auto const compute = [=] { return limitWeight(cosineOfSector(static_cast<float>(valence))); };
            return valence < kValences ? weights.at(valence, compute) : compute();
        };
        // Each point writes its own entry.
        parallelFor(
            tbb::blocked_range<unsigned int>(0, numPoints, kOneRingGrain), [&, position, limit](auto const& range) {
                for (unsigned int point = range.begin(); point != range.end(); ++point) {
                    float3 sum{0, 0, 0};
                    for (auto const& neighbor : halfEdges.neighbors(point))
                        sum = sum + position[neighbor.point];
                    std::uint64_t const valence = halfEdges.valence(point);
                    float const weight = weightOf(valence);
                    limit[point] = position[point] * (1 - weight) + sum * (weight / static_cast<float>(valence));
                }
            });
    }

    void computePositions(HalfEdgeDataStructure const& halfEdges, unsigned int numPoints,
        Orvan::Array<float3> const& basePositions, Orvan::Array<float3> const& limitPositions,
        Orvan::Array<unsigned char> const& vertexLevels, Orvan::Array<unsigned char> const& faceStates,
        Orvan::Array<float3>& positions)
    {
        MODELING_ASSERT(basePositions.size >= numPoints && limitPositions.size >= numPoints);
        MODELING_ASSERT(vertexLevels.size >= numPoints);
        positions.resize(numPoints, Orvan::kUninitialized);
        RemainingWeights weights;
        PointsInTime const points{nullptr, basePositions.data, limitPositions.data, vertexLevels.data, weights};
        unsigned char const* const state = faceStates.data;
        float3* const position = positions.data;
        // Each point writes its own entry.
        parallelFor(
            tbb::blocked_range<unsigned int>(0, numPoints, kOneRingGrain), [&, state, position](auto const& range) {
                for (unsigned int point = range.begin(); point != range.end(); ++point) {
                    unsigned int finestStep = 0;
                    for (auto const& neighbor : halfEdges.neighbors(point))
                        finestStep = std::max(finestStep, stepOf(state[neighbor.halfEdge.face]));
                    position[point] = points.after(point, halfEdges.valence(point), points.stepsAt(point, finestStep));
                }
            });
    }

}

}
