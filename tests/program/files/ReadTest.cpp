#include "FileSupport.h"

namespace ModelingProgram {

namespace {

    using testing::AllOf, testing::ElementsAre, testing::HasSubstr, testing::IsEmpty, testing::StartsWith;
    using Indices = std::vector<unsigned int>;

    TEST(ReadGeometryFile, AcceptsWhatFormatsAllow)
    {
        struct Case {
            char const* extension;
            std::string content;
            std::uint64_t points;
            Indices corners;
            Indices offsets; // of faces, or of strands if there are no corners
            std::string note = {};
        };
        std::string const square = "v 0 0 0\nv 1 0 0\nv 1 1 0\nv 0 1 0\n";
        std::string const plyHead = "ply\nformat ascii 1.0\ncomment x\n";
        std::string const plyPoints = "element vertex 3\nproperty float x\nproperty float y\nproperty float z\n";
        std::string const plyFace = "element face 1\nproperty list uchar int vertex_index\n";
        std::map<std::string, Case> const cases{
            {"indices from the end", {".obj", square + "f -4 -3 -2\n", 4, {0, 1, 2}, {0, 3}}},
            {"indices of points that come later", {".obj", "f 1 2 4 3\n" + square, 4, {0, 1, 3, 2}, {0, 4}}},
            {"a line that goes on in the next", {".obj", square + "f 1 2 \\\r\n3\\\n 4", 4, {0, 1, 2, 3}, {0, 4}}},
            {"line ends of two characters, tabs",
                {".OBJ", "v\t0 0 0 \r\nv 1 0 0\r\nv 1e0 +1 -0.\r\nf 1 2 3\r\n", 3, {0, 1, 2}, {0, 3}}},
            {"comments", {".obj", "# \\\n" + square + "f 1 2 3# 4\n  # f 1 2 9", 4, {0, 1, 2}, {0, 3}}},
            {"all forms of corners",
                {".obj", square + "vt 0 0\nvn 0 0 1\nf 1/1/1 2//1 3/1 4/ 1// 2/1/", 4, {0, 1, 2, 3, 0, 1}, {0, 6},
                    "3 face corners have no \"uv\""}},
            {"numbers too small for a float", {".obj", "v 1e-60 -1e-4000 1e-42", 1, {}, {}}},
            {"objects without faces",
                {".obj", "o a b\ns off\nusemtl \n" + square, 4, {}, {},
                    "objects without faces are left out: 1 (\"a b\")"}},
            {"smoothing groups without faces", {".obj", "s 1\ns 2\n" + square, 4, {}, {}, "groups without faces"}},
            {"materials without faces",
                {".obj",
                    "usemtl a\nusemtl b\nusemtl c\nusemtl d\nusemtl e\nusemtl f\nusemtl a\n" + square + "f 1 2 3\n", 4,
                    {0, 1, 2}, {0, 3}, "5 (\"b\", \"c\", \"d\", \"e\", \"f\")"}},
            {"smoothing groups that are not numbers",
                {".obj", square + "s x\nf 1 2 3\ns 1x\nf 1 2 4\n", 4, {0, 1, 2, 0, 1, 3}, {0, 3, 6},
                    "not numbers are left out: 2 (\"x\", \"1x\")"}},
            {"a file of materials without faces", {".obj", "mtllib x y\n" + square, 4, {}, {}, "1 (\"x y\")"}},
            {"unknown statements", {".obj", "vp 1\n" + square, 4, {}, {}, "\"vp\""}},
            {"unused texture coordinates",
                {".obj", square + "vt 0 0\nvt 1 1\nf 1/2 2/2 3/2\n", 4, {0, 1, 2}, {0, 3},
                    "texture coordinates (vt) that no face refers to are left out: 1"}},
            {"unused normals",
                {".obj", square + "vn 0 0 1\nf 1 2 3\n", 4, {0, 1, 2}, {0, 3},
                    "normals (vn) that no face refers to are left out: 1"}},
            {"digits of a text",
                {".obj", "v 500000.123 1 0\nv 500001 0.1 0\n", 2, {}, {},
                    "positions lose up to 0.002 (single precision at coordinates up to 500,001); --center"}},
            {"as many digits as fit", {".obj", "v 0.1 3.14159274 0.15625000\nv 123456 -1.5e-7 1e10\n", 2, {}, {}}},
            {"digits of a binary file",
                {".ply",
                    "ply\nformat binary_little_endian 1.0\nelement vertex 1\nproperty double x\nproperty double y\n"
                    "property float z\nend_header\n"
                        + bytesOf(std::endian::little, 0.1, 0.5, 0.1f),
                    1, {}, {}, "positions lose up to 1.5e-09 (single precision at coordinates up to 0.5); --center"}},
            {"weights", {".obj", "v 0 0 0 1\nv 1 0 0 0.5", 2, {}, {}, "1 weights"}},
            {"polylines in order", {".obj", square + "l 1 2\nl 3 4\n", 4, {}, {0, 2, 4}}},
            {"polylines that share points",
                {".obj", square + "l 4 2 1 3\nl 1/ 4\n", 6, {}, {0, 4, 6}, "2 points are duplicated"}},
            {"faces and polylines", {".obj", square + "l 1 2\nf 1 2 3\n", 4, {0, 1, 2}, {0, 3}, "a mesh has none: 1"}},
            {"points only", {".obj", square + "p 1 2\n", 4, {}, {}, "point elements"}},
            {"a list of faces in front",
                {".ply", plyHead + plyFace + plyPoints + "end_header\r\n3 0 1 2\n\n0 0 0\n1 0 0\n0 1 0", 3, {0, 1, 2},
                    {0, 3}}},
            {"colors of no faces",
                {".ply",
                    plyHead + plyPoints
                        + "element face 0\nproperty list uchar int vertex_index\nproperty uchar red\n"
                          "property uchar green\nproperty uchar blue\nend_header\n0 0 0\n1 0 0\n0 1 0\n",
                    3, {}, {}}},
            {"the name of a texture file",
                {".ply", plyHead + "comment TextureFile a b.png\n" + plyPoints + "end_header\n0 0 0\n1 0 0\n0 1 0\n", 3,
                    {}, {}, "the texture file \"a b.png\""}},
            {"elements of other kinds",
                {".ply",
                    plyHead + "element edge 2\nproperty list int double q\nproperty char w\n" + plyPoints
                        + "end_header\n0 1\n2 0.5 1e9 -1\n0 0 0\n1 0 0\n0 1 0\n",
                    3, {}, {}, "\"edge\" are left out"}},
            {"more than was declared",
                {".ply", plyHead + plyPoints + "end_header\n0 0 0\n1 0 0\n0 1 0\n9", 3, {}, {},
                    "bytes after the last element are left out: 1"}},
            {"comments in OFF",
                {".off", "# a\nOFF # b\n\n3 1 # c\n0 0 0\n# d\n1 0 0\n0 1 0\n3 2 1 0\n#", 3, {2, 1, 0}, {0, 3}}},
            {"colors that refer to a color table",
                {".off", "OFF 3 1 0\n0 0 0\n1 0 0\n0 1 0\n3 2 1 0 7\n", 3, {2, 1, 0}, {0, 3},
                    "refer to a color table"}},
            {"points without normals", {".xyz", "0 0 0\n\n 1 2.5 3 # x\r\n", 2, {}, {}}},
            {"corners welded, also 0 and -0",
                {".stl",
                    "solid a b\nFacet normal 0 0 1\n outer loop\nVERTEX 0 0 0\n"
                    "vertex 1 0 0\nvertex 0 1 0\nendloop\nendfacet\nfacet normal nan 0 0\nouter loop\nvertex 1 0 -0\n"
                    "vertex 0 1 0\nvertex 1 1 0\nendloop\nendfacet\nendsolid a b\n",
                    4, {0, 1, 2, 1, 2, 3}, {0, 3, 6}, "and their names are left out: 1 (\"a b\")"}},
        };
        for (auto const& [name, test] : cases) {
            SCOPED_TRACE(name);
            GeometryFile const file = readContent(test.extension, test.content);
            EXPECT_TRUE(sameContents(*readContent(test.extension, "\xEF\xBB\xBF" + test.content).object, *file.object));
            EXPECT_EQ(getElementCount(*file.object, sPointComp), test.points);
            EXPECT_EQ(valuesOf<unsigned int>(*file.object, sFaceVertex), test.corners);
            bool const isMesh = !test.corners.empty();
            EXPECT_EQ(valuesOf<unsigned int>(*file.object, isMesh ? sFaceOffset : sStrandOffset), test.offsets);
            EXPECT_EQ(static_cast<bool>(validateMesh(*file.object)), isMesh);
            EXPECT_EQ(file.notes.empty(), test.note.empty());
            EXPECT_THAT(file.notes.empty() ? "" : file.notes[0], HasSubstr(test.note));
        }
    }

