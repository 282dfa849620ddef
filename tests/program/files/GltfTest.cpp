#include "FileSupport.h"
#include "Writers.h"

namespace ModelingProgram {

namespace {

    using testing::AllOf, testing::Contains, testing::ElementsAre, testing::HasSubstr, testing::IsEmpty, testing::Not;
    using Indices = std::vector<unsigned int>;
    using Notes = std::vector<std::string>;
    using OwnedObject = Orvan::MutablePtr<Tessara::Object>;

    template <class... T> std::string bytes(T... numbers)
    {
        return bytesOf(std::endian::little, numbers...);
    }

    /// A GLB file of these two chunks.
    std::string glbOf(std::string json, std::string binary)
    {
        json.resize((json.size() + 3) / 4 * 4, ' ');
        binary.resize((binary.size() + 3) / 4 * 4);
        auto const size = [](std::size_t count) { return static_cast<std::uint32_t>(count); };
        return "glTF" + bytes(2u, size(28 + json.size() + binary.size()), size(json.size())) + "JSON" + json
            + bytes(size(binary.size())) + std::string("BIN\0", 4) + binary;
    }

    /// The corners of a unit square.
    std::string const kSquare = bytes(0.0f, 0.0f, 0.0f, 1.0f, 0.0f, 0.0f, 1.0f, 1.0f, 0.0f, 0.0f, 1.0f, 0.0f);

    /// A file with the square as accessor 0 and view 0 (48 bytes). View 1 is the binary data after it, and accessors
    /// begin with number 1.
    struct Gltf {
        std::string primitives;
        std::string more = {};
        std::string accessors = {};
        std::string views = {};
        std::string rest = {};

        std::string json() const
        {
            return R"({"asset":{"version":"2.0"},"buffers":[{"byteLength":)" + std::to_string(48 + more.size())
                + R"(}],"bufferViews":[{"buffer":0,"byteLength":48},{"buffer":0,"byteOffset":48,"byteLength":)"
                + std::to_string(more.size()) + "}" + views
                + R"(],"accessors":[{"bufferView":0,"componentType":5126,"count":4,"type":"VEC3"})" + accessors
                + R"(],"meshes":[{"primitives":[)" + primitives + "]}]" + rest + "}";
        }
        std::string content() const { return glbOf(json(), kSquare + more); }
    };

    std::string accessor(int componentType, int count, std::string const& type, std::string const& rest = {})
    {
        return R"(,{"bufferView":1,"componentType":)" + std::to_string(componentType) + R"(,"count":)"
            + std::to_string(count) + R"(,"type":")" + type + "\"" + rest + "}";
    }

    std::string primitive(int mode, std::string const& rest = R"(,"indices":1)", std::string const& attributes = {})
    {
        return R"({"attributes":{"POSITION":0)" + attributes + R"(},"mode":)" + std::to_string(mode) + rest + "}";
    }

    std::vector<float> floatsOf(Tessara::Object const& object, char const* name)
    {
        std::vector<float> result;
        for (float3 const& p : valuesOf<float3>(object, name))
            result.insert(result.end(), {p.x, p.y, p.z});
        return result;
    }

