#include "Readers.h"
#include "TextParts.h"
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

    /// Numbers the corners of a file by their positions, and adds each new position to a builder.
    class CornerWelder {
    public:
        explicit CornerWelder(GeometryBuilder& builder)
            : builder_(builder)
        {
        }

        void addCorner(Coordinate const& x, Coordinate const& y, Coordinate const& z)
        {
            // If positions are translated, those that differ only in double precision become different points.
            unsigned int const point = builder_.movesPositions()
                ? wide_.numberOfPosition({x.value, y.value, z.value})
                : narrow_.numberOfPosition(
                    {static_cast<float>(x.value), static_cast<float>(y.value), static_cast<float>(z.value)});
            if (point == builder_.pointCount()) {
                builder_.addPoint(x, y, z);
                bool const isKept = std::isfinite(x.value) && std::isfinite(y.value) && std::isfinite(z.value);
                if (isKept && (x.losesDigits || y.losesDigits || z.losesDigits))
                    losses_.push_back({point, std::max({lossOf(x.value), lossOf(y.value), lossOf(z.value)})});
            }
            builder_.addCorner(point);
        }

        /// Removes the points that earlier parts of the file have too.
        /// \param numbers  of the points in the file, which ascend from `first` on for new points and are below it for
        ///                 the others
        void keepNewPoints(Orvan::Array<unsigned int> const& numbers, unsigned int first)
        {
            double largestLoss = 0;
            for (Loss const& loss : losses_)
                if (numbers[loss.point] >= first)
                    largestLoss = std::max(largestLoss, loss.value);
            builder_.keepNewPoints(numbers, first, largestLoss);
        }

    private:
        struct Loss {
            unsigned int point;
            double value;
        };

        GeometryBuilder& builder_;
        std::vector<Loss> losses_;
        Welder<float3> narrow_;
        Welder<double3> wide_;
    };

    class BinaryStlReader {
    public:
        BinaryStlReader(InputFile const& file, ReadOptions const& options)
            : file_(file)
            , in_(file, kBytesBeforeTriangles, kSwapsBytes)
            , builder_(in_, options)
        {
        }

        GeometryFile read()
        {
            std::uint32_t const triangleCount = declaredTriangles(file_);
            Orvan::Array<unsigned short> attributes(triangleCount);
            if (readTriangles(triangleCount, attributes))
                in_.skip(triangleCount * kTriangleBytes);
            else
                readTrianglesInOrder(triangleCount, attributes);
            builder_.noteBytesLeft();
            if (std::any_of(attributes.begin(), attributes.end(), [](unsigned short value) { return value != 0; }))
                builder_.addProperty<unsigned short>("attribute", Tessara::Geometry::sFaceComp, std::move(attributes));
            return std::move(builder_).finish("STL (binary)");
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

        void readTrianglesInOrder(std::uint32_t triangleCount, Orvan::Array<unsigned short>& attributes)
        {
            file_.load();
            builder_.expectFaces(triangleCount);
            CornerWelder corners(builder_);
            auto const coordinate = [&] { return Coordinate{in_.number<float>("a coordinate")}; };
            for (std::uint32_t triangle = 0; triangle < triangleCount; ++triangle) {
                in_.beginElement("triangle", triangle);
                in_.skip(sizeof(float3)); // the normal
                for (int corner = 0; corner < 3; ++corner) {
                    Coordinate const x = coordinate(), y = coordinate(), z = coordinate();
                    corners.addCorner(x, y, z);
                }
                builder_.endFace();
                attributes[triangle] = in_.number<unsigned short>("the attribute of a triangle");
            }
        }

        InputFile const& file_;
        BinaryScanner in_;
        GeometryBuilder builder_;
    };

    /// The number of solids in a file, and the names of the first ones.
    class Solids {
    public:
        void add(std::string_view name)
        {
            if (names_.size() <= kNamed)
                names_.emplace_back(name);
            ++count_;
        }
        void add(Solids const& next)
        {
            for (std::string const& name : next.names_)
                add(name);
            count_ += next.count_ - next.names_.size();
        }

        void noteLeftOut(GeometryBuilder& builder) const
        {
            std::string list;
            for (std::size_t solid = 0; solid < names_.size(); ++solid) {
                if (solid == kNamed)
                    list += list.empty() ? "" : ", ...";
                else if (!names_[solid].empty())
                    list += (list.empty() ? "" : ", ") + TextScanner::quoted(names_[solid]);
            }
            if (count_ > 1 || !list.empty())
                builder.note("the division into solids and their names are left out: " + std::to_string(count_)
                    + (list.empty() ? "" : " (" + list + ")"));
        }

    private:
        static constexpr std::size_t kNamed = 5;

        std::uint64_t count_ = 0;
        std::vector<std::string> names_; // one more than are named tells that there are more
    };

    /// Whether the next word, in this line or a later one, is `word` in upper or lower case.
    bool isNext(TextScanner& in, std::string_view word)
    {
        in.skipEmptyLines();
        if (in.atEnd())
            in.refuse("the file is cut off inside a solid");
        std::string_view const next = in.peekWord();
        return std::equal(
            next.begin(), next.end(), word.begin(), word.end(), [](char a, char b) { return lowerCase(a) == b; });
    }

    void expectWord(TextScanner& in, std::string_view word)
    {
        if (!isNext(in, word))
            in.refuse(TextScanner::quoted(in.peekWord()) + " instead of \"" + std::string(word) + "\"");
        in.word();
    }

    /// Some of the facets of a text. All parts but the first begin inside of a solid, at a line that begins with "facet".
    /// As the first word of no line is skipped, a part that is not complete at such a line is refused there.
    class StlPart {
    public:
        StlPart(InputFile const& file, std::size_t begin, std::size_t end, ReadOptions const& options)
            : in(file, begin, TextScanner::Syntax::Plain)
            , builder(in, options)
            , corners(builder)
            , isFirst_(begin == 0)
            , end_(end)
        {
        }

        /// \return whether the next part follows, which is not so at the end of the file, or at what a lenient reader
        /// leaves out there
        bool read()
        {
            bool isInSolid = !isFirst_;
            for (;;) {
                if (isInSolid && !readFacets())
                    break;
                in.skipEmptyLines();
                if (in.atEnd())
                    return false;
                if (builder.options().isLenient && builder.faceCount() != 0 && !isNext(in, "solid"))
                    return false;
                expectWord(in, "solid");
                solids.add(in.restOfLine());
                in.nextLine();
                isInSolid = true;
            }
            return true;
        }

        // Declared first, because the builder refers to it.
        TextScanner in; // which does not end with the part
        GeometryBuilder builder;
        CornerWelder corners;
        Solids solids;

    private:
        /// Reads up to the end of the solid or of the part. \return whether the solid has ended
        bool readFacets()
        {
            for (;;) {
                in.skipEmptyLines();
                if (!in.atEnd() && in.position() >= end_)
                    return false;
                if (isNext(in, "endsolid"))
                    break;
                expectWord(in, "facet");
                in.nextLine();
                readLoop();
                expectWord(in, "endfacet");
            }
            in.nextLine();
            return true;
        }

        void readLoop()
        {
            expectWord(in, "outer");
            in.nextLine();
            for (int corner = 0; corner < 3; ++corner) {
                expectWord(in, "vertex");
                Coordinate const x = in.coordinate(), y = in.coordinate(), z = in.coordinate();
                corners.addCorner(x, y, z);
                in.expectLineEnd();
            }
            expectWord(in, "endloop");
            builder.endFace();
        }

        bool isFirst_;
        std::size_t end_;
    };

    /// Moves the bounds of parts to lines that begin with "facet", and drops those of parts without such a line.
    std::vector<std::size_t> boundsAtFacets(InputFile const& file, std::vector<std::size_t> const& bounds)
    {
        std::vector<std::size_t> result{bounds.front()};
        for (std::size_t part = 1; part + 1 < bounds.size(); ++part) {
            TextScanner in(file, bounds[part], bounds[part + 1], TextScanner::Syntax::Plain);
            in.skipEmptyLines();
            while (!in.atEnd() && !isNext(in, "facet")) {
                in.nextLine();
                in.skipEmptyLines();
            }
            if (!in.atEnd())
                result.push_back(in.position());
        }
        result.push_back(bounds.back());
        return result;
    }

    /// Numbers the points of all parts in order of first appearance, as if they had been read in one part.
    /// \param positions  of the points of a builder
    template <class T, class PositionsOf>
    void weldParts(TextParts<StlPart> const& parts, PositionsOf const& positionsOf)
    {
        Welder<T> welder;
        std::vector<Orvan::Array<unsigned int>> numbers(parts.count());
        std::vector<unsigned int> firsts(parts.count());
        for (std::size_t part = 0; part != parts.count(); ++part) {
            Orvan::Array<T> const& positions = positionsOf(parts[part].builder);
            firsts[part] = static_cast<unsigned int>(welder.values().size);
            numbers[part] = Orvan::Array<unsigned int>(positions.size, Orvan::kUninitialized);
            std::transform(positions.begin(), positions.end(), numbers[part].begin(),
                [&](T const& position) { return welder.numberOfPosition(position); });
        }
        forEachPart(
            parts.count(), [&](std::size_t part) { parts[part].corners.keepNewPoints(numbers[part], firsts[part]); });
    }

    GeometryFile readText(InputFile const& file, ReadOptions const& options, std::size_t partBytes)
    {
        file.load();
        TextScanner in(file, 0, TextScanner::Syntax::Plain);
        GeometryBuilder builder(in, options);
        TextParts<StlPart> parts(file, boundsAtFacets(file, TextScanner::partsOf(file, 0, partBytes)), options);
        parts.read([](StlPart& part, std::size_t) {
            bool const isFollowed = part.read();
            part.in.countWorkLeft();
            return isFollowed;
        });
        in.skipTo(parts[parts.count() - 1].in.position());
        builder.noteBytesLeft();
        Solids solids;
        for (StlPart const* const part : parts.pointers())
            solids.add(part->solids);
        solids.noteLeftOut(builder);
        parts.releaseText();
        if (parts.count() > 1 && builder.movesPositions())
            weldParts<double3>(parts, std::mem_fn(&GeometryBuilder::widePositions));
        else if (parts.count() > 1)
            weldParts<float3>(parts, std::mem_fn(&GeometryBuilder::positions));
        parts.joinGeometry(builder);
        return std::move(builder).finish("STL (text)");
    }

}

GeometryFile readStl(InputFile const& file, ReadOptions const& options)
{
    return readStl(file, options, kTextPartBytes);
}

GeometryFile readStl(InputFile const& file, ReadOptions const& options, std::size_t partBytes)
{
    if (isBinary(file, options.isLenient))
        return BinaryStlReader(file, options).read();
    if (hasZeroByte(file) && !(options.isLenient && beginsAsText(file)))
        refuseDamagedBinary(file);
    return readText(file, options, partBytes);
}

}
