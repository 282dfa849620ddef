#include "PlyColumns.h"
#include "Readers.h"

#include <TessaraGeometry/Names.h>

#include <bit>
#include <map>

namespace ModelingProgram {

using namespace Tessara::Geometry;

namespace {

    enum class Scalar { Char, UChar, Short, UShort, Int, UInt, Float, Double };

    template <class Visit> decltype(auto) withScalar(Scalar scalar, Visit&& visit)
    {
        switch (scalar) {
        case Scalar::Char:
            return visit(std::type_identity<signed char>());
        case Scalar::UChar:
            return visit(std::type_identity<unsigned char>());
        case Scalar::Short:
            return visit(std::type_identity<short>());
        case Scalar::UShort:
            return visit(std::type_identity<unsigned short>());
        case Scalar::Int:
            return visit(std::type_identity<int>());
        case Scalar::UInt:
            return visit(std::type_identity<unsigned int>());
        case Scalar::Float:
            return visit(std::type_identity<float>());
        case Scalar::Double:
            break;
        }
        return visit(std::type_identity<double>());
    }

    std::size_t sizeOf(Scalar scalar)
    {
        return withScalar(scalar, []<class T>(std::type_identity<T>) { return sizeof(T); });
    }

    bool isWhole(Scalar scalar)
    {
        return scalar != Scalar::Float && scalar != Scalar::Double;
    }

    struct Property {
        std::string name;
        Scalar type = Scalar::Int;
        std::optional<Scalar> lengthType; // of a list

        // Where the values are stored.
        enum class Use { Nothing, Position, Value, Indices, List } use = Use::Nothing;
        int axis = 0; // of a position
        std::byte* target = nullptr; // of the next value
        std::size_t stride = 0;
        Orvan::Array<unsigned int> lengths; // of lists; one entry per element
        std::vector<std::byte> values; // of all lists
    };

    struct Element {
        std::string name;
        std::uint64_t count;
        std::vector<Property> properties;
    };

    enum class Encoding { Text, LittleEndian, BigEndian };

    struct Header {
        Encoding encoding = Encoding::Text;
        std::vector<Element> elements;
        std::vector<std::string> textureFiles; // that comments name
    };

    class HeaderReader {
    public:
        explicit HeaderReader(TextScanner& scanner)
            : in_(scanner)
        {
        }

        Header read()
        {
            if (in_.word() != "ply")
                in_.refuse("the file does not begin with \"ply\"");
            in_.nextLine();
            while (readLine()) { }
            for (Element const& element : header_.elements)
                in_.requirePossible(element.count, ("elements \"" + element.name + "\"").c_str(), leastBytes(element));
            return std::move(header_);
        }

    private:
        bool readLine()
        {
            if (in_.atEnd())
                in_.refuse("the file is cut off: its header has no \"end_header\"");
            if (++lineCount_ > kMostLines)
                in_.refuse("the header has more than " + std::to_string(kMostLines) + " lines");
            std::string_view const keyword = in_.word();
            if (keyword == "comment" || keyword == "obj_info") {
                if (in_.word() == "TextureFile")
                    header_.textureFiles.emplace_back(in_.restOfLine());
                in_.nextLine();
                return true;
            }
            if (keyword == "format")
                readFormat();
            else if (keyword == "element")
                readElement();
            else if (keyword == "property")
                readProperty();
            else if (!keyword.empty() && keyword != "end_header")
                in_.refuse(TextScanner::quoted(keyword) + " is not known in a header");
            in_.expectLineEnd();
            return keyword != "end_header";
        }

        void readFormat()
        {
            static std::map<std::string_view, Encoding> const encodings{{"ascii", Encoding::Text},
                {"binary_little_endian", Encoding::LittleEndian}, {"binary_big_endian", Encoding::BigEndian}};
            std::string_view const name = in_.word();
            auto const encoding = encodings.find(name);
            if (encoding == encodings.end() || in_.word() != "1.0")
                in_.refuse("the format " + TextScanner::quoted(name) + " is not known, or not of version 1.0");
            header_.encoding = encoding->second;
        }

        void readElement()
        {
            std::string const name(in_.word());
            for (Element const& element : header_.elements) {
                if (element.name == name)
                    in_.refuse("the element " + TextScanner::quoted(name) + " is declared twice");
            }
            header_.elements.push_back({name, in_.number<std::uint64_t>("the number of elements"), {}});
        }

        void readProperty()
        {
            if (header_.elements.empty())
                in_.refuse("a property comes before the first element");
            Property property;
            if (in_.peekWord() == "list") {
                in_.word();
                property.lengthType = readType();
                if (!isWhole(*property.lengthType))
                    in_.refuse("the length of a list is not a whole number");
            }
            property.type = readType();
            property.name = in_.word();
            if (property.name.empty())
                in_.refuse("a property has no name");
            for (Property const& other : header_.elements.back().properties) {
                if (other.name == property.name)
                    in_.refuse("the property " + TextScanner::quoted(property.name) + " is declared twice");
            }
            header_.elements.back().properties.push_back(std::move(property));
        }

