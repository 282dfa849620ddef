#include "Shape.h"

#include "Creases.h"
#include "FaceMeasures.h"
#include "Geometry.h"
#include "sumOverBlocks.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
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
            min = lowerCorner(min, other.min);
            max = upperCorner(max, other.max);
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

    /// What the faces of a mesh tell, and what finding its fold-overs needs.
    class MeasuredMesh {
    public:
        /// The mesh must outlive it.
        explicit MeasuredMesh(MeshArrays const& mesh, float sliverRatio = 0)
            : mesh_(mesh)
            , extent_(mesh.pointCount() == 0 ? Extent{{}, {}} : extentOf(mesh))
            , normals_(mesh.faceCount(), Orvan::kUninitialized)
            , measures_(measureFaces(mesh, extent_.min, sliverRatio, normals_.data))
        {
        }

        CreasesWithNormals foldOvers() const
        {
            return {{mesh_, kFoldOverDegrees}, normals_.data, CompactNormal::squaredSpreadBelow(kFoldOverDegrees)};
        }
        std::uint64_t sliverCount() const { return measures_.sliverCount; }
        Shape shape(MeshTopology const& topology, std::uint64_t foldOverCount) const
        {
            Shape shape{{}, measures_.area, foldOverCount, length(extent_.max - extent_.min)};
            if (mesh_.pointCount() != 0 && topology.isClosedManifold())
                shape.volume = measures_.volume;
            return shape;
        }

    private:
        MeshArrays const& mesh_;
        Extent extent_;
        Orvan::Array<CompactNormal> normals_;
        FaceMeasures measures_;
    };

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

ExaminedMesh examine(MeshArrays const& mesh, float sliverRatio)
{
    MeasuredMesh const measured(mesh, sliverRatio);
    MeshTopology const topology = analyzeTopology(mesh, std::array{measured.foldOvers()});
    return {topology, measured.shape(topology, topology.sharpEdgeCounts[0]), measured.sliverCount()};
}

ExaminedMove examineMove(MeshArrays const& before, MeshArrays const& after)
{
    MeasuredMesh const measuredBefore(before), measuredAfter(after);
    MeshTopology const topology =
        analyzeTopology(before, std::array{measuredBefore.foldOvers(), measuredAfter.foldOvers()});
    return {topology, measuredBefore.shape(topology, topology.sharpEdgeCounts[0]),
        measuredAfter.shape(topology, topology.sharpEdgeCounts[1])};
}

std::vector<unsigned int> sharpPoints(MeshArrays const& mesh, EdgeSides const& edges, double degrees)
{
    Creases const creases(mesh, degrees);
    unsigned int const* const pointAt = mesh.faceVertex->data;
    return edges.pointsOfEdges([&](std::span<Side const> sides) {
        if (sides.size() != 2)
            return sides.size() > 2;
        unsigned int const a = sides[0].corner, b = sides[1].corner;
        return creases.isSharp(edges.faceOf(a), edges.faceOf(b), pointAt[a] != pointAt[b]);
    });
}

double largestMove(MeshArrays const& before, MeshArrays const& after)
{
    if (before.positions == after.positions)
        return 0;
    std::size_t const count = std::min(before.pointCount(), after.pointCount());
    return sumOverBlocks<Largest>(count, [&](std::size_t begin, std::size_t end) {
        Largest largest;
        for (std::size_t point = begin; point != end; ++point)
            largest += {length(inDoubles((*after.positions)[point]) - inDoubles((*before.positions)[point]))};
        return largest;
    }).value;
}

Json countsAndShape(Tessara::Object const& mesh, Shape const& shape)
{
    Json values = countsOf(mesh);
    addMeasures(shape, values);
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
