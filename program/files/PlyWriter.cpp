#include "OutputBlocks.h"
#include "PlyColumns.h"
#include "Writers.h"
#include "copyStrided.h"

#include <algorithm>
#include <bit>
#include <iterator>
#include <limits>
#include <optional>
#include <set>
#include <sstream>

namespace ModelingProgram {

using namespace Tessara::Geometry;
using Tessara::Math::float3;

namespace {

    static_assert(std::endian::native == std::endian::little, "numbers are written with the byte order of memory");

    std::string typeName(auto elementType)
    {
        using Layout = ElementLayout<typename decltype(elementType)::Type>;
        if constexpr (Layout::components == 0)
            return {};
        else if constexpr (std::is_same_v<typename Layout::Scalar, bool>)
            return "uchar";
        else if constexpr (sizeof(typename Layout::Scalar) == 8 && !std::is_same_v<typename Layout::Scalar, double>)
            return {};
        else
            return elementTypeName<typename Layout::Scalar>();
    }

    /// The values of an attribute as written to the file, with a fixed number of bytes per element.
    struct Values {
        std::byte const* data;
        std::size_t bytes;
        std::string type; // of a scalar; empty if PLY has no such type
        unsigned int components;
        bool isAmbiguous; // a reader would choose another type with as many scalars
    };

    Values valuesOf(Attribute const& attribute)
    {
        Values result{};
        visitArray(attribute.values, [&](auto const& array, auto elementType) {
            using T = typename decltype(elementType)::Type;
            using Layout = ElementLayout<T>;
            result = {reinterpret_cast<std::byte const*>(array.data), sizeof(T), typeName(elementType),
                Layout::components, false};
            if constexpr (Layout::components != 0)
                visitElementTypeOf<typename Layout::Scalar>(Layout::components,
                    [&]<class First>(ElementType<First>) { result.isAmbiguous = !std::is_same_v<First, T>; });
        });
        return result;
    }

    std::vector<std::string> wordsOf(std::string_view text)
    {
        std::istringstream stream{std::string(text)};
        return {std::istream_iterator<std::string>(stream), {}};
    }

    /// The values of one property, and whether they are written as one list or as a column per component.
    struct Column {
        Values values;
        bool isList;
    };

    class PlyWriter {
    public:
        PlyWriter(WritableGeometry& geometry, std::filesystem::path const& file)
            : geometry_(geometry)
            , file_(file)
        {
        }

        void write()
        {
            if (geometry_.kind == WritableGeometry::Kind::Strands && !geometry_.isEmpty())
                throw FileError(
                    file_.string() + " cannot be written: PLY files cannot hold strands; OBJ and VTP files can");
            std::ostringstream header;
            header << "ply\nformat binary_little_endian 1.0\n";
            if (!geometry_.remark.empty())
                header << "comment " << geometry_.remark << "\n";
            header << "element vertex " << geometry_.pointCount()
                   << "\nproperty float x\nproperty float y\nproperty float z\n";
            std::vector<Column> const pointColumns = chooseColumns(sPointComp, {"x", "y", "z"}, header);
            std::vector<Column> faceColumns;
            if (geometry_.kind == WritableGeometry::Kind::Mesh)
                faceColumns = declareFaces(header);
            for (Attribute const& attribute : geometry_.attributes)
                leaveOutOthers(attribute);
            header << "end_header\n";

            OutputFile out(file_, geometry_.existing);
            out << header.str();
            writePoints(pointColumns, out);
            writeFaces(faceColumns, out);
            out.commit();
        }