        Scalar readType()
        {
            static std::map<std::string_view, Scalar> const types{{"char", Scalar::Char}, {"int8", Scalar::Char},
                {"uchar", Scalar::UChar}, {"uint8", Scalar::UChar}, {"short", Scalar::Short}, {"int16", Scalar::Short},
                {"ushort", Scalar::UShort}, {"uint16", Scalar::UShort}, {"int", Scalar::Int}, {"int32", Scalar::Int},
                {"uint", Scalar::UInt}, {"uint32", Scalar::UInt}, {"float", Scalar::Float}, {"float32", Scalar::Float},
                {"double", Scalar::Double}, {"float64", Scalar::Double}};
            std::string_view const name = in_.word();
            auto const type = types.find(name);
            if (type == types.end())
                in_.refuse("the type " + TextScanner::quoted(name) + " is not known");
            return type->second;
        }

        /// The minimum size of an element in the file: a digit and a blank per number, or the length of an empty list.
        std::size_t leastBytes(Element const& element) const
        {
            std::size_t bytes = 0;
            for (Property const& property : element.properties)
                bytes += header_.encoding == Encoding::Text ? 2 : sizeOf(property.lengthType.value_or(property.type));
            return bytes;
        }

        static constexpr int kMostLines = 10'000; // each name is compared with all names before it

        TextScanner& in_;
        Header header_;
        int lineCount_ = 0;
    };

