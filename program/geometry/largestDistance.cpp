#include "largestDistance.h"

#include "SurfaceTree.h"
#include "sumOverBlocks.h"

#include <tbb/blocked_range.h>
#include <tbb/parallel_for.h>

#include <algorithm>
#include <array>
#include <bit>
#include <cmath>
#include <cstdint>
#include <limits>
#include <optional>
#include <vector>

namespace ModelingProgram {

namespace {

    constexpr double kInfinity = std::numeric_limits<double>::infinity();

    struct Indices {
        std::vector<unsigned int> values;
        Indices& operator+=(Indices const& other)
        {
            values.insert(values.end(), other.values.begin(), other.values.end());
            return *this;
        }
    };

    /// The indices below a count for which a condition holds, in ascending order.
    template <class Condition> std::vector<unsigned int> indicesWhere(unsigned int count, Condition const& condition)
    {
        return sumOverBlocks<Indices, 16384>(count, [&](std::size_t begin, std::size_t end) {
            Indices indices;
            for (auto index = static_cast<unsigned int>(begin); index != end; ++index)
                if (condition(index))
                    indices.values.push_back(index);
            return indices;
        }).values;
    }

    /// A point of the old mesh that is elsewhere, or has another number, in the new one.
    struct MovedPoint {
        double3 position;
        // Not below the squared distance to the new surface, if what it was derived from is part of that surface.
        double squaredBound = kInfinity;
        bool isUsed = false; // isolated points are not part of the surface
    };

    /// The points that moved, and hints about how far: a position that the new mesh has at another number, and neighbors
    /// that did not move.
    class MovedPoints {
    public:
        MovedPoints(MeshArrays const& before, MeshArrays const& after)
            : before_(before)
            , numbers_(indicesWhere(before.pointCount(),
                  [&](unsigned int point) {
                      return !(
                          point < after.pointCount() && areSame((*before.positions)[point], (*after.positions)[point]));
                  }))
            , isMoved_(before.pointCount(), false)
        {
            for (unsigned int const point : numbers_) {
                isMoved_[point] = true;
                if (point < after.pointCount())
                    taken_.push_back(bitsOf((*after.positions)[point]));
            }
            std::sort(taken_.begin(), taken_.end());
        }

        /// Those that faces use.
        std::vector<MovedPoint> find() const
        {
            std::vector<MovedPoint> moved(numbers_.size());
            for (std::size_t i = 0; i != moved.size(); ++i)
                moved[i].position = inDoubles((*before_.positions)[numbers_[i]]);
            std::vector<unsigned int> const faces =
                indicesWhere(numbers_.empty() ? 0 : before_.faceCount(), [&](unsigned int face) {
                    auto const corners = before_.corners(face);
                    return std::any_of(
                        corners.begin(), corners.end(), [&](unsigned int point) { return isMoved_[point]; });
                });
            for (unsigned int const face : faces)
                for (unsigned int const point : before_.corners(face))
                    if (isMoved_[point])
                        bound(face, moved[numberOf(point)]);
            std::erase_if(moved, [](MovedPoint const& point) { return !point.isUsed; });
            return moved;
        }

    private:
        using Bits = std::array<std::uint32_t, 3>; // ordered also if coordinates are NaN

        static bool areSame(float3 const& a, float3 const& b) { return a.x == b.x && a.y == b.y && a.z == b.z; }
        static Bits bitsOf(float3 const& p)
        {
            return {std::bit_cast<std::uint32_t>(p.x), std::bit_cast<std::uint32_t>(p.y),
                std::bit_cast<std::uint32_t>(p.z)};
        }

        std::size_t numberOf(unsigned int point) const
        {
            return static_cast<std::size_t>(
                std::lower_bound(numbers_.begin(), numbers_.end(), point) - numbers_.begin());
        }

        bool isStillThere(unsigned int point) const
        {
            return !isMoved_[point]
                || std::binary_search(taken_.begin(), taken_.end(), bitsOf((*before_.positions)[point]));
        }

        void bound(unsigned int face, MovedPoint& moved) const
        {
            moved.isUsed = true;
            for (unsigned int const other : before_.corners(face))
                if (isStillThere(other)) {
                    double3 const away = inDoubles((*before_.positions)[other]) - moved.position;
                    moved.squaredBound = std::min(moved.squaredBound, dot(away, away));
                }
        }

        MeshArrays const& before_;
        std::vector<unsigned int> numbers_;
        std::vector<bool> isMoved_;
        std::vector<Bits> taken_; // positions that moved points have in the new mesh, sorted
    };

    /// Marks regions of space in a grid over a box; space outside counts to the cells at its sides.
    class MarkedCells {
    public:
        explicit MarkedCells(MeshArrays const& mesh)
            : low_{kInfinity, kInfinity, kInfinity}
            , bits_(kSide * kSide * kSide)
        {
            double3 high{-kInfinity, -kInfinity, -kInfinity};
            for (float3 const& p : *mesh.positions) {
                low_ = lowerCorner(low_, inDoubles(p));
                high = upperCorner(high, inDoubles(p));
            }
            for (std::size_t axis = 0; axis != 3; ++axis)
                scale_[axis] = kSide / (coordinate(high, axis) - coordinate(low_, axis));
        }