    TEST(ReadGeometryFile, RefusesMalformedFiles)
    {
        struct Case {
            char const* extension;
            std::string content;
            int line;
            char const* words;
        };
        std::string const points = "v 0 0 0\nv 1 0 0\nv 0 1 0\n";
        std::string const ply = "ply\nformat ascii 1.0\nelement vertex 1\nproperty float x\nproperty float y\n";
        std::string const plyTail = "property float z\nend_header\n0 0 0\n";
        std::string const plyMany =
            "ply\nformat ascii 1.0\nelement vertex 4000000000\nproperty char x\nend_header\n0\n";
        std::string const offPoints = "OFF\n3 1 0\n0 0 0\n1 0 0\n0 1 0\n",
                          solid = "solid\nfacet\nouter\nvertex 0 0 0\n";
        std::vector<Case> const cases{
            {".obj", "\nhello\n", 2, "\"hello\" is not a keyword of OBJ files"},
            {".obj", "v 0 nan 0", 1, "a coordinate is not finite"},
            {".obj", "v 0 1e39 0", 1, "\"1e39\" is not a valid number for a coordinate"},
            {".obj", "v 0 0\n", 1, "the line ends before a coordinate"},
            {".obj", "v 0 0 1.2x\n", 1, "\"1.2x\" is not a valid number for a coordinate"},
            {".obj", "v 0 0 +-1\n", 1, "\"+-1\" is not a valid number for a coordinate"},
            {".obj", "v 0 0 0 1 1 1 1", 1, "\"1\" is unexpected at the end of the line"},
            {".obj", points + "f 1 2 3 x", 4, "\"x\" is not a valid number for an index"},
            {".obj", points + "f 1 2 3.5", 4, "\".5\" follows an index, but is not one"},
            {".obj", points + "f 0 1 2", 4, "the point 0 does not exist: the first one is 1"},
            {".obj", points + "\nf 1 2 4", 5, "the point 4 does not exist: the file has 3"},
            {".obj", "v 0 0 0\nf -1 -2 1\nv 0 0 0", 2, "the point -2 does not exist: only 1 before this line"},
            {".obj", points + "f 1 2", 4, "a face has fewer than three corners"},
            {".obj", points + "f 1/1 2/1 3/1", 4, "the texture coordinate 1 does not exist: the file has 0"},
            {".obj", points + "f 1 2 99999999999999999999", 4, "is not a valid number for an index"},
            {".obj", points + "l\n", 4, "a polyline has no points"},
            {".obj", "\xFF\xFEv", 1, "the text is UTF-16; UTF-8 and ASCII are read"},
            {".ply", "plx\n", 1, "the file does not begin with \"ply\""},
            {".ply", ply, 6, "the file is cut off: its header has no \"end_header\""},
            {".ply", "ply\nformat ascii 2.0\n", 2, "the format \"ascii\" is not known, or not of version 1.0"},
            {".ply", ply + "property quux q\n" + plyTail, 6, "the type \"quux\" is not known"},
            {".ply", ply + "property list float int q\n" + plyTail, 6, "the length of a list is not a whole number"},
            {".ply", ply + "property char x\n" + plyTail, 6, "the property \"x\" is declared twice"},
            {".ply", ply + "property uchar c\nproperty float z\nend_header\n0.0 0 0\n", 9, "the line ends before z"},
            {".ply", ply + "end_header\n0 0\n", 7, "points lack x, y or z"},
            {".ply", ply + "property float z\nend_header\n0 0 zero\n", 8, "\"zero\" is not a valid number for z"},
            {".ply", ply + "property list char char q\nproperty float z\nend_header\n0 0 -1 0\n", 9,
                "a negative length"},
            {".ply", plyMany, 6, "it declares 4000000000 elements \"vertex\", but only 2 bytes follow"},
            {".off", "off\n", 1, "the file does not begin with OFF, COFF, NOFF or the like, or is binary"},
            {".off", "4OFF\n1 0 0\n0 0 0 0\n", 1,
                "\"4OFF\" files are not supported: only points with three coordinates are"},
            {".off", offPoints + "3 0 1 3\n", 6, "a face refers to point 3, but the file has 3 points, counted from 0"},
            {".off", "OFF\n1 0 0\n0 0 0 1 1\n", 3, "a color has 2 values instead of 3 or 4"},
            {".off", "OFF\n2 0 0\n0 0 0 # 0 0 0\n", 4, "the file is cut off before point 1"},
            {".xyz", "0 0\n1 2\n", 1,
                "there are 2 values; without a heading line that names the columns, 3, 4, 6, 7 or 9"},
            {".xyz", "0 0 0\n1 2 3 0 0 1\n", 2, "there are 6 values, but 3 in the lines above"},
            {".xyz", "x y z a\n1 2 3\n", 2, "there are 3 values, but the heading line names 4 columns"},
            {".xyz", "x y 3\n1 2 3\n", 1, "\"x\" is not a valid number for a coordinate"},
            {".xyz", "3\n0 0 0\n", 3, "it declares 3 points and holds 1"},
            {".xyz", "1,5;2,5;3,5\n", 1, "decimal commas are not supported"},
            {".xyz", "1,25 3 4\n", 1, "decimal commas are not supported"},
            {".xyz", "1,,3\n", 1, "\"\" is not a valid number for a coordinate"},
            {".xyz", "0 0 0 9 9 9 0.1 0.2 900\n1 1 1 0.5 9 9 9 9 9\n", 3, "are not a color and a normal"},
            {".stl", solid, 5, "the file is cut off inside a solid"},
            {".stl", solid + "endloop\n", 5, "\"endloop\" instead of \"vertex\""},
        };
        for (Case const& test : cases)
            EXPECT_THAT(refusalOf(test.extension, test.content),
                AllOf(StartsWith(", line " + std::to_string(test.line) + ": "), HasSubstr(test.words)))
                << test.content;
        for (char const* const extension : {".ply", ".stl", ".off"})
            EXPECT_EQ(refusalOf(extension, ""), " cannot be read: it is empty");
        EXPECT_EQ(refusalOf(".abc", "x"),
            " cannot be read: neither its name nor its first bytes tell the format; --format names it");
        EXPECT_EQ(refusalOf(".stl", std::string(90, '\0')),
            ", byte 80: the file is cut off or damaged: 0 triangles take 84 bytes, but it has 90");
        EXPECT_EQ(refusalOf(".ply",
                      "ply\nformat binary_little_endian 1.0\nelement vertex 1\nproperty float x\nproperty float y\n"
                      "property float z\nelement face 1\nproperty list uchar int vertex_indices\n"
                      "property list uchar float texcoord\nend_header\n"
                          + bytesOf(std::endian::little, 0.0f, 0.0f, 0.0f, '\3', 0, 0, 0, '\377', 0.5f)),
            ", face 0: the file is cut off: it declares 255 values of a list, but only 4 bytes follow");

        TemporaryFolder const folder;
        EXPECT_THROW(readGeometryFile(folder / "none.obj"), FileError);
        std::filesystem::create_directory(folder / "folder.obj");
        EXPECT_THROW(readGeometryFile(folder / "folder.obj"), FileError);
    }