    TEST(ReadGltf, ReadsAllModesAndIndexTypes)
    {
        struct Case {
            Gltf file;
            Indices corners; // of faces, or the offsets of strands
            char const* note = "";
        };
        auto const ushorts = [](auto... index) { return bytes(static_cast<std::uint16_t>(index)...); };
        std::map<std::string, Case> const cases{
            {"triangles, no indices", {{primitive(4, "")}, {0, 1, 2}, "1 vertices of incomplete"}},
            {"bytes", {{primitive(4), "\1\2\3", accessor(5121, 3, "SCALAR")}, {1, 2, 3}}},
            {"shorts", {{primitive(4), ushorts(0, 1, 2, 2, 3, 0), accessor(5123, 6, "SCALAR")}, {0, 1, 2, 2, 3, 0}}},
            {"ints", {{primitive(4), bytes(3u, 2u, 1u), accessor(5125, 3, "SCALAR")}, {3, 2, 1}}},
            {"strip", {{primitive(5), ushorts(0, 1, 3, 2), accessor(5123, 4, "SCALAR")}, {0, 1, 3, 1, 2, 3}}},
            {"strip with a joint",
                {{primitive(5), ushorts(0, 1, 3, 3, 2), accessor(5123, 5, "SCALAR")}, {0, 1, 3},
                    "2 triangles with repeated vertices"}},
            {"fan", {{primitive(6, "")}, {1, 2, 0, 2, 3, 0}}},
            {"lines joined at common vertices",
                {{primitive(1), ushorts(0, 1, 1, 2, 3, 0), accessor(5123, 6, "SCALAR")}, {0, 3, 5},
                    "1 points are dupl"}},
            {"loop", {{primitive(2, "")}, {0, 5}, "1 points are duplicated"}},
            {"line strip", {{primitive(3), "\2\1", accessor(5121, 2, "SCALAR")}, {0, 2}, "2 points of no line"}},
            {"points", {{primitive(0, "")}, {}}},
            {"triangles and lines",
                {{primitive(4) + "," + primitive(3), {"\2\1\0", 3}, accessor(5121, 3, "SCALAR")}, {2, 1, 0},
                    "1 primitives of lines"}},
        };
        for (auto const& [name, test] : cases) {
            SCOPED_TRACE(name);
            GeometryFile const file = readContent(".glb", test.file.content());
            EXPECT_TRUE(isValid(*file.object));
            EXPECT_EQ(
                valuesOf<unsigned int>(*file.object, file.object->hasProperty(sFaceComp) ? sFaceVertex : sStrandOffset),
                test.corners);
            EXPECT_EQ(file.notes.size(), *test.note ? 1u : 0u);
            EXPECT_THAT(file.notes.empty() ? "" : file.notes[0], HasSubstr(test.note));
        }
    }

    TEST(ReadGltf, ConvertsTypesAndFollowsStridesAndSparseValues)
    {
        // Interleaved from byte 0 of the view: two normalized shorts, four bytes; stride 8.
        std::string more;
        for (int i = 0; i < 4; ++i)
            more += bytes(static_cast<std::int16_t>(i == 0 ? -32768
                                  : i == 1                 ? 32767
                                                           : 0),
                std::int16_t{0}, static_cast<std::uint8_t>(50 * i), std::uint8_t{255}, std::uint8_t{1},
                std::uint8_t{2});
        more +=
            bytes(std::uint8_t{1}, std::uint8_t{3}, std::uint16_t{0}, 5.0f, 6.0f, 7.0f, 8.0f, 9.0f, 10.0f); // sparse
        Gltf const gltf{
            primitive(6, "", R"(,"TEXCOORD_1":1,"COLOR_0":2,"_pair":3,"_one":4,"_color":5,"JOINTS_0":2,"WEIGHTS_0":2)"),
            more,
            R"(,{"bufferView":2,"componentType":5122,"normalized":true,"count":4,"type":"VEC2"},)"
            R"({"bufferView":2,"byteOffset":4,"componentType":5121,"normalized":true,"count":4,"type":"VEC4"},)"
            R"({"bufferView":2,"byteOffset":4,"componentType":5121,"count":4,"type":"VEC2"},)"
            R"({"bufferView":2,"byteOffset":4,"componentType":5121,"count":4,"type":"SCALAR"},)"
            R"({"componentType":5126,"count":4,"type":"VEC3","sparse":{"count":2,)"
            R"("indices":{"bufferView":1,"byteOffset":32,"componentType":5121},)"
            R"("values":{"bufferView":1,"byteOffset":36}}})",
            R"(,{"buffer":0,"byteOffset":48,"byteLength":32,"byteStride":8})", R"(,"materials":[{},{}])"};

        GeometryFile const file = readContent(".glb", gltf.content());
        Tessara::Object const& mesh = *file.object;
        EXPECT_TRUE(isValid(mesh));
        EXPECT_EQ(valuesOf<float2>(mesh, "uv1"), (std::vector<float2>{{-1, 0}, {1, 0}, {0, 0}, {0, 0}}));
        EXPECT_EQ(valuesOf<uchar4>(mesh, "color"),
            (std::vector<uchar4>{{0, 255, 1, 2}, {50, 255, 1, 2}, {100, 255, 1, 2}, {150, 255, 1, 2}}));
        EXPECT_EQ(valuesOf<float2>(mesh, "pair"), (std::vector<float2>{{0, 255}, {50, 255}, {100, 255}, {150, 255}}));
        EXPECT_EQ(valuesOf<unsigned char>(mesh, "one"), (std::vector<unsigned char>{0, 50, 100, 150}));
        EXPECT_EQ(floatsOf(mesh, "point:color"), (std::vector<float>{0, 0, 0, 5, 6, 7, 0, 0, 0, 8, 9, 10}));
        EXPECT_THAT(file.notes,
            ElementsAre("attributes are left out: 2 (\"JOINTS_0\", \"WEIGHTS_0\")", "2 materials are left out"));
    }

