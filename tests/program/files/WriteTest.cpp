#include "FileSupport.h"

#include <csignal>
#include <sstream>
#include <sys/resource.h>

namespace ModelingProgram {

namespace {

    using testing::AllOf;
    using testing::ElementsAre;
    using testing::HasSubstr;
    using OwnedObject = Orvan::MutablePtr<Tessara::Object>;

    /// A triangle and a quad that share an edge.
    OwnedObject twoFaces()
    {
        return makeMesh({{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 1e-20f}, {1.0f / 3, 2, 123456.789f}},
            {0, 1, 2, 0, 2, 4, 3}, {0, 3, 7});
    }

    OwnedObject triangle()
    {
        return makeMesh({{0, 0, 0}, {1, 0, 0}, {1, 1, 0}}, {0, 1, 2}, {0, 3});
    }

    /// Values whose bytes all differ, in every element.
    template <class T> Orvan::Array<T> someValues(std::uint64_t count)
    {
        Orvan::Array<T> values(count);
        auto* const bytes = reinterpret_cast<unsigned char*>(values.data);
        for (std::uint64_t i = 0; i < count * sizeof(T); ++i)
            bytes[i] = static_cast<unsigned char>(i * 7 % 120);
        return values;
    }

    struct Written {
        std::string content;
        std::vector<std::string> notes;
        OwnedObject object; // read back, if the format can be read
    };

    Written written(Tessara::Object const& object, std::string const& extension)
    {
        TemporaryFolder const folder;
        std::filesystem::path const file = folder / ("file" + extension);
        auto notes = writeGeometryFile(object, file);
        return {contentOf(file), std::move(notes), extension == ".vtp" ? nullptr : readGeometryFile(file).object};
    }

    TEST(WritePly, PreservesPropertiesOfAllTypes)
    {
        OwnedObject const mesh = twoFaces();
        Random random(1);
        for (char const* const component : {sPointComp, sFaceComp}) {
            addAllTypes(component, random, *mesh);
            for (std::string const type : {"bool", "string", "GeoLocation"}) // tested below, or without columns
                mesh->eraseProperty((component + type).c_str());
        }
        addDataProperty<float>("face:both", sFaceComp, {1, 2}, *mesh);
        addDataProperty<float>("both", sPointComp, {1, 2, 3, 4, 5}, *mesh);
        addDataProperty<uchar4>("color", sPointComp, someValues<uchar4>(5), *mesh);
        addDataProperty<uchar3>("face:color", sFaceComp, someValues<uchar3>(2), *mesh);
        addDataProperty<double3>("normal", sPointComp, someValues<double3>(5), *mesh);
        addDataProperty<float2>("uv", sFaceVertexComp, someValues<float2>(7), *mesh);

        Written const file = written(*mesh, ".ply");
        EXPECT_EQ(file.notes.size(), 2 * 7);
        for (std::string const type :
            {"long", "ulong", "float2x2", "double2x2", "GeometryType", "FaceEdge", "GraphTransforms"})
            for (std::string const component : {sPointComp, sFaceComp})
                mesh->eraseProperty((component + type).c_str());
        EXPECT_TRUE(sameContents(*sorted(*file.object), *sorted(*mesh)));
    }

    TEST(WritePly, PreservesTheNamesOfColumns)
    {
        for (std::string const columns : {"s t", "u v", "texture_u texture_v"}) {
            std::string header = "element vertex 1\nproperty float x\nproperty float y\nproperty float z\n"
                                 "property float nx\nproperty float ny\nproperty float nz\n"
                                 "property float red\nproperty float green\nproperty float blue\n"
                                 "property short x2\n";
            std::istringstream names(columns);
            for (std::string name; names >> name;)
                header += "property double " + name + "\n";
            header += "property uchar sPointComp\nproperty list uchar float axis\nend_header\n";
            GeometryFile const file =
                readContent(".ply", "ply\nformat ascii 1.0\n" + header + "1 2 3 4 5 6 7 8 9 10 11 12 15 2 13 14\n");
            EXPECT_EQ(valuesOf<double2>(*file.object, "uv").size(), 1u) << columns;
            Written const again = written(*file.object, ".ply");
            EXPECT_TRUE(again.notes.empty());
            EXPECT_THAT(again.content, HasSubstr("1.0\n" + header));
            EXPECT_TRUE(sameContents(*again.object, *file.object));
        }
    }

