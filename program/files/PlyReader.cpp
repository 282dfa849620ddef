#include "PlyColumns.h"
#include "PlyElements.h"
#include "PlyRecords.h"
#include "Readers.h"
#include "TextParts.h"

#include <TessaraGeometry/Names.h>

#include <bit>

namespace ModelingProgram {

using namespace Tessara::Geometry;

namespace {

    /// Whether each element has a line of a text file.
    bool hasLines(PlyElement const& element)
    {
        return !element.properties.empty();
    }

    /// Some of the lines after the header of a text file. Values of properties go straight to their targets, those of
    /// lists are joined later.
    class PlyPart : public LinePart {
    public:
        PlyPart(InputFile const& file, std::size_t begin, std::size_t end, PlyHeader const& header,
            GeometryBuilder const& whole)
            : LinePart(file, begin, end, TextScanner::Syntax::Plain)
            , builder(in, whole.options())
            , elements(header.elements)
            , pointCount_(whole.expectedPointCount())
        {
        }

        void read(std::uint64_t first, std::uint64_t end)
        {
            std::uint64_t firstLine = 0; // of the elements of a kind
            for (PlyElement& element : elements) {
                if (!hasLines(element))
                    continue;
                auto const indexOf = [&](std::uint64_t line) {
                    return std::clamp(line, firstLine, firstLine + element.count) - firstLine;
                };
                readElements(element, indexOf(first), indexOf(end));
                firstLine += element.count;
            }
        }

        GeometryBuilder builder;
        std::vector<PlyElement> elements;

    private:
        void readElements(PlyElement& element, std::uint64_t first, std::uint64_t end)
        {
            for (PlyProperty& property : element.properties)
                if (property.use == PlyProperty::Use::Value)
                    property.target += first * property.stride;
            if (element.name == "vertex") {
                builder.expectPoints(end - first);
            } else if (element.name == "face") {
                builder.expectFaces(end - first);
                builder.expectCorners(3 * (end - first));
            }
            builder.expectOtherPoints(pointCount_);
            PlyElementReader(in, builder).read(element, first, end);
        }

        std::uint64_t pointCount_;
    };

