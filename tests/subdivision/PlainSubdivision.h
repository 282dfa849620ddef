#pragma once

#include "frame/VectorMath.h"

#include "support/Testing.h"

#include <set>

namespace TestSupport {

using namespace Modeling;

/// The longest side of a face's axis-aligned bounding box.
inline float largestSide(MeshBuilder::Triangle const& face, std::vector<float3> const& points)
{
    float side = 0;
    for (unsigned int k = 0; k != 3; ++k) {
        float3 const edge = points[face[(k + 1) % 3]] - points[face[k]];
        side = std::max({side, std::abs(edge.x), std::abs(edge.y), std::abs(edge.z)});
    }
    return side;
}

/// A plain reference for the operation: maps, every sweep over all faces, and no shortcuts. For triangle meshes.
class PlainSubdivision {
public:
    using Triangle = MeshBuilder::Triangle;

    explicit PlainSubdivision(MeshBuilder const& mesh)
        : faces(mesh.faces)
        , positions(mesh.points)
        , values(mesh.points)
        , states(faces.size(), 0)
    {
        rebuild();
        for (unsigned int v = 0; v != positions.size(); ++v) {
            auto const n = static_cast<float>(neighbors_[v].size());
            float3 const sum = sumOf(neighbors_[v], [this](unsigned int u) { return positions[u]; });
            points_.push_back({positions[v], limit(positions[v], sum, beta(n), n), 0});
        }
    }

    void run(float tolerance)
    {
        std::size_t before = 0;
        while (before != faces.size()) {
            before = faces.size();
            Orvan::Array<bool> marks;
            for (Triangle const& face : faces)
                marks.append(largestSide(face, positions) > tolerance + tolerance);
            pass(marks);
        }
    }

    void pass(Orvan::Array<bool> const& marks)
    {
        for (std::size_t f = 0; f != faces.size(); ++f)
            states[f] |= marks[f] && level(f) < kFinestLevel ? 1u : 0u;
        while (sweep()) { }
        std::vector<unsigned int> newPoint(faces.size());
        for (unsigned int f = 0; f != faces.size(); ++f)
            if (splits(f) && level(f) % 2 == 0) {
                newPoint[f] = static_cast<unsigned int>(points_.size());
                points_.push_back(pointIn(f));
                values.push_back(sumOf(faces[f], [this](unsigned int v) { return values[v]; }) * 0.33333334f);
            }
        replaceFaces(newPoint);
        positions.resize(points_.size());
        rebuild();
        for (unsigned int v = 0; v != positions.size(); ++v)
            positions[v] = at(v, finest_[v] >> 1);
    }

    static constexpr unsigned int kFinestLevel = 62; // cannot be marked: 64 does not fit the bits
    unsigned int level(std::size_t f) const { return states[f] >> 2; }

    std::vector<Triangle> faces;
    std::vector<float3> positions, values;
    std::vector<unsigned int> states;

private:
    struct Point {
        float3 base, limit;
        unsigned int level;
    };
    static constexpr unsigned int kNone = ~0u;
    struct Owner {
        unsigned int face, corner;
    };

    template <class Points, class ValueAt> static float3 sumOf(Points const& points, ValueAt const& valueAt)
    {
        float3 sum{0, 0, 0};
        for (unsigned int const point : points)
            sum = sum + valueAt(point);
        return sum;
    }
    static float3 third(float3 a) { return {a.x / 3.0f, a.y / 3.0f, a.z / 3.0f}; }
    static float cosine(float angle)
    {
        float volatile const atRunTime = angle;
        return std::cos(atRunTime);
    }
    static float beta(float n) { return (4 - 2 * cosine(6.2831855f / n)) / 9; }

    static float3 limit(float3 p, float3 sum, float beta, float n)
    {
        float const t = beta * 3, gamma = t / (t + 1);
        return p * (1 - gamma) + sum * (gamma / n);
    }

    float3 at(unsigned int v, unsigned int h) const
    {
        float const lambda = 0.6666667f - beta(static_cast<float>(neighbors_[v].size()));
        float const w = std::pow(lambda, static_cast<float>(h - points_[v].level));
        return points_[v].limit * (1 - w) + points_[v].base * w;
    }

