#include "frame/FaceAdjacency.h"
#include "frame/Arrays.h"
#include "frame/CornerArray.h"

#include "support/Testing.h"

using namespace Modeling;
using namespace TestSupport;

namespace {

using Neighbors = std::vector<std::array<unsigned int, 3>>;

Neighbors adjacencyOf(std::vector<std::array<unsigned int, 3>> const& triangles, unsigned int pointCount)
{
    IndexArray faceVertex, faceOffset{0};
    for (auto const& triangle : triangles) {
        for (unsigned int const point : triangle)
            faceVertex.append(point);
        faceOffset.append(static_cast<unsigned int>(faceVertex.size));
    }
    FaceView const faces{faceVertex.data, faceOffset, static_cast<unsigned int>(triangles.size())};
    FaceAdjacency const adjacency =
        buildFaceAdjacency(faces, cornersByPoint(pointCount, faceVertex.data, faceVertex.size));
    return {adjacency.begin(), adjacency.end()};
}

}

TEST(FaceAdjacency, FindsTheLowestFaceAcrossEachEdge)
{
    constexpr unsigned int kNone = kInvalidIndex;
    EXPECT_EQ(adjacencyOf({{0, 1, 2}, {0, 1, 3}}, 4), (Neighbors{{kNone, kNone, kNone}, {kNone, kNone, kNone}}))
        << "same direction";
    // A closed fan of faces (0, i, i + 1), of which each has a copy with a higher number.
    for (unsigned int const rim : {3u, 24u, 25u, 100u}) {
        std::vector<std::array<unsigned int, 3>> triangles;
        for (unsigned int i = 0; i != 2 * rim; ++i)
            triangles.push_back({0, 1 + i % rim, 1 + (i + 1) % rim});
        Neighbors const found = adjacencyOf(triangles, rim + 1); // sorted at larger hubs
        for (unsigned int face = 0; face != 2 * rim; ++face) {
            EXPECT_EQ(found[face][0], (face + rim - 1) % rim);
            EXPECT_EQ(found[face][1], kInvalidIndex);
            EXPECT_EQ(found[face][2], (face + 1) % rim);
        }
    }
}

TEST(FaceAdjacency, KnowsTriangleMeshesByTheirOffsets)
{
    EXPECT_TRUE(isTriangleMesh(0, {0}));
    EXPECT_TRUE(isTriangleMesh(1, {0, 3, 7})) << "later offsets are ignored";
    EXPECT_FALSE(isTriangleMesh(2, {0, 3, 7}));
    EXPECT_FALSE(isTriangleMesh(2, {3, 6, 9}));
    IndexArray offsets = offsetsFromCounts(10'000, [](std::size_t) { return 3u; });
    EXPECT_TRUE(isTriangleMesh(10'000, offsets));
    offsets[7'654] = 0;
    EXPECT_FALSE(isTriangleMesh(10'000, offsets));
}

TEST(CornerArray, AllocatesOnlyForManyCornersAndReusesThem)
{
    CornerArray<int, 4> corners;
    int const* const onStack = corners.take(4);
    EXPECT_EQ(corners.take(1), onStack);
    int const* const onHeap = corners.take(5);
    EXPECT_NE(onHeap, onStack);
    EXPECT_EQ(corners.take(5), onHeap);
    int* const larger = corners.take(6); // grows to 10
    larger[9] = 1;
    EXPECT_EQ(corners.take(10), larger);
    EXPECT_EQ(corners.take(4), onStack);
}
