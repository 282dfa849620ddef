#include "FileSupport.h"

#define TINYOBJLOADER_IMPLEMENTATION
#include <tiny_obj_loader.h>

namespace ModelingProgram {

namespace {

    /// Compares with the result of another reader of OBJ files: every point, face and corner value.
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
        // The other reader does not always round decimals correctly.
        auto const expectNear = [](std::initializer_list<float> actual, std::vector<float> const& all, int number) {
            auto expected = all.begin() + number * static_cast<int>(actual.size());
            for (float const value : actual)
                EXPECT_FLOAT_EQ(value, *expected++);
        };
        ASSERT_EQ(3 * positions.size(), theirs.vertices.size());
        for (std::size_t p = 0; p < positions.size(); ++p)
            expectNear({positions[p].x, positions[p].y, positions[p].z}, theirs.vertices, static_cast<int>(p));
        std::vector<unsigned int> theirOffsets{0}, theirCorners;
        for (tinyobj::shape_t const& shape : other.GetShapes()) {
            for (auto const count : shape.mesh.num_face_vertices)
                theirOffsets.push_back(theirOffsets.back() + count);
            for (tinyobj::index_t const& index : shape.mesh.indices) {
                std::size_t const corner = theirCorners.size();
                theirCorners.push_back(static_cast<unsigned int>(index.vertex_index));
                if (index.texcoord_index >= 0)
                    expectNear({textures.at(corner).x, textures[corner].y}, theirs.texcoords, index.texcoord_index);
                if (index.normal_index >= 0)
                    expectNear({normals.at(corner).x, normals[corner].y, normals[corner].z}, theirs.normals,
                        index.normal_index);
            }
        }
        EXPECT_EQ(offsets.empty() ? std::vector{0u} : offsets, theirOffsets); // polylines alone do not make a mesh
        EXPECT_EQ(corners, theirCorners);
    }

    TEST(ReadObj, AgreesWithTinyObjOnTheSamples)
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

}

}
