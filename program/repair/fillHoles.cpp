#include "fillHoles.h"

#include "findLoops.h"
#include "frame/ParallelFor.h"
#include "geometry/Triangulation.h"

#include <TessaraGeometry/Makers.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <utility>

namespace ModelingProgram {

namespace {

    using Triangle = std::array<unsigned int, 3>;

    /// The loops to fill, as polygons in the opposite direction. Corners of polygons are numbered through; those of
    /// polygon i are from `starts[i]` up to `starts[i + 1]`.
    struct Lids {
        std::vector<unsigned int> sides; // the boundary side that starts at the point of each corner
        std::vector<unsigned int> starts = {0};
        std::vector<Triangle> triangles; // of corners; polygons with n corners have n - 2
        std::vector<unsigned char> hasCenter; // for each polygon: it gets a fan around a new point instead

        std::size_t count() const { return starts.size() - 1; }
        unsigned int size(std::size_t lid) const { return starts[lid + 1] - starts[lid]; }
        unsigned int firstTriangle(std::size_t lid) const { return starts[lid] - 2 * static_cast<unsigned int>(lid); }
        unsigned int nextCorner(std::size_t lid, unsigned int corner) const
        {
            return corner + 1 == starts[lid + 1] ? starts[lid] : corner + 1;
        }
    };

    /// Whether all sides of a loop are of one face, and nothing else is joined with that.
    bool isAroundLooseFace(std::span<unsigned int const> loop, MeshArrays const& mesh, Adjacency const& adjacency)
    {
        unsigned int const face = adjacency.faceOf(loop[0]);
        if (std::any_of(loop.begin(), loop.end(), [&](unsigned int side) { return adjacency.faceOf(side) != face; }))
            return false;
        bool isLoose = true;
        for (unsigned int side = (*mesh.faceOffset)[face]; isLoose && side != (*mesh.faceOffset)[face + 1]; ++side)
            isLoose = !adjacency.isJoined(side) || adjacency.faceOf(adjacency.across(side)) == face;
        return isLoose;
    }

    /// Chooses the loops to fill, and joins those of two edges.
    Lids chooseLids(std::size_t mostEdges, MeshArrays const& mesh, Adjacency& adjacency, FilledHoles& result)
    {
        Loops const loops = findLoops(mesh, adjacency);
        Lids lids;
        std::vector<unsigned int> looseFaces;
        for (std::size_t i = 0; i != loops.count(); ++i) {
            std::span<unsigned int const> const loop = loops.sidesOf(i);
            if (loop.size() == 2) {
                adjacency.join(loop[0], loop[1]);
                ++result.closedSlits;
            } else if (isAroundLooseFace(loop, mesh, adjacency)) {
                looseFaces.push_back(adjacency.faceOf(loop[0]));
            } else if (loop.size() > mostEdges) {
                ++result.openCount;
                result.longestOpen = std::max(result.longestOpen, loop.size());
            } else {
                lids.sides.insert(lids.sides.end(), loop.rbegin(), loop.rend());
                lids.starts.push_back(static_cast<unsigned int>(lids.sides.size()));
                result.longestFilled = std::max(result.longestFilled, loop.size());
                ++result.filledCount;
            }
        }
        lids.hasCenter.resize(lids.count(), 0);
        std::sort(looseFaces.begin(), looseFaces.end());
        result.looseFaces =
            static_cast<unsigned int>(std::unique(looseFaces.begin(), looseFaces.end()) - looseFaces.begin());
        return lids;
    }

    void triangulateLids(MeshArrays const& mesh, Adjacency const& adjacency, Lids& lids)
    {
        Orvan::Array<float3> positions(lids.sides.size(), Orvan::kUninitialized);
        Orvan::Array<unsigned int> corners(lids.sides.size(), Orvan::kUninitialized);
        for (unsigned int corner = 0; corner != lids.sides.size(); ++corner) {
            positions[corner] = (*mesh.positions)[adjacency.startOf(lids.sides[corner])];
            corners[corner] = corner;
        }
        auto const polygons = Tessara::Geometry::makeMesh(std::move(positions), std::move(corners),
            Orvan::Array<unsigned int>(std::span(std::as_const(lids.starts))));
        Tessara::Object const cut = triangulatedAs(inFineUnits(*polygons), "^*", *polygons);
        MeshArrays const triangles = arraysOf(cut);
        lids.triangles.resize(triangles.faceCount());
        for (unsigned int corner = 0; corner != triangles.cornerCount(); ++corner)
            lids.triangles[corner / 3][corner % 3] = (*triangles.faceVertex)[corner];
    }

    /// An edge inside a lid.
    struct Diagonal {
        unsigned int lower, higher; // points of the mesh
        unsigned int lid;
        unsigned int isSpare; // the other one of a polygon with four corners
        friend auto operator<=>(Diagonal const&, Diagonal const&) = default;
    };

