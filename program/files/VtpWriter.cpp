#include "Writers.h"

#include <bit>
#include <functional>
#include <optional>
#include <sstream>

namespace ModelingProgram {

using namespace Tessara::Geometry;

namespace {

    static_assert(std::endian::native == std::endian::little, "numbers are written with the byte order of memory");

    template <class T> std::string vtkType()
    {
        std::string const bits = std::to_string(8 * sizeof(T));
        if constexpr (std::is_floating_point_v<T>)
            return "Float" + bits;
        else
            return (std::is_signed_v<T> ? "Int" : "UInt") + bits;
    }

    std::string escaped(std::string_view text)
    {
        std::string result;
        for (char const c : validUtf8(text)) {
            bool const isControl = static_cast<unsigned char>(c) < ' ';
            if (isControl && c != '\t' && c != '\n' && c != '\r')
                result += '?'; // XML cannot represent it
            else if (isControl || c == '&' || c == '<' || c == '>' || c == '"')
                result += "&#" + std::to_string(static_cast<unsigned char>(c)) + ";";
            else
                result += c;
        }
        return result;
    }

    /// The file is XML that states the offset of each array in the raw data at its end. The arrays are declared first,
    /// then written in the same order.
    class VtpWriter {
    public:
        explicit VtpWriter(WritableGeometry& geometry)
            : geometry_(geometry)
        {
        }

        void write(std::filesystem::path const& file)
        {
            declare();
            OutputFile out(file, geometry_.existing);
            out << xml_.str() << "  <AppendedData encoding=\"raw\">\n_";
            for (Block const& block : blocks_) {
                out.writeBinary<std::uint64_t>(block.bytes);
                block.write(out);
            }
            out << "\n  </AppendedData>\n</VTKFile>\n";
            out.commit();
        }

    private:
        struct Block {
            std::uint64_t bytes;
            std::function<void(OutputFile&)> write;
        };

        void declare()
        {
            WritableGeometry::Kind const kind = geometry_.kind;
            std::uint64_t const pointCount = geometry_.pointCount();
            std::uint64_t const cellCount = geometry_.cellCount();
            bool const isCloud = kind == WritableGeometry::Kind::PointCloud;
            xml_ << "<?xml version=\"1.0\"?>\n";
            if (!geometry_.remark.empty())
                xml_ << "<!-- " << geometry_.remark << " -->\n";
            xml_ << "<VTKFile type=\"PolyData\" version=\"1.0\" byte_order=\"LittleEndian\""
                    " header_type=\"UInt64\">\n  <PolyData>\n    <Piece NumberOfPoints=\""
                 << pointCount << "\" NumberOfVerts=\"" << (isCloud ? pointCount : 0) << "\" NumberOfLines=\""
                 << (kind == WritableGeometry::Kind::Strands ? cellCount : 0)
                 << "\" NumberOfStrips=\"0\" NumberOfPolys=\"" << (kind == WritableGeometry::Kind::Mesh ? cellCount : 0)
                 << "\">\n";
            declareAttributes("PointData", sPointComp);
            declareAttributes("CellData", kind == WritableGeometry::Kind::Mesh ? sFaceComp : sStrandComp);
            for (Attribute const& attribute : geometry_.attributes) {
                if (attribute.component == sFaceVertexComp)
                    leaveOut(
                        attribute, "VTP files can hold only values of points, faces and strands", geometry_.leftOut);
            }
            xml_ << "      <Points>\n";
            declareArray("Float32", "Points", 3, *geometry_.positions);
            xml_ << "      </Points>\n";
            declareCells();
            xml_ << "    </Piece>\n  </PolyData>\n";
        }

        void declareAttributes(char const* section, char const* component)
        {
            xml_ << "      <" << section << ">\n";
            for (Attribute const& attribute : geometry_.attributes) {
                if (attribute.component != component)
                    continue;
                visitArray(attribute.values, [&](auto const& array, auto elementType) {
                    using Layout = ElementLayout<typename decltype(elementType)::Type>;
                    if constexpr (Layout::components != 0)
                        declareArray(vtkType<typename Layout::Scalar>(), attribute.name, Layout::components, array);
                    else
                        leaveOut(attribute, "VTP files have no such type", geometry_.leftOut);
                });
            }
            xml_ << "      </" << section << ">\n";
        }

        /// Strands are lines. Each point of a cloud is a cell, because viewers show only cells.
        void declareCells()
        {
            struct Section {
                char const* name;
                WritableGeometry::Kind kind;
            };
            for (Section const section : {Section{"Verts", WritableGeometry::Kind::PointCloud},
                     Section{"Lines", WritableGeometry::Kind::Strands},
                     Section{"Polys", WritableGeometry::Kind::Mesh}}) {
                if (section.kind != geometry_.kind)
                    continue;
                xml_ << "      <" << section.name << ">\n";
                if (section.kind == WritableGeometry::Kind::PointCloud)
                    declareCellArrays(
                        geometry_.pointCount(), geometry_.pointCount(), [](auto i) { return i; },
                        [](auto i) { return i + 1; });
                else
                    declareCellsOf(*geometry_.offsets);
                xml_ << "      </" << section.name << ">\n";
            }
        }

        /// The offsets in the file have no entry before the first cell, which therefore begins at the first point or
        /// corner listed. Points before the first strand are not listed.
        void declareCellsOf(Orvan::Array<unsigned int> const& offsets)
        {
            std::uint64_t const first = offsets[0], last = offsets[offsets.size - 1];
            declareCellArrays(
                last - first, geometry_.cellCount(),
                [this, first](
                    std::uint64_t i) { return geometry_.faceVertex ? (*geometry_.faceVertex)[first + i] : first + i; },
                [&offsets, first](std::uint64_t cell) { return offsets[cell + 1] - first; });
        }

        template <class Point, class End> void declareCellArrays(
            std::uint64_t pointCount, std::uint64_t cellCount, Point const& pointAt, End const& endOf)
        {
            declareNumbers("connectivity", pointCount, pointAt);
            declareNumbers("offsets", cellCount, endOf);
        }

        template <class T>
        void declareArray(std::string const& type, std::string const& name, unsigned int components, T const& array)
        {
            std::uint64_t const bytes = array.size * sizeof(array.data[0]);
            declareBlock(
                type, name, components, bytes, [&array, bytes](OutputFile& out) { out.write(array.data, bytes); });
        }

        /// As Int64, the only index type that all versions of VTK read.
        template <class Number> void declareNumbers(std::string const& name, std::uint64_t count, Number const& number)
        {
            declareBlock("Int64", name, 1, count * sizeof(std::int64_t), [=](OutputFile& out) {
                for (std::uint64_t i = 0; i < count; ++i)
                    out.writeBinary(static_cast<std::int64_t>(number(i)));
            });
        }

        void declareBlock(std::string const& type, std::string const& name, unsigned int components,
            std::uint64_t bytes, std::function<void(OutputFile&)> write)
        {
            xml_ << "        <DataArray type=\"" << type << "\" Name=\"" << escaped(name) << "\" NumberOfComponents=\""
                 << components << "\" format=\"appended\" offset=\"" << offset_ << "\"/>\n";
            offset_ += sizeof(std::uint64_t) + bytes;
            blocks_.push_back({bytes, std::move(write)});
        }

        WritableGeometry& geometry_;
        std::ostringstream xml_;
        std::vector<Block> blocks_;
        std::uint64_t offset_ = 0;
    };

}

void writeVtp(WritableGeometry& geometry, std::filesystem::path const& file)
{
    VtpWriter(geometry).write(file);
}

}
