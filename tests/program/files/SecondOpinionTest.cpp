#include "FileSupport.h"

#include <TessaraGeometry/Names.h>

#include <gtest/gtest.h>

#include <sstream>

#define TINYOBJLOADER_IMPLEMENTATION
#include <tiny_obj_loader.h>

namespace ModelingProgram {

namespace {

    using namespace Tessara::Geometry;
    using namespace Tessara::Math;

    /// Compares what another reader makes of an OBJ file: every point, every face, every value of a corner.
    void expectSameAsTinyObj(std::filesystem::path const& file)
    {
        tinyobj::ObjReaderConfig config;
        config.triangulate = false;
        tinyobj::ObjReader other;
        ASSERT_TRUE(other.ParseFromFile(file.string(), config)) << other.Error();
        tinyobj::attrib_t const& theirs = other.GetAttrib();

        GeometryFile const ours = readGeometryFile(file);
        auto const positions = valuesOf<float3>(*ours.object, sPointPosition);
        auto const corners = valuesOf<unsigned int>(*ours.object, sFaceVertex);
        auto const offsets = valuesOf<unsigned int>(*ours.object, sFaceOffset);
        auto const textures = valuesOf<float2>(*ours.object, "uv");
        auto const normals = valuesOf<float3>(*ours.object, "normal");
        ASSERT_EQ(3 * positions.size(), theirs.vertices.size());
        for (std::size_t point = 0; point < positions.size(); ++point) {
            // Their decimals are off by a rounding now and then.
            EXPECT_FLOAT_EQ(positions[point].x, theirs.vertices[3 * point]);
            EXPECT_FLOAT_EQ(positions[point].y, theirs.vertices[3 * point + 1]);
            EXPECT_FLOAT_EQ(positions[point].z, theirs.vertices[3 * point + 2]);
        }
        std::size_t face = 0;
        std::size_t corner = 0;
        for (tinyobj::shape_t const& shape : other.GetShapes()) {
            for (auto const count : shape.mesh.num_face_vertices) {
                ASSERT_LT(face + 1, offsets.size());
                EXPECT_EQ(offsets[face + 1] - offsets[face], count);
                ++face;
            }
            for (tinyobj::index_t const& index : shape.mesh.indices) {
                ASSERT_LT(corner, corners.size());
                EXPECT_EQ(static_cast<int>(corners[corner]), index.vertex_index);
                if (index.texcoord_index >= 0) {
                    auto const texture = static_cast<std::size_t>(index.texcoord_index);
                    EXPECT_FLOAT_EQ(textures.at(corner).x, theirs.texcoords[2 * texture]);
                    EXPECT_FLOAT_EQ(textures.at(corner).y, theirs.texcoords[2 * texture + 1]);
                }
                if (index.normal_index >= 0) {
                    auto const normal = static_cast<std::size_t>(index.normal_index);
                    EXPECT_FLOAT_EQ(normals.at(corner).x, theirs.normals[3 * normal]);
                    EXPECT_FLOAT_EQ(normals.at(corner).z, theirs.normals[3 * normal + 2]);
                }
                ++corner;
            }
        }
        EXPECT_EQ(corner, corners.size());
    }

    TEST(ReadObj, agreesWithTinyObjOnTheSamples)
    {
        int count = 0;
        for (auto const& entry : std::filesystem::directory_iterator(MODELING_SAMPLES_DIR)) {
            if (entry.path().extension() != ".obj")
                continue;
            SCOPED_TRACE(entry.path().string());
            expectSameAsTinyObj(entry.path());
            ++count;
        }
        EXPECT_GT(count, 0);
    }

    TEST(WriteObj, isReadByTinyObj)
    {
        Orvan::Array<float3> positions;
        Orvan::Array<unsigned int> corners;
        Orvan::Array<unsigned int> offsets{0u};
        Orvan::Array<float2> textures;
        for (unsigned int face = 0; face < 200; ++face) {
            for (unsigned int corner = 0; corner < 3 + face % 5; ++corner) {
                positions.append({static_cast<float>(face) / 7, static_cast<float>(corner) * 1e-3f,
                    1e6f / (1.0f + static_cast<float>(face))});
                corners.append((face * 31 + corner * 17) % static_cast<unsigned int>(positions.size));
                textures.append({static_cast<float>(corner), static_cast<float>(face % 3)});
            }
            offsets.append(static_cast<unsigned int>(corners.size));
        }
        auto const mesh = makeMesh(positions, corners, offsets);
        addDataProperty<float2>("uv", sFaceVertexComp, textures, *mesh);
        TemporaryFolder const folder;
        writeGeometryFile(*mesh, folder / "a.obj");
        expectSameAsTinyObj(folder / "a.obj");
    }

}

}