    TEST(WritePly, WritesBoolsAsBytesAndLongFaces)
    {
        for (unsigned int const count : {127u, 200u, 300u}) { // lengths of two lists in bytes, of one, of none
            Orvan::Array<unsigned int> corners(count);
            for (unsigned int corner = 0; corner < count; ++corner)
                corners[corner] = corner % 5;
            OwnedObject const mesh = makeMesh(Orvan::Array<float3>(5), corners, {0, count});
            addDataProperty<bool>("chosen", sFaceComp, {true}, *mesh);
            addDataProperty<float2>("uv", sFaceVertexComp, someValues<float2>(count), *mesh);
            addDataProperty<int>("two words", sFaceComp, {1}, *mesh);
            addDataProperty<int>("x", sPointComp, someValues<int>(5), *mesh);
            Written const file = written(*mesh, ".ply");
            EXPECT_THAT(file.notes,
                ElementsAre(HasSubstr("\"x\" (int, points) is left out"), HasSubstr("\"chosen\" is written as uchar"),
                    HasSubstr("\"two words\"")));
            EXPECT_EQ(valuesOf<unsigned char>(*file.object, "chosen"), std::vector<unsigned char>{1});
            EXPECT_EQ(valuesOf<unsigned int>(*file.object, sFaceVertex), valuesOf<unsigned int>(*mesh, sFaceVertex));
            EXPECT_EQ(valuesOf<float2>(*file.object, "uv"), valuesOf<float2>(*mesh, "uv"));
        }
    }

    TEST(WriteObj, PreservesGeometryBitwise)
    {
        OwnedObject const mesh = twoFaces();
        addDataProperty<float2>("uv", sFaceVertexComp, someValues<float2>(7), *mesh);
        addDataProperty<float3>("normal", sFaceVertexComp, Orvan::Array<float3>(7, {0, 0.1f, 1}), *mesh);
        addDataProperty<float3>("color", sPointComp, someValues<float3>(5), *mesh);
        EXPECT_TRUE(sameContents(*written(*mesh, ".obj").object, *mesh));

        OwnedObject const strands = makeStrands({{0, 0, 0}, {1, 0, 0}, {0, 0, 0}, {5, 5, 5}}, {0, 3, 4});
        addDataProperty<float3>("normal", sPointComp, someValues<float3>(4), *strands);
        EXPECT_TRUE(sameContents(*written(*strands, ".obj").object, *strands));
        OwnedObject const cloud = makePointCloud({{0, 0, 0}, {1, 2, 3}});
        EXPECT_TRUE(sameContents(*written(*cloud, ".obj").object, *cloud));
    }

    TEST(WriteObj, SharesEqualCornerValuesAndWritesThoseOfPoints)
    {
        OwnedObject const mesh = twoFaces();
        addDataProperty<double2>("uv", sFaceVertexComp, Orvan::Array<double2>(7, {0, 0.1}), *mesh);
        addDataProperty<float3>("normal", sPointComp, Orvan::Array<float3>(5, {0, 0, 1}), *mesh);
        addDataProperty<uchar4>("color", sPointComp, Orvan::Array<uchar4>(5, {255, 0, 51, 9}), *mesh);
        addDataProperty<float>("heat", sPointComp, Orvan::Array<float>(5), *mesh);
        addDataProperty<int>("part", sFaceComp, Orvan::Array<int>(3), *mesh);
        addRangeProperty("range", sFaceComp, {0, 0}, *mesh);
        addDataProperty<int>("of range", "range", {1}, *mesh);
        Written const file = written(*mesh, ".obj");
        EXPECT_THAT(file.notes,
            ElementsAre("\"part\" (int, faces) is left out: it has 3 values for 2 elements",
                HasSubstr("\"of range\" (int, range) is left out"),
                HasSubstr("\"color\" is written as three fractions per point"),
                HasSubstr("\"heat\" (float, points) is left out")));
        EXPECT_THAT(file.content,
            AllOf(HasSubstr("v 1 0 0 1 0 0.2\n"), HasSubstr("\nvt 0 0.1\nvn "),
                HasSubstr("f 1/1/1 2/1/2 3/1/3\nf 1/1/1 3/1/3 5/1/5 4/1/4\n")));
    }

