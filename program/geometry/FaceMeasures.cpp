#include "FaceMeasures.h"

#include "TriangleBatch.h"
#include "sumOverBlocks.h"

#include <algorithm>
#include <functional>

namespace ModelingProgram {

namespace {

    constexpr std::size_t kBatch = TriangleBatch::kSize;
    template <class T> using BatchValues = TriangleBatch::Values<T>;

    /// Calls `measure(face, count)` for batches of some faces.
    template <class Measure> void forEachBatch(std::size_t begin, std::size_t end, Measure const& measure)
    {
        for (; begin < end; begin += kBatch)
            measure(static_cast<unsigned int>(begin), std::min(kBatch, end - begin));
    }

    /// Some faces between phases: each phase alone runs without waiting for the slow divisions and square roots.
    struct MeasuredBatch {
        BatchValues<double> x, y, z; // of the area vectors
        BatchValues<double> areas; // twice
        BatchValues<double> volumes; // six times

        void set(std::size_t i, double3 const& vector, double volume)
        {
            x[i] = vector.x;
            y[i] = vector.y;
            z[i] = vector.z;
            volumes[i] = volume;
        }

        void measure(TriangleBatch const& at, double3 const& origin)
        {
            for (std::size_t i = 0; i != kBatch; ++i) {
                double3 const first{at.x[0][i], at.y[0][i], at.z[0][i]};
                double3 const vector = cross(double3{at.x[1][i], at.y[1][i], at.z[1][i]} - first,
                    double3{at.x[2][i], at.y[2][i], at.z[2][i]} - first);
                set(i, vector, dot(first - origin, vector));
            }
        }

        void measure(MeshArrays const& mesh, unsigned int begin, std::size_t count, double3 const& origin)
        {
            float3 const* const position = mesh.positions->data;
            for (std::size_t i = 0; i != count; ++i) {
                auto const corners = mesh.corners(begin + static_cast<unsigned int>(i));
                double3 const vector = areaVector(corners, position);
                set(i, vector, corners.empty() ? 0 : dot(inDoubles(position[corners[0]]) - origin, vector));
            }
        }

        void finish()
        {
            for (std::size_t i = 0; i != kBatch; ++i) {
                areas[i] = length({x[i], y[i], z[i]});
                volumes[i] /= 6;
            }
        }

        void setNormals(std::size_t count, CompactNormal* normals) const
        {
            BatchValues<CompactNormal> batch;
            for (std::size_t i = 0; i != kBatch; i += CompactNormal::kLanes)
                CompactNormal::set(&x[i], &y[i], &z[i], &areas[i], &batch[i]);
            std::copy_n(batch.data(), count, normals);
        }
    };

    /// Finds the edge ranges of faces, and calls `visit(edges)`, except for triangles that are no sliver by far.
    template <class Visit>
    void forEachPossibleSliver(TriangleBatch const& triangles, std::size_t count, float ratio, Visit const& visit)
    {
        BatchValues<float> shortest, longest;
        triangles.findEdgeRanges(shortest, longest);
        int any = 0;
        for (std::size_t i = 0; i != kBatch; ++i)
            any |= isNoSliverByFar({shortest[i], longest[i]}, ratio) ? 0 : 1;
        if (any != 0)
            for (std::size_t i = 0; i != count; ++i)
                visit(EdgeRange{shortest[i], longest[i]});
    }

    std::uint64_t countSlivers(MeshArrays const& mesh, unsigned int begin, std::size_t count, float ratio)
    {
        std::uint64_t slivers = 0;
        for (std::size_t i = 0; i != count; ++i) {
            auto const corners = mesh.corners(begin + static_cast<unsigned int>(i));
            slivers += isSliver(squaredEdgeRange(corners, mesh.positions->data), ratio) ? 1u : 0u;
        }
        return slivers;
    }

}

FaceMeasures measureFaces(MeshArrays const& mesh, double3 const& origin, float sliverRatio, CompactNormal* normals)
{
    return sumOverBlocks<FaceMeasures>(mesh.faceCount(), [&](std::size_t blockBegin, std::size_t blockEnd) {
        FaceMeasures sum;
        TriangleBatch triangles;
        MeasuredBatch measured{};
        forEachBatch(blockBegin, blockEnd, [&](unsigned int begin, std::size_t count) {
            if (areTriangles(mesh, begin, begin + static_cast<unsigned int>(count))) {
                triangles.gather(mesh, begin, count);
                measured.measure(triangles, origin);
                if (sliverRatio > 0)
                    forEachPossibleSliver(triangles, count, sliverRatio,
                        [&](EdgeRange const& edges) { sum.sliverCount += isSliver(edges, sliverRatio) ? 1u : 0u; });
            } else {
                measured.measure(mesh, begin, count, origin);
                if (sliverRatio > 0)
                    sum.sliverCount += countSlivers(mesh, begin, count, sliverRatio);
            }
            measured.finish();
            measured.setNormals(count, normals + begin);
            for (std::size_t i = 0; i != count; ++i) { // in this order, which the bits of the sums depend on
                sum.area += measured.areas[i] / 2;
                sum.volume += measured.volumes[i];
            }
        });
        return sum;
    });
}

std::vector<std::uint64_t> countSlivers(MeshArrays const& mesh, std::vector<float> const& ratios)
{
    struct Counts : std::vector<std::uint64_t> {
        Counts& operator+=(Counts const& other)
        {
            resize(std::max(size(), other.size()));
            std::transform(other.begin(), other.end(), begin(), begin(), std::plus<>());
            return *this;
        }
    };
    float const largest = ratios.empty() ? 0 : *std::max_element(ratios.begin(), ratios.end());
    Counts counts = sumOverBlocks<Counts>(mesh.faceCount(), [&](std::size_t blockBegin, std::size_t blockEnd) {
        Counts found;
        found.resize(ratios.size());
        TriangleBatch triangles;
        forEachBatch(blockBegin, blockEnd, [&](unsigned int begin, std::size_t count) {
            if (areTriangles(mesh, begin, begin + static_cast<unsigned int>(count))) {
                triangles.gather(mesh, begin, count);
                forEachPossibleSliver(triangles, count, largest, [&](EdgeRange const& edges) {
                    for (std::size_t i = 0; i != ratios.size(); ++i)
                        found[i] += isSliver(edges, ratios[i]) ? 1u : 0u;
                });
            } else
                for (std::size_t i = 0; i != ratios.size(); ++i)
                    found[i] += countSlivers(mesh, begin, count, ratios[i]);
        });
        return found;
    });
    counts.resize(ratios.size());
    return counts;
}

}
