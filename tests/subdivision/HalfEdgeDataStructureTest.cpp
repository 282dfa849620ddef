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

constexpr HalfEdge kAbsent;

struct Polygons {
    unsigned int pointCount = 0;
    std::vector<std::vector<unsigned int>> faces;

    Orvan::Array<unsigned int> faceVertex() const
    {
        Orvan::Array<unsigned int> corners;
        for (auto const& face : faces)
            for (unsigned int const point : face)
                corners.append(point);
        return corners;
    }
    Orvan::Array<unsigned int> faceOffset() const
    {
        Orvan::Array<unsigned int> offsets{0};
        for (auto const& face : faces)
            offsets.append(offsets[offsets.size - 1] + static_cast<unsigned int>(face.size()));
        return offsets;
    }
    unsigned int faceCount() const { return static_cast<unsigned int>(faces.size()); }
    HalfEdgeDataStructure build() const { return {pointCount, faceCount(), faceVertex(), faceOffset()}; }
    bool hasBoundary() const { return build().hasBoundary(faceCount(), faceVertex(), faceOffset()); }
};

Polygons polygonsOf(MeshBuilder const& mesh)
{
    Polygons polygons{static_cast<unsigned int>(mesh.points.size()), {}};
    for (auto const& face : mesh.faces)
        polygons.faces.emplace_back(face.begin(), face.end());
    return polygons;
}

Polygons soup(unsigned int pointCount, unsigned int faceCount, std::size_t smallest, std::size_t largest)
{
    Random random(pointCount);
    Polygons polygons{pointCount, {}};
    for (unsigned int face = 0; face != faceCount; ++face) {
        polygons.faces.emplace_back(smallest + random.below(largest - smallest + 1));
        for (unsigned int& point : polygons.faces.back())
            point = random.below(pointCount);
    }
    return polygons;
}

using Edges = std::vector<std::map<unsigned int, HalfEdge>>;

Edges edgesOf(HalfEdgeDataStructure const& halfEdges, unsigned int pointCount)
{
    Edges edges(pointCount);
    for (unsigned int point = 0; point != pointCount; ++point) {
        unsigned int last = 0;
        for (auto const& [from, halfEdge] : halfEdges.neighbours(point)) {
            EXPECT_TRUE(edges[point].empty() || from > last) << "not ascending at point " << point;
            EXPECT_EQ(halfEdges.halfEdge(point, last = from), halfEdge);
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
        {"one triangle", {3, {{2, 0, 1}}}},
        {"nothing", {5, {}}},
        {"no points", {0, {}}},
        {"sphere", polygonsOf(MeshBuilder::sphere(40).shuffled(1))},
        {"hub", polygonsOf(MeshBuilder::bipyramid(3000))},
        {"triangles at random", soup(40, 30'000, 3, 3)},
        {"polygons at random", soup(300, 500, 0, 7)},
        {"large polygon", soup(4000, 3, 300, 300)},
    };
    for (auto const& [name, polygons] : meshes) {
        SCOPED_TRACE(name);
        Edges expected(polygons.pointCount);
        for (unsigned int f = 0; f != polygons.faceCount(); ++f) {
            auto const& face = polygons.faces[f];
            for (std::size_t i = 0; i != face.size(); ++i) // of equal edges the lowest face and corner
                expected[face[i]].try_emplace(face[(i + face.size() - 1) % face.size()],
                    HalfEdge{f, static_cast<unsigned char>(i), static_cast<unsigned char>(face.size())});
        }
        for (int const threads : {1, 2, 8})
            EXPECT_EQ(withThreads(threads, [&] { return edgesOf(polygons.build(), polygons.pointCount); }), expected)
                << threads << " threads";
    }
}

TEST(HalfEdgeDataStructure, findsOpenEdgesOfTriangles)
{
    Polygons tetrahedron = polygonsOf(MeshBuilder::tetrahedron());
    EXPECT_FALSE(tetrahedron.hasBoundary());
    EXPECT_FALSE((Polygons{3, {}}).hasBoundary());
    EXPECT_TRUE((Polygons{3, {{0, 1, 2}}}).hasBoundary());
    EXPECT_TRUE(polygonsOf(MeshBuilder::sphere(30).withoutFace(4321)).hasBoundary());
    Polygons const cube{8, {{0, 3, 2, 1}, {4, 5, 6, 7}, {0, 1, 5, 4}, {1, 2, 6, 5}, {2, 3, 7, 6}, {3, 0, 4, 7}}};
    EXPECT_TRUE(cube.hasBoundary()) << "the chord of a quad has no twin";
    EXPECT_EQ(cube.build().halfEdge(0, 3), (HalfEdge{5, 1, 4}));
    for (std::size_t const size : {0u, 1u, 2u}) {
        Polygons small = tetrahedron;
        small.faces.push_back(std::vector<unsigned int>(size, 3u));
        EXPECT_TRUE(small.hasBoundary()) << size << " corners";
    }
}

TEST(HalfEdgeDataStructure, clearsSwapsAndStartsEmpty)
{
    HalfEdgeDataStructure empty(4);
    EXPECT_EQ(empty.valence(3), 0);
    EXPECT_EQ(empty.halfEdge(3, 0), kAbsent);
    EXPECT_EQ(kAbsent.face, Tessara::Geometry::kInvalidIndex);
    EXPECT_EQ(kAbsent.faceSize, 1);
    HalfEdgeDataStructure tetrahedron = polygonsOf(MeshBuilder::tetrahedron()).build();
    empty.swap(tetrahedron);
    EXPECT_EQ(empty.valence(3), 3);
    EXPECT_EQ(tetrahedron.valence(3), 0);
    empty.clear();
    empty.swap(tetrahedron);
    EXPECT_EQ(empty.halfEdge(0, 1), kAbsent);
}