    private:
        std::vector<Column> declareFaces(std::ostringstream& header)
        {
            Orvan::Array<unsigned int> const& offset = *geometry_.offsets;
            for (std::uint64_t face = 0; face + 1 < offset.size; ++face)
                mostCorners_ = std::max(mostCorners_, offset[face + 1] - offset[face]);
            // Most programs support no other index type than int.
            char const* const indexType =
                geometry_.pointCount() > std::numeric_limits<std::int32_t>::max() ? "uint" : "int";
            header << "element face " << geometry_.cellCount() << "\nproperty list " << lengthType(mostCorners_) << " "
                   << indexType << " vertex_indices\n";
            for (Attribute const& attribute : geometry_.attributes) {
                Values const values = valuesOf(attribute);
                if (attribute.component == sFaceVertexComp && attribute.name == "uv" && values.components == 2
                    && (values.type == "float" || values.type == "double")) {
                    cornerTextures_ = values;
                    header << "property list " << lengthType(2 * mostCorners_) << " " << values.type << " "
                           << kPlyCornerTextures << "\n";
                }
            }
            return chooseColumns(
                sFaceComp, {"vertex_indices", "vertex_index", std::string(kPlyCornerTextures)}, header);
        }

        static char const* lengthType(unsigned int most) { return most > 255 ? "uint" : "uchar"; }

        std::vector<Column> chooseColumns(
            char const* component, std::set<std::string> taken, std::ostringstream& header)
        {
            std::vector<Column> columns;
            for (Attribute const& attribute : geometry_.attributes) {
                if (attribute.component != component)
                    continue;
                Values const values = valuesOf(attribute);
                std::vector<std::string> const names = columnNames(attribute, values);
                bool const isFree = std::none_of(
                    names.begin(), names.end(), [&](std::string const& name) { return taken.contains(name); });
                if (values.type.empty() || (values.isAmbiguous && names.size() == 1)) {
                    leaveOut(attribute, "PLY files have no such type", geometry_.leftOut);
                } else if (!isFree || wordsOf(attribute.name) != std::vector{attribute.name}) {
                    leaveOut(attribute, "PLY files cannot have a property with this name here", geometry_.leftOut);
                } else {
                    taken.insert(names.begin(), names.end());
                    bool const isList = names.size() != values.components;
                    for (std::string const& name : names)
                        header << "property " << (isList ? "list uchar " : "") << values.type << " " << name << "\n";
                    columns.push_back({values, isList});
                    noteBytesForBools(attribute);
                }
            }
            return columns;
        }

        /// A name for each component, or one for a list of them.
        static std::vector<std::string> columnNames(Attribute const& attribute, Values const& values)
        {
            std::vector<std::string> const own = wordsOf(attribute.columnNames);
            if (own.size() == values.components && values.components > 1)
                return own;
            for (PlyColumns const& columns : kPlyColumns) {
                if (columns.property == attribute.name && columns.components == values.components)
                    return wordsOf(columns.names);
            }
            return {attribute.name};
        }

        void noteBytesForBools(Attribute const& attribute)
        {
            if (visitAs<bool>(attribute.values, [](auto const&) {}))
                geometry_.leftOut.push_back(
                    "\"" + attribute.name + "\" is written as uchar, 0 or 1: PLY files have no bool");
        }

        void leaveOutOthers(Attribute const& attribute)
        {
            bool const isWritten = attribute.component == sPointComp || attribute.component == sFaceComp
                || (cornerTextures_ && attribute.component == sFaceVertexComp && attribute.name == "uv");
            if (!isWritten)
                leaveOut(
                    attribute, "PLY files can hold only texture coordinates (uv) of face corners", geometry_.leftOut);
        }

        static std::size_t lengthBytes(unsigned int most) { return most > 255 ? sizeof(unsigned int) : 1; }

        static std::size_t bytesOf(std::vector<Column> const& columns)
        {
            std::size_t bytes = 0;
            for (Column const& column : columns)
                bytes += column.values.bytes + (column.isList ? 1 : 0);
            return bytes;
        }

        void writePoints(std::vector<Column> const& columns, OutputFile& out) const
        {
            float3 const* const positions = geometry_.positions->data;
            std::size_t const bytes = sizeof(float3) + bytesOf(columns);
            writeInBlocks(
                geometry_.pointCount(), bytes,
                [&](std::uint64_t first, std::uint64_t end, OutputBuffer& block) {
                    char* const records = block.extend((end - first) * bytes);
                    copyStrided(positions + first, sizeof(float3), sizeof(float3), records, bytes, end - first);
                    fillColumns(columns, first, end, records + sizeof(float3), bytes);
                },
                out);
        }

