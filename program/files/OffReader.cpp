#include "Readers.h"

#include <TessaraGeometry/Names.h>

#include <span>

namespace ModelingProgram {

using namespace Tessara::Geometry;
using Tessara::Math::float2;
using Tessara::Math::float3;

namespace {

    /// The colors of the elements of a component as read: bytes or fractions, with or without alpha, possibly not for
    /// all elements. Their type is determined at the end.
    class Colors {
    public:
        void add(std::uint64_t element, std::span<float const> values, bool isFraction)
        {
            while (rgba_.size < 4 * element)
                rgba_.append(kMissing);
            for (std::size_t i = 0; i < 4; ++i)
                rgba_.append(i < values.size() ? values[i] : kMissing);
            hasFractions_ = hasFractions_ || isFraction
                || std::any_of(values.begin(), values.end(), [](float v) { return !(v >= 0 && v <= 255); });
            hasAlpha_ = hasAlpha_ || values.size() == 4;
        }

        void addTo(GeometryBuilder& builder, char const* component, std::uint64_t count)
        {
            if (rgba_.empty())
                return;
            std::uint64_t uncolored = count - rgba_.size / 4;
            for (std::uint64_t red = 0; red < rgba_.size; red += 4)
                uncolored += std::isnan(rgba_[red]);
            if (uncolored != 0)
                builder.note(
                    std::to_string(uncolored) + " " + elementNames(component) + " have no color and become white");
            while (rgba_.size < 4 * count)
                rgba_.append(kMissing);
            if (hasFractions_)
                addAs<float>(builder, component, count, 1.0f);
            else
                addAs<unsigned char>(builder, component, count, 255.0f);
        }

    private:
        static constexpr float kMissing = std::numeric_limits<float>::quiet_NaN();

        template <class Scalar>
        void addAs(GeometryBuilder& builder, char const* component, std::uint64_t count, float most) const
        {
            std::uint64_t const components = hasAlpha_ ? 4 : 3;
            auto const target = builder.addProperty<Scalar>("color", component, components, count);
            for (std::uint64_t element = 0; element < count; ++element) {
                for (std::uint64_t i = 0; i < components; ++i) {
                    float const value = rgba_[4 * element + i];
                    auto const scalar = static_cast<Scalar>(std::isnan(value) ? most : value);
                    std::memcpy(target->data + (element * components + i) * sizeof(Scalar), &scalar, sizeof(Scalar));
                }
            }
        }

        Orvan::Array<float> rgba_;
        bool hasFractions_ = false;
        bool hasAlpha_ = false;
    };

    class OffReader {
    public:
        OffReader(InputFile const& file, ReadOptions const& options)
            : in_(file, 0, TextScanner::Syntax::Comments)
            , builder_(in_, options)
        {
        }

        GeometryFile read()
        {
            readHeader();
            for (std::uint64_t point = 0; point < pointCount_; ++point) {
                in_.beginElement("point", point);
                readPoint(point);
                in_.endElement();
            }
            for (std::uint64_t face = 0; face < faceCount_; ++face) {
                in_.beginElement("face", face);
                readFace(face);
                in_.endElement();
            }
            in_.skipEmptyLines();
            if (!in_.atEnd() && !builder_.options().isLenient)
                in_.refuse(TextScanner::quoted(in_.peekWord()) + " follows after the last face");
            builder_.noteBytesLeft();
            if (hasNormals_)
                builder_.addProperty<float3>("normal", sPointComp, std::move(normals_));
            if (hasTextures_)
                builder_.addProperty<float2>("uv", sPointComp, std::move(textures_));
            pointColors_.addTo(builder_, sPointComp, pointCount_);
            faceColors_.addTo(builder_, sFaceComp, faceCount_);
            if (colorIndices_ != 0)
                builder_.note(std::to_string(colorIndices_) + " faces refer to a color table, which is ignored");
            return std::move(builder_).finish("OFF");
        }

