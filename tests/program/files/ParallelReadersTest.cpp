#include "FileSupport.h"
#include "Readers.h"
#include "TextParts.h"

using namespace std::string_literals;

namespace ModelingProgram {

namespace {

    /// What a reader makes of a file: the contents and notes, or the message of the refusal.
    struct Outcome {
        Orvan::MutablePtr<Tessara::Object> object;
        std::string text;
    };

    template <class Read> Outcome outcomeOf(Read const& read)
    {
        try {
            GeometryFile file = read();
            std::string text = file.format;
            for (std::string const& note : file.notes)
                text += "\n" + note;
            return {std::move(file.object), text};
        } catch (FileError const& error) {
            return {nullptr, error.what()};
        }
    }

    void expectSame(Outcome const& actual, Outcome const& expected)
    {
        EXPECT_EQ(actual.text, expected.text);
        ASSERT_EQ(!actual.object, !expected.object);
        if (actual.object) {
            EXPECT_TRUE(sameContents(*actual.object, *expected.object));
        }
    }

    /// Both ways of reading a PLY file, which must not differ. \return whether the file is accepted
    bool readBothWays(std::filesystem::path const& path)
    {
        bool isRead = false;
        for (bool const isLenient : {false, true}) {
            ReadOptions const options{.isLenient = isLenient, .isCentered = isLenient};
            auto const read = [&](PlyPath way) {
                return outcomeOf([&] {
                    return readPly(InputFile(path, InputFile::Loading::Beginning), options, way, kTextPartBytes);
                });
            };
            Outcome const expected = read(PlyPath::General);
            expectSame(read(PlyPath::Fastest), expected);
            isRead = !!expected.object;
        }
        return isRead;
    }

    /// A random binary PLY file that is valid unless a list has fewer than three corners.
    class RandomPly {
    public:
        RandomPly(Random& random, unsigned int mostElements)
            : random_(random)
            , order_(random.below(2) == 0 ? std::endian::little : std::endian::big)
            , pointCount_(1 + random.below(mostElements))
        {
            addElement("vertex", pointCount_);
            if (random.below(4) == 0)
                addElement("edge", random.below(5));
            addElement("face", random.below(mostElements));
        }

        std::string text() const
        {
            return "ply\nformat binary_" + std::string(order_ == std::endian::little ? "little" : "big")
                + "_endian 1.0\n" + header_ + "end_header\n" + body_;
        }

    private:
        struct Column {
            std::string type;
            std::string lengthType; // of a list
            unsigned int length; // of all lists, 0 if they differ
            bool isIndex = false;
        };

        void addElement(std::string const& name, unsigned int count)
        {
            static constexpr char const* kWhole[] = {"char", "uchar", "short", "ushort", "int", "uint"};
            static constexpr char const* kAll[] = {
                "char", "uchar", "short", "ushort", "int", "uint", "float", "double"};
            header_ += "element " + name + " " + std::to_string(count) + "\n";
            std::vector<Column> columns;
            auto const add = [&](std::string const& property, Column const& column) {
                header_ += "property " + (column.lengthType.empty() ? "" : "list " + column.lengthType + " ")
                    + column.type + " " + property + "\n";
                columns.push_back(column);
            };
            auto const addOthers = [&](std::string const& prefix) {
                for (unsigned int i = random_.below(3); i != 0; --i)
                    add(prefix + std::to_string(i),
                        {kAll[random_.below(8)], random_.below(5) == 0 ? kWhole[random_.below(6)] : "",
                            random_.below(4)});
                if (random_.below(3) == 0)
                    for (char const* const color : {"red", "green", "blue"})
                        add(prefix == "a" ? color : prefix + color, {"uchar", "", 0});
            };
            addOthers("a");
            if (name == "vertex") {
                std::string const type = random_.below(2) == 0 ? "float" : kAll[random_.below(8)];
                for (char const* const axis : {"x", "y", "z"})
                    add(axis, {random_.below(9) == 0 ? "double" : type, "", 0});
            } else if (name == "face") {
                add("vertex_indices", {kWhole[random_.below(6)], kWhole[random_.below(6)], 3 * random_.below(3), true});
                if (random_.below(3) == 0)
                    add("texcoord", {"float", "uchar", columns.back().length * 2});
            }
            addOthers("b");
            for (unsigned int element = 0; element != count; ++element)
                for (Column const& column : columns)
                    addValues(column);
        }

