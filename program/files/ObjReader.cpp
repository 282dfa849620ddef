#include "Readers.h"

#include <TessaraGeometry/Names.h>

#include <set>

namespace ModelingProgram {

using namespace Tessara::Geometry;
using Tessara::Math::float2;
using Tessara::Math::float3;

namespace {

    constexpr float3 kWhite{1, 1, 1};

    /// Distinct strings in order of appearance.
    class Texts {
    public:
        void add(std::string_view text)
        {
            if (known_.insert(std::string(text)).second && known_.size() <= kShown)
                shown_ += (shown_.empty() ? "" : ", ") + TextScanner::quoted(text);
        }
        bool empty() const { return known_.empty(); }
        std::string list() const
        {
            return shown_ + (known_.size() > kShown ? " and " + std::to_string(known_.size() - kShown) + " more" : "");
        }
        std::string countedList() const { return std::to_string(known_.size()) + " (" + list() + ")"; }

    private:
        static constexpr std::size_t kShown = 5;

        std::set<std::string> known_;
        std::string shown_;
    };

    class ObjReader {
    public:
        ObjReader(InputFile const& file, ReadOptions const& options)
            : file_(file)
            , in_(file, 0, TextScanner::Syntax::CommentsAndJoinedLines)
            , builder_(in_, options)
        {
        }

        GeometryFile read()
        {
            countStatements();
            if (total_.points == 0)
                requireObjStatements();
            for (; !in_.atEnd(); in_.nextLine())
                readStatement();
            addCornerValues("uv", textureOf_, textures_);
            addCornerValues("normal", normalOf_, normals_);
            noteUnused("texture coordinates (vt)", textureOf_, textures_.size);
            addPointValues();
            noteLeftOut();
            return std::move(builder_).finish("OBJ");
        }

    private:
        struct Counts {
            std::uint64_t points = 0;
            std::uint64_t textures = 0;
            std::uint64_t normals = 0;
            std::uint64_t faces = 0;
        };

        /// Counts first, so that each index, which may refer forwards, can be checked when it is read.
        void countStatements()
        {
            TextScanner scanner(file_, 0, TextScanner::Syntax::CommentsAndJoinedLines);
            for (; !scanner.atEnd(); scanner.nextLine()) {
                std::string_view const keyword = scanner.peekWord();
                total_.points += keyword == "v";
                total_.textures += keyword == "vt";
                total_.normals += keyword == "vn";
                total_.faces += keyword == "f";
            }
            if (std::max({total_.textures, total_.normals, total_.faces}) >= GeometryBuilder::kMostElements)
                in_.refuse("there are more elements than a mesh can hold");
            builder_.expectPoints(total_.points);
            builder_.expectFaces(total_.faces);
            textures_.reserve(total_.textures);
            normals_.reserve(total_.normals);
        }

        /// A file without points is empty geometry, unless it is not an OBJ file at all.
        void requireObjStatements()
        {
            TextScanner scanner(file_, 0, TextScanner::Syntax::CommentsAndJoinedLines);
            scanner.skipEmptyLines();
            std::string_view const keyword = scanner.atEnd() ? std::string_view() : scanner.peekWord();
            if (!keyword.empty() && !isGeometry(keyword) && !namesOf(keyword) && keyword != "p")
                scanner.refuse(TextScanner::quoted(keyword) + " is not a keyword of OBJ files");
        }

        void readStatement()
        {
            std::string_view const keyword = in_.word();
            if (keyword == "v")
                readPoint();
            else if (keyword == "f")
                readFace();
            else if (keyword == "vt")
                readTexture();
            else if (keyword == "vn")
                normals_.append(readFloat3("a component of the normal"));
            else if (keyword == "l")
                readPolyline();
            else if (keyword == "p")
                ++pointElements_;
            else if (!keyword.empty() && !readName(keyword))
                unknownKeywords_.add(keyword);
            if (isGeometry(keyword) && !in_.atLineEnd())
                in_.refuse(TextScanner::quoted(in_.peekWord()) + " is unexpected at the end of the line");
        }

        static bool isGeometry(std::string_view keyword)
        {
            return keyword == "v" || keyword == "f" || keyword == "vt" || keyword == "vn" || keyword == "l";
        }

        struct Names {
            std::string_view keyword;
            char const* plural;
            Texts names;
        };

        /// Null if the keyword does not name parts of the geometry.
        Names* namesOf(std::string_view keyword)
        {
            auto const known = std::find_if(
                std::begin(names_), std::end(names_), [=](Names const& names) { return names.keyword == keyword; });
            return known == std::end(names_) ? nullptr : known;
        }

