#include <Modeling/smooth.h>

#include "PointParts.h"

#include "frame/Arrays.h"
#include "frame/Assert.h"
#include "frame/Lanes.h"
#include "host/MeshArrays.h"

#include <TessaraMathSupport/Stepper.h>

#include <algorithm>
#include <atomic>
#include <cmath>
#include <limits>
#include <span>
#include <vector>

namespace Geometry::Mesh {

using namespace Modeling;
using namespace Modeling::Internal;
using Tessara::Math::float3;

namespace {

    /// What a triangle contributes to a point in a step.
    struct Sample {
        Lanes normal; // not normalized
        Lanes centroid;
    };

    /// Never reset between steps: targets and normals are means over all steps so far, and existing scenes depend on
    /// it.
    struct PointSums {
        Lanes normals{};
        Lanes centroids{};
    };

    /// What is found before the first step, and what the steps add up. Each part has entries for its points, and one
    /// behind them for all other points.
    struct Smoothing {
        FaceView mesh;
        PointParts parts;
        Orvan::Array<unsigned char> isRepeated; // see `findRepeatedCorners`
        Orvan::Array<PointSums> sums;
        IndexArray sampleCounts;

        static std::size_t entryOf(unsigned int point, std::size_t part) { return point + part; }
    };

    [[maybe_unused]] bool hasFaces(unsigned int faceCount, IndexArray const& faceVertex, IndexArray const& faceOffset)
    {
        return faceOffset.size > faceCount && isNonDecreasing(faceOffset.data, std::size_t{faceCount} + 1)
            && faceOffset[faceCount] <= faceVertex.size;
    }

    bool hasOnlyTriangles(FaceView const& mesh)
    {
        std::atomic<bool> areTriangles = true;
        // Any thread may clear the flag, which is read after the loop.
        parallelFor(tbb::blocked_range<unsigned int>(0, mesh.count, kElementGrain), [&](auto const& faces) {
            for (unsigned int face = faces.begin(); face != faces.end(); ++face)
                if (mesh.size(face) != 3)
                    return areTriangles.store(false, std::memory_order_relaxed);
        });
        return areTriangles.load(std::memory_order_relaxed);
    }

    void markRepeated(
        std::span<unsigned int const> points, std::vector<unsigned int>& sorted, unsigned char* isRepeated)
    {
        sorted.assign(points.begin(), points.end());
        std::sort(sorted.begin(), sorted.end());
        std::fill_n(isRepeated, points.size(), points.size() == 1);
        if (std::adjacent_find(sorted.begin(), sorted.end()) == sorted.end())
            return;
        for (std::size_t k = 0; k != points.size(); ++k) {
            auto const [first, last] = std::equal_range(sorted.begin(), sorted.end(), points[k]);
            isRepeated[k] = last - first > 1;
        }
    }

    /// Tells for each corner whether its face has the point at another corner too, or no other corner: then the point
    /// is not simply at two edges of the face. Empty if all faces are triangles, whose points need no distinction.
    Orvan::Array<unsigned char> findRepeatedCorners(FaceView const& mesh)
    {
        if (hasOnlyTriangles(mesh))
            return {};
        Orvan::Array<unsigned char> isRepeated = uninitializedArray<unsigned char>(mesh.offsets.begin(mesh.count));
        // Each face writes the entries of its corners.
        parallelFor(tbb::blocked_range<unsigned int>(0, mesh.count, kFaceGrain), [&](auto const& faces) {
            std::vector<unsigned int> sorted;
            for (unsigned int face = faces.begin(); face != faces.end(); ++face)
                markRepeated(
                    mesh.offsets.part(face, mesh.faceVertex), sorted, isRepeated.data + mesh.offsets.begin(face));
        });
        return isRepeated;
    }

    Smoothing prepareSmoothing(FaceView const& mesh, unsigned int pointCount)
    {
        Smoothing smoothing{mesh, dividePoints(mesh, pointCount), findRepeatedCorners(mesh), {}, {}};
        std::uint64_t const entryCount = pointCount + smoothing.parts.count();
        smoothing.sums = filledArray(entryCount, PointSums{});
        smoothing.sampleCounts = zeroedArray<unsigned int>(entryCount);
        return smoothing;
    }

