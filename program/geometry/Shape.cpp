#include "Shape.h"

#include "ClosedFan.h"
#include "Geometry.h"
#include "SurfaceTree.h"

#include <fmt/format.h>
#include <tbb/blocked_range.h>
#include <tbb/parallel_for.h>
#include <tbb/parallel_reduce.h>

#include <algorithm>
#include <cmath>
#include <functional>
#include <limits>
#include <numbers>
#include <string>

namespace ModelingProgram {

namespace {

    // Relative changes of the shape above these values cause a warning.

    // A mass computed from the mesh would be off by as much; scans and prints are about as accurate.
    constexpr double kVolumeFraction = 0.01;
    // Noise adds a few percent to the area of a scan, and removing it is the purpose of smoothing.
    constexpr double kAreaFraction = 0.05;
    // Visible on a screen that shows the whole mesh: 20 of 1,000 pixels.
    constexpr double kMoveFraction = 0.02;

    // A plate whose volume is a smaller fraction of area times diagonal is thinner than the resolution of single
    // precision: the measured volume is rounding error, and its sign is meaningless.
    constexpr double kFlatFraction = 1e-7;

    /// Calls `sumOf(begin, end)` for blocks of a fixed size in parallel, and adds the results in the order of the
    /// blocks.
    template <class Sum, std::size_t kBlock = 4096, class SumOf>
    Sum sumOverBlocks(std::size_t count, SumOf const& sumOf)
    {
        std::vector<Sum> sums((count + kBlock - 1) / kBlock);
        tbb::parallel_for(tbb::blocked_range<std::size_t>(0, sums.size(), 1), [&](auto const& blocks) {
            for (std::size_t block = blocks.begin(); block != blocks.end(); ++block)
                sums[block] = sumOf(block * kBlock, std::min((block + 1) * kBlock, count));
        });
        Sum total{};
        for (Sum const& sum : sums)
            total += sum;
        return total;
    }

    struct Largest {
        double value = 0;
        Largest& operator+=(Largest const& other)
        {
            value = std::max(value, other.value);
            return *this;
        }
    };

    struct Extent {
        static constexpr double kFar = std::numeric_limits<double>::infinity();
        double3 min{kFar, kFar, kFar};
        double3 max{-kFar, -kFar, -kFar};

        void add(double3 const& p)
        {
            min = lowerCorner(min, p);
            max = upperCorner(max, p);
        }
        Extent& operator+=(Extent const& other)
        {
            add(other.min);
            add(other.max);
            return *this;
        }
    };

    Extent extentOf(MeshArrays const& mesh)
    {
        return sumOverBlocks<Extent>(mesh.pointCount(), [&](std::size_t begin, std::size_t end) {
            Extent extent;
            for (std::size_t point = begin; point != end; ++point)
                extent.add(inDoubles((*mesh.positions)[point]));
            return extent;
        });
    }

    /// The vector areas of faces times two. Those of triangles are computed whenever they are needed: stored, they would
    /// be larger than the triangles. Those of large faces would then be computed once per edge, so they are stored.
    class AreaVectors {
    public:
        explicit AreaVectors(MeshArrays const& mesh)
            : mesh_(mesh)
        {
            if (areTriangles())
                return;
            vectors_.resize(mesh.faceCount());
            tbb::parallel_for(tbb::blocked_range<unsigned int>(0, mesh.faceCount(), 1000), [&](auto const& faces) {
                for (unsigned int face = faces.begin(); face != faces.end(); ++face)
                    vectors_[face] = areaVector(mesh_.corners(face), mesh_.positions->data);
            });
        }

        double3 operator[](std::size_t face) const
        {
            return vectors_.empty() ? areaVector({mesh_.faceVertex->data + 3 * face, 3}, mesh_.positions->data)
                                    : vectors_[face];
        }

    private:
        bool areTriangles() const
        {
            unsigned int const* const offset = mesh_.faceOffset->data;
            return tbb::parallel_reduce(
                tbb::blocked_range<unsigned int>(0, mesh_.faceCount(), 10'000), true,
                [=](auto const& faces, bool areSo) {
                    for (unsigned int face = faces.begin(); areSo && face != faces.end(); ++face)
                        areSo = offset[face] == 3 * face && offset[face + 1] == 3 * (face + 1);
                    return areSo;
                },
                std::logical_and<>());
        }

        MeshArrays const& mesh_;
        std::vector<double3> vectors_; // empty if all faces are triangles
    };