    bool splits(std::size_t f) const { return states[f] & 2; }
    Owner twin(std::size_t f, unsigned int k) const
    {
        auto const found = owners_.find({faces[f][(k + 1) % 3], faces[f][k]});
        return found == owners_.end() ? Owner{kNone, 0} : found->second;
    }
    unsigned int across(std::size_t f, unsigned int k) const { return twin(f, k).face; }
    unsigned int pointAcross(std::size_t f, unsigned int k) const
    {
        return faces[across(f, k)][(twin(f, k).corner + 1) % 3];
    }

    bool sweep()
    {
        std::vector<unsigned int> const current = states;
        for (std::size_t f = 0; f != faces.size(); ++f) {
            unsigned int const l = current[f] >> 2;
            unsigned int m = current[f] & 1, t = current[f] >> 1 & 1, lowest = ~0u;
            for (unsigned int k = 0; k != 3; ++k) {
                if (across(f, k) == kNone)
                    continue;
                unsigned int const n = current[across(f, k)], other = n >> 2;
                lowest = std::min(lowest, other);
                if (n & 1)
                    m |= l % 2 ? other != l : l < other;
                if (n & 2 && l % 2 && other < l)
                    t = 1;
            }
            if (l % 2 == 0 && m && l <= lowest)
                t = 1;
            states[f] = l << 2 | t << 1 | m;
        }
        return states != current;
    }

    Point pointIn(unsigned int f) const
    {
        unsigned int const h = level(f) >> 1;
        auto const middle = [&](unsigned int face) {
            return third(sumOf(faces[face], [&](unsigned int v) { return at(v, h); }));
        };
        float3 next{0, 0, 0};
        unsigned int newLevel = 0;
        for (unsigned int k = 0; k != 3; ++k) {
            next = next + at(faces[f][k], h + 1);
            newLevel = std::max(newLevel, points_[faces[f][k]].level + 1);
            if (unsigned int const n = across(f, k); n != kNone)
                next = next + (level(n) % 2 ? at(pointAcross(f, k), h) : middle(n));
        }
        float const betaOfSix = (4 - 2 * cosine(1.0471976f)) / 9;
        return {middle(f), limit(middle(f), next, betaOfSix, 6), newLevel};
    }

    void replaceFaces(std::vector<unsigned int> const& newPoint)
    {
        std::vector<Triangle> newFaces;
        std::vector<unsigned int> newStates;
        auto const add = [&](Triangle const& face, unsigned int state) {
            newFaces.push_back(face);
            newStates.push_back(state);
        };
        for (std::size_t f = 0; f != faces.size(); ++f)
            if (!splits(f))
                add(faces[f], states[f]);
        for (std::size_t f = 0; f != faces.size(); ++f)
            for (unsigned int k = 0; k != 3 && splits(f) && level(f) % 2 == 0; ++k) {
                unsigned int const a = faces[f][k], b = faces[f][(k + 1) % 3], c = newPoint[f], n = across(f, k);
                if (n == kNone)
                    continue;
                if (!splits(n)) {
                    add({a, b, c}, (level(f) + 1) << 2);
                } else if (level(n) > level(f)) {
                    add({a, pointAcross(f, k), c}, (level(f) + 2) << 2);
                    add({b, c, pointAcross(f, k)}, (level(f) + 2) << 2);
                } else if (level(n) == level(f)) {
                    add({a, newPoint[n], c}, (level(f) + 2) << 2);
                }
            }
        faces = newFaces;
        states = newStates;
    }

    void rebuild()
    {
        owners_.clear();
        neighbors_.assign(positions.size(), {});
        finest_.assign(positions.size(), 0);
        for (unsigned int f = 0; f != faces.size(); ++f)
            for (unsigned int k = 0; k != 3; ++k) {
                unsigned int const end = faces[f][k], start = faces[f][(k + 2) % 3];
                if (owners_.try_emplace({start, end}, Owner{f, k}).second)
                    finest_[end] = std::max(finest_[end], level(f));
                neighbors_[end].insert(start);
            }
    }

    std::vector<Point> points_;
    std::map<std::pair<unsigned int, unsigned int>, Owner> owners_; // of directed edges, with the corner at their end
    std::vector<std::set<unsigned int>> neighbors_;
    std::vector<unsigned int> finest_; // the highest level of a face at each point
};

}
