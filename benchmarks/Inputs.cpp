#include "Inputs.h"

#include "frame/VectorMath.h"
#include "support/Random.h"
#include "support/Volumes.h"

#include <TessaraGeometry/Makers.h>

#include <algorithm>
#include <map>

namespace Benchmarks {

using namespace Modeling; // operators of vectors
using namespace Tessara::Geometry;
using TestSupport::Random;

PolygonMesh const& made(MakeMesh make, std::size_t size)
{
    static std::map<std::pair<MakeMesh, std::size_t>, PolygonMesh> meshes;
    PolygonMesh& mesh = meshes[{make, size}];
    if (mesh.points.empty())
        mesh = make(size);
    return mesh;
}

Orvan::MutablePtr<Object> PatchedSphere::build() const
{
    auto mesh = makeMesh(points, faceVertex, faceOffset);
    addDataProperty("normal", sPointComp, normals, *mesh);
    addDataProperty("uv", sFaceVertexComp, coordinates, *mesh);
    addDataProperty("material", sFaceComp, materials, *mesh);
    return mesh;
}

Orvan::MutablePtr<Object> FlatCloud::build() const
{
    auto cloud = makePointCloud(positions);
    addDataProperty("normal", sPointComp, normals, *cloud);
    addDataProperty("color", sPointComp, colors, *cloud);
    addDataProperty("intensity", sPointComp, intensities, *cloud);
    return cloud;
}

Indices everySecondAtRandom(std::size_t points)
{
    Indices order = arrayOf(points, [](std::size_t point) { return static_cast<unsigned int>(point); });
    Random(2).shuffle(order);
    order.resize(points / 2);
    return order;
}

double areaOf(std::size_t triangles, float3 const* points, unsigned int const* corners)
{
    double area = 0;
    for (unsigned int const* c = corners; c != corners + 3 * triangles; c += 3)
        area += static_cast<double>(length(cross(points[c[1]] - points[c[0]], points[c[2]] - points[c[0]]))) / 2;
    return area;
}

double meanRadius(Points const& points)
{
    double sum = 0;
    for (float3 const point : points)
        sum += static_cast<double>(length(point));
    return sum / static_cast<double>(points.size);
}

std::vector<DrawnPolygon> drawnPolygons(std::size_t pointCount)
{
    auto const onCircle = [](float turn, float radius) {
        return float3{radius * std::cos(turn * 6.2831853f), radius * std::sin(turn * 6.2831853f), 0};
    };
    Random random(1);
    std::vector<DrawnPolygon> polygons(pointCount / 100);
    for (auto& [corners, points] : polygons) {
        auto const cornerCount = static_cast<float>(4 + random.below(5));
        for (float corner = 0; corner != cornerCount; ++corner)
            corners.append(onCircle(corner / cornerCount, 0.8f + 0.2f * random.coordinate()));
        while (points.size != 100)
            points.append(onCircle(random.coordinate(), 0.15f + 0.14f * random.coordinate()));
    }
    return polygons;
}

std::vector<Voxel> bandOfVoxels(std::size_t radius)
{
    std::vector<Voxel> voxels;
    auto const length = static_cast<float>(radius);
    int const reach = static_cast<int>(radius) + 4;
    TestSupport::forEachVoxel(-reach, reach + 1, [&](int i, int j, int k) {
        float const distance = std::sqrt(static_cast<float>(i * i + j * j + k * k));
        if (k >= static_cast<int>(-0.8f * length) && std::abs(distance - length) <= 3)
            voxels.push_back({i, j, k, 1.1f + static_cast<float>(i) / length});
    });
    return voxels;
}

std::vector<float3> pointsInBand(std::size_t faces, float scale)
{
    PolygonMesh const& mesh = made(Meshes::sphere, faces);
    std::vector<float3> points;
    for (std::size_t corner = 1; corner < mesh.faceVertex.size(); corner += 3)
        if (float3 const p = mesh.points[mesh.faceVertex[corner]]; p.z > -0.75f)
            points.push_back({p.x * scale, p.y * scale, p.z * scale});
    return points;
}

}