    TEST(ReadGltf, PlacesMeshesByTheNodesOfTheScene)
    {
        // Node 1 mirrors and node 2 moves its child: (x, y, z) becomes (10 - 2x, -z, y) below both.
        std::string const nodes =
            R"(,"scene":1,"scenes":[{"nodes":[0]},{"nodes":[2,3]}],"nodes":[{"mesh":1},)"
            R"({"mesh":0,"matrix":[-2,0,0,0, 0,0,1,0, 0,-1,0,0, 0,0,0,1]},)"
            R"({"children":[1],"translation":[10,0,0]},)"
            R"({"mesh":0,"rotation":[0,0,0.7071067811865476,0.7071067811865476],"scale":[2,1,1]}])";
        std::string const normals = bytes(0.6f, 0.0f, 0.8f, 0.0f, 1.0f, 0.0f, 0.0f, 0.0f, 1.0f, 0.0f, 0.0f, 0.0f);
        Gltf gltf{primitive(6, "", R"(,"NORMAL":1)"), normals, accessor(5126, 4, "VEC3"), {}, nodes};
        GeometryFile const file = readContent(".glb", gltf.content());
        Tessara::Object const& mesh = *file.object;
        EXPECT_THAT(file.notes, IsEmpty());
        std::vector<float> const positions = floatsOf(mesh, sPointPosition), normal = floatsOf(mesh, "normal");
        EXPECT_EQ(std::vector(positions.begin(), positions.begin() + 12),
            (std::vector<float>{10, 0, 0, 8, 0, 0, 8, 0, 1, 10, 0, 1}));
        EXPECT_EQ(valuesOf<unsigned int>(mesh, sFaceVertex), (Indices{1, 0, 2, 2, 0, 3, 5, 6, 4, 6, 7, 4}));
        EXPECT_EQ(valuesOf<int>(mesh, "source"), (std::vector<int>{0, 0, 1, 1}));
        // (0.6, 0, 0.8) becomes (-0.6 / 2, -0.8, 0), normalized.
        float const length = std::sqrt(0.09f + 0.64f);
        float const expected[] = {-0.3f / length, -0.8f / length, 0, 0, 0, 1, 0, -1, 0, 0, 0, 0};
        for (std::size_t i = 0; i < 12; ++i)
            EXPECT_FLOAT_EQ(normal[i], expected[i]) << i;
        float const rotated[] = {0, 0, 0, 0, 2, 0, -1, 2, 0, -1, 0, 0};
        for (std::size_t i = 0; i < 12; ++i)
            EXPECT_NEAR(positions[12 + i], rotated[i], 1e-6) << i;

        gltf.rest = R"(,"nodes":[{"mesh":0,"translation":[10000000.3,0,0]}])";
        EXPECT_THAT(readContent(".glb", gltf.content()).notes, ElementsAre(HasSubstr("positions lose up to")));
        EXPECT_THAT(readContent(".glb", gltf.content(), {.isCentered = true}).notes, IsEmpty());
        gltf.rest = R"(,"nodes":[{"mesh":0}],"scenes":[{}])";
        GeometryFile const empty = readContent(".glb", gltf.content());
        EXPECT_EQ(getElementCount(*empty.object, sPointComp), 0u);
        EXPECT_THAT(empty.notes, ElementsAre("1 meshes outside the scene are left out"));
    }

