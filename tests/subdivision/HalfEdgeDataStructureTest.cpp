#include <Modeling/HalfEdgeDataStructure.h>

#include "support/Testing.h"

using Geometry::Mesh::HalfEdge;
using Geometry::Mesh::HalfEdgeDataStructure;
using namespace TestSupport;

namespace {

using Array = Orvan::Array<unsigned int>;

HalfEdgeDataStructure halfEdgesOf(PolygonMesh const& mesh)
{
    return {static_cast<unsigned int>(mesh.points.size()), static_cast<unsigned int>(mesh.faceCount()),
        Array(std::span(mesh.faceVertex)), Array(std::span(mesh.faceOffset))};
}

bool hasBoundary(PolygonMesh const& mesh)
{
    return halfEdgesOf(mesh).hasBoundary(static_cast<unsigned int>(mesh.faceCount()), Array(std::span(mesh.faceVertex)),
        Array(std::span(mesh.faceOffset)));
}

using Edges = std::vector<std::map<unsigned int, HalfEdge>>;

Edges edgesOf(HalfEdgeDataStructure const& halfEdges, unsigned int pointCount)
{
    Edges edges(pointCount);
    for (unsigned int point = 0; point != pointCount; ++point) {
        for (auto const& [from, halfEdge] : halfEdges.neighbors(point)) {
            EXPECT_TRUE(edges[point].empty() || from > edges[point].rbegin()->first) << "ascending at " << point;
            EXPECT_EQ(halfEdges.halfEdge(point, from), halfEdge);
            edges[point][from] = halfEdge;
        }
        EXPECT_EQ(halfEdges.valence(point), edges[point].size());
    }
    return edges;
}

}

TEST(HalfEdgeDataStructure, AgreesWithAMapForEachPoint)
{
    Random random(1);
    std::map<std::string, PolygonMesh> const meshes{
        {"nothing", PolygonMesh::soup(5, 0, 0, 0, random)},
        {"no points", {}},
        {"a face twice", {std::vector<float3>(3), {0, 1, 2, 0, 1, 2}, {0, 3, 6}}},
        {"a triangle and a quad", {std::vector<float3>(4), {0, 1, 2, 3, 2, 1, 0}, {0, 3, 7}}},
        {"sphere", MeshBuilder::sphere(40).shuffled(1).polygons()},
        {"large sphere", MeshBuilder::sphere(100).polygons()},
        {"large sphere, shuffled", MeshBuilder::sphere(128).shuffled(1).polygons()},
        {"quads", PolygonMesh::quads(180)},
        {"hub", MeshBuilder::bipyramid(3000).polygons()},
        {"triangles at random", PolygonMesh::soup(40, 30'000, 3, 3, random)},
        {"polygons at random", PolygonMesh::soup(300, 500, 0, 7, random)},
        {"many polygons at random", PolygonMesh::soup(85'000, 85'000, 0, 5, random)},
        {"large polygons", PolygonMesh::soup(4000, 3, 300, 300, random)},
    };
    for (auto const& [name, mesh] : meshes) {
        auto const pointCount = static_cast<unsigned int>(mesh.points.size());
        Edges expected(pointCount);
        for (unsigned int face = 0; face != mesh.faceCount(); ++face) {
            unsigned int const first = mesh.faceOffset[face], size = mesh.faceOffset[face + 1] - first;
            for (unsigned int i = 0; i != size; ++i) // of repeated edges the one with the lowest face and corner
                expected[mesh.faceVertex[first + i]].try_emplace(mesh.faceVertex[first + (i + size - 1) % size],
                    HalfEdge{face, static_cast<unsigned char>(i), static_cast<unsigned char>(size)});
        }
        for (int const threads : {1, 2, 8})
            EXPECT_EQ(
                withThreads(threads, [&mesh = mesh, pointCount] { return edgesOf(halfEdgesOf(mesh), pointCount); }),
                expected)
                << name << ", " << threads << " threads";
    }
}

TEST(HalfEdgeDataStructure, FindsBoundaryEdgesOfTriangles)
{
    EXPECT_FALSE(hasBoundary(MeshBuilder::tetrahedron().polygons()));
    EXPECT_FALSE(hasBoundary({}));
    EXPECT_TRUE(hasBoundary(MeshBuilder::sphere(30).withoutFace(4321).polygons()));
    EXPECT_TRUE(hasBoundary({std::vector<float3>(4), {0, 1, 2, 3, 3, 2, 1, 0}, {0, 4, 8}})) << "chords of quads";
    for (unsigned int const size : {0u, 1u, 2u}) {
        PolygonMesh mesh = MeshBuilder::tetrahedron().polygons();
        mesh.faceVertex.resize(12 + size, 3);
        mesh.faceOffset.push_back(12 + size);
        EXPECT_TRUE(hasBoundary(mesh)) << size;
    }
}

TEST(HalfEdgeDataStructure, ClearsSwapsAndStartsEmpty)
{
    HalfEdgeDataStructure edges(4), tetrahedron = halfEdgesOf(MeshBuilder::tetrahedron().polygons());
    EXPECT_EQ(edges.halfEdge(3, 0), (HalfEdge{Tessara::Geometry::kInvalidIndex, 0, 1}));
    edges.swap(tetrahedron);
    tetrahedron.clear();
    EXPECT_EQ(edges.halfEdge(3, 0), (HalfEdge{1, 1, 3}));
    EXPECT_EQ(tetrahedron.size(), 0);
    auto neighbor = edges.neighbors(3).begin();
    auto const first = neighbor++;
    EXPECT_EQ((*first).point, 0);
    EXPECT_EQ((*neighbor).point, 1);
}
