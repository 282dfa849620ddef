#include "OutputBlocks.h"
#include "Scanner.h"
#include "Welder.h"
#include "Writers.h"

#include <mutex>
#include <set>

namespace ModelingProgram {

using namespace Tessara::Geometry;
using namespace Tessara::Math;

namespace {

    /// Texture coordinates or normals: a list of vectors, and the number of one of them for each corner. If they belong
    /// to points, the list has one entry per point and `numbers` is empty.
    struct Vectors {
        Tessara::PropertyValue list;
        Orvan::Array<unsigned int> numbers;
        bool isOfPoints = false;

        explicit operator bool() const { return !list.empty(); }
        unsigned int numberOf(std::uint64_t corner, unsigned int point) const
        {
            return isOfPoints ? point : numbers[corner];
        }
    };

    /// A statement that names all faces after it.
    struct NameStatement {
        char const* keyword;
        FaceNames const* names = nullptr;
        unsigned int number = kInvalidIndex; // of the last face
        std::string_view text = {}; // its name; empty for none, as at the start of the file
    };

    bool isBlank(char c)
    {
        return c == ' ' || (c >= '\t' && c <= '\r');
    }

    /// A name as one line of the file that reads back as a single name: nothing in it ends the line, continues it, or
    /// begins a comment.
    std::string inOneLine(std::string_view text, bool keepsHashes)
    {
        std::string line(text);
        std::replace_if(
            line.begin(), line.end(),
            [=](char c) { return c == '\n' || c == '\r' || c == '\0' || (c == '#' && !keepsHashes); }, '_');
        line.erase(std::find_if_not(line.rbegin(), line.rend(), isBlank).base(), line.end());
        line.erase(line.begin(), std::find_if_not(line.begin(), line.end(), isBlank));
        if (line.starts_with('#'))
            line.front() = '_';
        if (line.ends_with('\\'))
            line.back() = '_';
        return line.empty() && !text.empty() ? "_" : line;
    }

    template <class T> OutputBuffer& writeComponents(T const& vector, OutputBuffer& out)
    {
        if constexpr (sizeof(vector) > 2 * sizeof(vector.x))
            return out << " " << vector.x << " " << vector.y << " " << vector.z;
        else
            return out << " " << vector.x << " " << vector.y;
    }

    // About how many bytes of text they take up.
    constexpr std::size_t kBytesPerVector = 36;
    constexpr std::size_t kBytesPerFace = 40;

    class ObjWriter {
    public:
        explicit ObjWriter(WritableGeometry& geometry)
            : geometry_(geometry)
        {
        }

        void write(std::filesystem::path const& file)
        {
            chooseAttributes();
            OutputFile out(file, geometry_.existing);
            if (!geometry_.remark.empty())
                out << "# " << geometry_.remark << "\n";
            writeLibraries(out);
            writePoints(out);
            writeVectors<float2, double2>("vt", textures_, out);
            writeVectors<float3, double3>("vn", normals_, out);
            if (geometry_.kind == WritableGeometry::Kind::Mesh)
                writeFaces(out);
            else if (geometry_.kind == WritableGeometry::Kind::Strands)
                writePolylines(out);
            if (!changedNames_.empty())
                geometry_.leftOut.push_back(countOf(changedNames_.size())
                    + " written with other characters or blanks, "
                      "because OBJ files cannot hold "
                    + TextScanner::quoted(*changedNames_.begin()));
            out.commit();
        }

    private:
        static std::string countOf(std::size_t names)
        {
            return names == 1 ? "1 name of faces is" : std::to_string(names) + " names of faces are";
        }

        /// Values of corners take precedence over those of points, because the format is designed for them.
        void chooseAttributes()
        {
            for (char const* const component : {sFaceVertexComp, sPointComp}) {
                for (Attribute const& attribute : geometry_.attributes) {
                    if (attribute.component == component && !isTaken(attribute))
                        leaveOut(attribute, "OBJ files cannot hold it", geometry_.leftOut);
                }
            }
            for (Attribute const& attribute : geometry_.attributes) {
                if (attribute.component != sFaceVertexComp && attribute.component != sPointComp
                    && !takeSmoothingGroups(attribute))
                    leaveOut(attribute, "OBJ files cannot hold it", geometry_.leftOut);
            }
            for (FaceNames const& names : geometry_.faceNames) {
                if (!takeNames(names))
                    leaveOut(names.data, "OBJ files cannot hold it", geometry_.leftOut);
            }
        }

