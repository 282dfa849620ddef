#include "PlyColumns.h"
#include "PlyHeader.h"
#include "PlyRecords.h"
#include "Readers.h"

#include <TessaraGeometry/Names.h>

#include <bit>

namespace ModelingProgram {

using namespace Tessara::Geometry;

namespace {

    /// Reads the elements after a header, with a scanner for their encoding.
    template <class In> class PlyReader {
    public:
        PlyReader(PlyHeader& header, InputFile const& file, In& in, ReadOptions const& options, PlyPath path)
            : header_(header)
            , file_(file)
            , in_(in)
            , path_(path)
            , builder_(in, options)
        {
        }

        GeometryFile read(char const* format)
        {
            for (std::string const& file : header_.textureFiles)
                builder_.note("the name of the texture file " + TextScanner::quoted(file) + " is left out");
            for (PlyElement& element : header_.elements)
                prepare(element);
            for (PlyElement& element : header_.elements)
                if (!element.properties.empty())
                    readElements(element);
            if constexpr (kIsText)
                in_.skipEmptyLines();
            builder_.noteBytesLeft();
            for (PlyElement& element : header_.elements)
                addLists(element);
            return std::move(builder_).finish(format);
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
                    property.target = target->data + i * sizeof(T);
                    property.stride = target->elementBytes;
                }
                return target.has_value();
            });
        }

        void readElements(PlyElement& element)
        {
            if constexpr (!kIsText) {
                if (path_ == PlyPath::Fastest) {
                    std::size_t const begin = in_.position();
                    if (auto const end = readPlyRecords(element, begin, in_.swapsBytes(), file_, builder_)) {
                        in_.skip(*end - begin);
                        return;
                    }
                }
            }
            file_.load();
            for (std::uint64_t index = 0; index < element.count; ++index)
                readElement(element, index);
        }

        void readElement(PlyElement& element, std::uint64_t index)
        {
            in_.beginElement(element.name.c_str(), index);
            for (PlyProperty& property : element.properties) {
                withPlyScalar(property.type, [&]<class T>(std::type_identity<T>) {
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

        template <class T> void readValue(PlyProperty& property)
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

        template <class T> void readList(PlyProperty& property)
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

        std::uint64_t readLength(PlyProperty const& property)
        {
            return withPlyScalar(*property.lengthType, [&]<class T>(std::type_identity<T>) {
                T const length = in_.template number<T>(property.name.c_str());
                if (length < 0)
                    in_.refuse("the list " + TextScanner::quoted(property.name) + " has a negative length");
                return static_cast<std::uint64_t>(length);
            });
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
                std::memcpy(target->data, property.values.data(), property.values.size());
            return target.has_value();
        }

        PlyHeader& header_;
        InputFile const& file_;
        In& in_;
        PlyPath path_;
        GeometryBuilder builder_;
        Coordinate position_[3] = {};
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
    return readPly(file, options, PlyPath::Fastest);
}

GeometryFile readPly(InputFile const& file, ReadOptions const& options, PlyPath path)
{
    if (!isHeaderLoaded(file))
        file.load();
    TextScanner text(file, 0, TextScanner::Syntax::Plain);
    PlyHeader header = readPlyHeader(text);
    if (header.encoding == PlyEncoding::Text) {
        file.load();
        return PlyReader(header, file, text, options, path).read("PLY (ascii)");
    }
    bool const isLittle = header.encoding == PlyEncoding::LittleEndian;
    BinaryScanner binary(file, text.position(), isLittle != (std::endian::native == std::endian::little));
    return PlyReader(header, file, binary, options, path)
        .read(isLittle ? "PLY (binary, little endian)" : "PLY (binary, big endian)");
}

}
