#include "PolygonMesh.h"

#include <TessaraGeometry/Makers.h>

#include <cmath>
#include <span>

namespace TestSupport {

void addNoise(float amount, unsigned int seed, std::vector<float3>& points)
{
    Random random(seed);
    for (float3& p : points) {
        p.x += amount * random.coordinate();
        p.y += amount * random.coordinate();
        p.z += amount * random.coordinate();
    }
}

OnSquare aroundSquare(unsigned int step, unsigned int stepCount)
{
    float const along = 8 * static_cast<float>(step) / static_cast<float>(stepCount);
    float const side = std::floor(along / 2);
    float const t = along - 2 * side - 1;
    return {side == 0 ? t : side == 1 ? 1 : side == 2 ? -t : -1, side == 0 ? -1 : side == 1 ? t : side == 2 ? 1 : -t};
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
            auto const [x, y] = aroundSquare(i, cornerCount);
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