    /// Reads the elements after a header, with a scanner for their encoding.
    template <class In> class PlyReader {
    public:
        PlyReader(Header& header, In& in, ReadOptions const& options)
            : header_(header)
            , in_(in)
            , builder_(in, options)
        {
        }

        GeometryFile read(char const* format)
        {
            for (std::string const& file : header_.textureFiles)
                builder_.note("the name of the texture file " + TextScanner::quoted(file) + " is left out");
            for (Element& element : header_.elements)
                prepare(element);
            for (Element& element : header_.elements) {
                for (std::uint64_t index = 0; index < (element.properties.empty() ? 0 : element.count); ++index)
                    readElement(element, index);
            }
            if constexpr (kIsText)
                in_.skipEmptyLines();
            builder_.noteBytesLeft();
            for (Element& element : header_.elements)
                addLists(element);
            return std::move(builder_).finish(format);
        }

    private:
        static constexpr bool kIsText = std::is_same_v<In, TextScanner>;
        using Use = Property::Use;

        static char const* componentOf(Element const& element)
        {
            return element.name == "vertex" ? sPointComp : element.name == "face" ? sFaceComp : nullptr;
        }

        void prepare(Element& element)
        {
            in_.beginElement(element.name.c_str(), 0);
            if (element.name == "vertex") {
                preparePositions(element);
                builder_.expectPoints(element.count);
            } else if (element.name == "face") {
                prepareIndices(element);
                builder_.expectFaces(element.count);
            } else {
                builder_.note(
                    "the elements \"" + element.name + "\" are left out (" + std::to_string(element.count) + ")");
                return;
            }
            for (std::size_t first = 0; first < element.properties.size();)
                first += prepareColumns(element, first);
        }

        void preparePositions(Element& element)
        {
            int axisCount = 0;
            for (Property& property : element.properties) {
                if (property.lengthType || (property.name != "x" && property.name != "y" && property.name != "z"))
                    continue;
                property.use = Use::Position;
                property.axis = property.name[0] - 'x';
                ++axisCount;
            }
            if (axisCount != 3 && element.count != 0)
                in_.refuse("points lack x, y or z");
        }

        void prepareIndices(Element& element)
        {
            bool found = false;
            for (Property& property : element.properties) {
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
        std::size_t prepareColumns(Element& element, std::size_t first)
        {
            Property* const property = &element.properties[first];
            if (property->use != Use::Nothing)
                return 1;
            if (property->lengthType) {
                property->use = Use::List;
                return 1;
            }
            for (PlyColumns const& columns : kPlyColumns) {
                std::string names;
                std::size_t const last = std::min(element.properties.size(), first + columns.components);
                for (Property* p = property; p != element.properties.data() + last; ++p) {
                    if (p->type == property->type && !p->lengthType)
                        names += (names.empty() ? "" : " ") + p->name;
                }
                if (names == columns.names && addColumns(element, columns.property, first, columns.components, names))
                    return columns.components;
            }
            addColumns(element, property->name, first, 1, {});
            return 1;
        }

        bool addColumns(Element& element, std::string_view name, std::size_t first, unsigned int count,
            std::string const& columnNames)
        {
            auto const preferred = std::find_if(std::begin(kPlyColumns), std::end(kPlyColumns),
                [&](PlyColumns const& columns) { return columns.property == name && columns.components == count; });
            bool const isPreferred = preferred != std::end(kPlyColumns) && preferred->names == columnNames;
            return withScalar(element.properties[first].type, [&]<class T>(std::type_identity<T>) {
                auto const target = builder_.addProperty<T>(
                    std::string(name), componentOf(element), count, element.count, isPreferred ? "" : columnNames);
                for (std::size_t i = 0; target && i < count; ++i) {
                    Property& property = element.properties[first + i];
                    property.use = Use::Value;
                    property.target = target->data + i * sizeof(T);
                    property.stride = target->elementBytes;
                }
                return target.has_value();
            });
        }

        void readElement(Element& element, std::uint64_t index)
        {
            in_.beginElement(element.name.c_str(), index);
            for (Property& property : element.properties) {
                withScalar(property.type, [&]<class T>(std::type_identity<T>) {
                    if (property.lengthType)
                        readList<T>(property);
                    else
                        readValue<T>(property);
                });
            }
            if (element.name == "vertex")
                builder_.addPoint(position_[0], position_[1], position_[2]);
            else if (element.name == "face")
                builder_.endFace();
            in_.endElement();
        }

        template <class T> void readValue(Property& property)
        {
            if constexpr (kIsText && std::is_floating_point_v<T>) {
                if (property.use == Use::Position) {
                    position_[property.axis] = in_.coordinate(property.name.c_str());
                    return;
                }
            }
            T const value = in_.template number<T>(property.name.c_str());
            if (property.use == Use::Position) {
                // Beyond the range of float it becomes infinite, which the builder refuses or leaves out.
                position_[property.axis] = coordinateOf(value);
            } else if (property.use == Use::Value) {
                std::memcpy(property.target, &value, sizeof(T));
                property.target += property.stride;
            }
        }

        template <class T> void readList(Property& property)
        {
            std::uint64_t const length = readLength(property);
            in_.requirePossible(length, "values of a list", kIsText ? 2 : sizeof(T));
            if (property.use == Use::List)
                property.lengths.append(static_cast<unsigned int>(length));
            for (std::uint64_t i = 0; i < length; ++i) {
                T const value = in_.template number<T>(property.name.c_str());
                if constexpr (std::is_integral_v<T>) {
                    if (property.use == Use::Indices)
                        builder_.addCorner(value);
                }
                if (property.use == Use::List) {
                    auto const* const bytes = reinterpret_cast<std::byte const*>(&value);
                    property.values.insert(property.values.end(), bytes, bytes + sizeof(T));
                }
            }
        }

        std::uint64_t readLength(Property const& property)
        {
            return withScalar(*property.lengthType, [&]<class T>(std::type_identity<T>) {
                T const length = in_.template number<T>(property.name.c_str());
                if (length < 0)
                    in_.refuse("the list " + TextScanner::quoted(property.name) + " has a negative length");
                return static_cast<std::uint64_t>(length);
            });
        }

        void addLists(Element const& element)
        {
            for (Property const& property : element.properties) {
                if (property.use != Use::List || element.count == 0)
                    continue;
                bool const isAdded = withScalar(property.type, [&]<class T>(std::type_identity<T>) {
                    return addCornerTextures<T>(element, property) || addVectors<T>(element, property);
                });
                if (!isAdded)
                    builder_.note("the lists \"" + property.name + "\" of elements \"" + element.name
                        + "\" are left out: their lengths differ, or no vector is that long");
            }
        }

        template <class T> bool addCornerTextures(Element const& element, Property const& property)
        {
            if (element.name != "face" || property.name != kPlyCornerTextures || isWhole(property.type))
                return false;
            Orvan::Array<unsigned int> const& offset = builder_.faceOffset();
            for (std::uint64_t face = 0; face < element.count; ++face) {
                if (property.lengths[face] != 2 * (offset[face + 1] - offset[face]))
                    return false;
            }
            return copyLists<T>("uv", sFaceVertexComp, 2, builder_.cornerCount(), property);
        }

        template <class T> bool addVectors(Element const& element, Property const& property)
        {
            unsigned int const length = property.lengths[0];
            bool const differ = std::any_of(
                property.lengths.begin(), property.lengths.end(), [=](unsigned int other) { return other != length; });
            return !differ && copyLists<T>(property.name, componentOf(element), length, element.count, property);
        }

        template <class T> bool copyLists(std::string const& name, char const* component, std::uint64_t components,
            std::uint64_t count, Property const& property)
        {
            auto const target = builder_.addProperty<T>(name, component, components, count);
            if (target)
                std::memcpy(target->data, property.values.data(), property.values.size());
            return target.has_value();
        }

        Header& header_;
        In& in_;
        GeometryBuilder builder_;
        Coordinate position_[3] = {};
    };

}

GeometryFile readPly(InputFile const& file, ReadOptions const& options)
{
    TextScanner text(file, 0, TextScanner::Syntax::Plain);
    Header header = HeaderReader(text).read();
    if (header.encoding == Encoding::Text)
        return PlyReader(header, text, options).read("PLY (ascii)");
    bool const isLittle = header.encoding == Encoding::LittleEndian;
    BinaryScanner binary(file, text.position(), isLittle != (std::endian::native == std::endian::little));
    return PlyReader(header, binary, options)
        .read(isLittle ? "PLY (binary, little endian)" : "PLY (binary, big endian)");
}

}
