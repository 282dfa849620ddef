#include "Readers.h"
#include "Texts.h"

#include <TessaraGeometry/Names.h>

#include <unordered_map>

namespace ModelingProgram {

using namespace Tessara::Geometry;
using Tessara::Math::float2;
using Tessara::Math::float3;

namespace {

    constexpr float3 kWhite{1, 1, 1};

    /// Names that statements give to all faces after them, such as materials, as runs of faces with the same name.
    class NameRuns {
    public:
        struct Kind {
            std::string_view keyword;
            char const* property;
            char const* plural;
        };

        explicit NameRuns(Kind const& namedParts)
            : kind(namedParts)
        {
            begin({}, 0);
        }

        Kind const kind;

        /// Faces from this one on have this name; the empty name means none.
        void begin(std::string_view name, std::uint64_t face)
        {
            auto const [known, isNew] = numbers_.try_emplace(std::string(name), numbers_.size());
            if (isNew)
                names_.push_back(known->first);
            if (!runs_.empty() && runs_.back().firstFace == face)
                runs_.pop_back();
            runs_.push_back({face, known->second});
        }

        struct Numbered {
            Orvan::Array<unsigned int> numbers; // of the texts of all faces; empty if no face has a name
            Orvan::Array<Orvan::String> texts; // each once; empty for faces without a name
            Texts unused; // names without faces
        };

        Numbered numbered(std::uint64_t faceCount) const
        {
            Numbered result;
            std::uint64_t namedCount = 0;
            forEachRun(
                faceCount, [&](std::size_t, std::uint64_t first, std::uint64_t end) { namedCount += end - first; });
            result.numbers.resize(namedCount != 0 ? faceCount : 0);
            if (namedCount != 0 && namedCount != faceCount)
                result.texts.append("");
            std::vector<unsigned int> numberOf(names_.size(), kInvalidIndex);
            forEachRun(faceCount, [&](std::size_t name, std::uint64_t first, std::uint64_t end) {
                if (numberOf[name] == kInvalidIndex) {
                    numberOf[name] = static_cast<unsigned int>(result.texts.size);
                    result.texts.append(Orvan::String(names_[name]));
                }
                std::fill(result.numbers.data + first, result.numbers.data + end, numberOf[name]);
            });
            for (std::size_t name = 1; name < names_.size(); ++name)
                if (numberOf[name] == kInvalidIndex)
                    result.unused.add(names_[name]);
            return result;
        }

    private:
        struct Run {
            std::uint64_t firstFace;
            std::size_t name;
        };

        /// Calls `visit(name, first, end)` for each run of faces that have one.
        template <class Visit> void forEachRun(std::uint64_t faceCount, Visit const& visit) const
        {
            for (std::size_t run = 0; run < runs_.size(); ++run) {
                std::uint64_t const end = run + 1 < runs_.size() ? runs_[run + 1].firstFace : faceCount;
                if (runs_[run].name != 0 && runs_[run].firstFace != end)
                    visit(runs_[run].name, runs_[run].firstFace, end);
            }
        }

        std::unordered_map<std::string, std::size_t> numbers_;
        std::vector<std::string_view> names_; // the keys of `numbers_`; the first is empty
        std::vector<Run> runs_; // ends where the next one begins
    };

    class ObjReader {
    public:
        ObjReader(InputFile const& file, ReadOptions const& options)
            : file_(file)
            , in_(file, 0, TextScanner::Syntax::CommentsAndJoinedLines)
            , builder_(in_, options)
        {
            in_.setWorkShare(4);
        }

        GeometryFile read()
        {
            countStatements();
            if (total_.points == 0)
                requireObjStatements();
            for (; !in_.atEnd(); in_.nextLine())
                readStatement();
            requireTotals();
            addCornerValues("uv", textureOf_, textures_);
            addCornerValues("normal", normalOf_, normals_);
            noteUnused("texture coordinates (vt)", textureOf_, textures_.size);
            addPointValues();
            addFaceNames();
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
            scanner.setWorkShare(4);
            for (; !scanner.atEnd(); scanner.nextLine()) {
                std::string_view const keyword = scanner.word();
                total_.points += keyword == "v";
                total_.textures += keyword == "vt";
                total_.normals += keyword == "vn";
                total_.faces += keyword == "f";
                if (!isGeometry(keyword) && isName(keyword))
                    textOfName(keyword, scanner); // which may end in a later line
            }
            if (std::max({total_.textures, total_.normals, total_.faces}) >= GeometryBuilder::kMostElements)
                in_.refuse("there are more elements than a mesh can hold");
            builder_.expectPoints(total_.points);
            builder_.expectFaces(total_.faces);
            textures_.reserve(total_.textures);
            normals_.reserve(total_.normals);
        }