    TEST(ReadXyz, FindsColumnsByHeadingsOrValues)
    {
        struct Case {
            std::string content;
            std::vector<uchar3> colors;
            std::vector<float3> normals;
            std::vector<float> numbers; // of the property n, or of intensity if there is no n
        };
        std::vector<Case> const cases{
            {"1 2 3 255 0 7\n1 2 3 1 2 3\n", {{255, 0, 7}, {1, 2, 3}}, {}, {}},
            {"1 2 3 1 2 3\n1 2 3 -1 0 0\n", {}, {{1, 2, 3}, {-1, 0, 0}}, {}},
            {"1 2 3 0 0 1\n1 2 3 0 1 0\n", {}, {{0, 0, 1}, {0, 1, 0}}, {}},
            {"1 2 3 0.5\n", {}, {}, {0.5f}},
            {"2\n1 2 3 -20 1 2 3\n1 2 3 300 4 5 6\n", {{1, 2, 3}, {4, 5, 6}}, {}, {-20, 300}},
            {"1 2 3 4 5 6 0.25\n", {{4, 5, 6}}, {}, {0.25f}},
            {"1 2 3 0.6 0 -0.8 9\n", {}, {{0.6f, 0, -0.8f}}, {9}},
            {"1 2 3 4 5 6 0.6 0 -0.8\n", {{4, 5, 6}}, {{0.6f, 0, -0.8f}}, {}},
            {"1 2 3 0.6 0 -0.8 4 5 6\n", {{4, 5, 6}}, {{0.6f, 0, -0.8f}}, {}},
            {"1\n// X Y Z Nx Ny Nz R G B n\n1 2 3 0 0 1 0 1 0 9", {{0, 1, 0}}, {{0, 0, 1}}, {9}},
            {"\"z\"; \"n\"; \"x\"; 'y';\r\n3;9; 1 ;2;\r\n", {}, {}, {9}},
            {"x,y,z,,n\n1,2,3,4,5\n", {}, {}, {5}},
            {"x,y,z,r,g,b,\n1, 2, 3, 4, 5, 6\n", {{4, 5, 6}}, {}, {}},
            {"Points of the yard\n1\t2\t3\t4\t5\t6\n", {{4, 5, 6}}, {}, {}},
            {"1, 2, 3 4 5 6\n", {{4, 5, 6}}, {}, {}},
            {"x,y,z,r,g,b\n1,2,3,4,5,6\nnan,nan,nan,-1,nan,0.5\n", {{4, 5, 6}}, {}, {}},
        };
        for (Case const& test : cases) {
            SCOPED_TRACE(test.content);
            auto const object = readContent(".xyz", test.content, {.isLenient = true}).object;
            EXPECT_EQ(valuesOf<float3>(*object, sPointPosition).at(0), (float3{1, 2, 3}));
            EXPECT_EQ(valuesOf<uchar3>(*object, "color"), test.colors);
            EXPECT_EQ(valuesOf<float3>(*object, "normal"), test.normals);
            bool const isNamed = object->hasProperty("n");
            EXPECT_EQ(valuesOf<float>(*object, isNamed ? "n" : "intensity"), test.numbers);
        }
        EXPECT_THAT(
            readContent(".xyz", "1 2 3 4 5 6 7\n").notes, ElementsAre(HasSubstr("a heading line would decide")));
        for (auto const& [row, isDoubtful] : {std::pair{"1 2 3 256 0 7", true}, {"1 2 3 60000 40000 100", true},
                 {"1 2 3 0.5 0.5 0", true}, {"1 2 3 0.6 0 -0.8", false}, {"1 2 3 255 0 7", false}})
            EXPECT_THAT(readContent(".xyz", row).notes,
                testing::Conditional(
                    isDoubtful, ElementsAre(HasSubstr("columns 4 to 6 are read as normals")), IsEmpty()))
                << row;
        EXPECT_THAT(readContent(".xyz", "x y z nx ny nz\n1 2 3 9 9 9\n").notes, IsEmpty());
        EXPECT_THAT(readContent(".xyz", "a b c\n1 2 3\n").notes, ElementsAre(HasSubstr("does not name columns x")));
        EXPECT_EQ(valuesOf<double>(*readContent(".xyz", "x y z t\n0 0 0 123456789.125\n").object, "t"),
            std::vector<double>{123456789.125});
        EXPECT_EQ(refusalOf(".xyz", "x y z r g b nx ny nz\n"), ""); // no points
    }

