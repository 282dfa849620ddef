#include "Inputs.h"

#include "frame/VectorMath.h"
#include "support/Random.h"
#include "support/Volumes.h"

#include <TessaraGeometry/Makers.h>

#include <algorithm>
#include <map>
#include <numeric>

namespace Benchmarks {

using namespace Modeling; // operators of vectors
using TestSupport::Random;

namespace {

    /// Cuts each face into four, with the new points moved out to the unit sphere.
    void cutIntoFour(MeshBuilder& mesh)
    {
        std::map<std::pair<unsigned int, unsigned int>, unsigned int> middles;
        auto const middle = [&](unsigned int a, unsigned int b) {
            auto const point = static_cast<unsigned int>(mesh.points.size());
            auto const [entry, isNew] = middles.try_emplace(std::minmax(a, b), point);
            if (isNew)
                mesh.points.push_back(safeNormalize(mesh.points[a] + mesh.points[b]));
            return entry->second;
        };
        std::vector<MeshBuilder::Triangle> faces;
        for (auto const& [a, b, c] : mesh.faces) {
            unsigned int const ab = middle(a, b), bc = middle(b, c), ca = middle(c, a);
            faces.insert(faces.end(), {{a, ab, ca}, {b, bc, ab}, {c, ca, bc}, {ab, bc, ca}});
        }
        mesh.faces = std::move(faces);
    }

    float3 onCircle(float turn, float radius)
    {
        return {radius * std::cos(turn * 6.2831853f), radius * std::sin(turn * 6.2831853f), 0};
    }

}

MeshBuilder Meshes::icosahedronCut(std::size_t faces)
{
    MeshBuilder mesh = MeshBuilder::icosahedron();
    for (float3& p : mesh.points)
        p = safeNormalize(p);
    while (mesh.faces.size() < faces)
        cutIntoFour(mesh);
    return mesh;
}

PolygonMesh const& made(MakeMesh make, std::size_t size)
{
    static std::map<std::pair<MakeMesh, std::size_t>, PolygonMesh> meshes;
    auto const [entry, isNew] = meshes.try_emplace({make, size});
    if (isNew)
        entry->second = make(size);
    return entry->second;
}

PatchedSphere::PatchedSphere(std::size_t faces)
    : FlatMesh(Meshes::sphere, faces)
{
    for (std::size_t face = 0; face != deleted.size; ++face)
        deleted[face] = face / 100 % 2 == 1;
}

Orvan::MutablePtr<Object> PatchedSphere::build() const
{
    using namespace Tessara::Geometry;
    auto mesh = makeMesh(points, faceVertex, faceOffset);
    addDataProperty("normal", sPointComp, normals, *mesh);
    addDataProperty("uv", sFaceVertexComp, coordinates, *mesh);
    addDataProperty("material", sFaceComp, materials, *mesh);
    return mesh;
}

FlatCloud::FlatCloud(std::size_t points)
    : positions(points)
    , normals(points, float3{0, 0, 1})
    , colors(points)
    , intensities(points, 0.5f)
{
    Random random(1);
    for (std::size_t point = 0; point != points; ++point) {
        positions[point] = random.point();
        colors[point].x = static_cast<unsigned char>(point);
    }
}

Indices everySecondAtRandom(std::size_t points)
{
    Indices order(points);
    std::iota(order.begin(), order.end(), 0u);
    Random random(2);
    for (std::size_t i = points; i > 1; --i)
        std::swap(order[i - 1], order[random.below(i)]);
    order.resize(points / 2);
    return order;
}

std::vector<DrawnPolygon> drawnPolygons(std::size_t pointCount)
{
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