        /// Reads names of parts of the geometry. Those of `s` are numbers; 0 and off mean none.
        bool readName(std::string_view keyword)
        {
            Names* const known = namesOf(keyword);
            if (!known)
                return false;
            if (keyword == "g")
                for (std::string_view name = in_.word(); !name.empty(); name = in_.word())
                    known->names.add(name);
            else if (std::string_view const name = in_.restOfLine();
                     !name.empty() && (keyword != "s" || (name != "0" && name != "off")))
                known->names.add(name);
            return true;
        }

        float3 readFloat3(char const* what)
        {
            float const x = in_.number<float>(what);
            float const y = in_.number<float>(what);
            return {x, y, in_.number<float>(what)};
        }

        /// v x y z, optionally followed by a weight or a color.
        void readPoint()
        {
            Coordinate const x = in_.coordinate(), y = in_.coordinate();
            builder_.addPoint(x, y, in_.coordinate());
            if (in_.atLineEnd())
                return;
            float const first = in_.number<float>("a weight or a color");
            if (in_.atLineEnd()) {
                weightedPoints_ += first != 1;
                return;
            }
            float const green = in_.number<float>("a color");
            float3 const color{first, green, in_.number<float>("a color")};
            fillColors(builder_.pointCount() - 1);
            colors_.append(color);
        }

        void fillColors(std::uint64_t count)
        {
            while (colors_.size < count) {
                colors_.append(kWhite);
                ++uncoloredPoints_;
            }
        }

        void readTexture()
        {
            float const u = in_.number<float>("a texture coordinate");
            float const v = in_.atLineEnd() ? 0 : in_.number<float>("a texture coordinate");
            if (!in_.atLineEnd())
                deepTextures_ += in_.number<float>("a texture coordinate") != 0;
            textures_.append({u, v});
        }

        void readFace()
        {
            while (!in_.atLineEnd()) {
                builder_.addCorner(readIndex("point", builder_.pointCount(), total_.points));
                unsigned int texture = kInvalidIndex;
                unsigned int normal = kInvalidIndex;
                if (in_.accept('/')) { // v/vt, v/vt/vn, v//vn, each optionally with an empty end
                    if (!in_.atTokenEnd() && !in_.isAt('/'))
                        texture = readIndex("texture coordinate", textures_.size, total_.textures);
                    if (in_.accept('/') && !in_.atTokenEnd())
                        normal = readIndex("normal", normals_.size, total_.normals);
                }
                expectTokenEnd();
                if (total_.textures != 0)
                    textureOf_.append(texture);
                if (total_.normals != 0)
                    normalOf_.append(normal);
            }
            builder_.endFace();
        }

        void readPolyline()
        {
            while (!in_.atLineEnd()) {
                linePoints_.append(readIndex("point", builder_.pointCount(), total_.points));
                if (in_.accept('/') && !in_.atTokenEnd())
                    static_cast<void>(readIndex("texture coordinate", textures_.size, total_.textures));
                expectTokenEnd();
            }
            if (linePoints_.size == lineOffset_[lineOffset_.size - 1])
                in_.refuse("a polyline has no points");
            if (linePoints_.size >= GeometryBuilder::kMostElements)
                in_.refuse("the polylines have more points than a strand set can hold");
            lineOffset_.append(static_cast<unsigned int>(linePoints_.size));
        }

        /// Indices count from 1; negative ones count backwards from the last element read.
        unsigned int readIndex(char const* kind, std::uint64_t read, std::uint64_t total)
        {
            long long const index = in_.leadingInteger("an index");
            long long const element = index < 0 ? static_cast<long long>(read) + index : index - 1;
            if (element < 0 || element >= static_cast<long long>(total))
                in_.refuse(std::string("the ") + kind + " " + std::to_string(index) + " does not exist: "
                    + (index == 0       ? "the first one is 1"
                            : index < 0 ? "only " + std::to_string(read) + " before this line"
                                        : "the file has " + std::to_string(total)));
            return static_cast<unsigned int>(element);
        }

        void expectTokenEnd()
        {
            if (!in_.atTokenEnd())
                in_.refuse(TextScanner::quoted(in_.peekWord()) + " follows an index, but is not one");
        }