    TEST(ReadGeometryFile, LeavesOutBrokenElementsIfLenient)
    {
        struct Case {
            char const* extension;
            std::string content;
            std::uint64_t points;
            Indices corners;
            Indices offsets; // of faces, or of strands if there are no corners
            std::vector<char const*> notes;
        };
        std::string const ply =
            "ply\nformat ascii 1.0\nelement vertex 5\nproperty float x\nproperty float y\nproperty float z\n"
            "property int id\nelement face 4\nproperty list uchar int vertex_indices\n"
            "property list uchar float texcoord\nproperty int part\nend_header\n"
            "0 0 0 10\nnan nan NaN 11\n1 0 0 12\n1 1 0 13\n0 -inf 0 14\n"
            "3 0 1 2 6 0 0 0 0 0 0 6\n3 0 2 3 6 0 1 2 3 4 5 7\n2 0 4 4 0 0 0 0 8\n4 3 2 0 3 8 6 7 8 9 0 1 2 3 9\n";
        std::string const facet = "facet\nouter loop\nvertex 0 0 0\nvertex 1 0 0\nvertex 0 1 0\nendloop\nendfacet\n";
        std::string const broken = "facet\nouter loop\nvertex 5 5 5\nvertex nan 0 0\nvertex 0 1 0\nendloop\nendfacet\n";
        std::string const binary = std::string(80, ' ')
            + bytesOf(
                std::endian::little, 1u, 0.f, 0.f, 0.f, 0.f, 0.f, 0.f, 1.f, 0.f, 0.f, 0.f, 1.f, 0.f, std::uint16_t{});
        std::vector<Case> const cases{
            {".ply", ply, 3, {0, 1, 2, 2, 1, 0, 2}, {0, 3, 7},
                {"points that are NaN or infinite are left out: 2", "faces at such points are left out: 1",
                    "faces with fewer than three corners are left out: 1"}},
            {".obj", "v 0 0 0\nv nan 0 0\nv 1 0 0\nv 2 0 0\nl 1 2\nl 3 4\n", 2, {}, {0, 2},
                {"infinite are left out: 1", "polylines at such points"}},
            {".obj", "v 0 0 0\nv 1 0 0\nf 1 2\n", 2, {}, {}, {"fewer than three corners are left out: 1"}},
            {".off", "OFF\n3 1 0\n0 0 0\n1 0 0\n0 1 0\n3 0 1 2\nrest", 3, {0, 1, 2}, {0, 3},
                {"element are left out: 4"}},
            {".stl", binary + "rest", 3, {0, 1, 2}, {0, 3}, {"element are left out: 4"}},
            {".stl", "solid\n" + facet + "endsolid\n" + std::string(2, '\0'), 3, {0, 1, 2}, {0, 3},
                {"element are left out: 2"}},
            {".stl", "solid\n" + broken + facet + broken + "endsolid\n", 4, {2, 3, 1}, {0, 3},
                {"points that are NaN or infinite are left out: 2", "faces at such points are left out: 2"}},
        };
        for (Case const& test : cases) {
            SCOPED_TRACE(test.extension + test.content);
            EXPECT_NE(refusalOf(test.extension, test.content), "");
            GeometryFile const file = readContent(test.extension, test.content, {.isLenient = true});
            EXPECT_EQ(getElementCount(*file.object, sPointComp), test.points);
            EXPECT_EQ(valuesOf<unsigned int>(*file.object, sFaceVertex), test.corners);
            char const* const offsets = test.corners.empty() ? sStrandOffset : sFaceOffset;
            EXPECT_EQ(valuesOf<unsigned int>(*file.object, offsets), test.offsets);
            EXPECT_TRUE(isValid(*file.object) && reportProperties(*file.object).empty());
            EXPECT_EQ(file.notes.size(), test.notes.size());
            for (char const* const note : test.notes)
                EXPECT_THAT(file.notes, testing::Contains(HasSubstr(note)));
        }
        auto const mesh = readContent(".ply", ply, {.isLenient = true}).object;
        EXPECT_EQ(valuesOf<int>(*mesh, "id"), (std::vector<int>{10, 12, 13}));
        EXPECT_EQ(valuesOf<int>(*mesh, "part"), (std::vector<int>{7, 9}));
        EXPECT_EQ(valuesOf<float2>(*mesh, "uv"),
            (std::vector<float2>{{0, 1}, {2, 3}, {4, 5}, {6, 7}, {8, 9}, {0, 1}, {2, 3}}));
        EXPECT_THROW(readContent(".obj", "v nan 0 0\n", {.isLenient = true}), FileError);
    }