    /// Finds diagonals that are edges of the mesh or of a lower lid.
    class DiagonalCheck {
    public:
        DiagonalCheck(MeshArrays const& mesh, Adjacency const& adjacency, Lids const& lids)
            : mesh_(mesh)
            , adjacency_(adjacency)
            , isEnd_(mesh.pointCount())
            , isTaken_(2 * lids.count())
        {
            for (unsigned int lid = 0; lid != lids.count(); ++lid)
                addDiagonals(lids, lid);
            std::sort(diagonals_.begin(), diagonals_.end());
            for (std::size_t i = 1; i < diagonals_.size(); ++i)
                if (std::pair(diagonals_[i].lower, diagonals_[i].higher)
                    == std::pair(diagonals_[i - 1].lower, diagonals_[i - 1].higher))
                    markTaken(diagonals_[i]);
            findEdges();
        }

        bool isTaken(std::size_t lid) const { return isTaken_[2 * lid] != 0; }
        bool isSpareTaken(std::size_t lid) const { return isTaken_[2 * lid + 1] != 0; }

    private:
        void add(unsigned int a, unsigned int b, unsigned int lid, bool isSpare)
        {
            isEnd_[a] = isEnd_[b] = 1;
            diagonals_.push_back({std::min(a, b), std::max(a, b), lid, isSpare ? 1u : 0u});
        }

        void addDiagonals(Lids const& lids, unsigned int lid)
        {
            auto const pointOf = [&](unsigned int corner) { return adjacency_.startOf(lids.sides[corner]); };
            unsigned int const first = lids.starts[lid];
            for (unsigned int t = lids.firstTriangle(lid); t != lids.firstTriangle(lid + 1); ++t)
                for (unsigned int k = 0; k != 3; ++k) {
                    unsigned int const from = lids.triangles[t][k], to = lids.triangles[t][k == 2 ? 0 : k + 1];
                    if (from > to || to == lids.nextCorner(lid, from) || from == lids.nextCorner(lid, to))
                        continue; // seen from the other triangle, or a side of the loop
                    add(pointOf(from), pointOf(to), lid, false);
                    if (lids.size(lid) == 4) {
                        unsigned int const other = from == first ? first + 1 : first;
                        add(pointOf(other), pointOf(other + 2), lid, true);
                    }
                }
        }

        void markTaken(Diagonal const& diagonal)
        {
            // Several threads may mark the same diagonal.
            std::atomic_ref(isTaken_[2 * diagonal.lid + diagonal.isSpare]).store(1, std::memory_order_relaxed);
        }

        void findEdges()
        {
            if (diagonals_.empty())
                return;
            Modeling::parallelFor(
                tbb::blocked_range<unsigned int>(0, mesh_.cornerCount(), 10'000), [&](auto const& sides) {
                    for (unsigned int side = sides.begin(); side != sides.end(); ++side) {
                        unsigned int const start = adjacency_.startOf(side);
                        if (!isEnd_[start])
                            continue;
                        unsigned int const end = adjacency_.endOf(side);
                        if (isEnd_[end])
                            markEqual(std::min(start, end), std::max(start, end));
                    }
                });
        }

        /// The first of equal diagonals is enough, because the others are marked already.
        void markEqual(unsigned int lower, unsigned int higher)
        {
            auto const diagonal = std::lower_bound(diagonals_.begin(), diagonals_.end(), Diagonal{lower, higher, 0, 0});
            if (diagonal != diagonals_.end() && diagonal->lower == lower && diagonal->higher == higher)
                markTaken(*diagonal);
        }

        MeshArrays const& mesh_;
        Adjacency const& adjacency_;
        std::vector<unsigned char> isEnd_; // for each point: of a diagonal
        std::vector<Diagonal> diagonals_;
        std::vector<unsigned char> isTaken_; // for each lid, and for its spare diagonal
    };

    void avoidEdges(MeshArrays const& mesh, Adjacency const& adjacency, Lids& lids)
    {
        DiagonalCheck const check(mesh, adjacency, lids);
        for (std::size_t lid = 0; lid != lids.count(); ++lid) {
            if (!check.isTaken(lid))
                continue;
            if (lids.size(lid) == 4 && !check.isSpareTaken(lid)) {
                unsigned int const first = lids.starts[lid];
                Triangle* const triangle = &lids.triangles[lids.firstTriangle(lid)];
                bool const isFromFirst = std::find(triangle[0].begin(), triangle[0].end(), first) != triangle[0].end()
                    && std::find(triangle[1].begin(), triangle[1].end(), first) != triangle[1].end();
                unsigned int const start = isFromFirst ? first + 1 : first;
                unsigned int const last = isFromFirst ? first : first + 3;
                triangle[0] = {start, start + 1, start + 2};
                triangle[1] = {start, start + 2, last};
            } else {
                lids.hasCenter[lid] = 1;
            }
        }
    }

