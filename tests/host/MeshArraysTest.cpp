#include "host/MeshArrays.h"

#include "support/Testing.h"

using namespace Modeling;
using namespace TestSupport;

TEST(OffsetView, findsTheParts)
{
    IndexArray const offsets{0, 3, 3, 2, 9};
    std::vector<int> const values{10, 11, 12, 13, 14};
    OffsetView const view(offsets);
    std::span<int const> const first = view.part(0, values.data());
    EXPECT_EQ(std::vector<int>(first.begin(), first.end()), (std::vector<int>{10, 11, 12}));
    EXPECT_TRUE(view.part(1, values.data()).empty());
    EXPECT_EQ(view.sizeWithin(values.size(), 0), 3u);
    EXPECT_EQ(view.sizeWithin(2, 0), 0u) << "beyond the values";
    EXPECT_EQ(view.sizeWithin(values.size(), 2), 0u) << "decreasing";
    EXPECT_EQ(view.sizeWithin(values.size(), 3), 0u) << "beyond the values";
    EXPECT_EQ(view.sizeWithin(9, 3), 7u);
}

TEST(MeshArrays, areSharedWithTheObject)
{
    auto const object = MeshBuilder::tetrahedron().build();
    MeshArrays const mesh = readMeshArrays(*object);
    ASSERT_TRUE(mesh.isComplete());
    EXPECT_EQ(mesh.positions, readGeoPropData<float3>(*object, sPointPosition));
    EXPECT_EQ(mesh.faceVertex, readGeoPropData<unsigned int>(*object, sFaceVertex));
    EXPECT_EQ(mesh.faceOffset, readGeoPropData<unsigned int>(*object, sFaceOffset));
    EXPECT_EQ(mesh.pointCount, 4u);
    EXPECT_EQ(mesh.cornerCount, 12u);
    EXPECT_EQ(mesh.faceCount, 4u);
    EXPECT_EQ(mesh.faces().size(3), 3u);
    EXPECT_EQ(mesh.faces().corners(3), mesh.faceVertex->data + 9);
}

TEST(MeshArrays, areNullIfMissing)
{
    auto const object = MeshBuilder::tetrahedron().build();
    object->eraseProperty(sFaceOffset);
    MeshArrays const mesh = readMeshArrays(*object);
    EXPECT_FALSE(mesh.isComplete());
    EXPECT_TRUE(mesh.positions && mesh.faceVertex && !mesh.faceOffset);
    EXPECT_FALSE(readMeshArrays(*Tessara::createObject()).isComplete());
}

TEST(MeshArrays, areWrittenWithTheirCountsUnlessNull)
{
    auto const object = MeshBuilder::tetrahedron().build();
    auto const positions = readGeoPropData<float3>(*object, sPointPosition);
    MeshArrays triangle;
    triangle.faceVertex = Orvan::makePtr<IndexArray>(IndexArray{2, 1, 0});
    triangle.faceOffset = Orvan::makePtr<IndexArray>(IndexArray{0, 3});
    triangle.pointCount = 17; // ignored, because there are no positions
    triangle.cornerCount = 3;
    triangle.faceCount = 1;

    PreparedWrites writes(*object);
    writeMeshArrays(std::move(triangle), writes);
    EXPECT_EQ(getElementCount(*object, sFaceComp), 4u) << "written on commit";
    writes.commit();
    MeshArrays const written = readMeshArrays(*object);
    EXPECT_EQ(written.positions, positions);
    EXPECT_EQ(*written.faceVertex, (IndexArray{2, 1, 0}));
    EXPECT_EQ(*written.faceOffset, (IndexArray{0, 3}));
    EXPECT_EQ(written.pointCount, 4u);
    EXPECT_EQ(written.cornerCount, 3u);
    EXPECT_EQ(written.faceCount, 1u);
}