    TEST(WriteObj, PreservesTheNamesOfFaces)
    {
        std::string const faces = "mtllib a b.mtl\nmtllib c.mtl\nv 0 0 0\nv 1 0 0\nv 1 1 0\no one two\nf 1 2 3\ng x y\n"
                                  "usemtl red\ns 4294967295\nf 1 2 3\no two\nusemtl blue\nf 1 3 2\nusemtl red\ns 0\n"
                                  "f 2 3 1\ng\nusemtl\nf 2 1 3\n";
        GeometryFile const file = readContent(".obj", faces);
        EXPECT_THAT(file.notes, testing::IsEmpty());
        Written const again = written(*file.object, ".obj");
        EXPECT_EQ(again.content, faces);
        EXPECT_THAT(again.notes, testing::IsEmpty());
        EXPECT_TRUE(sameContents(*again.object, *file.object));
        EXPECT_THAT(written(*file.object, ".ply").notes,
            ElementsAre("\"object_name\" (string, object) is left out: only OBJ and HDF5 files can hold names of faces",
                HasSubstr("\"group_name\""), HasSubstr("\"material_name\""), HasSubstr("\"material_library_name\"")));
        EXPECT_EQ(valuesOf<unsigned int>(*written(*file.object, ".ply").object, "smoothing_group")[1], 4294967295u);

        // The merged range repeats names and libraries, and has entries beyond the names.
        OwnedObject const merged = triangle();
        addRangeProperty("material_library", sFaceComp, {7}, *merged);
        addDataProperty<Orvan::String>("material_library_name", "material_library", {"a\nb", "b"}, *merged);
        addRangeProperty("material", sFaceComp, {1}, *merged);
        addDataProperty<Orvan::String>("material_name", "material", {"a", "#b\nv 1\\"}, *merged);
        EXPECT_THAT(written(*merged, ".obj").content,
            AllOf(testing::StartsWith("v 0"), HasSubstr("\nusemtl _b_v 1_\nf 1 2 3\n")));
    }