        bool takeSmoothingGroups(Attribute const& attribute)
        {
            auto const* const groups = attribute.values.get<Orvan::Ptr<Orvan::Array<unsigned int>>>();
            if (!groups || attribute.name != "smoothing_group" || attribute.component != sFaceComp)
                return false;
            smoothingGroups_ = *groups;
            return true;
        }

        bool takeNames(FaceNames const& names)
        {
            if (names.name == "material_library") {
                libraries_ = &names;
                return true;
            }
            constexpr std::pair<char const*, std::string_view> kKeywords[] = {
                {"o", "object"}, {"g", "group"}, {"usemtl", "material"}};
            for (auto const& [keyword, name] : kKeywords) {
                if (names.name == name)
                    statements_.push_back({keyword, &names});
            }
            return !statements_.empty() && statements_.back().names == &names;
        }

        bool isTaken(Attribute const& attribute)
        {
            bool const isOfPoints = attribute.component == sPointComp;
            if (attribute.name == "color" && isOfPoints)
                return takeColors(attribute);
            if (attribute.name == "uv" && !textures_ && geometry_.kind == WritableGeometry::Kind::Mesh)
                return takeVectors<float2>(attribute, textures_) || takeVectors<double2>(attribute, textures_);
            if (attribute.name == "normal" && !normals_)
                return takeVectors<float3>(attribute, normals_) || takeVectors<double3>(attribute, normals_);
            return false;
        }

        bool takeColors(Attribute const& attribute)
        {
            colors_ = attribute.values;
            auto const isOf = [&]<class... T>(std::type_identity<T>...) {
                return (visitAs<T>(attribute.values, [](auto const&) {}) || ...);
            };
            if (isOf(std::type_identity<float3>()))
                return true;
            if (isOf(std::type_identity<uchar3>(), std::type_identity<uchar4>(), std::type_identity<float4>())) {
                geometry_.leftOut.push_back(
                    "\"color\" is written as three fractions per point: OBJ files have no bytes "
                    "there and no alpha");
                return true;
            }
            colors_ = {};
            return false;
        }

        template <class T> bool takeVectors(Attribute const& attribute, Vectors& vectors)
        {
            return visitAs<T>(attribute.values, [&](Orvan::Array<T> const& values) {
                vectors.isOfPoints = attribute.component == sPointComp;
                vectors.list = attribute.values;
                if (vectors.isOfPoints)
                    return;
                Welder<T> welder;
                vectors.numbers = Orvan::Array<unsigned int>(values.size, Orvan::kUninitialized);
                for (std::uint64_t corner = 0; corner < values.size; ++corner)
                    vectors.numbers[corner] = welder.numberOf(values[corner]);
                vectors.list = Orvan::makePtr<Orvan::Array<T>>(welder.values());
            });
        }

        /// Each library that faces refer to, once. The text of a face has a line per library.
        void writeLibraries(OutputFile& out) const
        {
            if (!libraries_)
                return;
            std::vector<bool> isUsed(libraries_->texts->size);
            for (unsigned int const number : *libraries_->numbers) {
                if (number < isUsed.size())
                    isUsed[number] = true;
            }
            std::set<std::string_view> written;
            for (unsigned int number = 0; number < isUsed.size(); ++number) {
                std::string_view rest = isUsed[number] ? libraries_->textAt(number) : std::string_view();
                while (!rest.empty()) {
                    std::string_view const library = rest.substr(0, rest.find('\n'));
                    rest.remove_prefix(std::min(rest.size(), library.size() + 1));
                    if (!library.empty() && written.insert(library).second)
                        out << "mtllib " << inOneLine(library, true) << "\n";
                }
            }
        }

        void writePoints(OutputFile& out) const
        {
            Orvan::Array<float3> const& positions = *geometry_.positions;
            auto const writeAll = [&](auto const& writeColor) {
                writeInBlocks(
                    positions.size, kBytesPerVector,
                    [&](std::uint64_t first, std::uint64_t end, OutputBuffer& block) {
                        for (std::uint64_t point = first; point != end; ++point) {
                            writeComponents(positions[point], block << "v");
                            writeColor(point, block);
                            block << "\n";
                        }
                    },
                    out);
            };
            auto const writeAs = [&]<class T>(std::type_identity<T>, float most) {
                return visitAs<T>(colors_, [&](Orvan::Array<T> const& colors) {
                    writeAll([&](std::uint64_t point, OutputBuffer& block) {
                        T const& c = colors[point];
                        block << " " << static_cast<float>(c.x) / most << " " << static_cast<float>(c.y) / most << " "
                              << static_cast<float>(c.z) / most;
                    });
                });
            };
            bool const areColored = writeAs(std::type_identity<float3>(), 1) || writeAs(std::type_identity<float4>(), 1)
                || writeAs(std::type_identity<uchar3>(), 255) || writeAs(std::type_identity<uchar4>(), 255);
            if (!areColored)
                writeAll([](std::uint64_t, OutputBuffer&) {});
        }