    /// Reads the elements after a header, with a scanner for their encoding.
    template <class In> class PlyReader {
    public:
        PlyReader(PlyHeader& header, InputFile const& file, In& in, ReadOptions const& options)
            : header_(header)
            , file_(file)
            , in_(in)
            , builder_(in, options)
        {
        }

        /// \param readElements  `void ()`, reads all elements with one of the functions below
        template <class ReadElements> GeometryFile read(char const* format, ReadElements const& readElements)
        {
            for (std::string const& file : header_.textureFiles)
                builder_.note("the name of the texture file " + TextScanner::quoted(file) + " is left out");
            for (PlyElement& element : header_.elements)
                prepare(element);
            readElements();
            builder_.noteBytesLeft();
            for (PlyElement& element : header_.elements)
                addLists(element);
            return std::move(builder_).finish(format);
        }

        void readRecords(PlyPath path)
        {
            for (PlyElement& element : header_.elements) {
                if (element.properties.empty())
                    continue;
                std::size_t const begin = in_.position();
                auto const end = path == PlyPath::Fastest
                    ? readPlyRecords(element, begin, in_.swapsBytes(), file_, builder_)
                    : std::nullopt;
                if (end) {
                    in_.skip(*end - begin);
                    continue;
                }
                file_.load();
                PlyElementReader(in_, builder_).read(element, 0, element.count);
            }
        }

        void readLines(std::size_t partBytes)
        {
            std::uint64_t lineCount = 0;
            for (PlyElement const& element : header_.elements)
                lineCount += hasLines(element) ? element.count : 0;
            TextParts<PlyPart> parts(file_, TextScanner::partsOf(file_, in_.position(), partBytes), header_, builder_);
            in_.skipTo(ModelingProgram::readLines(parts, lineCount));
            in_.skipEmptyLines();
            parts.releaseText();
            parts.joinGeometry(builder_);
            for (std::size_t element = 0; element != header_.elements.size(); ++element)
                for (std::size_t property = 0; property != header_.elements[element].properties.size(); ++property)
                    joinLists(parts, element, property);
        }

    private:
        static constexpr bool kIsText = std::is_same_v<In, TextScanner>;
        using Use = PlyProperty::Use;

        static char const* componentOf(PlyElement const& element)
        {
            return element.name == "vertex" ? sPointComp : element.name == "face" ? sFaceComp : nullptr;
        }

        void prepare(PlyElement& element)
        {
            if (element.count != 0)
                in_.beginElement(element.name.c_str(), 0);
            if (element.name == "vertex") {
                preparePositions(element);
                if constexpr (kIsText)
                    builder_.expectOtherPoints(element.count);
                else
                    builder_.expectPoints(element.count);
            } else if (element.name == "face") {
                prepareIndices(element);
                if constexpr (!kIsText)
                    builder_.expectFaces(element.count);
            } else {
                builder_.note(
                    "the elements \"" + element.name + "\" are left out (" + std::to_string(element.count) + ")");
                return;
            }
            for (std::size_t first = 0; first < element.properties.size();)
                first += prepareColumns(element, first);
        }

        void preparePositions(PlyElement& element)
        {
            int axisCount = 0;
            for (PlyProperty& property : element.properties) {
                if (property.lengthType || (property.name != "x" && property.name != "y" && property.name != "z"))
                    continue;
                property.use = Use::Position;
                property.axis = property.name[0] - 'x';
                ++axisCount;
            }
            if (axisCount != 3 && element.count != 0)
                in_.refuse("points lack x, y or z");
        }

        void prepareIndices(PlyElement& element)
        {
            bool found = false;
            for (PlyProperty& property : element.properties) {
                if (property.name != "vertex_indices" && property.name != "vertex_index")
                    continue;
                if (found || !property.lengthType || !isWhole(property.type))
                    in_.refuse("the point indices of faces are not one list of whole numbers");
                property.use = Use::Indices;
                found = true;
            }
            if (!found && element.count != 0)
                in_.refuse("faces have no list \"vertex_indices\"");
        }

        /// Prepares one column, or several columns that form one property. \return their number
        std::size_t prepareColumns(PlyElement& element, std::size_t first)
        {
            PlyProperty* const property = &element.properties[first];
            if (property->use != Use::Nothing)
                return 1;
            if (property->lengthType) {
                property->use = Use::List;
                return 1;
            }
            for (PlyColumns const& columns : kPlyColumns) {
                std::string names;
                std::size_t const last = std::min(element.properties.size(), first + columns.components);
                for (PlyProperty* p = property; p != element.properties.data() + last; ++p) {
                    if (p->type == property->type && !p->lengthType)
                        names += (names.empty() ? "" : " ") + p->name;
                }
                if (names == columns.names && addColumns(element, columns.property, first, columns.components, names))
                    return columns.components;
            }
            addColumns(element, property->name, first, 1, {});
            return 1;
        }

        bool addColumns(PlyElement& element, std::string_view name, std::size_t first, unsigned int count,
            std::string const& columnNames)
        {
            auto const preferred = std::find_if(std::begin(kPlyColumns), std::end(kPlyColumns),
                [&](PlyColumns const& columns) { return columns.property == name && columns.components == count; });
            bool const isPreferred = preferred != std::end(kPlyColumns) && preferred->names == columnNames;
            return withPlyScalar(element.properties[first].type, [&]<class T>(std::type_identity<T>) {
                auto const target = builder_.addProperty<T>(
                    std::string(name), componentOf(element), count, element.count, isPreferred ? "" : columnNames);
                for (std::size_t i = 0; target && i < count; ++i) {
                    PlyProperty& property = element.properties[first + i];
                    property.use = Use::Value;
                    property.target =
                        element.count == 0 ? nullptr : target->data + i * sizeof(T); // no values, no array
                    property.stride = target->elementBytes;
                }
                return target.has_value();
            });
        }

        void joinLists(TextParts<PlyPart> const& parts, std::size_t element, std::size_t property)
        {
            PlyProperty& whole = header_.elements[element].properties[property];
            auto const join = [&](auto PlyProperty::*array) {
                whole.*array = joinedArray(
                    parts.pointers(), [=](PlyPart & part) -> auto& {
                        return part.elements[element].properties[property].*array;
                    });
            };
            join(&PlyProperty::lengths);
            join(&PlyProperty::values);
        }

        void addLists(PlyElement const& element)
        {
            for (PlyProperty const& property : element.properties) {
                if (property.use != Use::List || element.count == 0)
                    continue;
                bool const isAdded = withPlyScalar(property.type, [&]<class T>(std::type_identity<T>) {
                    return addCornerTextures<T>(element, property) || addVectors<T>(element, property);
                });
                if (!isAdded)
                    builder_.note("the lists \"" + property.name + "\" of elements \"" + element.name
                        + "\" are left out: their lengths differ, or no vector is that long");
            }
        }

        template <class T> bool addCornerTextures(PlyElement const& element, PlyProperty const& property)
        {
            if (element.name != "face" || property.name != kPlyCornerTextures || isWhole(property.type))
                return false;
            Orvan::Array<unsigned int> const& offset = builder_.faceOffset();
            for (std::uint64_t face = 0; face < (property.equalLists ? 1 : element.count); ++face) {
                if (lengthOf(property, face) != 2 * (offset[face + 1] - offset[face]))
                    return false;
            }
            return copyLists<T>("uv", sFaceVertexComp, 2, builder_.cornerCount(), property);
        }

        template <class T> bool addVectors(PlyElement const& element, PlyProperty const& property)
        {
            unsigned int const length = lengthOf(property, 0);
            bool const differ = std::any_of(
                property.lengths.begin(), property.lengths.end(), [=](unsigned int other) { return other != length; });
            return !differ && copyLists<T>(property.name, componentOf(element), length, element.count, property);
        }

        static unsigned int lengthOf(PlyProperty const& property, std::uint64_t element)
        {
            return property.equalLists ? property.equalLists->length : property.lengths[element];
        }

        template <class T> bool copyLists(std::string const& name, char const* component, std::uint64_t components,
            std::uint64_t count, PlyProperty const& property)
        {
            auto const target = builder_.addProperty<T>(name, component, components, count);
            if (target && property.equalLists)
                copyEqualLists(property, file_, target->data);
            else if (target)
                std::copy(property.values.begin(), property.values.end(), target->data);
            return target.has_value();
        }

        PlyHeader& header_;
        InputFile const& file_;
        In& in_;
        GeometryBuilder builder_;
    };

