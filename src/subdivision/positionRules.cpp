#include "positionRules.h"

#include <Modeling/subdivisionSteps.h>

#include "frame/Arrays.h"
#include "frame/VectorMath.h"

#include <algorithm>
#include <cmath>

namespace Geometry::Mesh {

using namespace Modeling;
using Tessara::Geometry::kInvalidIndex;

namespace Internal {

    namespace {

        // One step moves a point of valence n to (1 - β) p + β m, where m is the mean of its neighbours. That brings it
        // closer to its limit by the factor λ; γ is the weight of m in the limit itself.

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

        /// λ raised to a number of steps. A point that is younger than the step asked for has a negative number of
        /// them, which has wrapped around: λ is below 1/2, so that the power is 0, and the point is at its limit.
        float remainingWeight(std::uint64_t valence, unsigned int steps)
        {
            constexpr unsigned int kWrapped = 1u << 31;
            if (steps == 0)
                return 1; // as the power is for any λ, even NaN, but without computing λ
            if (steps >= kWrapped && valence != 0)
                return 0;
            float const lambda = 0.6666667f - smoothingWeight(cosineOfSector(static_cast<float>(valence)));
            return std::pow(lambda, static_cast<float>(steps));
        }

        /// Points at any step, from where they were made and where they go.
        struct PointsInTime {
            HalfEdgeDataStructure const& halfEdges;
            float3 const* basePositions;
            float3 const* limitPositions;
            unsigned char const* levels;

            float3 after(unsigned int point, unsigned int steps) const
            {
                float const weight = remainingWeight(halfEdges.valence(point), steps);
                return limitPositions[point] * (1 - weight) + basePositions[point] * weight;
            }
            /// Unsigned on purpose, see `remainingWeight`.
            unsigned int stepsAt(unsigned int point, unsigned int step) const { return step - levels[point]; }
            float3 at(unsigned int point, unsigned int step) const { return after(point, stepsAt(point, step)); }

            float3 centre(unsigned int const* corners, unsigned int step) const
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

        /// The sum of the points that a new point will have around it after its step: the corners of its face, and
        /// across each edge the middle of the neighbour or, where that is split already, the point across the gate.
        float3 sumOfFutureNeighbours(SettledFaces const& faces, PointsInTime const& points, unsigned int face)
        {
            unsigned int const step = stepOf(faces.states[face]);
            float3 sum{0, 0, 0};
            for (unsigned int k = 0; k != 3; ++k) {
                unsigned int const point = faces.corners(face)[k];
                sum = sum + points.after(point, points.stepsAt(point, step) + 1);
                unsigned int const across = faces.neighbours[face][k];
                if (across == kInvalidIndex)
                    continue;
                if (isThird(faces.states[across]))
                    sum = sum + points.at(faces.pointAcross(face, k), step);
                else if (splitsAtStep(faces.states[across], step))
                    sum = sum + points.basePositions[faces.newPoint(across)]; // which is that middle
                else
                    sum = sum + points.centre(faces.corners(across), step);
            }
            return sum;
        }

        /// γ for valence 6, which all new points have. Its cosine is the run-time library's, as everywhere else:
        /// compilers would round it in their own way.
        float limitWeightOfNewPoint()
        {
            float const volatile sector = 1.0471976f;
            return limitWeight(std::cos(sector));
        }

        /// Calls `work(face)` for the faces that get a point.
        template <class Work> void forEachSplitFace(SettledFaces const& faces, Work const& work)
        {
            // Each face writes the entries of its own new point.
            parallelFor(tbb::blocked_range<unsigned int>(0, faces.faceCount, kFaceGrain), [&](auto const& range) {
                for (unsigned int face = range.begin(); face != range.end(); ++face)
                    if (isSplitAroundPoint(faces.states[face]))
                        work(face);
            });
        }

    }

    void computeNewPoints(SettledFaces const& faces, RefinedPoints const& refined)
    {
        PointsInTime const points{faces.halfEdges, refined.basePositions, refined.limitPositions, refined.levels};
        forEachSplitFace(faces, [&](unsigned int face) {
            refined.basePositions[faces.newPoint(face)] =
                points.centre(faces.corners(face), stepOf(faces.states[face]));
        });

        float const weight = limitWeightOfNewPoint();
        forEachSplitFace(faces, [&](unsigned int face) {
            unsigned int const* const c = faces.corners(face);
            unsigned int const newPoint = faces.newPoint(face);
            refined.limitPositions[newPoint] = refined.basePositions[newPoint] * (1 - weight)
                + sumOfFutureNeighbours(faces, points, face) * (weight / 6);
            unsigned int const newest = std::max({refined.levels[c[0]], refined.levels[c[1]], refined.levels[c[2]]});
            refined.levels[newPoint] = static_cast<unsigned char>(newest + 1);
        });
    }

    void computePositionsInfinity(HalfEdgeDataStructure const& halfEdges, unsigned int numPoints,
        Orvan::Array<float3> const& positions, Orvan::Array<float3>& limitPositions)
    {
        limitPositions.resize(numPoints, Orvan::kUninitialized);
        float3 const* const position = positions.data;
        float3* const limit = limitPositions.data;
        // Each point writes its own entry.
        parallelFor(
            tbb::blocked_range<unsigned int>(0, numPoints, kFaceGrain), [&, position, limit](auto const& range) {
                for (unsigned int point = range.begin(); point != range.end(); ++point) {
                    float3 sum{0, 0, 0};
                    for (auto const& neighbour : halfEdges.neighbours(point))
                        sum = sum + position[neighbour.point];
                    auto const valence = static_cast<float>(halfEdges.valence(point));
                    float const weight = limitWeight(cosineOfSector(valence));
                    limit[point] = position[point] * (1 - weight) + sum * (weight / valence);
                }
            });
    }

    void computePositions(HalfEdgeDataStructure const& halfEdges, unsigned int numPoints,
        Orvan::Array<float3> const& basePositions, Orvan::Array<float3> const& limitPositions,
        Orvan::Array<unsigned char> const& vertexLevels, Orvan::Array<unsigned char> const& faceStates,
        Orvan::Array<float3>& positions)
    {
        positions.resize(numPoints, Orvan::kUninitialized);
        PointsInTime const points{halfEdges, basePositions.data, limitPositions.data, vertexLevels.data};
        unsigned char const* const state = faceStates.data;
        float3* const position = positions.data;
        // Each point writes its own entry.
        parallelFor(
            tbb::blocked_range<unsigned int>(0, numPoints, kFaceGrain), [&, state, position](auto const& range) {
                for (unsigned int point = range.begin(); point != range.end(); ++point) {
                    unsigned int finestStep = 0;
                    for (auto const& neighbour : halfEdges.neighbours(point))
                        finestStep = std::max(finestStep, stepOf(state[neighbour.halfEdge.face]));
                    position[point] = points.at(point, finestStep);
                }
            });
    }

}

}
