#include "splitPoints.h"

#include "joinSides.h"

namespace ModelingProgram {

namespace {

    /// Finds the corners at the same point that joined sides connect.
    class Fans {
    public:
        Fans(MeshArrays const& mesh, Adjacency const& adjacency)
            : pointAt_(mesh.faceVertex->data)
            , adjacency_(adjacency)
            , isVisited_(mesh.cornerCount())
        {
        }

        bool isVisited(unsigned int corner) const { return isVisited_[corner]; }

        /// Calls `visit(corner)` for all corners of a fan.
        template <class Visit> void forEachCorner(unsigned int corner, Visit const& visit)
        {
            isVisited_[corner] = true;
            visit(corner);
            if (!walk(corner, corner, visit))
                walk(corner, adjacency_.previous(corner), visit);
        }

    private:
        /// Walks from a corner across one of its sides, and on in that direction around the point.
        /// \return whether this leads back to the corner
        template <class Visit> bool walk(unsigned int corner, unsigned int side, Visit const& visit)
        {
            unsigned int const first = corner;
            unsigned int const point = pointAt_[corner];
            for (;;) {
                bool isStart = false; // whether the side that leads to the next corner starts at it
                if (adjacency_.isJoined(side)) {
                    side = adjacency_.across(side);
                    isStart = pointAt_[side] == point;
                } else if (pointAt_[side] == pointAt_[adjacency_.next(side)]) { // the next corner of the same face
                    isStart = side != corner;
                } else {
                    return false;
                }
                corner = isStart ? side : adjacency_.next(side);
                if (corner == first)
                    return true;
                if (isVisited_[corner])
                    return false;
                isVisited_[corner] = true;
                visit(corner);
                side = isStart ? adjacency_.previous(corner) : corner;
            }
        }

        unsigned int const* pointAt_;
        Adjacency const& adjacency_;
        std::vector<bool> isVisited_;
    };

    void appendPoints(std::vector<unsigned int> const& originals, MeshWithSources& mesh)
    {
        editArray(mesh.arrays.positions, [&](Orvan::Array<float3>& positions) {
            for (unsigned int const point : originals)
                positions.append(positions[point]);
        });
        for (unsigned int const point : originals)
            mesh.pointSource.append(mesh.pointSource[point]);
    }

}

unsigned int splitPoints(MeshWithSources& mesh, Adjacency const& adjacency)
{
    MeshArrays const old = mesh.arrays; // the walk needs the points as they were
    Fans fans(old, adjacency);
    std::vector<bool> isTaken(old.pointCount());
    std::vector<unsigned int> originals; // of the new points
    std::vector<std::array<unsigned int, 2>> moved; // a corner and its new point
    for (unsigned int corner = 0; corner != old.cornerCount(); ++corner) {
        if (fans.isVisited(corner))
            continue;
        unsigned int const face = adjacency.faceOf(corner);
        if ((*old.faceOffset)[face + 1] - (*old.faceOffset)[face] < 3)
            continue;
        unsigned int const point = (*old.faceVertex)[corner];
        if (!isTaken[point]) {
            isTaken[point] = true;
            fans.forEachCorner(corner, [](unsigned int) {});
            continue;
        }
        auto const added = static_cast<unsigned int>(old.pointCount() + originals.size());
        originals.push_back(point);
        fans.forEachCorner(corner, [&](unsigned int other) { moved.push_back({other, added}); });
    }
    if (originals.empty())
        return 0;
    editArray(mesh.arrays.faceVertex, [&](Orvan::Array<unsigned int>& points) {
        for (auto const& [corner, point] : moved)
            points[corner] = point;
    });
    appendPoints(originals, mesh);
    return static_cast<unsigned int>(originals.size());
}

unsigned int cutCrowdedEdges(MeshWithSources const& mesh, Adjacency& adjacency)
{
    Adjacency other(mesh.arrays);
    NonManifoldEdges const edges = joinTwoSided(mesh.arrays, other);
    for (unsigned int const side : edges.sides)
        adjacency.cut(side);
    return static_cast<unsigned int>(edges.count());
}

}
