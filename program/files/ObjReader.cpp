#include "Readers.h"
#include "TextParts.h"
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

    constexpr NameRuns::Kind kNames[] = {{"o", "object", "objects"}, {"g", "group", "groups"},
        {"s", "smoothing_group", "smoothing groups"}, {"usemtl", "material", "materials"}};

    bool isGeometry(std::string_view keyword)
    {
        return keyword == "v" || keyword == "f" || keyword == "vt" || keyword == "vn" || keyword == "l";
    }

    /// The number of the names that the keyword gives; nullopt if it gives none.
    std::optional<std::size_t> namesOf(std::string_view keyword)
    {
        auto const* const known = std::find_if(std::begin(kNames), std::end(kNames),
            [=](NameRuns::Kind const& names) { return names.keyword == keyword; });
        return known == std::end(kNames) ? std::nullopt
                                         : std::optional(static_cast<std::size_t>(known - std::begin(kNames)));
    }

    bool isName(std::string_view keyword)
    {
        return keyword == "mtllib" || namesOf(keyword);
    }

    /// What a statement names. A face can be in several groups, which are kept as one name; other names may contain
    /// blanks and #.
    std::string textOfName(std::string_view keyword, TextScanner& in)
    {
        if (keyword != "g")
            return std::string(in.restOfLine(TextScanner::Rest::WithHashes));
        std::string groups;
        for (std::string_view group = in.word(); !group.empty(); group = in.word())
            groups.append(groups.empty() ? "" : " ").append(group);
        return groups;
    }

    /// Numbers of statements.
    struct ObjCounts {
        std::uint64_t points = 0;
        std::uint64_t textures = 0;
        std::uint64_t normals = 0;
        std::uint64_t faces = 0;

        ObjCounts& operator+=(ObjCounts const& other)
        {
            points += other.points;
            textures += other.textures;
            normals += other.normals;
            faces += other.faces;
            return *this;
        }
    };

    /// Some lines of the file and what they contain. Indices are those of the whole file, counted from 0.
    class ObjPart {
    public:
        ObjPart(InputFile const& file, std::size_t begin, std::size_t end, ReadOptions const& options)
            : in_(file, begin, end, TextScanner::Syntax::CommentsAndJoinedLines)
            , counter_(file, begin, end, TextScanner::Syntax::CommentsAndJoinedLines)
            , builder(in_, options)
        {
            counter_.setWorkShare(4);
            in_.setWorkShare(4);
        }

        /// Counts first, so that each index, which may refer forwards, can be checked when it is read.
        void count()
        {
            for (; !counter_.atEnd(); counter_.nextLine()) {
                std::string_view const keyword = counter_.word();
                counts.points += keyword == "v";
                counts.textures += keyword == "vt";
                counts.normals += keyword == "vn";
                counts.faces += keyword == "f";
                if (!isGeometry(keyword) && isName(keyword))
                    textOfName(keyword, counter_); // which may end in a later line
            }
            counter_.countWorkLeft();
        }

        /// \param before  what precedes this part
        void read(ObjCounts const& before, ObjCounts const& total)
        {
            before_ = before;
            total_ = total;
            builder.expectPoints(counts.points);
            builder.expectOtherPoints(total.points);
            builder.expectFaces(counts.faces);
            textures.reserve(counts.textures);
            normals.reserve(counts.normals);
            for (; !in_.atEnd(); in_.nextLine())
                readStatement();
            in_.countWorkLeft();
            // Indices have been checked against what was counted.
            if (builder.pointCount() != counts.points || textures.size != counts.textures
                || normals.size != counts.normals)
                in_.refuse("the file has other numbers of v, vt and vn than were counted first");
        }

        /// Makes points white up to a number of points.
        void fillColors(std::uint64_t count)
        {
            while (colors.size < count)
                colors.append(kWhite);
        }

        struct Naming {
            std::size_t names; // which of `kNames`
            std::string text;
            std::uint64_t face; // the first one, of this part
        };

    private:
        // Declared first, because the builder refers to it.
        TextScanner in_;
        TextScanner counter_;

    public:
        ObjCounts counts;
        GeometryBuilder builder;
        Orvan::Array<float2> textures;
        Orvan::Array<float3> normals;
        Orvan::Array<float3> colors; // up to the last point that has one
        Orvan::Array<unsigned int> textureOf; // one entry per corner, if the file has texture coordinates
        Orvan::Array<unsigned int> normalOf;
        Orvan::Array<unsigned int> linePoints;
        Orvan::Array<unsigned int> lineOffset{0u};
        std::uint64_t coloredPoints = 0;
        std::uint64_t pointElements = 0;
        std::uint64_t weightedPoints = 0;
        std::uint64_t deepTextures = 0;
        std::vector<Naming> namings;
        Texts libraries;
        Texts unknownKeywords;

    private:
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
                normals.append(readFloat3("a component of the normal"));
            else if (keyword == "l")
                readPolyline();
            else if (keyword == "p")
                ++pointElements;
            else if (!keyword.empty() && !readName(keyword))
                unknownKeywords.add(keyword);
            if (isGeometry(keyword) && !in_.atLineEnd())
                in_.refuse(TextScanner::quoted(in_.peekWord()) + " is unexpected at the end of the line");
        }

        /// Reads a name of the faces that follow.
        bool readName(std::string_view keyword)
        {
            if (!isName(keyword))
                return false;
            std::string name = textOfName(keyword, in_);
            if (keyword == "mtllib") {
                if (!name.empty())
                    libraries.add(name);
                return true;
            }
            bool const isNone = keyword == "s" && (name == "0" || name == "off");
            namings.push_back({*namesOf(keyword), isNone ? std::string() : std::move(name), builder.faceCount()});
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
            builder.addPoint(x, y, in_.coordinate());
            if (in_.atLineEnd())
                return;
            float const first = in_.number<float>("a weight or a color");
            if (in_.atLineEnd()) {
                weightedPoints += first != 1;
                return;
            }
            float const green = in_.number<float>("a color");
            float3 const color{first, green, in_.number<float>("a color")};
            fillColors(builder.pointCount() - 1);
            colors.append(color);
            ++coloredPoints;
        }

        void readTexture()
        {
            float const u = in_.number<float>("a texture coordinate");
            float const v = in_.atLineEnd() ? 0 : in_.number<float>("a texture coordinate");
            if (!in_.atLineEnd())
                deepTextures += in_.number<float>("a texture coordinate") != 0;
            textures.append({u, v});
        }

        void readFace()
        {
            while (!in_.atLineEnd()) {
                builder.addCorner(readIndex("point", before_.points + builder.pointCount(), total_.points));
                unsigned int texture = kInvalidIndex;
                unsigned int normal = kInvalidIndex;
                if (in_.accept('/')) { // v/vt, v/vt/vn, v//vn, each optionally with an empty end
                    if (!in_.atTokenEnd() && !in_.isAt('/'))
                        texture = readIndex("texture coordinate", before_.textures + textures.size, total_.textures);
                    if (in_.accept('/') && !in_.atTokenEnd())
                        normal = readIndex("normal", before_.normals + normals.size, total_.normals);
                }
                expectTokenEnd();
                if (total_.textures != 0)
                    textureOf.append(texture);
                if (total_.normals != 0)
                    normalOf.append(normal);
            }
            builder.endFace();
        }

        void readPolyline()
        {
            while (!in_.atLineEnd()) {
                linePoints.append(readIndex("point", before_.points + builder.pointCount(), total_.points));
                if (in_.accept('/') && !in_.atTokenEnd())
                    static_cast<void>(
                        readIndex("texture coordinate", before_.textures + textures.size, total_.textures));
                expectTokenEnd();
            }
            if (linePoints.size == lineOffset[lineOffset.size - 1])
                in_.refuse("a polyline has no points");
            if (linePoints.size >= GeometryBuilder::kMostElements)
                in_.refuse("the polylines have more points than a strand set can hold");
            lineOffset.append(static_cast<unsigned int>(linePoints.size));
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

        ObjCounts before_;
        ObjCounts total_;
    };

    /// Reads parts of the file in parallel and joins them.
    class ObjReader {
    public:
        ObjReader(InputFile const& file, ReadOptions const& options, std::size_t partBytes)
            : file_(file)
            , in_(file, 0, TextScanner::Syntax::CommentsAndJoinedLines)
            , builder_(in_, options)
            , parts_(file, TextScanner::partsOf(file, 0, partBytes), options)
        {
        }

        GeometryFile read()
        {
            countStatements();
            if (total_.points == 0)
                requireObjStatements();
            readParts();
            joinParts();
            in_.skipAll();
            addCornerValues("uv", textureOf_, textures_);
            addCornerValues("normal", normalOf_, normals_);
            noteUnused("texture coordinates (vt)", textureOf_, textures_.size);
            addPointValues();
            addFaceNames();
            noteLeftOut();
            return std::move(builder_).finish("OBJ");
        }

    private:
        void countStatements()
        {
            forEachPart(parts_.count(), [&](std::size_t part) { parts_[part].count(); });
            total_ = parts_.sum(&ObjPart::counts);
            if (std::max({total_.textures, total_.normals, total_.faces}) >= GeometryBuilder::kMostElements)
                in_.refuse("there are more elements than a mesh can hold");
            builder_.expectOtherPoints(total_.points);
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

        void readParts()
        {
            std::vector<ObjCounts> before(parts_.count());
            for (std::size_t part = 1; part < parts_.count(); ++part)
                (before[part] = before[part - 1]) += parts_[part - 1].counts;
            parts_.read([&](ObjPart& part, std::size_t index) {
                part.read(before[index], total_);
                return true;
            });
        }

        void joinParts()
        {
            std::uint64_t linePointCount = 0;
            for (ObjPart const* const part : parts_.pointers())
                linePointCount += part->linePoints.size;
            if (linePointCount >= GeometryBuilder::kMostElements)
                in_.refuse("the polylines have more points than a strand set can hold");
            parts_.releaseText();
            std::uint64_t faceCount = 0;
            for (ObjPart const* const part : parts_.pointers()) {
                for (ObjPart::Naming const& naming : part->namings)
                    names_[naming.names].begin(naming.text, faceCount + naming.face);
                faceCount += part->counts.faces;
                libraries_.add(part->libraries);
                unknownKeywords_.add(part->unknownKeywords);
            }
            parts_.joinGeometry(builder_);
            textures_ = parts_.joined(&ObjPart::textures);
            normals_ = parts_.joined(&ObjPart::normals);
            textureOf_ = parts_.joined(&ObjPart::textureOf);
            normalOf_ = parts_.joined(&ObjPart::normalOf);
            linePoints_ = parts_.joined(&ObjPart::linePoints);
            lineOffset_ = joinedOffsets(parts_.pointers(), &ObjPart::lineOffset);
        }

        /// If a point has a color, all get one.
        void joinColors()
        {
            std::uint64_t const coloredPoints = parts_.sum(&ObjPart::coloredPoints);
            if (coloredPoints == 0)
                return;
            forEachPart(parts_.count(), [&](std::size_t part) { parts_[part].fillColors(parts_[part].counts.points); });
            colors_ = parts_.joined(&ObjPart::colors);
            if (coloredPoints != total_.points)
                builder_.note(std::to_string(total_.points - coloredPoints) + " points have no color and become white");
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
            joinColors();
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
            auto const noteCount = [&](std::uint64_t ObjPart::*number, char const* what) {
                if (std::uint64_t const count = parts_.sum(number))
                    builder_.note(std::to_string(count) + what);
            };
            noteCount(&ObjPart::pointElements, " lines of point elements (p) are left out: every point is kept anyway");
            noteCount(&ObjPart::weightedPoints, " weights of points are left out");
            noteCount(&ObjPart::deepTextures, " third texture coordinates are left out");
            if (!unknownKeywords_.empty())
                builder_.note("lines that begin with " + unknownKeywords_.list() + " are left out");
        }

        InputFile const& file_;
        TextScanner in_;
        GeometryBuilder builder_;
        TextParts<ObjPart> parts_;
        ObjCounts total_;
        Orvan::Array<float2> textures_;
        Orvan::Array<float3> normals_;
        Orvan::Array<float3> colors_;
        Orvan::Array<unsigned int> textureOf_; // one entry per corner, if the file has texture coordinates
        Orvan::Array<unsigned int> normalOf_;
        Orvan::Array<unsigned int> linePoints_;
        Orvan::Array<unsigned int> lineOffset_{0u};
        NameRuns names_[std::size(kNames)] = {
            NameRuns(kNames[0]), NameRuns(kNames[1]), NameRuns(kNames[2]), NameRuns(kNames[3])};
        Texts libraries_;
        Texts unknownKeywords_;
    };

}

GeometryFile readObj(InputFile const& file, ReadOptions const& options)
{
    return readObj(file, options, kTextPartBytes);
}

GeometryFile readObj(InputFile const& file, ReadOptions const& options, std::size_t partBytes)
{
    file.load();
    return ObjReader(file, options, partBytes).read();
}

}