    // The arithmetic of `VectorMath.h` in the lanes of a register.

    Lanes cross(Lanes a, Lanes b)
    {
        auto const yzx = [](Lanes v) { return __builtin_shufflevector(v, v, 1, 2, 0, 3); };
        auto const zxy = [](Lanes v) { return __builtin_shufflevector(v, v, 2, 0, 1, 3); };
        return yzx(a) * zxy(b) - zxy(a) * yzx(b);
    }

    float dot(Lanes a, Lanes b)
    {
        Lanes const products = a * b;
        return (products[0] + products[1]) + products[2];
    }

    Lanes safeNormalize(Lanes v)
    {
        float const norm = std::sqrt(dot(v, v));
        return norm > std::numeric_limits<float>::min() ? v * (1.0f / norm) : v;
    }

    Sample sampleOf(Lanes a, Lanes b, Lanes c)
    {
        return {cross(b - a, c - a), ((b + a) + c) / 3.0f};
    }

    /// Adds samples to the points of one part. Those of other points go to the entry behind, which nobody reads, so
    /// that the faces between two parts need no branch.
    class PartAdder {
    public:
        PartAdder(Smoothing const& smoothing, std::size_t part)
            : firstPoint_(smoothing.parts.firstPoint(part))
            , pointCount_(smoothing.parts.endPoint(part) - firstPoint_)
            , sums_(smoothing.sums.data + Smoothing::entryOf(firstPoint_, part))
            , sampleCounts_(smoothing.sampleCounts.data + Smoothing::entryOf(firstPoint_, part))
        {
        }

        bool contains(unsigned int point) const { return point - firstPoint_ < pointCount_; }

        void add(unsigned int point, Sample const& sample) const
        {
            unsigned int const entry = std::min(point - firstPoint_, pointCount_);
            sums_[entry].normals += sample.normal;
            sums_[entry].centroids += sample.centroid;
            ++sampleCounts_[entry];
        }

    private:
        unsigned int firstPoint_;
        unsigned int pointCount_;
        PointSums* sums_;
        unsigned int* sampleCounts_;
    };

    void addTriangle(unsigned int const* corner, float3 const* position, PartAdder const& adder)
    {
        Sample const sample = sampleOf(load(position[corner[0]]), load(position[corner[1]]), load(position[corner[2]]));
        adder.add(corner[0], sample);
        adder.add(corner[1], sample);
        adder.add(corner[2], sample);
    }

    /// A polygon as the fan of triangles between its edges and the mean of its corners.
    class FanOfPolygon {
    public:
        FanOfPolygon(std::span<unsigned int const> corners, unsigned char const* isRepeated, float3 const* position)
            : corners_(corners)
            , isRepeated_(isRepeated)
            , position_(position)
        {
            for (unsigned int const point : corners)
                mean_ += load(position[point]) / static_cast<float>(corners.size());
        }

        /// Adds each triangle to the two points at its edge, but for repeated ones.
        /// \return whether there are repeated points
        bool addToSinglePoints(PartAdder const& adder) const
        {
            bool hasRepeated = false;
            for (std::size_t k = 0; k != corners_.size(); ++k) {
                Sample const sample = sampleAt(k);
                hasRepeated = hasRepeated || isRepeated_[k];
                for (std::size_t const end : {k, next(k)})
                    if (!isRepeated_[end])
                        adder.add(corners_[end], sample);
            }
            return hasRepeated;
        }

        /// Adds to each repeated point, as often as it is repeated, all triangles at it.
        void addToRepeatedPoints(PartAdder const& adder) const
        {
            for (std::size_t k = 0; k != corners_.size(); ++k) {
                unsigned int const point = corners_[k];
                if (!isRepeated_[k] || !adder.contains(point))
                    continue;
                for (std::size_t edge = 0; edge != corners_.size(); ++edge)
                    if (corners_[edge] == point || corners_[next(edge)] == point)
                        adder.add(point, sampleAt(edge));
            }
        }

    private:
        std::size_t next(std::size_t k) const { return k + 1 == corners_.size() ? 0 : k + 1; }

        Sample sampleAt(std::size_t edge) const
        {
            return sampleOf(mean_, load(position_[corners_[edge]]), load(position_[corners_[next(edge)]]));
        }