    TEST(ReadGeometryFile, SubtractsACenterInDoublePrecision)
    {
        using Tessara::Math::double3;
        double3 const center{500000, -4100000, 0};
        std::string const a = "500000.125 -4100000.5 10.0625\n", b = "500100.1875 -4100080.75 12\n";
        std::string const corner = "vertex 500100.1885 -4100080.75 12\n"; // equal to b in single precision
        for (auto const& [extension, content] :
            {std::pair{".obj", "v " + a + "v " + b}, {".xyz", a + b}, {".off", "OFF 2 0 0\n" + a + b},
                {".ply",
                    "ply\nformat ascii 1.0\nelement vertex 2\nproperty float x\nproperty double y\n"
                    "property double z\nend_header\n"
                        + a + b},
                {".stl",
                    "solid\nfacet\nouter loop\nvertex " + a + "vertex " + b + corner
                        + "endloop\nendfacet\nendsolid\n"}}) {
            SCOPED_TRACE(extension);
            GeometryFile const file = readContent(extension, content, {.isCentered = true});
            EXPECT_EQ(file.origin, center);
            auto const positions = valuesOf<float3>(*file.object, sPointPosition);
            EXPECT_EQ(positions.at(0), (float3{0.125f, -0.5f, 10.0625f}));
            EXPECT_EQ(positions.at(1), (float3{100.1875f, -80.75f, 12}));
            EXPECT_EQ(positions.size(), extension == std::string(".stl") ? 3 : 2);
            GeometryFile const moved = readContent(extension, content, {.origin = double3{500100, -4100000, 10}});
            EXPECT_EQ(valuesOf<float3>(*moved.object, sPointPosition).at(1), (float3{0.1875f, -80.75f, 2}));
        }
        EXPECT_EQ(readContent(".obj", "v 0.31 0.29 0\nv 0.32 0.30 0\nv 0.33 0.31 0\n", {.isCentered = true}).origin,
            (double3{0.3, 0.3, 0}));
        EXPECT_EQ(readContent(".obj", "v -7.5 2 0\n", {.isCentered = true}).origin, (double3{-8, 2, 0}));
    }