    struct Measures {
        double area = 0;
        double volume = 0;
        Measures& operator+=(Measures const& other)
        {
            area += other.area;
            volume += other.volume;
            return *this;
        }
    };

    /// \param origin  inside or near the mesh: far away, the signed volumes of faces would suffer from cancellation
    Measures measure(MeshArrays const& mesh, AreaVectors const& vectors, double3 const& origin)
    {
        return sumOverBlocks<Measures>(mesh.faceCount(), [&](std::size_t begin, std::size_t end) {
            Measures sum;
            for (std::size_t face = begin; face != end; ++face) {
                auto const corners = mesh.corners(static_cast<unsigned int>(face));
                if (corners.empty())
                    continue;
                double3 const vector = vectors[face];
                sum.area += length(vector) / 2;
                sum.volume += dot(inDoubles((*mesh.positions)[corners[0]]) - origin, vector) / 6;
            }
            return sum;
        });
    }

    /// Classifies edges by the angle between the normals of their faces.
    class Creases {
    public:
        Creases(MeshArrays const& mesh, EdgeSides const& edges, AreaVectors const& vectors, double degrees)
            : mesh_(mesh)
            , edges_(edges)
            , vectors_(vectors)
            , cosine_(std::cos(degrees * std::numbers::pi / 180))
        {
        }

        /// Whether the normals at an edge with two sides differ by more than the angle.
        bool isSharp(std::span<Side const> sides) const
        {
            unsigned int const a = sides[0].corner, b = sides[1].corner;
            return isSharp(a, b, (*mesh_.faceVertex)[a] != (*mesh_.faceVertex)[b]);
        }

        /// The same for an edge of the faces of these corners.
        /// \param areOriented  whether the faces traverse the edge in opposite directions
        bool isSharp(unsigned int cornerOfA, unsigned int cornerOfB, bool areOriented) const
        {
            double3 const a = vectors_[edges_.faceOf(cornerOfA)], b = vectors_[edges_.faceOf(cornerOfB)];
            double const product = areOriented ? dot(a, b) : -dot(a, b);
            double const lengths = std::sqrt(dot(a, a) * dot(b, b));
            return lengths > 0 && product < cosine_ * lengths;
        }

    private:
        MeshArrays const& mesh_;
        EdgeSides const& edges_;
        AreaVectors const& vectors_;
        double cosine_;
    };

    std::uint64_t countFoldOvers(MeshArrays const& mesh, EdgeSides const& edges, AreaVectors const& vectors)
    {
        Creases const creases(mesh, edges, vectors, kFoldOverDegrees);
        return sumOverBlocks<std::uint64_t>(mesh.pointCount(), [&](std::size_t begin, std::size_t end) {
            std::uint64_t count = 0;
            for (auto point = static_cast<unsigned int>(begin); point != end; ++point) {
                if (ClosedFan const fan(mesh, edges, point); fan)
                    fan.forEachHigherEdge(
                        [&](unsigned int a, unsigned int b) { count += creases.isSharp(a, b, true) ? 1u : 0u; });
                else
                    edges.forEachEdge(point, point + 1, [&](unsigned int, std::span<Side const> sides) {
                        count += sides.size() == 2 && creases.isSharp(sides) ? 1u : 0u;
                    });
            }
            return count;
        });
    }

    /// The relative change of a positive quantity; 0 if it was not positive.
    double relativeChange(double before, double after)
    {
        return before > 0 ? (after - before) / before : 0;
    }

    std::string percentOf(double share)
    {
        return fmt::format("{:+.2g} %", share * 100);
    }

    std::vector<std::string> describeChanges(ShapeChange const& change)
    {
        std::vector<std::string> changes;
        auto const& [before, after, largest] = change;
        if (before.volume && after.volume && std::abs(*before.volume) > kFlatFraction * before.area * before.diagonal) {
            double const share = relativeChange(std::abs(*before.volume), std::abs(*after.volume));
            if (*before.volume * *after.volume < 0)
                changes.push_back("the closed surface turned inside out");
            else if (std::abs(share) > kVolumeFraction)
                changes.push_back(fmt::format("the volume by {}", percentOf(share)));
        }
        if (double const share = relativeChange(before.area, after.area); std::abs(share) > kAreaFraction)
            changes.push_back(fmt::format("the area by {}", percentOf(share)));
        if (double const share = before.diagonal > 0 ? largest / before.diagonal : 0; share > kMoveFraction)
            changes.push_back(fmt::format("a point by {:.2g} % of the diagonal of the bounding box", share * 100));
        if (after.foldOvers > before.foldOvers)
            changes.push_back(countOf(after.foldOvers - before.foldOvers, "edge folded over", "edges folded over"));
        return changes;
    }