    TEST(ReadGltf, JoinsVerticesAtEqualPositionsOfOneMesh)
    {
        // Two triangles without common vertices; the vertices of the diagonal have equal "same", but not "uv".
        std::string const more = bytes(0.0f, 0.0f, 0.0f, 1.0f, 0.0f, 0.0f, 1.0f, 1.0f, 0.0f, 1.0f, 1.0f, 0.0f, 0.0f,
                                     1.0f, 0.0f, -0.0f, 0.0f, 0.0f)
            + bytes(0.0f, 1.0f, 2.0f, 2.0f, 4.0f, 0.0f)
            + bytes(0.0f, 0.0f, 1.0f, 0.0f, 2.0f, 0.0f, 3.0f, 0.0f, 4.0f, 0.0f, 5.0f, 0.0f);
        Gltf const gltf{R"({"attributes":{"POSITION":1,"_same":2,"TEXCOORD_0":3}})", more,
            accessor(5126, 6, "VEC3") + accessor(5126, 6, "SCALAR", R"(,"byteOffset":72)")
                + accessor(5126, 6, "VEC2", R"(,"byteOffset":96)"),
            {}, R"(,"nodes":[{"mesh":0},{"mesh":0}])"};
        GeometryFile const file = readContent(".glb", gltf.content());
        EXPECT_EQ(valuesOf<unsigned int>(*file.object, sFaceVertex), (Indices{0, 1, 2, 2, 3, 0, 4, 5, 6, 6, 7, 4}));
        EXPECT_EQ(valuesOf<float>(*file.object, "same"), (std::vector<float>{0, 1, 2, 4, 0, 1, 2, 4}));
        EXPECT_EQ(valuesOf<float2>(*file.object, "uv")[3], (float2{3, 0}));
        EXPECT_EQ(valuesOf<float2>(*file.object, "uv").size(), 12u);
        EXPECT_THAT(file.notes, ElementsAre(HasSubstr("4 vertices become one point")));
    }

    TEST(ReadGltf, SharesVerticesOfPrimitivesAndFillsMissingValues)
    {
        std::string const heat = bytes(1.0f, 2.0f, 3.0f, 4.0f);
        Gltf const gltf{primitive(4, R"(,"indices":1)") + "," + primitive(4, R"(,"indices":2)") + ","
                + primitive(4, R"(,"indices":1)", R"(,"_heat":3)") + "," + R"({"attributes":{"_heat":3}})",
            bytes(std::uint8_t{0}, std::uint8_t{1}, std::uint8_t{2}, std::uint8_t{2}, std::uint8_t{3}, std::uint8_t{0},
                std::uint16_t{0})
                + heat,
            accessor(5121, 3, "SCALAR") + accessor(5121, 3, "SCALAR", R"(,"byteOffset":3)")
                + accessor(5126, 4, "SCALAR", R"(,"byteOffset":8)")};
        GeometryFile const file = readContent(".glb", gltf.content());
        EXPECT_EQ(valuesOf<unsigned int>(*file.object, sFaceVertex), (Indices{0, 1, 2, 2, 3, 0, 0, 1, 2}));
        EXPECT_EQ(valuesOf<int>(*file.object, "source"), (std::vector<int>{0, 1, 2}));
        EXPECT_EQ(valuesOf<float>(*file.object, "heat"), (std::vector<float>{0, 0, 0, 0, 0, 0, 1, 2, 3}));
        EXPECT_THAT(file.notes,
            ElementsAre("4 vertices have no \"heat\" and get zeros", HasSubstr("4 vertices become one point"),
                "1 primitives without positions are left out"));
    }

