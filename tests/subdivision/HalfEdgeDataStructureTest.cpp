#include <Modeling/HalfEdgeDataStructure.h>

#include "support/MeshBuilder.h"
#include "support/Random.h"
#include "support/Threads.h"

#include <gtest/gtest.h>

#include <map>
#include <string>
#include <vector>

using Geometry::Mesh::HalfEdge;
using Geometry::Mesh::HalfEdgeDataStructure;
using namespace TestSupport;

namespace {

struct Polygons {
    unsigned int pointCount;
    unsigned int faceCount = 0;
    Orvan::Array<unsigned int> faceVertex{};
    Orvan::Array<unsigned int> faceOffset{0};

    template <class Face> Polygons& add(Face const& face)
    {
        for (unsigned int const point : face)
            faceVertex.append(point);
        faceOffset.append(static_cast<unsigned int>(faceVertex.size));
        ++faceCount;
        return *this;
    }
    HalfEdgeDataStructure build() const { return {pointCount, faceCount, faceVertex, faceOffset}; }
    bool hasBoundary() const { return build().hasBoundary(faceCount, faceVertex, faceOffset); }
};

Polygons polygonsOf(MeshBuilder const& mesh)
{
    Polygons polygons{static_cast<unsigned int>(mesh.points.size())};
    for (auto const& face : mesh.faces)
        polygons.add(face);
    return polygons;
}

Polygons soup(unsigned int pointCount, unsigned int faceCount, std::size_t smallest, std::size_t largest)
{
    Random random(pointCount);
    Polygons polygons{pointCount};
    while (polygons.faceCount != faceCount) {
        std::vector<unsigned int> face(smallest + random.below(largest - smallest + 1));
        for (unsigned int& point : face)
            point = random.below(pointCount);
        polygons.add(face);
    }
    return polygons;
}

using Edges = std::vector<std::map<unsigned int, HalfEdge>>;

Edges edgesOf(HalfEdgeDataStructure const& halfEdges, unsigned int pointCount)
{
    Edges edges(pointCount);
    for (unsigned int point = 0; point != pointCount; ++point) {
        for (auto const& [from, halfEdge] : halfEdges.neighbours(point)) {
            EXPECT_TRUE(edges[point].empty() || from > edges[point].rbegin()->first) << "ascending at " << point;
            EXPECT_EQ(halfEdges.halfEdge(point, from), halfEdge);
            edges[point][from] = halfEdge;
        }
        EXPECT_EQ(halfEdges.valence(point), edges[point].size());
    }
    return edges;
}

}

TEST(HalfEdgeDataStructure, agreesWithAMapForEachPoint)
{
    std::map<std::string, Polygons> const meshes{
        {"nothing", {5}},
        {"no points", {0}},
        {"sphere", polygonsOf(MeshBuilder::sphere(40).shuffled(1))},
        {"hub", polygonsOf(MeshBuilder::bipyramid(3000))},
        {"triangles at random", soup(40, 30'000, 3, 3)},
        {"polygons at random", soup(300, 500, 0, 7)},
        {"large polygons", soup(4000, 3, 300, 300)},
    };
    for (auto const& [name, mesh] : meshes) {
        Edges expected(mesh.pointCount);
        for (unsigned int face = 0; face != mesh.faceCount; ++face) {
            unsigned int const first = mesh.faceOffset[face], size = mesh.faceOffset[face + 1] - first;
            for (unsigned int i = 0; i != size; ++i) // of equal edges the lowest face and corner
                expected[mesh.faceVertex[first + i]].try_emplace(mesh.faceVertex[first + (i + size - 1) % size],
                    HalfEdge{face, static_cast<unsigned char>(i), static_cast<unsigned char>(size)});
        }
        for (int const threads : {1, 2, 8})
            EXPECT_EQ(withThreads(threads, [&mesh = mesh] { return edgesOf(mesh.build(), mesh.pointCount); }), expected)
                << name << ", " << threads << " threads";
    }
}

TEST(HalfEdgeDataStructure, findsOpenEdgesOfTriangles)
{
    EXPECT_FALSE(polygonsOf(MeshBuilder::tetrahedron()).hasBoundary());
    EXPECT_FALSE(Polygons{3}.hasBoundary());
    EXPECT_TRUE(polygonsOf(MeshBuilder::sphere(30).withoutFace(4321)).hasBoundary());
    EXPECT_TRUE(Polygons{4}.add(std::vector{0u, 1u, 2u, 3u}).add(std::vector{3u, 2u, 1u, 0u}).hasBoundary())
        << "chords of quads";
    for (std::size_t const size : {0u, 1u, 2u})
        EXPECT_TRUE(polygonsOf(MeshBuilder::tetrahedron()).add(std::vector(size, 3u)).hasBoundary()) << size;
}

TEST(HalfEdgeDataStructure, clearsSwapsAndStartsEmpty)
{
    HalfEdgeDataStructure edges(4), tetrahedron = polygonsOf(MeshBuilder::tetrahedron()).build();
    EXPECT_EQ(edges.halfEdge(3, 0), (HalfEdge{Tessara::Geometry::kInvalidIndex, 0, 1}));
    edges.swap(tetrahedron);
    tetrahedron.clear();
    EXPECT_EQ(edges.halfEdge(3, 0), (HalfEdge{1, 1, 3}));
    EXPECT_EQ(tetrahedron.size(), 0);
}