        void addValues(Column const& column)
        {
            unsigned int count = 1;
            if (!column.lengthType.empty()) {
                count = column.length != 0 ? column.length : (column.isIndex ? 3 : 0) + random_.below(3);
                addNumber(column.lengthType, count);
            }
            for (unsigned int i = 0; i != count; ++i) {
                unsigned int const most = column.type == "char" ? 128 : column.type == "uchar" ? 256 : 30000;
                addNumber(column.type, random_.below(column.isIndex ? std::min(most, pointCount_) : most));
            }
        }

        void addNumber(std::string const& type, unsigned int value)
        {
            bool const isByte = type == "char" || type == "uchar";
            bool const isShort = type == "short" || type == "ushort";
            body_ += isByte        ? bytesOf(order_, static_cast<unsigned char>(value))
                : isShort          ? bytesOf(order_, static_cast<unsigned short>(value))
                : type == "float"  ? bytesOf(order_, static_cast<float>(value) / 7)
                : type == "double" ? bytesOf(order_, value / 7.0)
                                   : bytesOf(order_, value);
        }

        Random& random_;
        std::endian order_;
        unsigned int pointCount_;
        std::string header_, body_;
    };

    TEST(ParallelReaders, PlyFilesOfAnyLayoutAreReadAsElementByElement)
    {
        Random random(1);
        TemporaryFolder const folder;
        int readCount = 0;
        for (int i = 0; i != 600; ++i) {
            SCOPED_TRACE(i);
            std::string const content = RandomPly(random, 40).text();
            store(folder / "a.ply", content);
            readCount += readBothWays(folder / "a.ply");
            std::string broken = content;
            if (i % 2 == 0)
                broken.resize(random.below(content.size()));
            else
                for (int change = 0; change != 3; ++change)
                    broken[content.find("end_header") + random.below(content.size() - content.find("end_header"))] =
                        "\x00\x01\x03\x7f\xff"[random.below(5)];
            store(folder / "b.ply", broken);
            readBothWays(folder / "b.ply");
        }
        EXPECT_GT(readCount, 200);
    }

    TEST(ParallelReaders, PlyFilesWithoutUsablePointsAreRefusedAsElementByElement)
    {
        TemporaryFolder const folder;
        store(folder / "a.ply",
            "ply\nformat binary_little_endian 1.0\nelement vertex 1\nproperty float x\nproperty float y\n"
            "property float z\nelement edge 1\nproperty int vertex1\nproperty int vertex2\nend_header\n"
                + bytesOf(std::endian::little, kNan, kNan, kNan, 0, 0));
        EXPECT_FALSE(readBothWays(folder / "a.ply"));
    }

    /// A file of many blocks, with faces of 3 or of 3 to 6 corners.
    std::string largePly(std::endian order, bool areTriangles)
    {
        constexpr unsigned int kPoints = 70'000, kFaces = 60'000;
        std::string content = "ply\nformat binary_" + std::string(order == std::endian::little ? "little" : "big")
            + "_endian 1.0\nelement vertex 70000\nproperty float x\nproperty float y\nproperty float z\n"
              "property uchar red\nproperty uchar green\nproperty uchar blue\nproperty short s\n"
              "element face 60000\nproperty uchar before\nproperty list uchar int vertex_indices\n"
              "property ushort after\n";
        if (areTriangles)
            content += "property list uchar float texcoord\n";
        content += "end_header\n";
        Random random(2);
        auto const byte = [&] { return static_cast<unsigned char>(random.below(256)); };
        for (unsigned int point = 0; point != kPoints; ++point)
            content += bytesOf(order, random.coordinate(), random.coordinate(), random.coordinate(), byte(), byte(),
                byte(), static_cast<short>(point));
        for (unsigned int face = 0; face != kFaces; ++face) {
            auto const corners = static_cast<unsigned char>(areTriangles ? 3 : 3 + random.below(4));
            content += bytesOf(order, byte(), corners);
            for (int corner = 0; corner != corners; ++corner)
                content += bytesOf(order, random.below(kPoints));
            content += bytesOf(order, static_cast<unsigned short>(face));
            if (areTriangles)
                content +=
                    bytesOf(order, static_cast<unsigned char>(6), 0.0f, 0.5f, 1.0f, 0.25f, 0.125f, random.coordinate());
        }
        return content;
    }