    TEST(ReadGltf, ReadsTextWithDataInsideOrBeside)
    {
        TemporaryFolder const folder;
        Gltf const gltf{primitive(6, "")};
        auto const withUri = [&](std::string const& uri) {
            std::string json = gltf.json();
            store(folder / "a.gltf", json.insert(json.find(R"("byteLength":48})"), "\"uri\":\"" + uri + "\","));
            return readGeometryFile(folder / "a.gltf");
        };
        store(folder / "a b.bin", kSquare);
        GeometryFile const beside = withUri("./a%20b.bin");
        EXPECT_EQ(beside.format, "glTF (text)");
        EXPECT_EQ(floatsOf(*beside.object, sPointPosition)[3], 1);
        EXPECT_TRUE(
            sameContents(*withUri("data:application/octet-stream;base64,AAAAAAAAAAAAAAAAAACAPwAAAAAAAAAAAACAPwAA"
                                  "gD8AAAAAAAAAAAAAgD8AAAAA")
                              .object,
                *beside.object));
        for (std::string const uri : {"../a%20b.bin", "/etc/passwd", "file:///etc/passwd", "http://x/y", "x/../../a",
                 "", "none.bin", "data:,AAAA", "data:;base64,A?", "."}) {
            try {
                withUri(uri);
                ADD_FAILURE() << uri;
            } catch (FileError const& error) {
                EXPECT_THAT(error.what(), HasSubstr("a.gltf, mesh 0"));
            }
        }
    }