    /// Whether the part of the file that has been loaded reaches beyond the header.
    bool isHeaderLoaded(InputFile const& file)
    {
        std::size_t const loaded = std::min(file.size, InputFile::kBeginningBytes);
        std::string_view const beginning(file.bytes.get(), loaded);
        std::size_t const end = beginning.find("\nend_header");
        return end != std::string_view::npos && beginning.find('\n', end + 1) != std::string_view::npos;
    }

}

GeometryFile readPly(InputFile const& file, ReadOptions const& options)
{
    return readPly(file, options, PlyPath::Fastest, kTextPartBytes);
}

GeometryFile readPly(InputFile const& file, ReadOptions const& options, PlyPath path, std::size_t partBytes)
{
    if (!isHeaderLoaded(file))
        file.load();
    TextScanner text(file, 0, TextScanner::Syntax::Plain);
    PlyHeader header = readPlyHeader(text);
    if (header.encoding == PlyEncoding::Text) {
        file.load();
        PlyReader reader(header, file, text, options);
        return reader.read("PLY (ascii)", [&] { reader.readLines(partBytes); });
    }
    bool const isLittle = header.encoding == PlyEncoding::LittleEndian;
    BinaryScanner binary(file, text.position(), isLittle != (std::endian::native == std::endian::little));
    PlyReader reader(header, file, binary, options);
    return reader.read(
        isLittle ? "PLY (binary, little endian)" : "PLY (binary, big endian)", [&] { reader.readRecords(path); });
}

}