        template <class... T> static void writeVectors(char const* keyword, Vectors const& vectors, OutputFile& out)
        {
            auto const writeAll = [&](auto const& list) {
                writeInBlocks(
                    list.size, kBytesPerVector,
                    [&](std::uint64_t first, std::uint64_t end, OutputBuffer& block) {
                        for (std::uint64_t i = first; i != end; ++i)
                            writeComponents(list[i], block << keyword) << "\n";
                    },
                    out);
            };
            static_cast<void>((visitAs<T>(vectors.list, writeAll) || ...));
        }

        /// The statements that are in force before a face.
        std::vector<NameStatement> statementsBefore(std::uint64_t face) const
        {
            std::vector<NameStatement> result = statements_;
            for (NameStatement& statement : result) {
                if (face == 0)
                    continue;
                statement.number = (*statement.names->numbers)[face - 1];
                statement.text = statement.names->textAt(statement.number);
            }
            return result;
        }

        void writeNames(std::uint64_t face, std::vector<NameStatement>& statements, OutputBuffer& out)
        {
            for (NameStatement& statement : statements) {
                unsigned int const number = (*statement.names->numbers)[face];
                if (number == statement.number)
                    continue;
                statement.number = number;
                std::string_view const text = statement.names->textAt(number);
                if (text == statement.text)
                    continue;
                statement.text = text;
                std::string const line = inOneLine(text, statement.keyword != std::string_view("g"));
                if (line != text) {
                    std::lock_guard const lock(changedNamesMutex_);
                    changedNames_.emplace(text);
                }
                out << statement.keyword << (text.empty() ? "" : " ") << line << "\n";
            }
            if (!smoothingGroups_)
                return;
            unsigned int const group = (*smoothingGroups_)[face];
            if (group != (face == 0 ? 0 : (*smoothingGroups_)[face - 1]))
                out << "s " << group << "\n"; // 0 is off
        }

        void writeFaces(OutputFile& out)
        {
            writeInBlocks(
                geometry_.cellCount(), kBytesPerFace,
                [&](std::uint64_t first, std::uint64_t end, OutputBuffer& block) {
                    std::vector<NameStatement> statements = statementsBefore(first);
                    for (std::uint64_t face = first; face != end; ++face) {
                        writeNames(face, statements, block);
                        writeFace(face, block);
                    }
                },
                out);
        }

        void writeFace(std::uint64_t face, OutputBuffer& out) const
        {
            Orvan::Array<unsigned int> const& point = *geometry_.faceVertex;
            Orvan::Array<unsigned int> const& offset = *geometry_.offsets;
            out << "f";
            for (std::uint64_t corner = offset[face]; corner < offset[face + 1]; ++corner) {
                out << " " << oneBased(point[corner]);
                if (textures_)
                    out << "/" << oneBased(textures_.numberOf(corner, point[corner]));
                if (normals_)
                    out << (textures_ ? "/" : "//") << oneBased(normals_.numberOf(corner, point[corner]));
            }
            out << "\n";
        }

        void writePolylines(OutputFile& out)
        {
            Orvan::Array<unsigned int> const& offset = *geometry_.offsets;
            std::uint64_t emptyCount = 0;
            for (std::uint64_t strand = 0; strand + 1 < offset.size; ++strand) {
                emptyCount += offset[strand] == offset[strand + 1];
                if (offset[strand] == offset[strand + 1])
                    continue;
                out << "l";
                for (unsigned int point = offset[strand]; point < offset[strand + 1]; ++point)
                    out << " " << oneBased(point);
                out << "\n";
            }
            if (emptyCount != 0)
                geometry_.leftOut.push_back(
                    std::to_string(emptyCount) + " strands without points are left out: OBJ files cannot hold them");
        }

        static std::uint64_t oneBased(unsigned int index) { return std::uint64_t{index} + 1; }

        WritableGeometry& geometry_;
        Tessara::PropertyValue colors_;
        Vectors textures_;
        Vectors normals_;
        FaceNames const* libraries_ = nullptr;
        std::vector<NameStatement> statements_;
        std::mutex changedNamesMutex_;
        std::set<std::string_view> changedNames_; // that are not written as they are
        Orvan::Ptr<Orvan::Array<unsigned int>> smoothingGroups_; // null if there are none
    };

}

void writeObj(WritableGeometry& geometry, std::filesystem::path const& file)
{
    ObjWriter(geometry).write(file);
}

}