        template <class T>
        void addCornerValues(char const* name, Orvan::Array<unsigned int> const& indices, Orvan::Array<T> const& values)
        {
            auto const missing = static_cast<std::uint64_t>(std::count(indices.begin(), indices.end(), kInvalidIndex));
            if (missing == indices.size)
                return;
            if (missing != 0)
                builder_.note(std::to_string(missing) + " face corners have no \"" + name + "\" and get zeros");
            builder_.addProperty<T>(name, sFaceVertexComp, gathered(values, indices));
        }

        void noteUnused(char const* what, Orvan::Array<unsigned int> const& indices, std::uint64_t count)
        {
            std::vector<bool> isUsed(count);
            for (unsigned int const index : indices)
                if (index != kInvalidIndex)
                    isUsed[index] = true;
            auto const unused = std::count(isUsed.begin(), isUsed.end(), false);
            if (unused != 0)
                builder_.note(std::string(what) + " that no face refers to are left out: " + std::to_string(unused));
        }

        void addPointValues()
        {
            if (!colors_.empty())
                fillColors(total_.points);
            if (uncoloredPoints_ != 0)
                builder_.note(std::to_string(uncoloredPoints_) + " points have no color and become white");
            // Without faces nothing refers to normals, but writers of point clouds write one per point.
            if (builder_.faceCount() != 0 || normals_.size != total_.points) {
                noteUnused("normals (vn)", normalOf_, normals_.size);
                normals_.clear();
            }
            if (lineOffset_.size != 1)
                addPolylines();
            if (!colors_.empty())
                builder_.addProperty<float3>("color", sPointComp, std::move(colors_));
            if (!normals_.empty())
                builder_.addProperty<float3>("normal", sPointComp, std::move(normals_));
        }

        /// Each strand has consecutive points of its own: points that polylines share are duplicated, and points of no
        /// polyline are removed.
        void addPolylines()
        {
            if (builder_.faceCount() != 0) {
                builder_.note(
                    "polylines are left out, because a mesh has none: " + std::to_string(lineOffset_.size - 1));
                return;
            }
            std::vector<bool> isUsed(total_.points);
            std::uint64_t usedCount = 0;
            for (unsigned int const point : linePoints_) {
                usedCount += !isUsed[point];
                isUsed[point] = true;
            }
            if (usedCount != total_.points)
                builder_.note(std::to_string(total_.points - usedCount) + " points of no polyline are left out");
            if (usedCount != linePoints_.size)
                builder_.note(std::to_string(linePoints_.size - usedCount)
                    + " points are duplicated, because each strand has its own points");
            if (!colors_.empty())
                colors_ = gathered(colors_, linePoints_);
            if (!normals_.empty())
                normals_ = gathered(normals_, linePoints_);
            builder_.makeStrands(std::move(lineOffset_), linePoints_);
        }

        void noteLeftOut()
        {
            auto const noteCount = [&](std::uint64_t count, char const* what) {
                if (count != 0)
                    builder_.note(std::to_string(count) + what);
            };
            noteCount(pointElements_, " lines of point elements (p) are left out: every point is kept anyway");
            noteCount(weightedPoints_, " weights of points are left out");
            noteCount(deepTextures_, " third texture coordinates are left out");
            for (Names const& names : names_)
                if (!names.names.empty())
                    builder_.note(std::string(names.plural) + " are left out: " + names.names.countedList());
            if (!unknownKeywords_.empty())
                builder_.note("lines that begin with " + unknownKeywords_.list() + " are left out");
        }

        InputFile const& file_;
        TextScanner in_;
        GeometryBuilder builder_;
        Counts total_;
        Orvan::Array<float2> textures_;
        Orvan::Array<float3> normals_;
        Orvan::Array<float3> colors_;
        Orvan::Array<unsigned int> textureOf_; // one entry per corner, if the file has texture coordinates
        Orvan::Array<unsigned int> normalOf_;
        Orvan::Array<unsigned int> linePoints_;
        Orvan::Array<unsigned int> lineOffset_{0u};
        std::uint64_t uncoloredPoints_ = 0;
        std::uint64_t pointElements_ = 0;
        std::uint64_t weightedPoints_ = 0;
        std::uint64_t deepTextures_ = 0;
        Names names_[5] = {{"o", "objects", {}}, {"g", "groups", {}}, {"s", "smoothing groups", {}},
            {"usemtl", "materials", {}}, {"mtllib", "material libraries", {}}};
        Texts unknownKeywords_;
    };

}

GeometryFile readObj(InputFile const& file, ReadOptions const& options)
{
    return ObjReader(file, options).read();
}

}