    TEST(WriteStl, PreservesTriangles)
    {
        OwnedObject const mesh = triangle();
        addDataProperty<unsigned short>("attribute", sFaceComp, {7}, *mesh);
        Written const file = written(*mesh, ".stl");
        EXPECT_TRUE(sameContents(*file.object, *mesh));
        EXPECT_EQ(file.content.substr(84, 12), bytesOf(std::endian::little, 0.0f, 0.0f, 1.0f));
        OwnedObject const withLoosePoint = makeMesh({{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {2, 2, 2}}, {0, 1, 2}, {0, 3});
        EXPECT_THAT(written(*withLoosePoint, ".stl").notes, ElementsAre(HasSubstr("1 points of no face")));
    }

    std::string attributeOf(std::string const& tag, std::string const& name)
    {
        std::size_t const begin = tag.find(" " + name + "=\"") + name.size() + 3;
        return tag.substr(begin, tag.find('"', begin) - begin);
    }

    /// The bytes of each array of a VTP file, by section, name and type.
    std::map<std::string, std::string> arraysOf(std::string const& content)
    {
        std::map<std::string, std::string> arrays;
        std::size_t const data = content.find('_', content.find("<AppendedData encoding=\"raw\">")) + 1;
        std::istringstream xml(content.substr(0, data));
        std::string section;
        for (std::string line; std::getline(xml, line);) {
            std::string const tag = line.substr(std::min(line.size(), line.find('<')));
            if (tag.find(' ') == std::string::npos)
                section = tag;
            if (!tag.starts_with("<DataArray"))
                continue;
            std::size_t const begin = data + std::stoul(attributeOf(tag, "offset"));
            std::uint64_t bytes = 0;
            std::memcpy(&bytes, content.data() + begin, sizeof(bytes));
            arrays[section + " " + attributeOf(tag, "Name") + " " + attributeOf(tag, "type") + "x"
                + attributeOf(tag, "NumberOfComponents")] = content.substr(begin + sizeof(bytes), bytes);
        }
        return arrays;
    }

    template <class T> std::string bytesOfArray(Tessara::Object const& object, char const* name)
    {
        auto const array = dataOf<T>(object, name);
        return {reinterpret_cast<char const*>(array->data), array->size * sizeof(T)};
    }

    TEST(WriteVtp, ContainsNamedArraysOfPointsAndCells)
    {
        using Arrays = std::map<std::string, std::string>;
        auto const longs = [](auto... numbers) { return bytesOf(std::endian::little, std::int64_t{numbers}...); };
        auto const arraysIn = [](OwnedObject const& object) { return arraysOf(written(*object, ".vtp").content); };

        OwnedObject const mesh = twoFaces();
        addDataProperty<float3>("a<\"b\">&\x01", sPointComp, someValues<float3>(5), *mesh);
        addDataProperty<unsigned long long>("id", sFaceComp, someValues<unsigned long long>(2), *mesh);
        addDataProperty<float3x3>("face:id", sFaceComp, someValues<float3x3>(2), *mesh);
        addDataProperty<bool>("tag", sFaceComp, {true, false}, *mesh);
        addDataProperty<float2>("uv", sFaceVertexComp, someValues<float2>(7), *mesh);
        addDataProperty<Orvan::String>("text", sFaceComp, {"a", "b"}, *mesh);
        EXPECT_THAT(written(*mesh, ".vtp").notes, ElementsAre(HasSubstr("\"text\""), HasSubstr("\"uv\"")));
        EXPECT_EQ(arraysIn(mesh),
            (Arrays{
                {"<PointData> a&#60;&#34;b&#34;&#62;&#38;? Float32x3", bytesOfArray<float3>(*mesh, "a<\"b\">&\x01")},
                {"<CellData> id UInt64x1", bytesOfArray<unsigned long long>(*mesh, "id")},
                {"<CellData> id Float32x9", bytesOfArray<float3x3>(*mesh, "face:id")},
                {"<CellData> tag UInt8x1", bytesOfArray<bool>(*mesh, "tag")},
                {"<Points> Points Float32x3", bytesOfArray<float3>(*mesh, sPointPosition)},
                {"<Polys> connectivity Int64x1", longs(0, 1, 2, 0, 2, 4, 3)},
                {"<Polys> offsets Int64x1", longs(3, 7)}}));

        OwnedObject const strands =
            makeStrands({{9, 9, 9}, {0, 0, 0}, {1, 0, 0}, {2, 0, 0}}, {1, 3, 4}); // one point is in no strand
        addDataProperty<int>("part", sStrandComp, {4, 5}, *strands);
        EXPECT_THAT(written(*strands, ".obj").content, HasSubstr("\nl 2 3\nl 4\n"));
        EXPECT_EQ(arraysIn(strands),
            (Arrays{{"<CellData> part Int32x1", bytesOfArray<int>(*strands, "part")},
                {"<Points> Points Float32x3", bytesOfArray<float3>(*strands, sPointPosition)},
                {"<Lines> connectivity Int64x1", longs(1, 2, 3)}, {"<Lines> offsets Int64x1", longs(2, 3)}}));

        OwnedObject const cloud = makePointCloud({{0, 0, 0}, {1, 0, 0}});
        EXPECT_EQ(arraysIn(cloud),
            (Arrays{{"<Points> Points Float32x3", bytesOfArray<float3>(*cloud, sPointPosition)},
                {"<Verts> connectivity Int64x1", longs(0, 1)}, {"<Verts> offsets Int64x1", longs(1, 2)}}));
    }

    TEST(WriteGeometryFile, RefusesWhatAFormatCannotHold)
    {
        struct Case {
            OwnedObject object;
            char const* name;
            char const* refusal;
        } const cases[] = {
            {twoFaces(), "a.stl", "triangles only, but face 1 has 4 corners"},
            {makePointCloud({{0, 0, 0}}), "a.stl", "triangles only, and this is not a mesh"},
            {makeStrands({{0, 0, 0}}, {0, 1}), "a.ply", "PLY files cannot hold strands"},
            {makePointCloud({{0, 0, 0}, {0, std::numeric_limits<float>::infinity(), 0}}), "a.ply",
                "point 1 has a coordinate that is not finite"},
            {makeMesh({{0, 0, 0}}, {0, 0}, {0, 2}), "a.obj", "face 0 has fewer than three corners"},
            {makeMesh({{0, 0, 0}}, {0, 0, 7}, {0, 3}), "a.obj", "is invalid: sFaceVertex[2] is 7"},
            {twoFaces(), "a.glb", "GLB files hold triangles only, but face 1 has 4 corners"},
            {triangle(), "a.off", "its extension is none of .obj, .ply, .stl, .vtp, .glb, .h5 and .hdf5"},
        };
        for (Case const& test : cases) {
            TemporaryFolder const folder;
            store(folder / test.name, "old");
            try {
                writeGeometryFile(*test.object, folder / test.name);
                ADD_FAILURE() << "written, but: " << test.refusal;
            } catch (FileError const& error) {
                EXPECT_THAT(error.what(), HasSubstr(test.refusal));
            }
            EXPECT_EQ(contentOf(folder / test.name), "old");
            EXPECT_EQ(folder.entryCount(), 1);
        }
        EXPECT_TRUE(isWritableFormat(formatOf("x.PLY")));
        EXPECT_FALSE(isWritableFormat(".off"));
    }

    TEST(WriteGeometryFile, LeavesTheOldFileUnchangedIfTheDiskIsFull)
    {
        TemporaryFolder const folder;
        EXPECT_THROW(writeGeometryFile(*triangle(), folder / "none/a.obj"), FileError);
        std::filesystem::create_symlink("/dev/full", folder / "full.obj");
        EXPECT_THROW(writeGeometryFile(*triangle(), folder / "full.obj"), FileError);
        EXPECT_EQ(folder.entryCount(), 1);

        // A limit on the size of files has the same effect as a disk that becomes full in the middle.
        store(folder / "a.ply", "old");
        OwnedObject const large = makePointCloud(Orvan::Array<float3>(100'000));
        rlimit limit{};
        ASSERT_EQ(::getrlimit(RLIMIT_FSIZE, &limit), 0);
        rlimit const small{600'000, limit.rlim_max};
        auto* const handler = std::signal(SIGXFSZ, SIG_IGN);
        ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &small), 0);
        EXPECT_THROW(writeGeometryFile(*large, folder / "a.ply"), FileError);
        ::setrlimit(RLIMIT_FSIZE, &limit);
        std::signal(SIGXFSZ, handler);
        EXPECT_EQ(contentOf(folder / "a.ply"), "old");
        EXPECT_EQ(folder.entryCount(), 2);
    }

    TEST(WriteGeometryFile, ReplacesTheTargetOfALinkAndKeepsItsPermissions)
    {
        using std::filesystem::perms;
        TemporaryFolder const folder;
        store(folder / "real.obj", "old");
        std::filesystem::permissions(folder / "real.obj", perms::owner_read | perms::owner_write);
        std::filesystem::create_symlink("real.obj", folder / "link.obj");
        writeGeometryFile(*triangle(), folder / "link.obj");
        EXPECT_TRUE(std::filesystem::is_symlink(folder / "link.obj"));
        EXPECT_THAT(contentOf(folder / "real.obj"), HasSubstr("f 1 2 3"));
        EXPECT_EQ(std::filesystem::status(folder / "real.obj").permissions(), perms::owner_read | perms::owner_write);
        EXPECT_EQ(folder.entryCount(), 2);
    }

}

}
