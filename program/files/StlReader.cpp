#include "Readers.h"
#include "Welder.h"
#include "weldRecords.h"

#include "frame/Arrays.h"

#include <TessaraGeometry/Names.h>

namespace ModelingProgram {

using Tessara::Math::double3;
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

    bool hasZeroByte(InputFile const& file)
    {
        return std::memchr(file.bytes.get(), 0, file.size) != nullptr;
    }

    /// A binary file may begin with "solid" too. But the bytes of a text at the position of the count never match the
    /// length of the file, and a text has no zero byte.
    bool isBinary(InputFile const& file, bool mayBeLonger)
    {
        if (file.size < kBytesBeforeTriangles)
            return false;
        std::uint64_t const declaredSize = kBytesBeforeTriangles + kTriangleBytes * declaredTriangles(file);
        if (file.size == declaredSize)
            return true;
        file.load();
        return mayBeLonger && file.size > declaredSize && hasZeroByte(file);
    }

    /// Whether the file is text at least up to the first facet. The header of a binary file may begin with "solid" too,
    /// but the header and the count that follows it hold a zero byte.
    bool beginsAsText(InputFile const& file)
    {
        std::string_view const beginning(file.bytes.get(), std::min(file.size, kBytesBeforeTriangles));
        return beginning.starts_with("solid") && beginning.find('\0') == std::string_view::npos;
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
        StlReader(InputFile const& file, Scanner& in, ReadOptions const& options)
            : file_(file)
            , builder_(in, options)
        {
        }

        GeometryFile readBinary(BinaryScanner& in)
        {
            std::uint32_t const triangleCount = declaredTriangles(file_);
            Orvan::Array<unsigned short> attributes(triangleCount);
            if (readTriangles(triangleCount, attributes))
                in.skip(triangleCount * kTriangleBytes);
            else
                readTrianglesInOrder(in, triangleCount, attributes);
            builder_.noteBytesLeft();
            if (std::any_of(attributes.begin(), attributes.end(), [](unsigned short value) { return value != 0; }))
                builder_.addProperty<unsigned short>("attribute", Tessara::Geometry::sFaceComp, std::move(attributes));
            return std::move(builder_).finish("STL (binary)");
        }

        GeometryFile readText(TextScanner& in)
        {
            for (in.skipEmptyLines(); !in.atEnd(); in.skipEmptyLines()) {
                if (builder_.options().isLenient && builder_.faceCount() != 0 && !isNext(in, "solid"))
                    break;
                expectWord(in, "solid");
                noteSolid(in.restOfLine());
                in.nextLine();
                while (!isNext(in, "endsolid")) {
                    expectWord(in, "facet");
                    in.nextLine();
                    readLoop(in);
                    expectWord(in, "endfacet");
                }
                in.nextLine();
            }
            builder_.noteBytesLeft();
            if (solidCount_ > 1 || !solidNames_.empty())
                builder_.note("the division into solids and their names are left out: " + std::to_string(solidCount_)
                    + (solidNames_.empty() ? "" : " (" + solidNames_ + ")"));
            return std::move(builder_).finish("STL (text)");
        }

    private:
        /// Reads all triangles at once, in parallel. \return false if something may be wrong with them; nothing has been
        /// added to the builder then
        bool readTriangles(std::uint32_t triangleCount, Orvan::Array<unsigned short>& attributes)
        {
            constexpr std::size_t kAttributeOffset = kTriangleBytes - sizeof(unsigned short);
            if (std::uint64_t{triangleCount} * 3 >= GeometryBuilder::kMostElements || builder_.movesPositions())
                return false;
            BinaryRecords const records{kBytesBeforeTriangles, triangleCount, kTriangleBytes, nullptr, 0, kSwapsBytes};
            auto points = weldRecords(records, sizeof(float3), file_);
            if (!points)
                return false;
            RecordField const field{kAttributeOffset, false, sizeof(unsigned short), 1,
                reinterpret_cast<std::byte*>(attributes.data), sizeof(unsigned short)};
            forEachBlock(records, file_, [&](RecordBlock const& block) {
                copyField(field, block);
                return true;
            });
            builder_.setPoints(std::move(points->positions), {}, 0);
            builder_.setFaces(
                std::move(points->numbers), Modeling::offsetsFromCounts(triangleCount, [](std::size_t) { return 3u; }));
            return true;
        }

        void readTrianglesInOrder(
            BinaryScanner& in, std::uint32_t triangleCount, Orvan::Array<unsigned short>& attributes)
        {
            file_.load();
            builder_.expectFaces(triangleCount);
            for (std::uint32_t triangle = 0; triangle < triangleCount; ++triangle) {
                in.beginElement("triangle", triangle);
                in.skip(sizeof(float3)); // the normal
                for (int corner = 0; corner < 3; ++corner)
                    addCorner(in);
                builder_.endFace();
                attributes[triangle] = in.number<unsigned short>("the attribute of a triangle");
            }
        }

        void noteSolid(std::string_view name)
        {
            constexpr std::uint64_t kNamed = 5;
            ++solidCount_;
            if (!name.empty() && solidCount_ <= kNamed)
                solidNames_ += (solidNames_.empty() ? "" : ", ") + TextScanner::quoted(name);
            else if (solidCount_ == kNamed + 1 && !solidNames_.empty())
                solidNames_ += ", ...";
        }

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
            Coordinate const x = coordinateFrom(in), y = coordinateFrom(in), z = coordinateFrom(in);
            // If positions are translated, those that differ only in double precision become different points.
            unsigned int const point = builder_.movesPositions()
                ? widePoints_.numberOfPosition({x.value, y.value, z.value})
                : points_.numberOfPosition(
                    {static_cast<float>(x.value), static_cast<float>(y.value), static_cast<float>(z.value)});
            if (point == builder_.pointCount())
                builder_.addPoint(x, y, z);
            builder_.addCorner(point);
        }

        static Coordinate coordinateFrom(TextScanner& in) { return in.coordinate(); }
        static Coordinate coordinateFrom(BinaryScanner& in) { return {in.number<float>("a coordinate")}; }

        /// Whether the next word, in this line or a later one, is `word` in upper or lower case.
        static bool isNext(TextScanner& in, std::string_view word)
        {
            in.skipEmptyLines();
            if (in.atEnd())
                in.refuse("the file is cut off inside a solid");
            std::string_view const next = in.peekWord();
            return std::equal(
                next.begin(), next.end(), word.begin(), word.end(), [](char a, char b) { return lowerCase(a) == b; });
        }

        static void expectWord(TextScanner& in, std::string_view word)
        {
            if (!isNext(in, word))
                in.refuse(TextScanner::quoted(in.peekWord()) + " instead of \"" + std::string(word) + "\"");
            in.word();
        }

        InputFile const& file_;
        GeometryBuilder builder_;
        std::uint64_t solidCount_ = 0;
        std::string solidNames_;
        Welder<float3> points_;
        Welder<double3> widePoints_;
    };

}

GeometryFile readStl(InputFile const& file, ReadOptions const& options)
{
    if (isBinary(file, options.isLenient)) {
        BinaryScanner in(file, kBytesBeforeTriangles, kSwapsBytes);
        return StlReader(file, in, options).readBinary(in);
    }
    if (hasZeroByte(file) && !(options.isLenient && beginsAsText(file)))
        refuseDamagedBinary(file);
    TextScanner in(file, 0, TextScanner::Syntax::Plain);
    return StlReader(file, in, options).readText(in);
}

}