    /// Appends the triangles of lids to the mesh.
    class LidWriter {
    public:
        LidWriter(Lids const& lids, MeshWithSources& mesh, Adjacency& adjacency)
            : lids_(lids)
            , mesh_(mesh)
            , adjacency_(adjacency)
            , firstCorner_(mesh.arrays.cornerCount())
            , points_(*mesh.arrays.faceVertex)
            , offsets_(*mesh.arrays.faceOffset)
        {
        }

        void write(FilledHoles& result)
        {
            for (std::size_t lid = 0; lid != lids_.count(); ++lid)
                if (lids_.hasCenter[lid])
                    writeFan(lid);
                else
                    writeTriangles(lid);
            result.faceCount += static_cast<unsigned int>((points_.size - firstCorner_) / 3);
            result.centerCount += static_cast<unsigned int>(centers_.size());
            mesh_.arrays.faceVertex = Orvan::makePtr<Orvan::Array<unsigned int>>(std::move(points_));
            mesh_.arrays.faceOffset = Orvan::makePtr<Orvan::Array<unsigned int>>(std::move(offsets_));
            if (!centers_.empty())
                editArray(mesh_.arrays.positions, [&](Orvan::Array<float3>& positions) {
                    for (float3 const& center : centers_)
                        positions.append(center);
                });
            adjacency_.extend();
            joinSides();
        }

    private:
        /// A side of a lid, by the corners of its polygon or, for a fan, those and its center.
        struct LidSide {
            std::size_t lid;
            unsigned int lower, higher;
            unsigned int side;
            friend auto operator<=>(LidSide const&, LidSide const&) = default;
        };
        static constexpr unsigned int kCenter = Tessara::Geometry::kInvalidIndex;

        void writeTriangles(std::size_t lid)
        {
            for (unsigned int t = lids_.firstTriangle(lid); t != lids_.firstTriangle(lid + 1); ++t)
                writeTriangle(lid, lids_.triangles[t], 0);
        }

        void writeFan(std::size_t lid)
        {
            auto const center = static_cast<unsigned int>(mesh_.arrays.pointCount() + centers_.size());
            double3 sum{0, 0, 0};
            for (unsigned int corner = lids_.starts[lid]; corner != lids_.starts[lid + 1]; ++corner) {
                writeTriangle(lid, {corner, lids_.nextCorner(lid, corner), kCenter}, center);
                sum = sum + inDoubles((*mesh_.arrays.positions)[pointOf(corner)]);
            }
            double const count = lids_.size(lid);
            centers_.push_back({static_cast<float>(sum.x / count), static_cast<float>(sum.y / count),
                static_cast<float>(sum.z / count)});
            mesh_.pointSource.append(mesh_.pointSource[pointOf(lids_.starts[lid])]);
        }

        void writeTriangle(std::size_t lid, Triangle const& triangle, unsigned int center)
        {
            for (unsigned int k = 0; k != 3; ++k) {
                unsigned int const from = triangle[k], to = triangle[k == 2 ? 0 : k + 1];
                auto const side = static_cast<unsigned int>(points_.size);
                if (from != kCenter && to == lids_.nextCorner(lid, from))
                    outer_.push_back({side, lids_.sides[to]}); // the polygon is the reversed loop
                else
                    inner_.push_back({lid, std::min(from, to), std::max(from, to), side});
                points_.append(from == kCenter ? center : pointOf(from));
                mesh_.cornerSource.append(mesh_.cornerSource[lids_.sides[from == kCenter ? triangle[0] : from]]);
            }
            offsets_.append(static_cast<unsigned int>(points_.size));
            mesh_.faceSource.append(mesh_.faceSource[adjacency_.faceOf(lids_.sides[triangle[0]])]);
        }

        void joinSides()
        {
            for (auto const& [side, other] : outer_)
                adjacency_.join(side, other);
            std::sort(inner_.begin(), inner_.end());
            for (std::size_t i = 1; i < inner_.size(); i += 2)
                adjacency_.join(inner_[i - 1].side, inner_[i].side);
        }

        unsigned int pointOf(unsigned int corner) const { return adjacency_.startOf(lids_.sides[corner]); }

        Lids const& lids_;
        MeshWithSources& mesh_;
        Adjacency& adjacency_;
        std::size_t firstCorner_;
        Orvan::Array<unsigned int> points_, offsets_;
        std::vector<float3> centers_;
        std::vector<std::array<unsigned int, 2>> outer_; // sides of lids and of the faces around them
        std::vector<LidSide> inner_;
    };

}

FilledHoles fillHoles(std::size_t mostEdges, MeshWithSources& mesh, Adjacency& adjacency)
{
    FilledHoles result;
    Lids lids = chooseLids(mostEdges, mesh.arrays, adjacency, result);
    if (lids.count() == 0)
        return result;
    triangulateLids(mesh.arrays, adjacency, lids);
    avoidEdges(mesh.arrays, adjacency, lids);
    LidWriter(lids, mesh, adjacency).write(result);
    return result;
}

}
