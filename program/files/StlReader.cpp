#include "Readers.h"
#include "Welder.h"

#include <TessaraGeometry/Names.h>

namespace ModelingProgram {

using Tessara::Math::float3;

namespace {

    constexpr std::size_t kHeaderBytes = 80;
    constexpr std::size_t kBytesBeforeTriangles = kHeaderBytes + sizeof(std::uint32_t);
    constexpr std::size_t kTriangleBytes = 50;

    constexpr bool kSwapsBytes = std::endian::native == std::endian::big;

    std::uint32_t declaredTriangles(InputFile const& file)
    {
        return BinaryScanner(file, kHeaderBytes, kSwapsBytes).number<std::uint32_t>("the number of triangles");
    }

    /// Text files too may be as long as a binary one, and binary ones too may begin with "solid"; but no text has a
    /// count there that fits its own length.
    bool isBinary(InputFile const& file)
    {
        return file.size >= kBytesBeforeTriangles
            && file.size == kBytesBeforeTriangles + kTriangleBytes * declaredTriangles(file);
    }

    [[noreturn]] void refuseDamagedBinary(InputFile const& file)
    {
        BinaryScanner in(file, 0, kSwapsBytes);
        in.beginElement("byte", kHeaderBytes);
        if (file.size < kBytesBeforeTriangles)
            in.refuse("the file is cut off: binary STL files have at least 84 bytes");
        std::uint64_t const triangleCount = declaredTriangles(file);
        in.refuse("the file is cut off or damaged: " + std::to_string(triangleCount) + " triangles take "
            + std::to_string(kBytesBeforeTriangles + kTriangleBytes * triangleCount) + " bytes, but it has "
            + std::to_string(file.size));
    }

    class StlReader {
    public:
        StlReader(InputFile const& file, Scanner& in)
            : file_(file)
            , builder_(in)
        {
        }

        GeometryFile readBinary(BinaryScanner& in)
        {
            std::uint32_t const triangleCount = declaredTriangles(file_);
            Orvan::Array<unsigned short> attributes(triangleCount);
            builder_.expectFaces(triangleCount);
            bool hasAttributes = false;
            for (std::uint32_t triangle = 0; triangle < triangleCount; ++triangle) {
                in.beginElement("triangle", triangle);
                in.skip(sizeof(float3)); // the normal
                for (int corner = 0; corner < 3; ++corner)
                    addCorner(in);
                builder_.endFace();
                attributes[triangle] = in.number<unsigned short>("the attribute of a triangle");
                hasAttributes = hasAttributes || attributes[triangle] != 0;
            }
            if (hasAttributes)
                builder_.addProperty<unsigned short>("attribute", Tessara::Geometry::sFaceComp, std::move(attributes));
            return std::move(builder_).finish("STL (binary)");
        }

        GeometryFile readText(TextScanner& in)
        {
            for (in.skipEmptyLines(); !in.atEnd(); in.skipEmptyLines()) {
                expectWord(in, "solid");
                in.nextLine();
                while (!isNext(in, "endsolid")) {
                    expectWord(in, "facet");
                    in.nextLine();
                    readLoop(in);
                    expectWord(in, "endfacet");
                }
                in.nextLine();
            }
            return std::move(builder_).finish("STL (text)");
        }

    private:
        void readLoop(TextScanner& in)
        {
            expectWord(in, "outer");
            in.nextLine();
            for (int corner = 0; corner < 3; ++corner) {
                expectWord(in, "vertex");
                addCorner(in);
                in.expectLineEnd();
            }
            expectWord(in, "endloop");
            builder_.endFace();
        }

        template <class In> void addCorner(In& in)
        {
            float const x = in.template number<float>("a coordinate");
            float const y = in.template number<float>("a coordinate");
            float3 const position{x, y, in.template number<float>("a coordinate")};
            unsigned int const point = points_.numberOf(position);
            if (point == builder_.pointCount())
                builder_.addPoint(position);
            builder_.addCorner(point);
        }

        /// The next word in this line or a later one, in any case.
        static bool isNext(TextScanner& in, std::string_view word)
        {
            in.skipEmptyLines();
            if (in.atEnd())
                in.refuse("the file is cut off inside of a solid");
            std::string_view const next = in.peekWord();
            return std::equal(next.begin(), next.end(), word.begin(), word.end(),
                [](char a, char b) { return (a >= 'A' && a <= 'Z' ? a - 'A' + 'a' : a) == b; });
        }

        static void expectWord(TextScanner& in, std::string_view word)
        {
            if (!isNext(in, word))
                in.refuse(TextScanner::quoted(in.peekWord()) + " stands where \"" + std::string(word) + "\" belongs");
            in.word();
        }

        InputFile const& file_;
        GeometryBuilder builder_;
        Welder<float3> points_;
    };

}

GeometryFile readStl(InputFile const& file)
{
    if (isBinary(file)) {
        BinaryScanner in(file, kBytesBeforeTriangles, kSwapsBytes);
        return StlReader(file, in).readBinary(in);
    }
    if (std::memchr(file.bytes.get(), 0, file.size))
        refuseDamagedBinary(file); // for there is no such byte in a text
    TextScanner in(file, 0, TextScanner::Syntax::Plain);
    return StlReader(file, in).readText(in);
}

}
