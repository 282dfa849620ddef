#include "DrawnGeometry.h"

#include "geometry/EdgeSides.h"
#include "geometry/Geometry.h"
#include "geometry/Triangulation.h"
#include "shell/Report.h"

#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Names.h>

#include <fmt/format.h>

#include <array>
#include <bit>

namespace ModelingProgram {

using namespace Tessara::Geometry;

namespace {

    constexpr std::size_t kMostEdges = 500'000; // of each kind

    /// Cuts faces into triangles, given by their corners.
    Indices cutFaces(Tessara::Object const& mesh)
    {
        constexpr char kNumber[] = "corner number";
        Tessara::Object bare;
        for (char const* const key : {sPointComp, sFaceComp, sFaceVertexComp, sPointPosition, sFaceVertex, sFaceOffset})
            bare.setProperty(key, mesh.getProperty(key));
        Indices numbers(arraysOf(mesh).cornerCount(), Orvan::kUninitialized);
        for (unsigned int i = 0; i != numbers.size; ++i)
            numbers[i] = i;
        addDataProperty(kNumber, sFaceVertexComp, std::move(numbers), bare);
        Tessara::Object const cut = triangulatedAs(inFineUnits(bare), "*", bare);
        return *dataOf<unsigned int>(cut, kNumber);
    }

    bool areTriangles(Indices const& offsets)
    {
        for (std::uint64_t face = 0; face != offsets.size; ++face)
            if (offsets[face] != 3 * face)
                return false;
        return true;
    }

    /// Gives every point the first one in the same cell of a grid.
    class Clusters {
    public:
        Clusters(Orvan::Array<float3> const& positions, BoundingBox const& box)
            : positions_(positions)
            , box_(box)
            , slots_(std::bit_ceil(4 * kMostCells))
        {
        }

        /// \return false if there would be too many
        bool build(double cellsPerSide)
        {
            std::fill(slots_.begin(), slots_.end(), Slot());
            points.clear();
            ofPoints = Indices(positions_.size, Orvan::kUninitialized);
            double const side = std::max({double{box_.max.x} - box_.min.x, double{box_.max.y} - box_.min.y,
                                    double{box_.max.z} - box_.min.z, 1e-30})
                / cellsPerSide;
            for (std::uint64_t point = 0; point != positions_.size; ++point) {
                Slot& slot = find(cellOf(positions_[point], side));
                if (slot.cluster == kInvalidIndex) {
                    if (points.size() == kMostCells)
                        return false;
                    slot.cluster = static_cast<unsigned int>(points.size());
                    points.push_back(static_cast<unsigned int>(point));
                }
                ofPoints[point] = slot.cluster;
            }
            return true;
        }

        std::vector<unsigned int> points; // one per cluster
        Indices ofPoints; // the cluster of each point

    private:
        static constexpr std::size_t kMostCells = 1 << 20;

        struct Slot {
            std::uint64_t cell = 0;
            unsigned int cluster = kInvalidIndex;
        };

        std::uint64_t cellOf(float3 const& p, double side) const
        {
            auto const along = [=](float value, float least) {
                double const cell = (double{value} - least) / side;
                return static_cast<std::uint64_t>(cell >= 0 && cell < 1e6 ? cell : 0); // also if it is NaN
            };
            return along(p.x, box_.min.x) << 40 | along(p.y, box_.min.y) << 20 | along(p.z, box_.min.z);
        }

        Slot& find(std::uint64_t cell)
        {
            std::size_t i = cell * 0x9E3779B97F4A7C15u >> 20;
            for (;; ++i) {
                Slot& slot = slots_[i & (slots_.size() - 1)];
                if (slot.cluster == kInvalidIndex)
                    slot.cell = cell;
                if (slot.cell == cell)
                    return slot;
            }
        }

        Orvan::Array<float3> const& positions_;
        BoundingBox box_;
        std::vector<Slot> slots_;
    };

    Indices arrayOf(std::vector<unsigned int> const& numbers)
    {
        return Indices(std::span<unsigned int const>(numbers));
    }

    /// The corners of the triangles whose points are in three different clusters.
    std::vector<unsigned int> cornersBetween(
        Clusters const& clusters, Indices const& faceVertex, std::optional<Indices> const& triangles)
    {
        std::vector<unsigned int> corners;
        std::uint64_t const count = triangles ? triangles->size : faceVertex.size;
        for (std::uint64_t first = 0; first != count; first += 3) {
            std::array<unsigned int, 3> corner{}, cluster{};
            for (std::size_t i = 0; i != 3; ++i) {
                corner[i] = triangles ? (*triangles)[first + i] : static_cast<unsigned int>(first + i);
                cluster[i] = clusters.ofPoints[faceVertex[corner[i]]];
            }
            if (cluster[0] != cluster[1] && cluster[1] != cluster[2] && cluster[2] != cluster[0])
                corners.insert(corners.end(), corner.begin(), corner.end());
        }
        return corners;
    }

    /// Replaces the points of edges by their clusters, without edges in a single one.
    void moveToClusters(Clusters const& clusters, Indices& edges)
    {
        std::vector<unsigned int> moved;
        for (std::uint64_t i = 0; i != edges.size; i += 2) {
            unsigned int const a = clusters.ofPoints[edges[i]], b = clusters.ofPoints[edges[i + 1]];
            if (a != b)
                moved.insert(moved.end(), {a, b});
        }
        edges = arrayOf(moved);
    }