    private:
        /// [ST][C][N]OFF, with C and N in either order, then the numbers of points, faces and optionally edges.
        void readHeader()
        {
            in_.skipEmptyLines();
            std::string_view const word = in_.word();
            std::string_view prefix = word.substr(0, word.size() - std::min<std::size_t>(word.size(), 3));
            if (!word.ends_with("OFF") || in_.peekWord() == "BINARY")
                in_.refuse("the file does not begin with OFF, COFF, NOFF or the like, or is binary");
            hasTextures_ = prefix.starts_with("ST");
            prefix.remove_prefix(hasTextures_ ? 2 : 0);
            hasNormals_ = prefix.find('N') != std::string_view::npos;
            if (prefix.find_first_not_of("CN") != std::string_view::npos)
                in_.refuse(
                    TextScanner::quoted(word) + " files are not supported: only points with three coordinates are");
            in_.skipEmptyLines();
            pointCount_ = in_.number<std::uint64_t>("the number of points");
            faceCount_ = in_.number<std::uint64_t>("the number of faces");
            if (!in_.atLineEnd())
                static_cast<void>(in_.number<std::uint64_t>("the number of edges"));
            in_.expectLineEnd();
            in_.requirePossible(pointCount_, "points", 6);
            in_.requirePossible(faceCount_, "faces", 8);
            builder_.expectPoints(pointCount_);
            builder_.expectFaces(faceCount_);
        }

        float3 readFloat3(char const* what)
        {
            float const x = in_.number<float>(what);
            float const y = in_.number<float>(what);
            return {x, y, in_.number<float>(what)};
        }

        /// Position, normal, color, texture coordinates. Colors are read even if the header does not announce them.
        void readPoint(std::uint64_t point)
        {
            Coordinate const x = in_.coordinate(), y = in_.coordinate();
            builder_.addPoint(x, y, in_.coordinate());
            if (hasNormals_)
                normals_.append(readFloat3("a component of the normal"));
            std::size_t const textureValues = hasTextures_ ? 2 : 0;
            float values[6];
            unsigned int fractions = 0;
            std::size_t const count = readValues(values, 4 + textureValues, fractions);
            std::size_t const colorValues = count - std::min(count, textureValues);
            if (count < textureValues)
                in_.refuse("the line ends before the texture coordinates");
            if (colorValues != 0)
                addColor(point, {values, colorValues}, fractions & ((1u << colorValues) - 1), pointColors_);
            if (hasTextures_)
                textures_.append({values[colorValues], values[colorValues + 1]});
        }

        void readFace(std::uint64_t face)
        {
            auto const corners = in_.number<std::uint64_t>("the number of corners");
            in_.requirePossible(corners, "corners", 2);
            for (std::uint64_t corner = 0; corner < corners; ++corner)
                builder_.addCorner(in_.number<long long>("a point"));
            builder_.endFace();
            float values[4];
            unsigned int fractions = 0;
            std::size_t const count = readValues(values, 4, fractions);
            colorIndices_ += count == 1;
            if (count > 1)
                addColor(face, {values, count}, fractions, faceColors_);
        }

        void addColor(std::uint64_t element, std::span<float const> values, unsigned int fractions, Colors& colors)
        {
            if (values.size() < 3)
                in_.refuse("a color has " + std::to_string(values.size()) + " values instead of 3 or 4");
            colors.add(element, values, fractions != 0);
        }

        /// Up to `most` values, as many as the line has, and one bit of `fractions` for each value with a decimal
        /// point.
        std::size_t readValues(float* values, std::size_t most, unsigned int& fractions)
        {
            std::size_t count = 0;
            for (; count < most && !in_.atLineEnd(); ++count) {
                fractions |= (in_.peekWord().find('.') != std::string_view::npos ? 1u : 0u) << count;
                values[count] = in_.number<float>("a color or texture coordinate");
            }
            return count;
        }

        TextScanner in_;
        GeometryBuilder builder_;
        std::uint64_t pointCount_ = 0;
        std::uint64_t faceCount_ = 0;
        bool hasNormals_ = false;
        bool hasTextures_ = false;
        Orvan::Array<float3> normals_;
        Orvan::Array<float2> textures_;
        Colors pointColors_;
        Colors faceColors_;
        std::uint64_t colorIndices_ = 0;
    };

}

GeometryFile readOff(InputFile const& file, ReadOptions const& options)
{
    return OffReader(file, options).read();
}

}