    TEST(ReadGltf, RefusesWhatIsMalformedOrNotSupported)
    {
        auto const with = [](std::string const& accessors, std::string const& views = {},
                              std::string const& rest = {}) {
            return Gltf{primitive(4), std::string(12, '\0'), accessors, views, rest}.content();
        };
        auto const withRest = [&](std::string const& rest) { return with(accessor(5123, 3, "SCALAR"), {}, rest); };
        std::string const deep = std::string(200'000, '[') + std::string(200'000, ']');
        std::string const whole = with(accessor(5123, 3, "SCALAR"));
        std::string versionOne = whole;
        versionOne[4] = 1;
        std::string longChunk = whole;
        longChunk[15] = '\x7f';
        std::pair<std::string, char const*> const cases[] = {
            {"hello", "header: it does not begin with \"glTF\""},
            {whole.substr(0, 19), "the file is cut off"},
            {whole.substr(0, 200), "the file is cut off: it declares"},
            {versionOne, "version 1 of the format"},
            {longChunk, "chunk at byte 12: it declares"},
            {glbOf("{", ""), "JSON: it is malformed at byte 5"},
            {glbOf("[]", ""), "JSON: it is not an object"},
            {glbOf(R"({"asset":{"version":"2.0"},"nodes":[{"children":[1]},{"children":[0]}]})", ""),
                "every node is the child of a node"},
            {glbOf(R"({"asset":{"version":"2.0"},"nodes":[{"matrix":[1,0,0,0,0,1,0,0,0,0,1,0,0,0,0,2]}]})", ""),
                "node 0: the last row of matrix is not 0 0 0 1"},
            {glbOf(R"({"asset":{"version":"1.0"}})", ""), "asset.version is \"1.0\""},
            {withRest(R"(,"extensionsRequired":["KHR_draco_mesh_compression"])"), "the geometry is compressed"},
            {withRest(R"(,"extensionsRequired":["X_y"])"), "requires the extension \"X_y\""},
            {withRest(",\"extensionsRequired\":" + deep), "requires the extension"},
            {Gltf{primitive(4, "", ",\"_x\":" + deep)}.content(), "_x is not a whole number"},
            {with({}, R"(,{"buffer":1,"byteLength":1})"), "refers to accessors 1, but the file has 1"},
            {with(R"(,{"bufferView":2,"componentType":5123,"count":3,"type":"SCALAR"})"), "refers to bufferViews 2"},
            {with(accessor(5123, 7, "SCALAR")), "mesh 0, primitive 0: accessor 1 ends after its buffer view"},
            {with(accessor(5123, 3, "SCALAR", R"(,"byteOffset":18446744073709551615)")), "begins after the end of"},
            {with(accessor(5123, 3, "SCALAR", R"(,"byteOffset":-1)")), "byteOffset is not a whole number"},
            {with(accessor(5124, 3, "SCALAR")), "componentType 5124 does not exist"},
            {with(accessor(5123, 3, "VEC5")), "type \"VEC5\""},
            {with(accessor(5126, 3, "SCALAR")), "indices are not unsigned integers"},
            {with(R"(,{"componentType":5121,"count":4294967293,"type":"SCALAR"})"), "elements without data"},
            {with(R"(,{"componentType":5121,"count":18446744073709551615,"type":"SCALAR"})"), "more elements than"},
            {with(R"(,{"bufferView":2,"componentType":5123,"count":3,"type":"SCALAR"})",
                 R"(,{"buffer":0,"byteOffset":18446744073709551615,"byteLength":8})"),
                "buffer view 2 ends after its buffer"},
            {with(R"(,{"bufferView":2,"componentType":5123,"count":3,"type":"SCALAR"})",
                 R"(,{"buffer":0,"byteStride":1,"byteLength":8})"),
                "ends after its buffer view"},
            {with(R"(,{"componentType":5121,"count":3,"type":"SCALAR","sparse":{"count":2,"indices":{"bufferView":1,)"
                  R"("componentType":5121},"values":{"bufferView":1}}})"),
                "indices of sparse do not ascend"},
            {Gltf{primitive(4), "\1\2\4", accessor(5121, 3, "SCALAR")}.content(), "index 2 refers to vertex 4"},
            {Gltf{primitive(7)}.content(), "mode 7 does not exist"},
            {Gltf{primitive(4, "", R"(,"NORMAL":1)"), std::string(8, '\0'), accessor(5121, 1, "VEC3")}.content(),
                "NORMAL has 1 elements, but POSITION has 4"},
            {withRest(R"(,"nodes":[{"children":[1]},{"children":[0]}],"scenes":[{"nodes":[0]}])"),
                "node 0: it occurs twice"},
            {withRest(R"(,"nodes":[{"mesh":0,"matrix":[1]}])"), "node 0: matrix is not an array of 16 numbers"},
            {withRest(R"(,"nodes":[{"mesh":0,"scale":[1e300,1,1],"translation":[1e300,0,0]}])"), "is not finite"},
        };
        for (auto const& [content, words] : cases)
            EXPECT_THAT(refusalOf(".glb", content), HasSubstr(words));
    }

    struct WrittenGlb {
        std::string content;
        Notes notes;
        GeometryFile again;
    };

    WrittenGlb writtenGlb(Tessara::Object const& object)
    {
        TemporaryFolder const folder;
        Notes notes = writeGeometryFile(object, folder / "a.glb", {.remark = "center \"1\""});
        return {contentOf(folder / "a.glb"), std::move(notes), readGeometryFile(folder / "a.glb")};
    }

    OwnedObject twoTriangles()
    {
        return makeMesh(
            {{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {-0.1f, 1, 1e-20f}, {5, 5, 123456.789f}}, {0, 1, 2, 0, 2, 3}, {0, 3, 6});
    }

    TEST(WriteGltf, PreservesGeometryAndAttributesOfPointsBitwise)
    {
        OwnedObject const mesh = twoTriangles();
        addDataProperty<float3>("normal", sPointComp, Orvan::Array<float3>(5, {0, 0.6f, 0.8f}), *mesh);
        addDataProperty<uchar3>("color", sPointComp, {{1, 2, 3}, {4, 5, 6}, {7, 8, 9}, {0, 0, 0}, {255, 0, 1}}, *mesh);
        addDataProperty<float4>("color1", sPointComp, Orvan::Array<float4>(5, {0.1f, 1, 0, 0.5f}), *mesh);
        addDataProperty<float2>("uv", sPointComp, Orvan::Array<float2>(5, {0.1f, -7}), *mesh);
        addDataProperty<float2>("uv1", sPointComp, Orvan::Array<float2>(5, {2, 3}), *mesh);
        addDataProperty<short>("level", sPointComp, {1, -2, 3, -32768, 32767}, *mesh);
        addDataProperty<float3x3>(
            "axes", sPointComp, Orvan::Array<float3x3>(5, {{{1, 2, 3}, {4, 5, 6}, {7, 8, 9}}}), *mesh);
        WrittenGlb const file = writtenGlb(*mesh);
        EXPECT_THAT(file.notes, IsEmpty());
        EXPECT_THAT(file.again.notes, IsEmpty());
        EXPECT_THAT(file.content,
            AllOf(HasSubstr(R"("TEXCOORD_0")"), HasSubstr(R"("COLOR_1")"),
                HasSubstr(R"("min":[-0.10000000149011612,0.0,0.0],"max":[5.0,5.0,123456.7890625])"),
                HasSubstr(R"("remark":"center \"1\"")")));
        EXPECT_TRUE(sameContents(*sorted(*file.again.object), *sorted(*mesh)));

        OwnedObject const strands = makeStrands({{0, 0, 0}, {1, 0, 0}, {0, 0, 0}, {5, 5, 5}, {6, 5, 5}}, {0, 3, 5});
        EXPECT_TRUE(sameContents(*writtenGlb(*strands).again.object, *strands));
        OwnedObject const cloud = makePointCloud({{0, 0, 0}, {1, 2, 3}, {0, 0, 0}});
        EXPECT_TRUE(sameContents(*writtenGlb(*cloud).again.object, *cloud));
        EXPECT_TRUE(sameContents(*writtenGlb(*makePointCloud({})).again.object, *makePointCloud({})));
        OwnedObject const large = makePointCloud(Orvan::Array<float3>(70'000));
        EXPECT_TRUE(sameContents(*writtenGlb(*large).again.object, *large));
    }

    TEST(WriteGltf, SplitsPointsWhoseCornersDiffer)
    {
        OwnedObject const mesh = twoTriangles();
        addDataProperty<float2>("uv", sFaceVertexComp, {{0, 0}, {1, 0}, {1, 1}, {0.5f, 0}, {1, 1}, {0, 1}}, *mesh);
        addDataProperty<short>("part", sFaceVertexComp, {1, 1, 1, 2, 2, 2}, *mesh);
        addDataProperty<float>("heat", sPointComp, {1, 2, 3, 4, 5}, *mesh);
        WrittenGlb const file = writtenGlb(*mesh);
        EXPECT_THAT(file.notes, ElementsAre(HasSubstr("2 vertices are added")));
        EXPECT_THAT(file.again.notes, ElementsAre(HasSubstr("2 vertices become one point")));
        EXPECT_TRUE(sameContents(*sorted(*file.again.object), *sorted(*mesh)));
    }

    TEST(WriteGltf, TellsWhatItConvertsAndLeavesOut)
    {
        OwnedObject const mesh = twoTriangles();
        addDataProperty<int>("count", sPointComp, {1, 2, 3, 4, -16777216}, *mesh);
        addDataProperty<int>("id", sPointComp, {1, 2, 3, 4, 16777217}, *mesh);
        addDataProperty<bool>("chosen", sPointComp, {true, false, true, true, false}, *mesh);
        addDataProperty<double>("wide", sPointComp, Orvan::Array<double>(5, 0.1), *mesh);
        addDataProperty<float>("hole", sPointComp, Orvan::Array<float>(5, NAN), *mesh);
        addDataProperty<float3>("normal", sPointComp, Orvan::Array<float3>(5, {0, 0, 2}), *mesh);
        addDataProperty<float3>("color", sPointComp, Orvan::Array<float3>(5, {0, 0, 256}), *mesh);
        addDataProperty<float2>("uv1", sPointComp, Orvan::Array<float2>(5), *mesh);
        addDataProperty<float2x2>("square", sPointComp, Orvan::Array<float2x2>(5), *mesh);
        addDataProperty<int>("part", sFaceComp, {1, 2}, *mesh);
        WrittenGlb const file = writtenGlb(*mesh);
        EXPECT_THAT(file.notes,
            ElementsAre(HasSubstr("\"count\" is written as floats: GLB files have no int"),
                HasSubstr("\"id\" (int, points) is left out"), HasSubstr("\"chosen\" is written as bytes"),
                HasSubstr("\"wide\" is written as floats: GLB files have no double"),
                HasSubstr("\"hole\" (float, points) is left out"), HasSubstr("\"normal\" is written as \"_normal\""),
                HasSubstr("\"color\" is written as \"_color\""), HasSubstr("\"square\" (float2x2, points) is left out"),
                HasSubstr("\"part\" (int, faces) is left out")));
        EXPECT_THAT(file.content, AllOf(HasSubstr("\"_uv1\""), Not(HasSubstr("TEXCOORD"))));
        EXPECT_EQ(valuesOf<float>(*file.again.object, "count"), (std::vector<float>{1, 2, 3, 4, -16777216}));
        EXPECT_EQ(valuesOf<unsigned char>(*file.again.object, "chosen"), (std::vector<unsigned char>{1, 0, 1, 1, 0}));
        EXPECT_EQ(valuesOf<float3>(*file.again.object, "normal")[0], (float3{0, 0, 2}));
    }

    TEST(ReadGltf, FillsLargeSparseAccessorsOfSmallFiles)
    {
        std::string const content =
            R"({"asset":{"version":"2.0"},"buffers":[{"byteLength":16,"uri":"data:;base64,n4YBAAAAgD8AAABAAABAQA=="}],)"
            R"("bufferViews":[{"buffer":0,"byteLength":4},{"buffer":0,"byteOffset":4,"byteLength":12}],"accessors":[{)"
            R"("componentType":5126,"count":100000,"type":"VEC3","sparse":{"count":1,"indices":{"bufferView":0,)"
            R"("componentType":5125},"values":{"bufferView":1}}}],"meshes":[{"primitives":[{"attributes":{)"
            R"("POSITION":0},"mode":0}]}],"scenes":[{"nodes":[0]}],"nodes":[{"mesh":0}]})";
        auto const positions = valuesOf<float3>(*readContent(".gltf", content).object, sPointPosition);
        ASSERT_EQ(positions.size(), 100'000u);
        EXPECT_EQ(positions[99'998], (float3{0, 0, 0}));
        EXPECT_EQ(positions[99'999], (float3{1, 2, 3}));
    }

    TEST(WriteGltf, RefusesFilesBeyondTheLimit)
    {
        auto const mesh = makeMesh({{0, 0, 0}, {1, 0, 0}, {0, 1, 0}}, {0, 1, 2}, {0, 3});
        TemporaryFolder const folder;
        WritableGeometry geometry = takeApart(*mesh, folder / "a.glb");
        writeGltf(geometry, folder / "a.glb");
        std::uint64_t const size = std::filesystem::file_size(folder / "a.glb");
        EXPECT_THROW(writeGltf(geometry, folder / "b.glb", size - 1), FileError);
        EXPECT_FALSE(std::filesystem::exists(folder / "b.glb"));
        writeGltf(geometry, folder / "b.glb", size);
        EXPECT_EQ(contentOf(folder / "b.glb"), contentOf(folder / "a.glb"));
    }

}

}