        std::span<unsigned int const> corners_;
        unsigned char const* isRepeated_;
        float3 const* position_;
        Lanes mean_{};
    };

    void addFacesOfPart(Smoothing const& smoothing, std::size_t part, float3 const* position)
    {
        FaceView const& mesh = smoothing.mesh;
        PartAdder const adder(smoothing, part);
        for (unsigned int const face : smoothing.parts.facesOf(part)) {
            if (mesh.size(face) == 3) {
                addTriangle(mesh.corners(face), position, adder);
                continue;
            }
            FanOfPolygon const fan(mesh.offsets.part(face, mesh.faceVertex),
                smoothing.isRepeated.data + mesh.offsets.begin(face), position);
            if (fan.addToSinglePoints(adder))
                fan.addToRepeatedPoints(adder);
        }
    }

    Lanes moveOf(PointSums const& sums, unsigned int sampleCount, Lanes position, float increment)
    {
        Lanes const normal = safeNormalize(sums.normals);
        Lanes const target = sums.centroids / static_cast<float>(sampleCount);
        Lanes const move = (target - position) * increment;
        return move - normal * dot(normal, move);
    }

    void movePointsOfPart(Smoothing const& smoothing, std::size_t part, Tessara::Math::Stepper const& stepper,
        float const* weight, float3* position)
    {
        for (unsigned int point = smoothing.parts.firstPoint(part); point != smoothing.parts.endPoint(part); ++point) {
            std::size_t const entry = Smoothing::entryOf(point, part);
            Lanes const old = load(position[point]);
            Lanes move = moveOf(smoothing.sums[entry], smoothing.sampleCounts[entry], old, stepper.increment());
            if (weight) {
                float const atLeast0 = 0.0f > weight[point] ? 0.0f : weight[point];
                move *= atLeast0 > 1.0f ? 1.0f : atLeast0;
            }
            Lanes const moved = old + move;
            position[point] = {moved[0], moved[1], moved[2]};
        }
    }

    /// Calls `work(part)` for each part of the points.
    template <class Work> void forEachPart(Smoothing const& smoothing, Work const& work)
    {
        tbb::blocked_range<std::size_t> const all(0, smoothing.parts.count(), kCoarseGrain);
        parallelFor(all, [&](auto const& parts) {
            for (std::size_t part = parts.begin(); part != parts.end(); ++part)
                work(part);
        });
    }

}

template <class Logger> void smooth(float amount, unsigned int pointCount, unsigned int faceCount,
    IndexArray const& faceVertex, IndexArray const& faceOffset, Orvan::Array<float> const* weights,
    Orvan::Array<float3>& positions, Logger const& logger)
{
    Tessara::Math::Stepper stepper(amount, 0.9f);
    if (!stepper)
        return;
    MODELING_ASSERT(positions.size >= pointCount && (!weights || weights->size >= pointCount));
    MODELING_ASSERT(faceCount == 0 || hasFaces(faceCount, faceVertex, faceOffset));
    FaceView const mesh{faceVertex.data, faceOffset, faceCount};
    Smoothing const smoothing = prepareSmoothing(mesh, pointCount);
    float const* const weight = weights ? weights->data : nullptr;
    for (; stepper; stepper.step(logger)) {
        // Each part adds to the sums of its own points while positions do not change, then moves these points.
        forEachPart(smoothing, [&](std::size_t part) { addFacesOfPart(smoothing, part, positions.data); });
        forEachPart(
            smoothing, [&](std::size_t part) { movePointsOfPart(smoothing, part, stepper, weight, positions.data); });
    }
}

template MODELING_EXPORT void smooth(float, unsigned int, unsigned int, IndexArray const&, IndexArray const&,
    Orvan::Array<float> const*, Orvan::Array<float3>&, CoreGL::OrvanLogger const&);
template MODELING_EXPORT void smooth(float, unsigned int, unsigned int, IndexArray const&, IndexArray const&,
    Orvan::Array<float> const*, Orvan::Array<float3>&, CoreGL::ConsoleLogger const&);
template MODELING_EXPORT void smooth(float, unsigned int, unsigned int, IndexArray const&, IndexArray const&,
    Orvan::Array<float> const*, Orvan::Array<float3>&, CoreGL::NOPLogger const&);

}
