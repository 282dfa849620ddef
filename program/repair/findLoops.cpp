#include "findLoops.h"

#include <algorithm>
#include <limits>

namespace ModelingProgram {

namespace {

    constexpr unsigned int kNoPlace = Tessara::Geometry::kInvalidIndex;
    constexpr std::size_t kMostCompared = 16; // boundaries at a point of which all pairs are compared

    /// An end of a boundary side at a point.
    struct BoundaryEnd {
        unsigned int point;
        unsigned int place; // of the side, in the list of boundary sides
        friend auto operator<=>(BoundaryEnd const&, BoundaryEnd const&) = default;
    };
    using Ends = std::span<BoundaryEnd const>;

    /// Finds for each boundary side the one that follows it.
    class Followers {
    public:
        Followers(MeshArrays const& mesh, Adjacency const& adjacency, std::vector<unsigned int> const& sides)
            : position_(mesh.positions->data)
            , adjacency_(adjacency)
            , sides_(sides)
            , followers_(sides.size(), kNoPlace)
        {
            std::vector<BoundaryEnd> in, out;
            for (unsigned int place = 0; place != sides.size(); ++place) {
                in.push_back({adjacency.endOf(sides[place]), place});
                out.push_back({adjacency.startOf(sides[place]), place});
            }
            std::sort(in.begin(), in.end());
            std::sort(out.begin(), out.end());
            auto const endOfPoint = [](auto first, auto last) {
                return std::find_if(first, last, [=](BoundaryEnd const& end) { return end.point != first->point; });
            };
            auto outFirst = out.begin();
            for (auto first = in.begin(); first != in.end();) {
                auto const last = endOfPoint(first, in.end());
                while (outFirst != out.end() && outFirst->point < first->point)
                    ++outFirst;
                if (outFirst != out.end() && outFirst->point == first->point) {
                    auto const outLast = endOfPoint(outFirst, out.end());
                    connect({first, last}, {outFirst, outLast});
                    outFirst = outLast;
                }
                first = last;
            }
        }

        std::vector<unsigned int> take() { return std::move(followers_); }

    private:
        void connect(Ends in, Ends out)
        {
            if (in.size() == 1 && out.size() == 1)
                followers_[in[0].place] = out[0].place;
            else if (in.size() <= kMostCompared && out.size() <= kMostCompared)
                connectAtSmallestAngles(in, out);
            else
                connectInFans(in, out);
        }

        double3 directionOf(unsigned int from, unsigned int to) const
        {
            double3 const d = inDoubles(position_[to]) - inDoubles(position_[from]);
            double const size = length(d);
            return size > 0 ? double3{d.x / size, d.y / size, d.z / size} : d;
        }

        void connectAtSmallestAngles(Ends in, Ends out)
        {
            bool isTaken[kMostCompared] = {};
            for (BoundaryEnd const& end : in) {
                unsigned int const point = end.point;
                double3 const back = directionOf(point, adjacency_.startOf(sides_[end.place]));
                double bestCosine = -std::numeric_limits<double>::infinity();
                std::size_t best = out.size();
                for (std::size_t i = 0; i != out.size(); ++i) {
                    double const cosine = dot(back, directionOf(point, adjacency_.endOf(sides_[out[i].place])));
                    if (!isTaken[i] && (best == out.size() || cosine > bestCosine)) {
                        bestCosine = cosine;
                        best = i;
                    }
                }
                if (best != out.size()) {
                    isTaken[best] = true;
                    followers_[end.place] = out[best].place;
                }
            }
        }

        /// Walks around the point from each side that ends there, through the fan of its face.
        void connectInFans(Ends in, Ends out)
        {
            for (BoundaryEnd const& end : in) {
                unsigned int side = adjacency_.next(sides_[end.place]); // starts at the point
                while (adjacency_.isJoined(side) && adjacency_.areOpposite(side, adjacency_.across(side)))
                    side = adjacency_.next(adjacency_.across(side));
                auto const follower = std::lower_bound(out.begin(), out.end(), side,
                    [&](BoundaryEnd const& o, unsigned int s) { return sides_[o.place] < s; });
                if (follower != out.end() && sides_[follower->place] == side)
                    followers_[end.place] = follower->place;
            }
        }

        float3 const* position_;
        Adjacency const& adjacency_;
        std::vector<unsigned int> const& sides_;
        std::vector<unsigned int> followers_;
    };

    /// Follows the sides and divides loops where they return to a point.
    class LoopWalk {
    public:
        LoopWalk(MeshArrays const& mesh, Adjacency const& adjacency, std::vector<unsigned int> const& sides,
            std::vector<unsigned int> const& followers)
            : adjacency_(adjacency)
            , sides_(sides)
            , followers_(followers)
            , isVisited_(sides.size())
            , depthOfPoint_(mesh.pointCount(), kNoPlace)
        {
        }

        Loops run()
        {
            for (unsigned int first = 0; first != sides_.size(); ++first) {
                unsigned int place = first;
                for (; place != kNoPlace && !isVisited_[place]; place = followers_[place]) {
                    isVisited_[place] = true;
                    unsigned int const side = sides_[place];
                    closeLoopAt(adjacency_.startOf(side));
                    depthOfPoint_[adjacency_.startOf(side)] = static_cast<unsigned int>(path_.size());
                    path_.push_back(side);
                }
                if (place == first && !path_.empty())
                    closeLoopAt(adjacency_.startOf(sides_[place]));
                dropPath(0);
            }
            return std::move(loops_);
        }

    private:
        /// If the path visits the point, the part since then is a loop.
        void closeLoopAt(unsigned int point)
        {
            unsigned int const depth = depthOfPoint_[point];
            if (depth == kNoPlace)
                return;
            loops_.sides.insert(loops_.sides.end(), path_.begin() + depth, path_.end());
            loops_.starts.push_back(loops_.sides.size());
            dropPath(depth);
        }

        void dropPath(std::size_t depth)
        {
            for (std::size_t i = depth; i != path_.size(); ++i)
                depthOfPoint_[adjacency_.startOf(path_[i])] = kNoPlace;
            path_.resize(depth);
        }

        Adjacency const& adjacency_;
        std::vector<unsigned int> const& sides_;
        std::vector<unsigned int> const& followers_;
        std::vector<bool> isVisited_;
        std::vector<unsigned int> depthOfPoint_; // in the path
        std::vector<unsigned int> path_; // sides
        Loops loops_;
    };

}

Loops findLoops(MeshArrays const& mesh, Adjacency const& adjacency)
{
    std::vector<unsigned int> sides;
    for (unsigned int side = 0; side != mesh.cornerCount(); ++side)
        if (adjacency.isBoundary(side))
            sides.push_back(side);
    if (sides.empty())
        return {};
    std::vector<unsigned int> const followers = Followers(mesh, adjacency, sides).take();
    return LoopWalk(mesh, adjacency, sides, followers).run();
}

}
