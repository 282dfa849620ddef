#include "joinSides.h"

#include "geometry/EdgeSides.h"

#include <tbb/blocked_range.h>
#include <tbb/parallel_reduce.h>

#include <algorithm>
#include <cmath>
#include <tuple>

namespace ModelingProgram {

namespace {

    /// Faces around a non-manifold edge.
    class FacesAroundEdge {
    public:
        FacesAroundEdge(MeshArrays const& mesh, NonManifoldEdges const& edges,
            std::vector<unsigned char> const& isFlipped, Adjacency& adjacency)
            : position_(mesh.positions->data)
            , isFlipped_(isFlipped)
            , adjacency_(adjacency)
        {
            for (unsigned int const side : edges.sides)
                faces_.push_back(adjacency.faceOf(side));
            std::sort(faces_.begin(), faces_.end());
            faces_.erase(std::unique(faces_.begin(), faces_.end()), faces_.end());
            normals_.reserve(faces_.size());
            for (unsigned int const face : faces_)
                normals_.push_back(areaVector(mesh.corners(face), position_));
        }

        void join(std::span<unsigned int const> sides)
        {
            sortByAngle(sides);
            joinFacing();
            joinRemaining();
        }

    private:
        struct Wall {
            double angle; // counterclockwise around the direction from the lower to the higher point
            bool opens; // its inside is in counterclockwise direction
            unsigned int side;
            bool isJoined = false;
        };

        void sortByAngle(std::span<unsigned int const> sides)
        {
            unsigned int const lower = std::min(adjacency_.startOf(sides[0]), adjacency_.endOf(sides[0]));
            unsigned int const higher = std::max(adjacency_.startOf(sides[0]), adjacency_.endOf(sides[0]));
            double3 const axis = inDoubles(position_[higher]) - inDoubles(position_[lower]);
            walls_.clear();
            double3 right{}, up{}; // of the plane across the edge; the first face is on the right
            for (unsigned int const side : sides) {
                auto const place = std::lower_bound(faces_.begin(), faces_.end(), adjacency_.faceOf(side));
                double3 const normal = normals_[static_cast<std::size_t>(place - faces_.begin())];
                bool const isUpward = adjacency_.startOf(side) == lower;
                double3 const inward = isUpward ? cross(normal, axis) : cross(axis, normal);
                if (dot(right, right) == 0) {
                    right = inward;
                    up = cross(axis, right);
                }
                // Both vectors across the edge are scaled to the same length.
                double const angle = std::atan2(dot(inward, up), dot(inward, right) * length(axis));
                walls_.push_back({rounded(angle), isUpward == (isFlipped_[adjacency_.faceOf(side)] != 0), side});
            }
            // Of faces back to back the one whose inside is clockwise comes first, so that both face their neighbors.
            std::sort(walls_.begin(), walls_.end(), [](Wall const& a, Wall const& b) {
                return std::tie(a.angle, a.opens, a.side) < std::tie(b.angle, b.opens, b.side);
            });
        }

        /// Faces back to back have the same angle, which rounding errors must not decide. -180 degrees are 180.
        static double rounded(double angle)
        {
            constexpr double kSteps = 1e8; // per radian
            constexpr double kPi = 3.14159265358979323846;
            double const steps = std::round(angle * kSteps);
            return steps <= -std::round(kPi * kSteps) ? -steps : steps;
        }

        void join(Wall& a, Wall& b)
        {
            adjacency_.join(a.side, b.side);
            a.isJoined = b.isJoined = true;
        }

        /// Like brackets: each closing wall is joined with the last open one. The second turn is for those before all
        /// that open.
        void joinFacing()
        {
            open_.clear();
            for (int turn = 0; turn != 2; ++turn)
                for (Wall& wall : walls_) {
                    if (wall.isJoined)
                        continue;
                    if (wall.opens && turn == 0) {
                        open_.push_back(&wall);
                    } else if (!wall.opens && !open_.empty()) {
                        join(*open_.back(), wall);
                        open_.pop_back();
                    }
                }
        }

        void joinRemaining()
        {
            Wall* previous = nullptr;
            for (Wall& wall : walls_) {
                if (wall.isJoined)
                    continue;
                if (previous)
                    join(*previous, wall);
                previous = previous ? nullptr : &wall;
            }
        }

        float3 const* position_;
        std::vector<unsigned char> const& isFlipped_;
        Adjacency& adjacency_;
        std::vector<unsigned int> faces_; // ascending
        std::vector<double3> normals_;
        std::vector<Wall> walls_;
        std::vector<Wall*> open_;
    };

}

NonManifoldEdges joinTwoSided(MeshArrays const& mesh, Adjacency& adjacency)
{
    EdgeSides const edges(mesh);
    // The sides of an edge are written by its lower point only. Partial results are joined in the order of the points.
    return tbb::parallel_reduce(
        tbb::blocked_range<unsigned int>(0, mesh.pointCount(), 1000), NonManifoldEdges{},
        [&](auto const& points, NonManifoldEdges found) {
            edges.forEachEdge(points.begin(), points.end(), [&](unsigned int, std::span<Side const> sides) {
                for (Side const& side : sides)
                    adjacency.markBoundary(side.corner);
                if (sides.size() == 2)
                    adjacency.join(sides[0].corner, sides[1].corner);
                if (sides.size() <= 2)
                    return;
                for (Side const& side : sides)
                    found.sides.push_back(side.corner);
                found.offsets.push_back(found.sides.size());
            });
            return found;
        },
        [](NonManifoldEdges a, NonManifoldEdges const& b) {
            std::size_t const start = a.sides.size();
            a.sides.insert(a.sides.end(), b.sides.begin(), b.sides.end());
            for (std::size_t edge = 0; edge != b.count(); ++edge)
                a.offsets.push_back(start + b.offsets[edge + 1]);
            return a;
        });
}

void joinNonManifold(MeshArrays const& mesh, NonManifoldEdges const& edges, std::vector<unsigned char> const& isFlipped,
    Adjacency& adjacency)
{
    FacesAroundEdge faces(mesh, edges, isFlipped, adjacency);
    for (std::size_t edge = 0; edge != edges.count(); ++edge)
        faces.join(edges.sidesOf(edge));
}

}