    void thinMesh(Tessara::Object const& object, std::uint64_t mostFaces, DrawnGeometry& drawn)
    {
        Indices const& faceVertex = *drawn.all.faceVertex;
        Clusters clusters(*drawn.all.positions, boundingBoxOf(object).value_or(BoundingBox{}));
        std::vector<unsigned int> corners;
        constexpr double kFinest = 2000, kCoarser = 0.8;
        for (double cells = kFinest;; cells *= kCoarser) {
            if (!clusters.build(cells))
                continue;
            corners = cornersBetween(clusters, faceVertex, drawn.triangles);
            if (corners.size() <= 3 * mostFaces)
                break;
        }
        Indices points(corners.size(), Orvan::kUninitialized), cells(corners.size() / 3, Orvan::kUninitialized);
        MeshArrays const mesh = arraysOf(object);
        for (std::size_t i = 0; i != corners.size(); ++i)
            points[i] = clusters.ofPoints[faceVertex[corners[i]]];
        for (std::size_t face = 0; face != cells.size; ++face)
            cells[face] = mesh.faceOf(corners[3 * face]);
        moveToClusters(clusters, drawn.boundaryEdges);
        moveToClusters(clusters, drawn.nonManifoldEdges);
        drawn.notes.push_back(fmt::format(
            "Drawn with {} of {} faces: points that are too close to be told apart are drawn "
            "as one. Facts and histograms are those of all faces, colors by quality and slivers those of the "
            "drawn ones.",
            groupDigits(cells.size), groupDigits(drawn.all.cellCount())));
        drawn.triangles.reset();
        drawn.points = arrayOf(clusters.points);
        drawn.corners = arrayOf(corners);
        drawn.cells = std::move(cells);
        drawn.cornerPoints = std::move(points);
    }

    void findEdges(MeshArrays const& mesh, DrawnGeometry& drawn)
    {
        EdgeSides const sides(mesh);
        std::vector<unsigned int> boundary, nonManifold;
        sides.forEachEdge(0, mesh.pointCount(), [&](unsigned int lower, std::span<Side const> edge) {
            if (edge.size() == 2)
                return;
            std::vector<unsigned int>& edges = edge.size() == 1 ? boundary : nonManifold;
            if (edges.size() < 2 * kMostEdges)
                edges.insert(edges.end(), {lower, edge[0].otherPoint});
        });
        for (std::vector<unsigned int> const* const edges : {&boundary, &nonManifold})
            if (edges->size() == 2 * kMostEdges)
                drawn.notes.push_back(fmt::format("Only the first {} {} edges are highlighted.",
                    groupDigits(kMostEdges), edges == &boundary ? "boundary" : "non-manifold"));
        drawn.boundaryEdges = arrayOf(boundary);
        drawn.nonManifoldEdges = arrayOf(nonManifold);
    }

    void chooseMesh(Tessara::Object const& object, std::uint64_t mostFaces, bool findsEdges, DrawnGeometry& drawn)
    {
        if (findsEdges)
            findEdges(arraysOf(object), drawn);
        if (!areTriangles(*drawn.all.offsets))
            drawn.triangles = cutFaces(object);
        std::uint64_t const triangleCount = (drawn.triangles ? drawn.triangles->size : drawn.all.faceVertex->size) / 3;
        if (triangleCount > mostFaces)
            thinMesh(object, mostFaces, drawn);
    }

    /// Every n-th of so many elements.
    Indices everyNth(std::uint64_t count, std::uint64_t n)
    {
        Indices numbers((count + n - 1) / n, Orvan::kUninitialized);
        for (std::uint64_t i = 0; i != numbers.size; ++i)
            numbers[i] = static_cast<unsigned int>(i * n);
        return numbers;
    }

    void thinCloud(std::uint64_t mostPoints, DrawnGeometry& drawn)
    {
        std::uint64_t const count = drawn.all.pointCount(), n = (count + mostPoints - 1) / mostPoints;
        drawn.points = everyNth(count, n);
        drawn.notes.push_back(fmt::format(
            "Drawn with {} of {} points: one of {}.", groupDigits(drawn.points->size), groupDigits(count), n));
    }

    void thinStrands(std::uint64_t mostPoints, DrawnGeometry& drawn)
    {
        Indices const& offsets = *drawn.all.offsets;
        std::uint64_t const count = drawn.all.cellCount();
        std::uint64_t const n = (drawn.all.pointCount() + mostPoints - 1) / mostPoints;
        drawn.cells = everyNth(count, n);
        std::vector<unsigned int> points, starts{0};
        for (unsigned int const strand : *drawn.cells) {
            for (unsigned int point = offsets[strand]; point != offsets[strand + 1]; ++point)
                points.push_back(point);
            starts.push_back(static_cast<unsigned int>(points.size()));
        }
        drawn.points = arrayOf(points);
        drawn.offsets = arrayOf(starts);
        drawn.notes.push_back(fmt::format(
            "Drawn with {} of {} strands: one of {}.", groupDigits(drawn.cells->size), groupDigits(count), n));
    }

}

DrawnGeometry chooseDrawn(Tessara::Object const& object, std::uint64_t mostElements, bool findsEdges)
{
    DrawnGeometry drawn;
    drawn.all = takeApartUnchecked(object);
    switch (drawn.all.kind) {
    case WritableGeometry::Kind::Mesh:
        chooseMesh(object, mostElements, findsEdges, drawn);
        break;
    case WritableGeometry::Kind::Strands:
        if (drawn.all.pointCount() > mostElements)
            thinStrands(mostElements, drawn);
        break;
    case WritableGeometry::Kind::PointCloud:
        if (drawn.all.pointCount() > mostElements)
            thinCloud(mostElements, drawn);
        break;
    }
    return drawn;
}

}