    /// The float nearest to a decimal number, even if the nearest double is halfway between two floats.
    TEST(ReadGeometryFile, RoundsDecimalsOnce)
    {
        EXPECT_EQ(valuesOf<float3>(*readContent(".obj",
                                       "v 1.000000059604644775390625000001 1.00000005960464477539062499999 "
                                       "1.000000059604644775390625")
                                        .object,
                      sPointPosition)
                      .at(0),
            (float3{std::nextafter(1.0f, 2.0f), 1, 1}));
    }

    /// The names of all faces.
    std::vector<std::string> namesOf(Tessara::Object const& mesh, std::string const& range)
    {
        auto const texts = valuesOf<Orvan::String>(mesh, (range + "_name").c_str());
        std::vector<std::string> names;
        for (unsigned int const number : *getRangeGeoPropIndices(mesh, range.c_str()))
            names.emplace_back(texts.at(number).view());
        return names;
    }

    TEST(ReadObj, KeepsTheNamesOfFaces)
    {
        std::string const triangle = "v 0 0 0\nv 1 0 0\nv 1 1 0\nf 1 2 3\n";
        std::string const content = "mtllib a.mtl\nv 0 0 0\nv 1 0 0\nv 1 1 0\nv nan 1 0\nf 1 2 3\no one\ng b  c # d\n"
                                    "usemtl red\ns 7\nf 1 2 3\nf 1 2 4\nmtllib b c.mtl\nmtllib a.mtl\ng\ns on\n"
                                    "usemtl blue\nf 1 2 4\nusemtl red\nf 1 2 3\n";
        using Names = std::vector<std::string>;
        GeometryFile const file = readContent(".obj", content, {.isLenient = true});
        Tessara::Object const& mesh = *file.object;
        EXPECT_TRUE(reportProperties(mesh).empty());
        EXPECT_EQ(namesOf(mesh, "object"), (Names{"", "one", "one"}));
        EXPECT_EQ(namesOf(mesh, "group"), (Names{"", "b c", ""}));
        EXPECT_EQ(namesOf(mesh, "material"), (Names{"", "red", "red"}));
        EXPECT_EQ(namesOf(mesh, "material_library"), Names(3, "a.mtl\nb c.mtl"));
        EXPECT_EQ(valuesOf<unsigned int>(mesh, "smoothing_group"), (Indices{0, 7, 1}));
        EXPECT_EQ(valuesOf<Orvan::String>(mesh, "material_name").size(), 2u); // each once, "blue" has no face left

        GeometryFile const unnamed = readContent(".obj", "usemtl a\ns 1\nusemtl \ns 0\n" + triangle);
        EXPECT_FALSE(unnamed.object->hasProperty("material") || unnamed.object->hasProperty("smoothing_group"));
    }

    TEST(ReadObj, TakesStatementsOnJoinedLinesForNames)
    {
        constexpr char kTriangle[] = "v 0 0 0\nv 1 0 0\nv 0 1 0\nvt 0 0\n";
        for (char const* const keyword : {"g", "usemtl", "mtllib", "s", "o"})
            EXPECT_THAT(refusalOf(".obj", kTriangle + std::string(keyword) + " \\\nvt\nf 1/1 2/1 3/2\n"),
                HasSubstr("the texture coordinate 2 does not exist: the file has 1"))
                << keyword;
    }

