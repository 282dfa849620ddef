#include "MeshBuilder.h"

#include "Random.h"

#include <TessaraGeometry/Makers.h>

#include <algorithm>
#include <cmath>
#include <numeric>
#include <tuple>

namespace TestSupport {

namespace {

    float3 onSphere(int x, int y, int z)
    {
        auto const length = std::sqrt(static_cast<float>(x * x + y * y + z * z));
        return {static_cast<float>(x) / length, static_cast<float>(y) / length, static_cast<float>(z) / length};
    }

    /// Points of the octahedron |x| + |y| + |z| = n by rings of constant z: a ring of "radius" r has 4 r points, a pole
    /// one.
    struct OctahedronGrid {
        int n;

        static unsigned int ringSize(int radius) { return radius == 0 ? 1 : 4 * static_cast<unsigned int>(radius); }

        float3 point(int z, unsigned int t) const
        {
            int const radius = n - std::abs(z);
            if (radius == 0)
                return onSphere(0, 0, z);
            int const side = static_cast<int>(t) / radius;
            int const step = static_cast<int>(t) % radius;
            int const corners[4][2] = {{radius, 0}, {0, radius}, {-radius, 0}, {0, -radius}};
            int const steps[4][2] = {{-1, 1}, {-1, -1}, {1, -1}, {1, 1}};
            return onSphere(corners[side][0] + step * steps[side][0], corners[side][1] + step * steps[side][1], z);
        }
    };