        /// Returns false if that would take too long.
        bool mark(double3 const& min, double3 const& max)
        {
            Cells const cells = cellsOf(min, max);
            markedCount_ += cells.count();
            if (markedCount_ > kMostMarked)
                return false;
            cells.visit([&](std::size_t cell) {
                bits_[cell] = true;
                return false;
            });
            return true;
        }

        bool meets(double3 const& min, double3 const& max) const
        {
            constexpr std::size_t kMany = 64;
            Cells const cells = cellsOf(min, max);
            return cells.count() > kMany || cells.visit([&](std::size_t cell) { return bits_[cell]; });
        }

    private:
        static constexpr std::size_t kSide = 128; // 256 KiB in all, which fit into the cache of a core
        static constexpr std::size_t kMostMarked = 1 << 24;

        struct Cells {
            std::array<std::size_t, 3> first, last;

            std::size_t count() const
            {
                return (last[0] - first[0] + 1) * (last[1] - first[1] + 1) * (last[2] - first[2] + 1);
            }
            /// Until `visitCell` returns true; that is the result.
            template <class VisitCell> bool visit(VisitCell const& visitCell) const
            {
                for (std::size_t z = first[2]; z <= last[2]; ++z)
                    for (std::size_t y = first[1]; y <= last[1]; ++y)
                        for (std::size_t x = first[0]; x <= last[0]; ++x)
                            if (visitCell((z * kSide + y) * kSide + x))
                                return true;
                return false;
            }
        };

        static double coordinate(double3 const& p, std::size_t axis) { return axis == 0 ? p.x : axis == 1 ? p.y : p.z; }

        /// Monotonic, so that boxes that meet have a common cell.
        std::size_t cellOf(double3 const& p, std::size_t axis) const
        {
            double const cell = (coordinate(p, axis) - coordinate(low_, axis)) * scale_[axis];
            return cell > 0 ? static_cast<std::size_t>(std::min(cell, kSide - 1.0)) : 0;
        }
        Cells cellsOf(double3 const& min, double3 const& max) const
        {
            Cells cells;
            for (std::size_t axis = 0; axis != 3; ++axis) {
                cells.first[axis] = cellOf(min, axis);
                cells.last[axis] = std::max(cells.first[axis], cellOf(max, axis));
            }
            return cells;
        }

        double3 low_;
        std::array<double, 3> scale_{};
        std::vector<bool> bits_;
        std::size_t markedCount_ = 0;
    };

    /// The faces of a surface near enough to contain the points nearest to those that moved; nullopt if these are so many,
    /// or may be so far, that this would not be faster than to search all faces.
    std::optional<std::vector<unsigned int>> facesNear(std::vector<MovedPoint> const& moved, MeshArrays const& surface)
    {
        constexpr unsigned int kFewOf = 16;
        constexpr double kRounded = 1 + 1e-9; // more than all rounding of distances
        if (moved.size() > surface.pointCount() / kFewOf)
            return std::nullopt;
        MarkedCells cells(surface);
        for (MovedPoint const& point : moved) {
            double const radius = std::sqrt(point.squaredBound) * kRounded;
            double3 const reach{radius, radius, radius};
            if (!(radius < kInfinity) || !cells.mark(point.position - reach, point.position + reach))
                return std::nullopt;
        }
        return indicesWhere(surface.faceCount(), [&](unsigned int face) {
            double3 min{kInfinity, kInfinity, kInfinity}, max{-kInfinity, -kInfinity, -kInfinity};
            for (unsigned int const point : surface.corners(face)) {
                double3 const p = inDoubles((*surface.positions)[point]);
                min = lowerCorner(min, p);
                max = upperCorner(max, p);
            }
            return cells.meets(min, max);
        });
    }

    std::vector<double> squaredDistances(std::vector<MovedPoint> const& points, SurfaceTree const& surface)
    {
        std::vector<double> distances(points.size());
        tbb::parallel_for(tbb::blocked_range<std::size_t>(0, points.size(), 64), [&](auto const& range) {
            for (std::size_t i = range.begin(); i != range.end(); ++i)
                distances[i] = surface.squaredDistance(points[i].position);
        });
        return distances;
    }

}

double largestDistance(MeshArrays const& before, MeshArrays const& after)
{
    std::vector<MovedPoint> const moved = MovedPoints(before, after).find();
    if (moved.empty())
        return 0;
    std::vector<double> distances;
    if (auto const faces = facesNear(moved, after))
        distances = squaredDistances(moved, SurfaceTree(after, *faces));
    // A distance within its bound is that to the whole surface, since all faces within the bound were searched. If a bound
    // came from a point that no face uses any more, the distance may be larger.
    auto const isWithin = [](double distance, MovedPoint const& point) { return distance <= point.squaredBound; };
    if (!std::equal(distances.begin(), distances.end(), moved.begin(), moved.end(), isWithin))
        distances = squaredDistances(moved, SurfaceTree(after));
    return std::sqrt(*std::max_element(distances.begin(), distances.end()));
}

}
