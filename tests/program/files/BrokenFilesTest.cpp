#include "FileSupport.h"

namespace ModelingProgram {

namespace {

    /// A file is either read as valid geometry or refused with its name. Anything else is a bug in the reader.
    void readBroken(std::filesystem::path const& file, std::string_view content)
    {
        store(file, content);
        for (bool const isLenient : {false, true}) {
            try {
                GeometryFile const whole = readGeometryFile(file, {.isLenient = isLenient, .isCentered = isLenient});
                Tessara::Object const& object = *whole.object;
                EXPECT_TRUE(isValid(object));
                for (Orvan::String const& sentence : reportProperties(object))
                    ADD_FAILURE() << content << sentence.view();
            } catch (FileError const& error) {
                EXPECT_NE(std::string(error.what()).find(file.string()), std::string::npos);
            }
        }
    }

    std::map<std::string, std::string> wholeFiles()
    {
        auto const mesh = makeMesh({{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0.5f}}, {0, 1, 2, 0, 2, 3}, {0, 3, 6});
        addDataProperty<float2>("uv", sFaceVertexComp, Orvan::Array<float2>(6, {0.5f, 0.25f}), *mesh);
        addDataProperty<float3>("normal", sFaceVertexComp, Orvan::Array<float3>(6, {0, 0, 1}), *mesh);
        addDataProperty<uchar3>("color", sPointComp, Orvan::Array<uchar3>(4, {255, 0, 1}), *mesh);
        addDataProperty<float4>("axis", sFaceComp, Orvan::Array<float4>(2, {1, 2, 3, 4}), *mesh);
        TemporaryFolder const folder;
        std::map<std::string, std::string> files;
        for (std::string const extension : {".glb", ".obj", ".ply", ".stl"}) {
            writeGeometryFile(*mesh, folder / ("a" + extension));
            files[extension] = contentOf(folder / ("a" + extension));
        }
        files[".off"] = "COFF\n3 1 0\n0 0 0 1 0 0 1\n1 0 0 0 0 0 1\n0 1 0 0 0 0 1\n3 0 1 2 1.0 0 0\n";
        files[".xyz"] = "0 0 0 1 0 0\n1 2 3 0 0 1\n";
        files["-table.xyz"] = "2\n//X,Y,Z,R,G,B,\"i\"\n1.5,nan,0,1,2,3,1e3\n-1,2,3,4,5,6,0.123456789\n";
        files["-nan.obj"] = "v 0 0 0\nv nan 0 0\nv 1 0 0\nv 1 1 0\nvt 0 1\nf 1/1 2/1 3/1\nf 1/1 3 4\nf 1 3\n";
        files["-nan-lines.obj"] = "v 0 0 0\nv nan 0 0\nv 1 0 0\nv 1 1 0\nl 1 3\nl 3 2 4\nl 4\n";
        files["-text.ply"] =
            "ply\nformat ascii 1.0\nelement vertex 3\nproperty float x\nproperty double y\n"
            "property uchar z\nproperty list int short q\nelement face 1\n"
            "property list uchar int vertex_indices\nend_header\n0 1e1 2 1 5\n1 -1 2 1 6\n0 0 0 1 7\n3 0 1 2\n";
        files["-text.stl"] =
            "solid\nfacet normal 0 0 1\nouter loop\nvertex 0 0 0\nvertex 1 0 0\nvertex 0 1 0\nendloop\n"
            "endfacet\nendsolid\n";
        files["-sparse.gltf"] =
            R"({"asset":{"version":"2.0"},"buffers":[{"byteLength":48,"uri":"data:;base64,)"
            R"(AAAAAAAAAAAAAAAAAACAPwAAAAAAAAAAAACAPwAAgD8AAAAAAAAAAAAAgD8AAAAA"}],"bufferViews":[{"buffer":0,)"
            R"("byteLength":48,"byteStride":12}],"accessors":[{"bufferView":0,"componentType":5126,"count":4,)"
            R"("type":"VEC3"},{"componentType":5126,"count":4,"type":"VEC2","sparse":{"count":1,"indices":{)"
            R"("bufferView":0,"byteOffset":8,"componentType":5121},"values":{"bufferView":0,"byteOffset":8}}}],)"
            R"("meshes":[{"primitives":[{"attributes":{"POSITION":0,"TEXCOORD_0":1},"mode":5},{"attributes":{)"
            R"("POSITION":0,"_x":1},"mode":3}]}],"scenes":[{"nodes":[0]}],"nodes":[{"children":[1]},)"
            R"({"mesh":0,"rotation":[0,0,0,1],"scale":[1,-2,1],"translation":[3,0,0]}]})";
        return files;
    }

    TEST(BrokenFiles, CutOffAnywhereAreReadOrRefused)
    {
        TemporaryFolder const folder;
        for (auto const& [ending, content] : wholeFiles())
            for (std::size_t length = 0; length <= content.size(); ++length) {
                readBroken(folder / ("a" + ending), content.substr(0, length));
                if ((ending == ".glb" || ending == ".ply" || ending == ".stl") && length != content.size()) { // binary
                    EXPECT_THROW(readGeometryFile(folder / ("a" + ending)), FileError) << ending << " " << length;
                }
            }
    }

    TEST(BrokenFiles, WithOtherBytesAreReadOrRefused)
    {
        constexpr char kBytes[] = {'\0', '\n', ' ', ',', ';', '-', '0', '9', '.', 'e', '\\', '/', '#', '\x7f', '\xff'};
        Random random(1);
        TemporaryFolder const folder;
        for (auto const& [ending, content] : wholeFiles()) {
            for (int i = 0; i < 400; ++i) {
                std::string broken = content;
                for (unsigned int changes = 1 + random.below(3); changes != 0; --changes)
                    broken[random.below(broken.size())] = kBytes[random.below(std::size(kBytes))];
                readBroken(folder / ("a" + ending), broken);
            }
        }
    }

}

}