    /// The faces between a ring of radius r and the next smaller one.
    void addBelt(unsigned int outerStart, unsigned int innerStart, int radius, bool isUpper,
        std::vector<MeshBuilder::Triangle>& faces)
    {
        auto const r = static_cast<unsigned int>(radius);
        auto const outer = [=](unsigned int t) { return outerStart + t % (4 * r); };
        auto const inner = [=](unsigned int t) { return innerStart + t % OctahedronGrid::ringSize(radius - 1); };
        auto const add = [&](unsigned int a, unsigned int b, unsigned int c) {
            faces.push_back(isUpper ? MeshBuilder::Triangle{a, b, c} : MeshBuilder::Triangle{b, a, c});
        };
        for (unsigned int side = 0; side != 4; ++side)
            for (unsigned int step = 0; step != r; ++step) {
                add(outer(side * r + step), outer(side * r + step + 1), inner(side * (r - 1) + step));
                if (step + 1 != r)
                    add(inner(side * (r - 1) + step), outer(side * r + step + 1), inner(side * (r - 1) + step + 1));
            }
    }

}

MeshBuilder MeshBuilder::of(std::vector<float3> points, std::vector<Triangle> faces)
{
    MeshBuilder mesh;
    mesh.points = std::move(points);
    mesh.faces = std::move(faces);
    return mesh;
}

MeshBuilder MeshBuilder::tetrahedron()
{
    return of({{1, 1, 1}, {1, -1, -1}, {-1, 1, -1}, {-1, -1, 1}}, {{0, 1, 2}, {0, 3, 1}, {0, 2, 3}, {1, 3, 2}});
}

MeshBuilder MeshBuilder::sphere(unsigned int segments)
{
    MeshBuilder mesh;
    int const n = static_cast<int>(segments);
    OctahedronGrid const grid{n};
    std::vector<unsigned int> ringStart;
    for (int z = n; z >= -n; --z) {
        ringStart.push_back(static_cast<unsigned int>(mesh.points.size()));
        for (unsigned int t = 0; t != OctahedronGrid::ringSize(n - std::abs(z)); ++t)
            mesh.points.push_back(grid.point(z, t));
    }
    for (int radius = 1; radius <= n; ++radius) {
        auto const r = static_cast<std::size_t>(radius);
        auto const bottom = static_cast<std::size_t>(2 * n);
        addBelt(ringStart[r], ringStart[r - 1], radius, true, mesh.faces);
        addBelt(ringStart[bottom - r], ringStart[bottom - r + 1], radius, false, mesh.faces);
    }
    return mesh;
}

MeshBuilder MeshBuilder::sphereWithFaces(std::size_t atLeast)
{
    unsigned int segments = 1;
    while (8 * std::size_t{segments} * segments < atLeast)
        ++segments;
    return sphere(segments);
}

MeshBuilder MeshBuilder::icosahedron()
{
    float const t = (1 + std::sqrt(5.0f)) / 2;
    return of({{-1, t, 0}, {1, t, 0}, {-1, -t, 0}, {1, -t, 0}, {0, -1, t}, {0, 1, t}, {0, -1, -t}, {0, 1, -t},
                  {t, 0, -1}, {t, 0, 1}, {-t, 0, -1}, {-t, 0, 1}},
        {{0, 11, 5}, {0, 5, 1}, {0, 1, 7}, {0, 7, 10}, {0, 10, 11}, {1, 5, 9}, {5, 11, 4}, {11, 10, 2}, {10, 7, 6},
            {7, 1, 8}, {3, 9, 4}, {3, 4, 2}, {3, 2, 6}, {3, 6, 8}, {3, 8, 9}, {4, 9, 5}, {2, 4, 11}, {6, 2, 10},
            {8, 6, 7}, {9, 8, 1}});
}

MeshBuilder MeshBuilder::torus(unsigned int rings, unsigned int sides)
{
    // Circles as chords of the rational parametrisation would be uneven; a square ring with a square section will do.
    auto const onSquare = [](unsigned int i, unsigned int count) {
        float const t = 8.0f * static_cast<float>(i) / static_cast<float>(count);
        float const x = t < 1 ? 1.0f : t < 3 ? 2 - t : t < 5 ? -1.0f : t < 7 ? t - 6 : 1.0f;
        float const y = t < 1 ? t : t < 3 ? 1.0f : t < 5 ? 4 - t : t < 7 ? -1.0f : t - 8;
        float const length = std::sqrt(x * x + y * y);
        return std::pair(x / length, y / length);
    };
    MeshBuilder mesh;
    for (unsigned int ring = 0; ring != rings; ++ring)
        for (unsigned int side = 0; side != sides; ++side) {
            auto const [cx, cy] = onSquare(ring, rings);
            auto const [dx, dz] = onSquare(side, sides);
            mesh.points.push_back({cx * (3 + dx), cy * (3 + dx), dz});
        }
    for (unsigned int ring = 0; ring != rings; ++ring)
        for (unsigned int side = 0; side != sides; ++side) {
            unsigned int const a = ring * sides + side;
            unsigned int const b = (ring + 1) % rings * sides + side;
            unsigned int const c = (ring + 1) % rings * sides + (side + 1) % sides;
            unsigned int const d = ring * sides + (side + 1) % sides;
            mesh.faces.push_back({a, b, c});
            mesh.faces.push_back({a, c, d});
        }
    return mesh;
}

MeshBuilder MeshBuilder::bipyramid(unsigned int rim)
{
    MeshBuilder mesh;
    for (unsigned int i = 0; i != rim; ++i) {
        // Around a diamond, so that no angle functions are needed.
        float const t = 4.0f * static_cast<float>(i) / static_cast<float>(rim);
        float const x = t < 2 ? 1 - t : t - 3;
        float const y = t < 1 ? t : t < 3 ? 2 - t : t - 4;
        mesh.points.push_back({x, y, 0});
    }
    mesh.points.push_back({0, 0, 1});
    mesh.points.push_back({0, 0, -1});
    for (unsigned int i = 0; i != rim; ++i) {
        mesh.faces.push_back({i, (i + 1) % rim, rim});
        mesh.faces.push_back({(i + 1) % rim, i, rim + 1});
    }
    return mesh;
}

MeshBuilder MeshBuilder::square(unsigned int segments)
{
    MeshBuilder mesh;
    for (unsigned int y = 0; y <= segments; ++y)
        for (unsigned int x = 0; x <= segments; ++x)
            mesh.points.push_back({static_cast<float>(x), static_cast<float>(y), 0});
    for (unsigned int y = 0; y != segments; ++y)
        for (unsigned int x = 0; x != segments; ++x) {
            unsigned int const a = y * (segments + 1) + x;
            mesh.faces.push_back({a, a + 1, a + segments + 2});
            mesh.faces.push_back({a, a + segments + 2, a + segments + 1});
        }
    return mesh;
}

MeshBuilder MeshBuilder::withNeedles(std::size_t cuts, float fraction) &&
{
    struct HalfEdge {
        unsigned int low, high;
        std::size_t face;
        unsigned int corner;
    };
    std::vector<HalfEdge> halfEdges;
    for (std::size_t face = 0; face != faces.size(); ++face)
        for (unsigned int k = 0; k != 3; ++k) {
            auto const [low, high] = std::minmax(faces[face][k], faces[face][(k + 1) % 3]);
            halfEdges.push_back({low, high, face, k});
        }
    auto const key = [](HalfEdge const& h) { return std::tuple(h.low, h.high, h.face, h.corner); };
    std::sort(halfEdges.begin(), halfEdges.end(), [&](auto const& a, auto const& b) { return key(a) < key(b); });

    std::vector<bool> isCut(faces.size());
    std::size_t const spacing = std::max<std::size_t>(1, halfEdges.size() / 2 / std::max<std::size_t>(1, cuts) / 2);
    for (std::size_t i = 0; cuts != 0 && i + 1 < halfEdges.size(); i += 2 * spacing) {
        HalfEdge const f = halfEdges[i];
        HalfEdge const g = halfEdges[i + 1];
        bool const isEdge = f.low == g.low && f.high == g.high && f.face != g.face;
        if (!isEdge || isCut[f.face] || isCut[g.face])
            continue;
        isCut[f.face] = isCut[g.face] = true;
        --cuts;
        Triangle const inF = faces[f.face], inG = faces[g.face];
        unsigned int const a = inF[f.corner], b = inF[(f.corner + 1) % 3];
        unsigned int const c = inF[(f.corner + 2) % 3], d = inG[(g.corner + 2) % 3];
        float3 const from = points[a], to = points[b];
        auto const middle = static_cast<unsigned int>(points.size());
        points.push_back({from.x + (to.x - from.x) * fraction, from.y + (to.y - from.y) * fraction,
            from.z + (to.z - from.z) * fraction});
        faces[f.face] = {a, middle, c};
        faces[g.face] = {middle, a, d};
        faces.push_back({middle, b, c});
        faces.push_back({b, middle, d});
    }
    return std::move(*this);
}

MeshBuilder MeshBuilder::withNoise(float amount, unsigned int seed) &&
{
    Random random(seed);
    for (float3& point : points) {
        point.x += amount * random.coordinate();
        point.y += amount * random.coordinate();
        point.z += amount * random.coordinate();
    }
    return std::move(*this);
}

MeshBuilder MeshBuilder::shuffled(unsigned int seed) &&
{
    Random random(seed);
    // Written out, because standard libraries shuffle differently.
    auto const shuffle = [&](auto& values) {
        for (std::size_t i = values.size(); i > 1; --i)
            std::swap(values[i - 1], values[random.below(i)]);
    };
    std::vector<unsigned int> order(points.size());
    std::iota(order.begin(), order.end(), 0u);
    shuffle(order);
    std::vector<float3> moved(points.size());
    for (std::size_t point = 0; point != points.size(); ++point)
        moved[order[point]] = points[point];
    points = std::move(moved);
    for (Triangle& face : faces)
        for (unsigned int& corner : face)
            corner = order[corner];
    shuffle(faces);
    return std::move(*this);
}

MeshBuilder MeshBuilder::withoutFace(std::size_t face) &&
{
    faces.erase(faces.begin() + static_cast<std::ptrdiff_t>(face));
    return std::move(*this);
}

MeshBuilder MeshBuilder::joinedWith(MeshBuilder const& other, float3 offset) &&
{
    auto const first = static_cast<unsigned int>(points.size());
    for (float3 const& p : other.points)
        points.push_back({p.x + offset.x, p.y + offset.y, p.z + offset.z});
    for (Triangle const& f : other.faces)
        faces.push_back({f[0] + first, f[1] + first, f[2] + first});
    return std::move(*this);
}

Orvan::MutablePtr<Tessara::Object> MeshBuilder::build() const
{
    Orvan::Array<unsigned int> corners;
    Orvan::Array<unsigned int> offsets;
    corners.reserve(3 * faces.size());
    offsets.reserve(faces.size() + 1);
    offsets.append(0);
    for (Triangle const& face : faces) {
        for (unsigned int const corner : face)
            corners.append(corner);
        offsets.append(static_cast<unsigned int>(corners.size));
    }
    return Tessara::Geometry::makeMesh(
        Orvan::Array<float3>(std::span<float3 const>(points)), std::move(corners), std::move(offsets));
}

}