    void addMeasures(Shape const& shape, Json& values)
    {
        values["volume"] = shape.volume ? numberOf(static_cast<float>(*shape.volume)) : Json();
        values["area"] = numberOf(static_cast<float>(shape.area));
        values["foldOvers"] = shape.foldOvers;
    }

}

Shape shapeOf(MeshArrays const& mesh, EdgeSides const& edges, bool isClosed)
{
    Shape shape;
    if (mesh.pointCount() == 0)
        return shape;
    Extent const extent = extentOf(mesh);
    AreaVectors const vectors(mesh);
    Measures const measures = measure(mesh, vectors, extent.min);
    if (isClosed)
        shape.volume = measures.volume;
    shape.area = measures.area;
    shape.foldOvers = countFoldOvers(mesh, edges, vectors);
    shape.diagonal = length(extent.max - extent.min);
    return shape;
}

ExaminedMesh examine(MeshArrays const& mesh)
{
    EdgeSides const edges(mesh);
    MeshTopology const topology = analyzeTopology(mesh, edges);
    return {topology, shapeOf(mesh, edges, topology.isClosedManifold())};
}

std::vector<unsigned int> sharpPoints(MeshArrays const& mesh, EdgeSides const& edges, double degrees)
{
    AreaVectors const vectors(mesh);
    Creases const creases(mesh, edges, vectors, degrees);
    return edges.pointsOfEdges(
        [&](std::span<Side const> sides) { return sides.size() > 2 || (sides.size() == 2 && creases.isSharp(sides)); });
}

double largestMove(MeshArrays const& before, MeshArrays const& after)
{
    std::size_t const count = std::min(before.pointCount(), after.pointCount());
    return sumOverBlocks<Largest>(count, [&](std::size_t begin, std::size_t end) {
        Largest largest;
        for (std::size_t point = begin; point != end; ++point)
            largest += {length(inDoubles((*after.positions)[point]) - inDoubles((*before.positions)[point]))};
        return largest;
    }).value;
}

double largestDistance(MeshArrays const& before, MeshArrays const& after)
{
    // Most points keep their positions and numbers; the others are looked up in the surface.
    auto const isSame = [](float3 const& a, float3 const& b) { return a.x == b.x && a.y == b.y && a.z == b.z; };
    std::vector<bool> isSettled(before.pointCount(), true); // isolated points are not part of the surface
    for (unsigned int const point : *before.faceVertex)
        isSettled[point] = false;
    std::vector<unsigned int> moved;
    for (unsigned int point = 0; point != before.pointCount(); ++point)
        if (!isSettled[point]
            && !(point < after.pointCount() && isSame((*before.positions)[point], (*after.positions)[point])))
            moved.push_back(point);
    if (moved.empty())
        return 0;
    SurfaceTree const tree(after);
    return std::sqrt(sumOverBlocks<Largest, 64>(moved.size(), [&](std::size_t begin, std::size_t end) {
        Largest largest;
        for (std::size_t i = begin; i != end; ++i)
            largest += {tree.squaredDistance(inDoubles((*before.positions)[moved[i]]))};
        return largest;
    }).value);
}

Json countsAndShape(Tessara::Object const& object)
{
    Json values = countsOf(object);
    if (typeOf(object) == GeometryType::Mesh)
        addMeasures(examine(arraysOf(object)).shape, values);
    return values;
}

void addShape(ShapeChange const& change, Json& before, Json& after)
{
    addMeasures(change.before, before);
    addMeasures(change.after, after);
    before["largestMoveOverDiagonal"] = nullptr;
    double const diagonal = change.before.diagonal;
    after["largestMoveOverDiagonal"] = numberOf(static_cast<float>(diagonal > 0 ? change.largestMove / diagonal : 0));
}

void warnOfShape(ShapeChange const& change, char const* advice, Report& report)
{
    std::vector<std::string> const changes = describeChanges(change);
    if (!changes.empty())
        report.warn(fmt::format("the shape changed: {}. {}", fmt::join(changes, ", "), advice));
}

}
