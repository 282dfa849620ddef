#include "weldPoints.h"

#include "frame/ParallelFor.h"

#include <TessaraGeometry/Names.h>

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstdint>
#include <vector>

namespace ModelingProgram {

namespace {

    constexpr unsigned int kNoPoint = Tessara::Geometry::kInvalidIndex;

    /// The points that were kept so far, in cells of space. Cells are twice as wide as the distance, so that the points
    /// within the distance of a point are in eight of them; and since kept points are farther apart than the distance,
    /// a cell holds only a few of them. With distance 0 each position has a cell of its own.
    class WeldGrid {
    public:
        WeldGrid(double distance, Orvan::Array<float3> const& positions)
            : position_(positions.data)
            , distance_(distance * distance > 0 ? distance : 0) // cells of that width would be infinitely many
            , heads_(std::bit_ceil(std::max<std::size_t>(positions.size, 16)), kNoPoint)
            , nextInSlot_(positions.size, kNoPoint)
        {
        }

        /// The lowest kept point within the distance, or the point itself, which is kept then.
        unsigned int findOrKeep(unsigned int point)
        {
            double3 const p = inDoubles(position_[point]);
            if (!isFinite(position_[point]))
                return point;
            unsigned int lowest = kNoPoint;
            if (distance_ == 0) {
                lowest = lowestIn(slotOf(p), p);
            } else {
                // The corner of cells that is nearest to the point: the eight cells around it are searched.
                double3 const c{
                    std::floor(p.x / width() + 0.5), std::floor(p.y / width() + 0.5), std::floor(p.z / width() + 0.5)};
                for (int i = 0; i != 8; ++i)
                    lowest =
                        std::min(lowest, lowestIn(slotOf({c.x - (i & 1), c.y - (i >> 1 & 1), c.z - (i >> 2 & 1)}), p));
            }
            if (lowest != kNoPoint)
                return lowest;
            std::size_t const slot = distance_ == 0
                ? slotOf(p)
                : slotOf({std::floor(p.x / width()), std::floor(p.y / width()), std::floor(p.z / width())});
            nextInSlot_[point] = heads_[slot];
            heads_[slot] = point;
            return point;
        }

    private:
        double width() const { return 2 * distance_; }

        std::size_t slotOf(double3 const& cell) const
        {
            std::uint64_t hash = 0;
            for (double const number : {cell.x, cell.y, cell.z}) {
                hash = (hash ^ std::bit_cast<std::uint64_t>(number + 0.0)) * 0x9E3779B97F4A7C15u; // -0 + 0 is 0
                hash ^= hash >> 32;
            }
            return hash & (heads_.size() - 1);
        }

        unsigned int lowestIn(std::size_t slot, double3 const& p) const
        {
            unsigned int lowest = kNoPoint;
            for (unsigned int point = heads_[slot]; point != kNoPoint; point = nextInSlot_[point]) {
                double3 const d = inDoubles(position_[point]) - p;
                if (point < lowest && dot(d, d) <= distance_ * distance_)
                    lowest = point;
            }
            return lowest;
        }

        float3 const* position_;
        double distance_;
        std::vector<unsigned int> heads_; // of the lists of points, by the hash of their cell
        std::vector<unsigned int> nextInSlot_;
    };

}

unsigned int weldPoints(double distance, MeshWithSources& mesh)
{
    unsigned int const count = mesh.arrays.pointCount();
    WeldGrid grid(distance, *mesh.arrays.positions);
    Orvan::Array<unsigned int> keptPoint(count, Orvan::kUninitialized);
    unsigned int weldedCount = 0;
    for (unsigned int point = 0; point != count; ++point) {
        keptPoint[point] = grid.findOrKeep(point);
        weldedCount += keptPoint[point] != point ? 1u : 0u;
    }
    if (weldedCount == 0)
        return 0;
    editArray(mesh.arrays.faceVertex, [&](Orvan::Array<unsigned int>& points) {
        // Each corner writes its own entry.
        Modeling::parallelFor(
            tbb::blocked_range<std::size_t>(0, points.size, Modeling::kElementGrain), [&](auto const& corners) {
                for (std::size_t corner = corners.begin(); corner != corners.end(); ++corner)
                    points[corner] = keptPoint[points[corner]];
            });
    });
    mesh.keptPoint = std::move(keptPoint);
    return weldedCount;
}

}
