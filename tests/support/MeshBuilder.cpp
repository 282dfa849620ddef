#include "MeshBuilder.h"

#include "Random.h"

#include <TessaraGeometry/Makers.h>

#include <algorithm>
#include <cmath>
#include <numeric>
#include <span>
#include <tuple>

namespace TestSupport {

namespace {

    float3 onSphere(int x, int y, int z)
    {
        auto const length = std::sqrt(static_cast<float>(x * x + y * y + z * z));
        return {static_cast<float>(x) / length, static_cast<float>(y) / length, static_cast<float>(z) / length};
    }

    /// Moves every point by up to `amount` along each axis.
    void addNoise(float amount, unsigned int seed, std::vector<float3>& points)
    {
        Random random(seed);
        for (float3& p : points) {
            p.x += amount * random.coordinate();
            p.y += amount * random.coordinate();
            p.z += amount * random.coordinate();
        }
    }

    /// The position at the fraction step / stepCount of the way around the square [-1, 1]² in the plane z = 0. Needs no
    /// sines.
    float3 aroundSquare(unsigned int step, unsigned int stepCount)
    {
        float const along = 8 * static_cast<float>(step) / static_cast<float>(stepCount);
        float const side = std::floor(along / 2);
        float const t = along - 2 * side - 1;
        float3 const sides[] = {{t, -1, 0}, {1, t, 0}, {-t, 1, 0}, {-1, -t, 0}};
        return sides[static_cast<int>(side)];
    }

}

MeshBuilder MeshBuilder::tetrahedron()
{
    return of({{1, 1, 1}, {1, -1, -1}, {-1, 1, -1}, {-1, -1, 1}}, {{0, 1, 2}, {0, 3, 1}, {0, 2, 3}, {1, 3, 2}});
}

MeshBuilder MeshBuilder::sphere(unsigned int segments)
{
    // Points of the octahedron |x| + |y| + |z| = n by rings of constant z: a ring of "radius" r has 4 r points, a pole
    // one.
    MeshBuilder mesh;
    std::vector<unsigned int> ringStart;
    int const n = static_cast<int>(segments);
    for (int z = n; z >= -n; --z) {
        int const radius = n - std::abs(z);
        ringStart.push_back(static_cast<unsigned int>(mesh.points.size()));
        if (radius == 0)
            mesh.points.push_back(onSphere(0, 0, z));
        for (int t = 0; t != 4 * radius; ++t) {
            int const step = t % radius, rest = radius - step;
            int const sides[4][2] = {{rest, step}, {-step, rest}, {-rest, -step}, {step, -rest}};
            auto const [x, y] = sides[t / radius];
            mesh.points.push_back(onSphere(x, y, z));
        }
    }
    // The faces between a ring of radius r and the next smaller one.
    for (unsigned int r = 1; r <= segments; ++r)
        for (bool const isUpper : {true, false}) {
            unsigned int const outerRing = isUpper ? r : 2 * segments - r, innerRing = isUpper ? r - 1 : outerRing + 1;
            auto const outer = [&](unsigned int t) { return ringStart[outerRing] + t % (4 * r); };
            auto const inner = [&](unsigned int t) { return ringStart[innerRing] + t % std::max(1u, 4 * (r - 1)); };
            auto const add = [&](unsigned int a, unsigned int b, unsigned int c) {
                mesh.faces.push_back(isUpper ? Triangle{a, b, c} : Triangle{b, a, c});
            };
            for (unsigned int t = 0; t != 4 * r; ++t) {
                unsigned int const below = t - t / r; // the inner ring has one point fewer per side
                add(outer(t), outer(t + 1), inner(below));
                if (t % r + 1 != r)
                    add(inner(below), outer(t + 1), inner(below + 1));
            }
        }
    return mesh;
}

MeshBuilder MeshBuilder::sphereWithFaces(std::size_t atLeast)
{
    return sphere(std::max(1u, static_cast<unsigned int>(std::ceil(std::sqrt(static_cast<double>(atLeast) / 8)))));
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
    auto const onCircle = [](unsigned int step, unsigned int stepCount) {
        auto const [x, y, z] = aroundSquare(step, stepCount);
        float const length = std::sqrt(x * x + y * y);
        return std::pair(x / length, y / length);
    };
    auto const at = [=](unsigned int ring, unsigned int side) { return ring % rings * sides + side % sides; };
    MeshBuilder mesh;
    for (unsigned int ring = 0; ring != rings; ++ring)
        for (unsigned int side = 0; side != sides; ++side) {
            auto const [cx, cy] = onCircle(ring, rings);
            auto const [dx, dz] = onCircle(side, sides);
            mesh.points.push_back({cx * (3 + dx), cy * (3 + dx), dz});
            mesh.faces.push_back({at(ring, side), at(ring + 1, side), at(ring + 1, side + 1)});
            mesh.faces.push_back({at(ring, side), at(ring + 1, side + 1), at(ring, side + 1)});
        }
    return mesh;
}

MeshBuilder MeshBuilder::bipyramid(unsigned int rim)
{
    MeshBuilder mesh;
    for (unsigned int i = 0; i != rim; ++i)
        mesh.points.push_back(aroundSquare(i, rim));
    mesh.points.push_back({0, 0, 1});
    mesh.points.push_back({0, 0, -1});
    for (unsigned int i = 0; i != rim; ++i) {
        mesh.faces.push_back({i, (i + 1) % rim, rim});
        mesh.faces.push_back({(i + 1) % rim, i, rim + 1});
    }
    return mesh;
}

MeshBuilder MeshBuilder::wheel(unsigned int rim, std::vector<float> const& radii)
{
    MeshBuilder mesh = bipyramid(rim);
    for (unsigned int point = 0; point != rim; ++point) {
        mesh.points[point].x *= radii[point % radii.size()];
        mesh.points[point].y *= radii[point % radii.size()];
    }
    mesh.points[rim].z = 0.001f;
    mesh.points[rim + 1].z = -0.001f;
    return mesh;
}

MeshBuilder MeshBuilder::withNeedles(std::size_t cuts, float fraction) &&
{
    using HalfEdge = std::tuple<unsigned int, unsigned int, std::size_t, unsigned int>; // points, face, corner
    std::vector<HalfEdge> halfEdges;
    for (std::size_t face = 0; face != faces.size(); ++face)
        for (unsigned int k = 0; k != 3; ++k) {
            auto const [low, high] = std::minmax(faces[face][k], faces[face][(k + 1) % 3]);
            halfEdges.emplace_back(low, high, face, k);
        }
    std::ranges::sort(halfEdges);

    std::vector<bool> isCut(faces.size());
    std::size_t const spacing = std::max<std::size_t>(1, halfEdges.size() / 2 / std::max<std::size_t>(1, cuts) / 2);
    for (std::size_t i = 0; cuts != 0 && i + 1 < halfEdges.size(); i += 2 * spacing) {
        auto const [low, high, f, cornerF] = halfEdges[i];
        auto const [otherLow, otherHigh, g, cornerG] = halfEdges[i + 1];
        if (low != otherLow || high != otherHigh || f == g || isCut[f] || isCut[g])
            continue;
        isCut[f] = isCut[g] = true;
        --cuts;
        Triangle const inF = faces[f], inG = faces[g];
        unsigned int const a = inF[cornerF], b = inF[(cornerF + 1) % 3];
        unsigned int const c = inF[(cornerF + 2) % 3], d = inG[(cornerG + 2) % 3];
        auto const middle = static_cast<unsigned int>(points.size());
        auto const cut = [=](float from, float to) { return from + (to - from) * fraction; };
        points.push_back({cut(points[a].x, points[b].x), cut(points[a].y, points[b].y), cut(points[a].z, points[b].z)});
        faces[f] = {a, middle, c};
        faces[g] = {middle, a, d};
        faces.push_back({middle, b, c});
        faces.push_back({b, middle, d});
    }
    return std::move(*this);
}

MeshBuilder MeshBuilder::withNoise(float amount, unsigned int seed) &&
{
    addNoise(amount, seed, points);
    return std::move(*this);
}

MeshBuilder MeshBuilder::graded() &&
{
    for (float3& p : points) {
        float const squared = p.x * p.x + p.y * p.y + (p.z + 0.5f) * (p.z + 0.5f);
        p = {p.x / squared, p.y / squared, (p.z + 0.5f) / squared};
    }
    return std::move(*this);
}

MeshBuilder MeshBuilder::shuffled(unsigned int seed) &&
{
    Random random(seed);
    std::vector<unsigned int> order(points.size());
    std::iota(order.begin(), order.end(), 0u);
    random.shuffle(order);
    std::vector<float3> moved(points.size());
    for (std::size_t point = 0; point != points.size(); ++point)
        moved[order[point]] = points[point];
    points = std::move(moved);
    for (Triangle& face : faces)
        for (unsigned int& corner : face)
            corner = order[corner];
    random.shuffle(faces);
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

PolygonMesh MeshBuilder::polygons() const
{
    PolygonMesh mesh;
    mesh.points = points;
    for (Triangle const& face : faces) {
        mesh.faceVertex.insert(mesh.faceVertex.end(), face.begin(), face.end());
        mesh.faceOffset.push_back(static_cast<unsigned int>(mesh.faceVertex.size()));
    }
    return mesh;
}

PolygonMesh PolygonMesh::quads(unsigned int segments)
{
    PolygonMesh mesh;
    for (unsigned int y = 0; y <= segments; ++y)
        for (unsigned int x = 0; x <= segments; ++x)
            mesh.points.push_back({static_cast<float>(x), static_cast<float>(y), 0});
    for (unsigned int y = 0; y != segments; ++y) {
        for (unsigned int x = 0; x != segments; ++x) {
            unsigned int const corner = y * (segments + 1) + x;
            mesh.faceVertex.insert(
                mesh.faceVertex.end(), {corner, corner + 1, corner + segments + 2, corner + segments + 1});
            mesh.faceOffset.push_back(static_cast<unsigned int>(mesh.faceVertex.size()));
        }
    }
    return mesh;
}

PolygonMesh PolygonMesh::stars(std::size_t count, unsigned int minCorners, unsigned int maxCorners, unsigned int seed)
{
    Random random(seed);
    PolygonMesh mesh;
    for (std::size_t polygon = 0; polygon != count; ++polygon) {
        unsigned int const cornerCount = minCorners + random.below(maxCorners - minCorners + 1);
        // Two perpendicular directions of any length span the plane.
        float3 const u = random.point();
        float3 const v = std::abs(u.x) > std::abs(u.z) ? float3{-u.y, u.x, 0} : float3{0, -u.z, u.y};
        std::vector<float3> corners;
        for (unsigned int i = 0; i != cornerCount; ++i) {
            auto const [x, y, z] = aroundSquare(i, cornerCount);
            float const radius = 1.1f + random.coordinate();
            float const column = static_cast<float>(polygon % 1000);
            corners.push_back({5 * column + radius * (x * u.x + y * v.x), radius * (x * u.y + y * v.y),
                radius * (x * u.z + y * v.z)});
        }
        mesh.addPolygon(corners);
    }
    return mesh;
}

PolygonMesh PolygonMesh::soup(
    std::size_t pointCount, std::size_t faceCount, unsigned int minCorners, unsigned int maxCorners, Random& random)
{
    PolygonMesh mesh;
    while (mesh.points.size() != pointCount)
        mesh.points.push_back(random.point());
    while (mesh.faceCount() != faceCount) {
        for (unsigned int corner = minCorners + random.below(maxCorners - minCorners + 1); corner != 0; --corner)
            mesh.faceVertex.push_back(random.below(pointCount));
        mesh.faceOffset.push_back(static_cast<unsigned int>(mesh.faceVertex.size()));
    }
    return mesh;
}

PolygonMesh PolygonMesh::withNoise(float amount, unsigned int seed) &&
{
    addNoise(amount, seed, points);
    return std::move(*this);
}

PolygonMesh PolygonMesh::joinedWith(PolygonMesh const& other) &&
{
    for (unsigned int const point : other.faceVertex)
        faceVertex.push_back(static_cast<unsigned int>(points.size()) + point);
    for (std::size_t face = 1; face != other.faceOffset.size(); ++face)
        faceOffset.push_back(faceOffset.back() + other.faceOffset[face] - other.faceOffset[face - 1]);
    points.insert(points.end(), other.points.begin(), other.points.end());
    return std::move(*this);
}

void PolygonMesh::addPolygon(std::vector<float3> const& corners)
{
    for (float3 const& corner : corners) {
        faceVertex.push_back(static_cast<unsigned int>(points.size()));
        points.push_back(corner);
    }
    faceOffset.push_back(static_cast<unsigned int>(faceVertex.size()));
}

Orvan::MutablePtr<Tessara::Object> PolygonMesh::build() const
{
    return Tessara::Geometry::makeMesh(Orvan::Array<float3>(std::span(points)),
        Orvan::Array<unsigned int>(std::span(faceVertex)), Orvan::Array<unsigned int>(std::span(faceOffset)));
}

}