    TEST(ReadObj, KeepsPointsSharedAcrossSeamsAndValuesOfStrandPoints)
    {
        GeometryFile const file = readContent(".obj",
            "v 0 0 0 1 0 0\nv 1 0 0\nv 1 1 0\nv 0 1 0 0 0 1\nvt 0 0\nvt 1 0.5\nvt 0.25 1 0\nvn 0 0 1\n"
            "f 1/1/1 2/2/1 3/3/1\nf 1/3/1 3/2/1 4/1/1\n");
        float2 const a{0, 0}, b{1, 0.5f}, c{0.25f, 1};
        EXPECT_EQ(getElementCount(*file.object, sPointComp), 4u);
        EXPECT_EQ(valuesOf<float2>(*file.object, "uv"), (std::vector<float2>{a, b, c, c, b, a}));
        EXPECT_EQ(valuesOf<float3>(*file.object, "normal"), std::vector<float3>(6, {0, 0, 1}));
        EXPECT_EQ(
            valuesOf<float3>(*file.object, "color"), (std::vector<float3>{{1, 0, 0}, {1, 1, 1}, {1, 1, 1}, {0, 0, 1}}));
        EXPECT_THAT(file.notes, ElementsAre(HasSubstr("2 points have no color")));

        GeometryFile const strands =
            readContent(".obj", "v 0 0 0 1 0 0\nv 1 0 0 0 1 0\nv 2 0 0 0 0 1\nvn 1 0 0\nvn 0 1 0\nvn 0 0 1\nl 3 1\n");
        EXPECT_EQ(valuesOf<float3>(*strands.object, sPointPosition), (std::vector<float3>{{2, 0, 0}, {0, 0, 0}}));
        for (char const* const name : {"color", "normal"})
            EXPECT_EQ(valuesOf<float3>(*strands.object, name), (std::vector<float3>{{0, 0, 1}, {1, 0, 0}})) << name;
        EXPECT_TRUE(isValid(*strands.object));
    }

    std::string const kPlyProperties = "element vertex 3\n"
                                       "property double x\nproperty short flag\nproperty double y\n"
                                       "property float nx\nproperty float ny\nproperty float nz\n"
                                       "property uchar red\nproperty uchar green\nproperty uchar blue\n"
                                       "property float u\nproperty float v\nproperty double z\n"
                                       "property list uchar float weights\nproperty uint sFaceVertex\n"
                                       "element face 1\n"
                                       "property list ushort float texcoord\nproperty list uchar uint vertex_indices\n"
                                       "property char red\nproperty list uint int odd\nproperty float nx\n"
                                       "element rest 1\nproperty list char double left\n"
                                       "end_header\n";

    std::string plyOf(std::endian order)
    {
        std::string content = std::string("ply\nformat binary_") + (order == std::endian::little ? "little" : "big")
            + "_endian 1.0\n" + kPlyProperties;
        for (unsigned char i = 0; i < 3; ++i) {
            float const f = i;
            content += bytesOf(order, 0.5 + i, short(-i), 1.5 * i, f, 0.5f, 1 - f, i, (unsigned char)(i + 1),
                (unsigned char)(255), f / 4, f / 2, -0.25, (unsigned char)(2), f, f + 1, 4000000000u + i);
        }
        content += bytesOf(order, (unsigned short)(6), 0.0f, 0.125f, 1.0f, 0.25f, 2.0f, 0.5f, (unsigned char)(3), 2u,
            0u, 1u, (signed char)(-7), 2u, 1, 2, 0.75f, (signed char)(1), 9.0);
        return content;
    }