    TEST(ParallelReaders, LargePlyFilesAreNotLoaded)
    {
        TemporaryFolder const folder;
        for (std::endian const order : {std::endian::little, std::endian::big})
            for (bool const areTriangles : {true, false}) {
                std::string content = largePly(order, areTriangles);
                store(folder / "a.ply", content);
                EXPECT_TRUE(readBothWays(folder / "a.ply"));
                InputFile const file(folder / "a.ply", InputFile::Loading::Beginning);
                expectSameForThreads({1, 2, 8}, [&] { return readPly(file, {}).object; });
                EXPECT_EQ(file.loadedBytes(file.size - 1, 1), nullptr); // read straight to its place
                content[content.size() - 40] = '\xff'; // an index or a length
                store(folder / "b.ply", content);
                readBothWays(folder / "b.ply");
                content.resize(content.size() - 1);
                store(folder / "b.ply", content);
                EXPECT_FALSE(readBothWays(folder / "b.ply"));
            }
    }

    /// The same triangles as text, which is read one by one, and as a binary file.
    TEST(ParallelReaders, StlCornersAreWeldedInOrderOfAppearance)
    {
        constexpr std::uint32_t kTriangles = 100'000;
        Random random(3);
        std::string text = "solid\n", binary(80, 'x');
        binary += bytesOf(std::endian::little, kTriangles);
        for (std::uint32_t triangle = 0; triangle != kTriangles; ++triangle) {
            text += "facet\nouter loop\n";
            binary += bytesOf(std::endian::little, 0.0f, 0.0f, 1.0f);
            for (int corner = 0; corner != 3; ++corner) {
                float3 const p{static_cast<float>(random.below(200)), random.below(2) == 0 ? 0.0f : -0.0f,
                    static_cast<float>(random.below(200)) / 4};
                text +=
                    "vertex " + std::to_string(p.x) + (std::signbit(p.y) ? " -0 " : " 0 ") + std::to_string(p.z) + "\n";
                binary += bytesOf(std::endian::little, p.x, p.y, p.z);
            }
            text += "endloop\nendfacet\n";
            binary += bytesOf(std::endian::little, static_cast<unsigned short>(0));
        }
        GeometryFile const expected = readContent(".stl", text + "endsolid\n");
        EXPECT_LT(getElementCount(*expected.object, sPointComp), 40'001u);
        TemporaryFolder const folder;
        store(folder / "a.stl", binary);
        expectSameForThreads({1, 2, 8}, [&] { return readGeometryFile(folder / "a.stl").object; });
        EXPECT_TRUE(sameContents(*readGeometryFile(folder / "a.stl").object, *expected.object));
        EXPECT_THAT(refusalOf(".stl",
                        binary.substr(0, 84 + 50 * kTriangles - 2 - 4) + bytesOf(std::endian::little, kNan) + "\0\0"s),
            testing::HasSubstr("triangle 99999: a coordinate is not finite"));
    }

    std::string randomObj(Random& random)
    {
        std::string text;
        unsigned int pointCount = 0;
        auto const index = [&] {
            return random.below(4) == 0 ? "-" + std::to_string(1 + random.below(std::max(1u, pointCount)))
                                        : std::to_string(1 + random.below(12));
        };
        auto const numbers = [&](int count) {
            std::string result;
            for (; count != 0; --count)
                result += (random.below(20) == 0 ? " \\ \n" : " ") + std::to_string(random.coordinate());
            return result;
        };
        for (int i = 0; i != 12; ++i) {
            pointCount += 1;
            text += "v" + numbers(random.below(5) == 0 ? 6 : random.below(9) == 0 ? 4 : 3) + "\n";
        }
        for (unsigned int line = random.below(60); line != 0; --line) {
            static constexpr char const* kOthers[] = {"o part one\n", "g a b \\\n c\n", "g\n", "s 1\n", "s off\n",
                "usemtl red # 1\n", "usemtl \\\n", "mtllib a.mtl\n", "mtllib b.mtl\n", "# comment \\\n", "p 1\n", "\n",
                "curv 1\n", " \t\r\n", "l 1 2 3\n", "\\\n"};
            std::string face = "f";
            for (unsigned int corners = 3 + random.below(2); corners != 0; --corners)
                face += " " + index() + (random.below(9) == 0 ? "/1" : random.below(9) == 0 ? "//1" : "");
            unsigned int const kind = random.below(10);
            text += kind < 5 ? face + "\n"
                : kind == 5  ? "vt" + numbers(2) + "\n"
                : kind == 6  ? "vn" + numbers(3) + "\n"
                             : kOthers[random.below(std::size(kOthers))];
        }
        if (random.below(8) == 0)
            text += random.below(2) == 0 ? "v 1 nan 2\n" : "f 1 2\nf 1 2 99\n";
        return text + (random.below(2) == 0 ? "v 1 2 3\n" : "f 1 2 3");
    }

    /// A number as programs write them: short, with more digits than a float has, rarely none at all.
    std::string randomNumber(Random& random)
    {
        unsigned int const kind = random.below(1000);
        return kind == 0 ? "nan"
            : kind == 1  ? "1e999"
            : kind == 2  ? "-"
            : kind < 300 ? std::to_string(random.below(5))
            : kind < 600 ? std::to_string(random.coordinate())
                         : std::to_string(random.below(5)) + ".123456789" + std::to_string(random.below(3));
    }

    /// Comments, blank lines, and line ends of other systems, between lines and at their ends.
    std::string randomLineEnd(Random& random, bool hasComments)
    {
        static constexpr char const* kEnds[] = {"\r\n", "\n\n", "\n \t\n", " \n", "\n#\n", " # 1 2\n"};
        return random.below(4) == 0 ? kEnds[random.below(hasComments ? 6 : 4)] : "\n";
    }

    std::string randomOff(Random& random)
    {
        bool const hasNormals = random.below(3) == 0, hasTextures = random.below(3) == 0;
        unsigned int const pointCount = 1 + random.below(30), faceCount = random.below(30), colors = random.below(6);
        std::string text = random.below(3) == 0 ? "\xEF\xBB\xBF" : "";
        text += std::string(hasTextures ? "ST" : "") + (hasNormals ? "NOFF\n" : "OFF ") + std::to_string(pointCount)
            + " " + std::to_string(faceCount + (random.below(9) == 0)) + (random.below(2) == 0 ? " 0\n" : "\n");
        auto const addColor = [&] {
            unsigned int const values = random.below(200) == 0 ? random.below(5) : random.below(6) < colors ? 3 : 0;
            for (unsigned int i = 0; i != values; ++i)
                text += " " + std::to_string(random.below(256)) + (random.below(40) == 0 ? ".5" : "");
        };
        for (unsigned int point = 0; point != pointCount; ++point) {
            for (int i = 0; i != (hasNormals ? 6 : 3); ++i)
                text += randomNumber(random) + " ";
            addColor();
            text += (hasTextures ? " 0.5 0.25" : "") + randomLineEnd(random, true);
        }
        for (unsigned int face = 0; face != faceCount; ++face) {
            unsigned int const corners = random.below(60) == 0 ? 2 : 3 + random.below(3);
            text += std::to_string(corners);
            for (unsigned int corner = 0; corner != corners; ++corner)
                text += " " + std::to_string(random.below(pointCount + (random.below(100) == 0)));
            addColor();
            text += randomLineEnd(random, true);
        }
        return text + (random.below(9) == 0 ? "3 0 0 0\n" : "");
    }

    std::string randomTextPly(Random& random)
    {
        unsigned int const pointCount = 1 + random.below(30), faceCount = random.below(30);
        bool const hasLists = random.below(3) == 0, hasQuality = random.below(2) == 0;
        bool const areFacesFirst = random.below(5) == 0;
        std::string points, faces;
        for (unsigned int point = 0; point != pointCount; ++point) {
            if (hasLists)
                points += random.below(40) == 0 ? "1 5 " : "2 5 6 ";
            for (int i = 0; i != 3; ++i)
                points += randomNumber(random) + " ";
            points += std::to_string(random.below(random.below(60) == 0 ? 300 : 256)) + randomLineEnd(random, false);
        }
        for (unsigned int face = 0; face != faceCount; ++face) {
            unsigned int const corners = random.below(60) == 0 ? 2 : 3 + random.below(3);
            faces += (hasQuality ? randomNumber(random) + " " : "") + std::to_string(corners);
            for (unsigned int corner = 0; corner != corners; ++corner)
                faces += " " + std::to_string(random.below(pointCount + (random.below(100) == 0)));
            faces += " " + std::to_string(2 * corners);
            for (unsigned int corner = 0; corner != 2 * corners; ++corner)
                faces += " 0." + std::to_string(corner);
            faces += randomLineEnd(random, false);
        }
        std::string const ofPoints = "element vertex " + std::to_string(pointCount + (random.below(20) == 0))
            + (hasLists ? "\nproperty list char short pair" : "")
            + "\nproperty double x\nproperty float y\nproperty float z\nproperty uchar s\n";
        std::string const ofFaces = "element face " + std::to_string(faceCount + (random.below(20) == 0))
            + (hasQuality ? "\nproperty float quality" : "")
            + "\nproperty list uchar int vertex_indices\nproperty list int float texcoord\n";
        std::string const others = random.below(2) == 0 ? "" : "7\n8\n";
        return "ply\nformat ascii 1.0\nelement nothing 1000\n" + (areFacesFirst ? ofFaces : ofPoints)
            + (others.empty() ? "" : "element other 2\nproperty int a\n") + (areFacesFirst ? ofPoints : ofFaces)
            + "end_header\n" + (areFacesFirst ? faces : points) + others + (areFacesFirst ? points : faces)
            + (random.below(9) == 0 ? "1 2\n" : "");
    }

    std::string randomXyz(Random& random)
    {
        unsigned int const columns = random.below(4), kind = random.below(4);
        unsigned int const columnCount = columns == 0 ? 3 : columns == 1 ? 6 : columns == 2 ? 7 : 9;
        std::string const separator = kind == 0 ? "," : kind == 1 ? " ; " : " ";
        std::string text = random.below(5) == 0 ? "x y z r g b nx ny nz\n" : "";
        unsigned int const rowCount = random.below(30);
        if (random.below(4) == 0)
            text = std::to_string(rowCount) + "\n" + text;
        for (unsigned int row = 0; row != rowCount; ++row) {
            unsigned int const count = columnCount - (random.below(200) == 0);
            for (unsigned int column = 0; column != count; ++column)
                text += (column == 0 ? "" : separator)
                    + (column < 3             ? randomNumber(random)
                            : column / 3 == 1 ? std::to_string(random.below(256)) + (random.below(90) == 0 ? ".5" : "")
                                              : (column % 3 == row % 3 ? "1" : "0"));
            text += random.below(400) == 0 ? " 1,5\n" : randomLineEnd(random, true);
        }
        return text;
    }

    std::string randomStl(Random& random)
    {
        std::string text;
        auto const end = [&] { return randomLineEnd(random, false); };
        for (unsigned int solid = random.below(9); solid != 0; --solid) {
            text += (random.below(3) == 0 ? "solid\n" : "SOLID part " + std::to_string(solid) + "\n");
            for (unsigned int facet = random.below(8); facet != 0; --facet) {
                text += " facet normal 0 0 1" + end() + (random.below(40) == 0 ? "" : "outer loop") + end();
                for (int corner = 0; corner != 3; ++corner)
                    text += " vertex " + randomNumber(random) + " " + randomNumber(random) + " -0" + end();
                text += (random.below(9) == 0 ? "endloop " : "endloop\n") + std::string("endfacet ") + end();
            }
            text += random.below(30) == 0 ? "" : "endsolid facet" + end();
        }
        return text + (random.below(9) == 0 ? "facet\n" : "");
    }

    using ReadParts = GeometryFile (*)(InputFile const&, ReadOptions const&, std::size_t partBytes);

    GeometryFile readTextPly(InputFile const& file, ReadOptions const& options, std::size_t partBytes)
    {
        return readPly(file, options, PlyPath::Fastest, partBytes);
    }

    struct TextFormat {
        std::string (*make)(Random&);
        ReadParts read;
    };
    std::map<std::string, TextFormat> const kTextFormats{{"a.obj", {randomObj, readObj}},
        {"a.off", {randomOff, readOff}}, {"a.ply", {randomTextPly, readTextPly}}, {"a.stl", {randomStl, readStl}},
        {"a.xyz", {randomXyz, readXyz}}};

    TEST(ParallelReaders, TextsAreReadInPartsAsInOne)
    {
        TemporaryFolder const folder;
        for (auto const& entry : kTextFormats) {
            std::string const& name = entry.first;
            TextFormat const& format = entry.second; // clang 14 cannot capture names of a structured binding
            Random random(4);
            int readCount = 0;
            for (int i = 0; i != 400; ++i) {
                std::string content = format.make(random) + "\n";
                for (unsigned int change = random.below(4) == 0 ? random.below(4) : 0; change != 0; --change)
                    content[random.below(content.size())] = "\n 0a-#\r."[random.below(8)];
                SCOPED_TRACE(name + " " + std::to_string(i) + "\n" + content);
                store(folder / name, content);
                InputFile const file(folder / name);
                ReadOptions const options{.isLenient = i % 2 == 0, .isCentered = i % 3 == 0};
                Outcome const whole = outcomeOf([&] { return format.read(file, options, content.size()); });
                readCount += !!whole.object;
                for (std::size_t const partBytes : std::initializer_list<std::size_t>{1, 20, 100, 400})
                    expectSame(outcomeOf([&] { return format.read(file, options, partBytes); }), whole);
            }
            EXPECT_GT(readCount, 80) << name;
            EXPECT_LT(readCount, 390) << name;
        }
    }

}

}