        /// Indices have been checked against what was counted.
        void requireTotals()
        {
            if (builder_.pointCount() != total_.points || textures_.size != total_.textures
                || normals_.size != total_.normals)
                in_.refuse("the file has other numbers of v, vt and vn than were counted first");
        }

        /// A file without points is empty geometry, unless it is not an OBJ file at all.
        void requireObjStatements()
        {
            TextScanner scanner(file_, 0, TextScanner::Syntax::CommentsAndJoinedLines);
            scanner.skipEmptyLines();
            std::string_view const keyword = scanner.atEnd() ? std::string_view() : scanner.peekWord();
            if (!keyword.empty() && !isGeometry(keyword) && !isName(keyword) && keyword != "p")
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

        /// Null if the keyword does not name parts of the geometry.
        NameRuns* namesOf(std::string_view keyword)
        {
            auto const known = std::find_if(std::begin(names_), std::end(names_),
                [=](NameRuns const& names) { return names.kind.keyword == keyword; });
            return known == std::end(names_) ? nullptr : known;
        }

        bool isName(std::string_view keyword) { return keyword == "mtllib" || namesOf(keyword); }

        /// What a statement names. A face can be in several groups, which are kept as one name; other names may contain
        /// blanks and #.
        std::string_view textOfName(std::string_view keyword, TextScanner& in)
        {
            if (keyword != "g")
                return in.restOfLine(TextScanner::Rest::WithHashes);
            groups_.clear();
            for (std::string_view group = in.word(); !group.empty(); group = in.word())
                groups_.append(groups_.empty() ? "" : " ").append(group);
            return groups_;
        }

        /// Reads a name of the faces that follow.
        bool readName(std::string_view keyword)
        {
            if (!isName(keyword))
                return false;
            std::string_view const name = textOfName(keyword, in_);
            if (keyword == "mtllib") {
                if (!name.empty())
                    libraries_.add(name);
                return true;
            }
            bool const isNone = keyword == "s" && (name == "0" || name == "off");
            namesOf(keyword)->begin(isNone ? std::string_view() : name, builder_.faceCount());
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

        /// Each name that faces have is stored once, and the number of their name for all faces.
        void addFaceNames()
        {
            std::uint64_t const faceCount = builder_.faceCount();
            for (NameRuns const& names : names_) {
                NameRuns::Numbered faces = names.numbered(faceCount);
                if (!faces.unused.empty())
                    builder_.note(
                        std::string(names.kind.plural) + " without faces are left out: " + faces.unused.countedList());
                if (faces.numbers.empty())
                    continue;
                if (names.kind.keyword == "s")
                    addSmoothingGroups(std::move(faces.numbers), faces.texts);
                else
                    builder_.addFaceNames(names.kind.property, std::move(faces.numbers), std::move(faces.texts));
            }
            if (faceCount != 0 && !libraries_.empty())
                builder_.addFaceNames("material_library", Orvan::Array<unsigned int>(faceCount),
                    {Orvan::String(std::string_view(libraries_.lines()))});
            else if (!libraries_.empty())
                builder_.note("material libraries are left out: " + libraries_.countedList());
        }

        /// Smoothing groups are numbers; "on" is written by some programs.
        void addSmoothingGroups(Orvan::Array<unsigned int> groups, Orvan::Array<Orvan::String> const& texts)
        {
            Texts unknown;
            std::vector<unsigned int> groupOf(texts.size);
            for (std::size_t text = 0; text < texts.size; ++text) {
                std::string_view const name = texts[text].view();
                if (name.empty())
                    continue; // 0
                auto const [rest, error] = std::from_chars(name.data(), name.data() + name.size(), groupOf[text]);
                if (name == "on")
                    groupOf[text] = 1;
                else if (error != std::errc{} || rest != name.data() + name.size()) {
                    groupOf[text] = 0;
                    unknown.add(name);
                }
            }
            for (unsigned int& group : groups)
                group = groupOf[group];
            if (!unknown.empty())
                builder_.note("smoothing groups that are not numbers are left out: " + unknown.countedList());
            builder_.addProperty<unsigned int>("smoothing_group", sFaceComp, std::move(groups));
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
        NameRuns names_[4] = {NameRuns({"o", "object", "objects"}), NameRuns({"g", "group", "groups"}),
            NameRuns({"s", "smoothing_group", "smoothing groups"}), NameRuns({"usemtl", "material", "materials"})};
        std::string groups_; // of a statement
        Texts libraries_;
        Texts unknownKeywords_;
    };

}

GeometryFile readObj(InputFile const& file, ReadOptions const& options)
{
    return ObjReader(file, options).read();
}

}