        void writeFaces(std::vector<Column> const& columns, OutputFile& out) const
        {
            std::uint64_t const count = geometry_.cellCount();
            if (count == 0)
                return;
            unsigned int const* const offset = geometry_.offsets->data;
            std::size_t const fixed =
                lengthBytes(mostCorners_) + (cornerTextures_ ? lengthBytes(2 * mostCorners_) : 0) + bytesOf(columns);
            std::size_t const cornerBytes = sizeof(unsigned int) + (cornerTextures_ ? cornerTextures_->bytes : 0);
            bool const areEqual = std::uint64_t{mostCorners_} * count == offset[count];
            writeInBlocks(
                count, fixed + cornerBytes * offset[count] / count,
                [&](std::uint64_t first, std::uint64_t end, OutputBuffer& block) {
                    char* const records =
                        block.extend((end - first) * fixed + (offset[end] - offset[first]) * cornerBytes);
                    if (areEqual)
                        fillEqualFaces(columns, first, end, records, fixed + mostCorners_ * cornerBytes);
                    else
                        fillFaces(columns, first, end, records);
                },
                out);
        }

        /// Fills records of faces that all have the same number of corners.
        void fillEqualFaces(std::vector<Column> const& columns, std::uint64_t first, std::uint64_t end, char* records,
            std::size_t bytes) const
        {
            unsigned int const corners = mostCorners_;
            char* const at = fillLists(geometry_.faceVertex->data + first * corners, sizeof(unsigned int), corners,
                lengthBytes(corners), end - first, records, bytes);
            char* const next = !cornerTextures_
                ? at
                : fillLists(cornerTextures_->data + first * corners * cornerTextures_->bytes,
                    cornerTextures_->bytes / 2, 2 * corners, lengthBytes(2 * corners), end - first, at, bytes);
            fillColumns(columns, first, end, next, bytes);
        }

        /// Fills a list of the same length in each record. \return the end of the first one
        static char* fillLists(void const* values, std::size_t scalarBytes, unsigned int length,
            std::size_t lengthBytes, std::uint64_t count, char* at, std::size_t recordBytes)
        {
            copyStrided(&length, 0, lengthBytes, at, recordBytes, count); // little-endian: also its first byte
            std::size_t const listBytes = length * scalarBytes;
            copyStrided(values, listBytes, listBytes, at + lengthBytes, recordBytes, count);
            return at + lengthBytes + listBytes;
        }

        void fillFaces(std::vector<Column> const& columns, std::uint64_t first, std::uint64_t end, char* at) const
        {
            for (std::uint64_t face = first; face != end; ++face) {
                unsigned int const corner = (*geometry_.offsets)[face];
                unsigned int const count = (*geometry_.offsets)[face + 1] - corner;
                at = fillLists(geometry_.faceVertex->data + corner, sizeof(unsigned int), count,
                    lengthBytes(mostCorners_), 1, at, 0);
                if (cornerTextures_)
                    at = fillLists(cornerTextures_->data + corner * cornerTextures_->bytes, cornerTextures_->bytes / 2,
                        2 * count, lengthBytes(2 * mostCorners_), 1, at, 0);
                at = fillColumns(columns, face, face + 1, at, 0);
            }
        }

        /// \return the end of the columns in the first record
        static char* fillColumns(std::vector<Column> const& columns, std::uint64_t first, std::uint64_t end, char* at,
            std::size_t recordBytes)
        {
            for (Column const& column : columns) {
                if (column.isList) {
                    auto const length = static_cast<unsigned char>(column.values.components);
                    copyStrided(&length, 0, 1, at++, recordBytes, end - first);
                }
                std::size_t const bytes = column.values.bytes;
                copyStrided(column.values.data + first * bytes, bytes, bytes, at, recordBytes, end - first);
                at += bytes;
            }
            return at;
        }

        WritableGeometry& geometry_;
        std::filesystem::path const& file_;
        unsigned int mostCorners_ = 0;
        std::optional<Values> cornerTextures_;
    };

}

void writePly(WritableGeometry& geometry, std::filesystem::path const& file)
{
    PlyWriter(geometry, file).write();
}

}
