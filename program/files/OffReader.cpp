#include "Readers.h"
#include "TextParts.h"

#include <TessaraGeometry/Names.h>

#include <span>

namespace ModelingProgram {

using namespace Tessara::Geometry;
using Tessara::Math::float2;
using Tessara::Math::float3;

namespace {

    /// The colors of consecutive elements as read: bytes or fractions, with or without alpha, possibly not for all
    /// elements.
    struct Colors {
        static constexpr float kMissing = std::numeric_limits<float>::quiet_NaN();

        Orvan::Array<float> rgba; // up to the last element that has one
        std::uint64_t count = 0; // of the elements that have one
        bool hasFractions = false;
        bool hasAlpha = false;

        void add(std::uint64_t element, std::span<float const> values, bool isFraction)
        {
            while (rgba.size < 4 * element)
                rgba.append(kMissing);
            for (std::size_t i = 0; i < 4; ++i)
                rgba.append(i < values.size() ? values[i] : kMissing);
            count += !std::isnan(values[0]);
            hasFractions = hasFractions || isFraction
                || std::any_of(values.begin(), values.end(), [](float v) { return !(v >= 0 && v <= 255); });
            hasAlpha = hasAlpha || values.size() == 4;
        }

        /// Those of so many elements; elements without one become white.
        template <class Scalar>
        void copyTo(std::byte* target, std::uint64_t elementCount, std::size_t components, Scalar most) const
        {
            for (std::uint64_t i = 0; i < elementCount * components; ++i, target += sizeof(Scalar)) {
                std::uint64_t const place = i / components * 4 + i % components;
                bool const isMissing = place >= rgba.size || std::isnan(rgba[place]);
                auto const scalar = isMissing ? most : static_cast<Scalar>(rgba[place]);
                std::memcpy(target, &scalar, sizeof(Scalar));
            }
        }
    };

    /// What the header says.
    struct OffHeader {
        std::uint64_t pointCount = 0;
        std::uint64_t faceCount = 0;
        bool hasNormals = false;
        bool hasTextures = false;
    };

    /// [ST][C][N]OFF, with C and N in either order, then the numbers of points, faces and optionally edges.
    OffHeader readHeader(TextScanner& in)
    {
        OffHeader header;
        in.skipEmptyLines();
        std::string_view const word = in.word();
        std::string_view prefix = word.substr(0, word.size() - std::min<std::size_t>(word.size(), 3));
        if (!word.ends_with("OFF") || in.peekWord() == "BINARY")
            in.refuse("the file does not begin with OFF, COFF, NOFF or the like, or is binary");
        header.hasTextures = prefix.starts_with("ST");
        prefix.remove_prefix(header.hasTextures ? 2 : 0);
        header.hasNormals = prefix.find('N') != std::string_view::npos;
        if (prefix.find_first_not_of("CN") != std::string_view::npos)
            in.refuse(TextScanner::quoted(word) + " files are not supported: only points with three coordinates are");
        in.skipEmptyLines();
        header.pointCount = in.number<std::uint64_t>("the number of points");
        header.faceCount = in.number<std::uint64_t>("the number of faces");
        if (!in.atLineEnd())
            static_cast<void>(in.number<std::uint64_t>("the number of edges"));
        in.expectLineEnd();
        in.requirePossible(header.pointCount, "points", 6);
        in.requirePossible(header.faceCount, "faces", 8);
        return header;
    }

    /// Some of the lines after the header: points, faces, or both.
    class OffPart : public LinePart {
    public:
        OffPart(InputFile const& file, std::size_t begin, std::size_t end, OffHeader const& header,
            ReadOptions const& options)
            : LinePart(file, begin, end, TextScanner::Syntax::Comments)
            , builder(in, options)
            , header_(header)
        {
        }

        /// Points come first, then faces.
        void read(std::uint64_t first, std::uint64_t end)
        {
            std::uint64_t const lastPoint = std::min(end, header_.pointCount),
                                firstFace = std::max(first, header_.pointCount);
            pointCount = lastPoint - std::min(first, lastPoint);
            faceCount = end - std::min(firstFace, end);
            builder.expectPoints(pointCount);
            builder.expectOtherPoints(header_.pointCount);
            builder.expectFaces(faceCount);
            builder.expectCorners(3 * faceCount);
            for (std::uint64_t point = 0; point < pointCount; ++point) {
                in.beginElement("point", first + point);
                readPoint(point);
                in.endElement();
            }
            for (std::uint64_t face = 0; face < faceCount; ++face) {
                in.beginElement("face", firstFace - header_.pointCount + face);
                readFace(face);
                in.endElement();
            }
        }

        GeometryBuilder builder;
        std::uint64_t pointCount = 0;
        std::uint64_t faceCount = 0;
        Orvan::Array<float3> normals;
        Orvan::Array<float2> textures;
        Colors pointColors;
        Colors faceColors;
        std::uint64_t colorIndices = 0;

    private:
        float3 readFloat3(char const* what)
        {
            float const x = in.number<float>(what);
            float const y = in.number<float>(what);
            return {x, y, in.number<float>(what)};
        }