    TEST(ReadPly, GivesTheSameResultInAllEncodings)
    {
        std::string const text = "ply\nformat ascii 1.0\n" + kPlyProperties
            + "0.5 0 0 0 0.5 1 0 1 255 0 0 -0.25 2 0 1 4000000000\n"
              "1.5 -1 1.5 1 0.5 0 1 2 255 0.25 0.5 -0.25 2 1 2 4000000001\n"
              "2.5 -2 3 2 0.5 -1 2 3 255 0.5 1 -0.25 2 2 3 4000000002\n"
              "6 0 0.125 1 0.25 2 0.5 3 2 0 1 -7 2 1 2 0.75\n"
              "1 9\n";
        GeometryFile const file = readContent(".ply", text);
        Tessara::Object const& mesh = *file.object;
        EXPECT_EQ(file.format, "PLY (ascii)");
        EXPECT_THAT(file.notes, ElementsAre(HasSubstr("\"rest\"")));
        EXPECT_EQ(valuesOf<float3>(mesh, sPointPosition),
            (std::vector<float3>{{0.5f, 0, -0.25f}, {1.5f, 1.5f, -0.25f}, {2.5f, 3, -0.25f}}));
        EXPECT_EQ(valuesOf<short>(mesh, "flag"), (std::vector<short>{0, -1, -2}));
        EXPECT_EQ(valuesOf<float3>(mesh, "normal"), (std::vector<float3>{{0, 0.5f, 1}, {1, 0.5f, 0}, {2, 0.5f, -1}}));
        EXPECT_EQ(valuesOf<uchar3>(mesh, "color"), (std::vector<uchar3>{{0, 1, 255}, {1, 2, 255}, {2, 3, 255}}));
        EXPECT_EQ(valuesOf<float2>(mesh, "uv"), (std::vector<float2>{{0, 0}, {0.25f, 0.5f}, {0.5f, 1}}));
        EXPECT_EQ(valuesOf<float2>(mesh, "weights"), (std::vector<float2>{{0, 1}, {1, 2}, {2, 3}}));
        EXPECT_EQ(valuesOf<unsigned int>(mesh, "point:sFaceVertex"),
            (std::vector<unsigned int>{4000000000u, 4000000001u, 4000000002u}));
        EXPECT_EQ(valuesOf<unsigned int>(mesh, sFaceVertex), (std::vector<unsigned int>{2u, 0u, 1u}));
        EXPECT_EQ(valuesOf<float2>(mesh, "corner:uv"), (std::vector<float2>{{0, 0.125f}, {1, 0.25f}, {2, 0.5f}}));
        EXPECT_EQ(valuesOf<signed char>(mesh, "red"), (std::vector<signed char>{-7}));
        EXPECT_EQ(valuesOf<int2>(mesh, "odd"), (std::vector<int2>{{1, 2}}));
        EXPECT_EQ(valuesOf<float>(mesh, "nx"), (std::vector<float>{0.75f}));

        for (std::endian const order : {std::endian::little, std::endian::big})
            EXPECT_TRUE(sameContents(*readContent(".ply", plyOf(order)).object, mesh));
        EXPECT_THAT(
            readContent(".ply",
                "ply\nformat ascii 1.0\nelement vertex 2\nproperty float x\nproperty float y\nproperty float z\n"
                "property list uchar int neighbors\nproperty list uchar ushort three\nend_header\n"
                "0 0 0 1 1 3 1 2 3\n1 0 0 2 0 0 3 1 2 3\n")
                .notes,
            ElementsAre(HasSubstr("\"neighbors\""), HasSubstr("\"three\"")));
    }

    TEST(ReadOff, DistinguishesBytesFromFractions)
    {
        auto const colored = [](std::string const& colors) {
            return readContent(".off",
                "STCNOFF\n3 1 0\n0 0 0 1 0 0 " + colors
                    + " 0.5 0\n1 0 0 0 1 0 0 1\n"
                      "0 1 0 0 0 1 0 0 1 0 1\n3 0 1 2 1 0 0 1\n")
                .object;
        };
        auto const bytes = colored("255 0 7");
        EXPECT_EQ(valuesOf<uchar3>(*bytes, "color"), (std::vector<uchar3>{{255, 0, 7}, {255, 255, 255}, {0, 0, 1}}));
        EXPECT_EQ(valuesOf<uchar4>(*bytes, "face:color"), (std::vector<uchar4>{{1, 0, 0, 1}}));
        EXPECT_EQ(valuesOf<float3>(*bytes, "normal"), (std::vector<float3>{{1, 0, 0}, {0, 1, 0}, {0, 0, 1}}));
        EXPECT_EQ(valuesOf<float2>(*bytes, "uv"), (std::vector<float2>{{0.5f, 0}, {0, 1}, {0, 1}}));
        auto const fractions = colored("1. 0 0 0.5");
        EXPECT_EQ(
            valuesOf<float4>(*fractions, "color"), (std::vector<float4>{{1, 0, 0, 0.5f}, {1, 1, 1, 1}, {0, 0, 1, 1}}));
    }

    TEST(ReadStl, IsBinaryIfItsLengthMatches)
    {
        std::string content =
            "solid, but not as a text is" + std::string(53, ' ') + bytesOf(std::endian::little, std::uint32_t{2});
        for (float const z : {0.0f, 1.0f})
            content += bytesOf(std::endian::little, 0.0f, 0.0f, 0.0f, 0.0f, 0.0f, 0.0f, 1.0f, 0.0f, 0.0f, 0.0f, 1.0f, z,
                std::uint16_t(z));
        GeometryFile const file = readContent(".stl", content);
        EXPECT_EQ(file.format, "STL (binary)");
        EXPECT_EQ(
            valuesOf<unsigned int>(*file.object, sFaceVertex), (std::vector<unsigned int>{0u, 1u, 2u, 0u, 1u, 3u}));
        EXPECT_EQ(valuesOf<unsigned short>(*file.object, "attribute"), (std::vector<unsigned short>{0, 1}));
        EXPECT_THAT(refusalOf(".stl", content.substr(1)), HasSubstr("damaged"));
        for (bool const isLenient : {false, true})
            EXPECT_THAT(refusalOf(".stl", content.substr(0, content.size() - 1), {.isLenient = isLenient}),
                HasSubstr("the file is cut off or damaged: 2 triangles take 184 bytes, but it has 183"));
    }

}

}