        /// Position, normal, color, texture coordinates. Colors are read even if the header does not announce them.
        void readPoint(std::uint64_t point)
        {
            Coordinate const x = in.coordinate(), y = in.coordinate();
            builder.addPoint(x, y, in.coordinate());
            if (header_.hasNormals)
                normals.append(readFloat3("a component of the normal"));
            std::size_t const textureValues = header_.hasTextures ? 2 : 0;
            float values[6];
            unsigned int fractions = 0;
            std::size_t const count = readValues(values, 4 + textureValues, fractions);
            std::size_t const colorValues = count - std::min(count, textureValues);
            if (count < textureValues)
                in.refuse("the line ends before the texture coordinates");
            if (colorValues != 0)
                addColor(point, {values, colorValues}, fractions & ((1u << colorValues) - 1), pointColors);
            if (header_.hasTextures)
                textures.append({values[colorValues], values[colorValues + 1]});
        }

        void readFace(std::uint64_t face)
        {
            auto const corners = in.number<std::uint64_t>("the number of corners");
            in.requirePossible(corners, "corners", 2);
            for (std::uint64_t corner = 0; corner < corners; ++corner)
                builder.addCorner(in.number<long long>("a point"));
            builder.endFace();
            float values[4];
            unsigned int fractions = 0;
            std::size_t const count = readValues(values, 4, fractions);
            colorIndices += count == 1;
            if (count > 1)
                addColor(face, {values, count}, fractions, faceColors);
        }

        void addColor(std::uint64_t element, std::span<float const> values, unsigned int fractions, Colors& colors)
        {
            if (values.size() < 3)
                in.refuse("a color has " + std::to_string(values.size()) + " values instead of 3 or 4");
            colors.add(element, values, fractions != 0);
        }

        /// Up to `most` values, as many as the line has, and one bit of `fractions` for each value with a decimal
        /// point.
        std::size_t readValues(float* values, std::size_t most, unsigned int& fractions)
        {
            std::size_t count = 0;
            for (; count < most && !in.atLineEnd(); ++count) {
                fractions |= (in.peekWord().find('.') != std::string_view::npos ? 1u : 0u) << count;
                values[count] = in.number<float>("a color or texture coordinate");
            }
            return count;
        }

        OffHeader const& header_;
    };

    /// The colors of all elements of a component. They determine the type of the property.
    class JoinedColors {
    public:
        JoinedColors(TextParts<OffPart> const& parts, Colors OffPart::*colors, std::uint64_t OffPart::*elementCount)
            : starts_(startsOf(parts.pointers(), [=](OffPart const& part) { return part.*elementCount; }))
        {
            for (OffPart* const part : parts.pointers()) {
                Colors const& some = part->*colors;
                parts_.push_back(&some);
                isEmpty_ = isEmpty_ && some.rgba.empty();
                coloredCount_ += some.count;
                hasFractions_ = hasFractions_ || some.hasFractions;
                hasAlpha_ = hasAlpha_ || some.hasAlpha;
            }
        }

        void addTo(GeometryBuilder& builder, char const* component) const
        {
            if (isEmpty_)
                return;
            std::uint64_t const uncolored = starts_.back() - coloredCount_;
            if (uncolored != 0)
                builder.note(
                    std::to_string(uncolored) + " " + elementNames(component) + " have no color and become white");
            if (hasFractions_)
                addAs<float>(builder, component, 1);
            else
                addAs<unsigned char>(builder, component, 255);
        }

    private:
        template <class Scalar> void addAs(GeometryBuilder& builder, char const* component, Scalar most) const
        {
            std::size_t const components = hasAlpha_ ? 4 : 3;
            auto const target = builder.addProperty<Scalar>("color", component, components, starts_.back());
            forEachPart(parts_.size(), [&](std::size_t part) {
                parts_[part]->copyTo(target->data + starts_[part] * components * sizeof(Scalar),
                    starts_[part + 1] - starts_[part], components, most);
            });
        }

        std::vector<Colors const*> parts_;
        std::vector<std::uint64_t> starts_; // the first element of each part, and the number of all
        std::uint64_t coloredCount_ = 0;
        bool isEmpty_ = true;
        bool hasFractions_ = false;
        bool hasAlpha_ = false;
    };

}

GeometryFile readOff(InputFile const& file, ReadOptions const& options)
{
    return readOff(file, options, kTextPartBytes);
}

GeometryFile readOff(InputFile const& file, ReadOptions const& options, std::size_t partBytes)
{
    file.load();
    TextScanner in(file, 0, TextScanner::Syntax::Comments);
    OffHeader const header = readHeader(in);
    GeometryBuilder builder(in, options);
    builder.expectOtherPoints(header.pointCount);
    TextParts<OffPart> parts(file, TextScanner::partsOf(file, in.position(), partBytes), header, options);
    in.skipTo(readLines(parts, header.pointCount + header.faceCount));
    in.skipEmptyLines();
    if (!in.atEnd() && !options.isLenient)
        in.refuse(TextScanner::quoted(in.peekWord()) + " follows after the last face");
    builder.noteBytesLeft();
    parts.releaseText();
    parts.joinGeometry(builder);
    if (header.hasNormals)
        builder.addProperty<float3>("normal", sPointComp, parts.joined(&OffPart::normals));
    if (header.hasTextures)
        builder.addProperty<float2>("uv", sPointComp, parts.joined(&OffPart::textures));
    JoinedColors(parts, &OffPart::pointColors, &OffPart::pointCount).addTo(builder, sPointComp);
    JoinedColors(parts, &OffPart::faceColors, &OffPart::faceCount).addTo(builder, sFaceComp);
    if (std::uint64_t const indices = parts.sum(&OffPart::colorIndices))
        builder.note(std::to_string(indices) + " faces refer to a color table, which is ignored");
    return std::move(builder).finish("OFF");
}

}
