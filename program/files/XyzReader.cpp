#include "Readers.h"
#include "TextParts.h"

#include <TessaraGeometry/Names.h>

namespace ModelingProgram {

using namespace Tessara::Math;
using Tessara::Geometry::sPointComp;

namespace {

    constexpr std::size_t kNone = static_cast<std::size_t>(-1);

    /// What the columns of a file contain; columns are counted from 0.
    struct Columns {
        std::size_t position[3] = {0, 1, 2};
        std::size_t color = kNone; // the first of three
        std::size_t normal = kNone; // the first of three
        struct Named {
            std::string name;
            std::size_t column;
        };
        std::vector<Named> others; // numbers on their own
    };

    bool isWordOf(std::string_view word, std::initializer_list<std::string_view> words)
    {
        return std::find(words.begin(), words.end(), word) != words.end();
    }

    /// What all values of a column have in common, over the rows with a finite position.
    struct Traits {
        bool areBytes = true;
        bool fitFloat = true;
        // Of the vectors that begin in this column:
        bool areUnit = true;
        bool areAxes = true; // 0 0 1 and the like, which could also be colors

        void add(Coordinate const& value)
        {
            areBytes = areBytes && value.value >= 0 && value.value <= 255 && value.value == std::floor(value.value);
            fitFloat = fitFloat && !value.losesDigits;
        }
        void add(Traits const& others)
        {
            areBytes = areBytes && others.areBytes;
            fitFloat = fitFloat && others.fitFloat;
            areUnit = areUnit && others.areUnit;
            areAxes = areAxes && others.areAxes;
        }
        void addVector(double x, double y, double z)
        {
            double const squaredLength = x * x + y * y + z * z;
            areUnit = areUnit && ((squaredLength > 0.98 && squaredLength < 1.02) || squaredLength == 0);
            areAxes = areAxes && squaredLength == 1 && std::max({x, y, z}) == 1;
        }
    };

    /// Reads the numbers of a line.
    void readValues(TextScanner& in, std::vector<Coordinate>& values)
    {
        using Separator = TextScanner::Separator;
        values.clear();
        bool hasTightComma = false, hasOther = false;
        for (Separator separator = Separator::Mark; separator != Separator::None;) {
            values.push_back(in.coordinate(values.size() < 3 ? "a coordinate" : "a value"));
            separator = in.separator();
            hasTightComma = hasTightComma || separator == Separator::TightComma;
            hasOther = hasOther || separator == Separator::Mark || separator == Separator::Blanks;
        }
        if (hasTightComma && hasOther)
            in.refuse("there are commas as well as other separators: decimal commas are not supported");
    }

    /// Some of the lines after the head.
    class XyzPart {
    public:
        /// \param columnCount  of all lines
        XyzPart(InputFile const& file, std::size_t begin, std::size_t end, std::size_t columnCount,
            Columns const& columns, ReadOptions const& options)
            : in_(file, begin, end, TextScanner::Syntax::CommentsAndMarks)
            , columns_(columns)
            , columnCount_(columnCount)
            , builder(in_, options)
            , traits(columnCount)
        {
        }

        void read()
        {
            for (in_.skipEmptyLines(); !in_.atEnd(); in_.skipEmptyLines()) {
                readRow();
                in_.nextLine();
            }
            in_.countWorkLeft();
        }

        std::uint64_t rowCount() const { return builder.pointCount(); }

    private:
        void readRow()
        {
            readValues(in_, row_);
            if (row_.size() != columnCount_)
                in_.refuse("there are " + std::to_string(row_.size()) + " values, but " + std::to_string(columnCount_)
                    + " in the lines above");
            Coordinate const &x = row_[columns_.position[0]], &y = row_[columns_.position[1]],
                             &z = row_[columns_.position[2]];
            builder.addPoint(x, y, z);
            bool const isUsable = std::isfinite(x.value) && std::isfinite(y.value) && std::isfinite(z.value);
            for (std::size_t column = 0; columnCount_ > 3 && column < columnCount_; ++column) {
                values.append(row_[column].value);
                if (isUsable)
                    traits[column].add(row_[column]);
            }
            for (std::size_t column = 3; isUsable && column + 2 < columnCount_; ++column)
                traits[column].addVector(row_[column].value, row_[column + 1].value, row_[column + 2].value);
        }

        // Declared first, because the builder refers to it.
        TextScanner in_;
        Columns const& columns_;
        std::size_t columnCount_;
        std::vector<Coordinate> row_;

    public:
        GeometryBuilder builder;
        Orvan::Array<double> values; // of all rows, if there is more than a position
        std::vector<Traits> traits; // one entry per column
    };

    class XyzReader {
    public:
        XyzReader(InputFile const& file, ReadOptions const& options)
            : file_(file)
            , in_(file, 0, TextScanner::Syntax::CommentsAndMarks)
            , builder_(in_, options)
        {
        }

        GeometryFile read(std::size_t partBytes)
        {
            readHead();
            std::size_t const begin = in_.position();
            countColumns();
            TextParts<XyzPart> parts(
                file_, TextScanner::partsOf(file_, begin, partBytes), columnCount_, columns_, builder_.options());
            parts.read([](XyzPart& part, std::size_t) {
                part.read();
                return true;
            });
            in_.skipAll();
            starts_ = startsOf(parts.pointers(), &XyzPart::rowCount);
            joinTraits(parts);
            requireDeclaredCount();
            if (headings_.empty() && rowCount() != 0)
                columns_ = guessColumns();
            if (headings_.empty() && columns_.normal != kNone && !traits_[columns_.normal].areUnit)
                noteDoubtfulNormals();
            parts.releaseText();
            parts.joinGeometry(builder_);
            addProperties(parts);
            return std::move(builder_).finish("XYZ");
        }

    private:
        /// Reads an optional heading line and an optional line with only the number of points, in either order.
        void readHead()
        {
            for (int line = 0; line < 2; ++line) {
                in_.skipEmptyLines();
                if (in_.atEnd())
                    return;
                std::vector<std::string_view> const fields = in_.fieldsOfLine();
                if (!declaredCount_ && fields.size() == 1 && isCount(fields[0]))
                    declaredCount_ = in_.number<std::uint64_t>("the number of points");
                else if (headings_.empty() && isHeading(fields))
                    readHeadings(fields);
                else
                    return;
                in_.nextLine();
            }
        }

        static bool isCount(std::string_view field)
        {
            return field.find_first_not_of("0123456789") == std::string_view::npos;
        }

        /// A heading has no field that is a number, so a damaged first line is not mistaken for one.
        static bool isHeading(std::vector<std::string_view> const& fields)
        {
            return std::none_of(fields.begin(), fields.end(), [](std::string_view field) {
                double number = 0;
                field.remove_prefix(field.starts_with('+') ? 1 : 0);
                char const* const end = field.data() + field.size();
                auto const [rest, error] = std::from_chars(field.data(), end, number);
                return rest == end && error != std::errc::invalid_argument;
            });
        }

        void readHeadings(std::vector<std::string_view> const& fields)
        {
            std::size_t axes[3] = {kNone, kNone, kNone};
            Columns named;
            for (std::string_view field : fields) {
                auto const isFrame = [](char c) { return c == '"' || c == '\'' || c == '/'; };
                while (!field.empty() && isFrame(field.front()))
                    field.remove_prefix(1);
                while (!field.empty() && isFrame(field.back()))
                    field.remove_suffix(1);
                if (field.empty() && headings_.empty())
                    continue; // "// X Y Z"
                std::size_t const column = headings_.size();
                headings_.push_back(field.empty() ? "column " + std::to_string(column + 1) : std::string(field));
                std::string const name = lowerCase(field);
                if (name.size() == 1 && name[0] >= 'x' && name[0] <= 'z' && axes[name[0] - 'x'] == kNone)
                    axes[name[0] - 'x'] = column;
            }
            if (std::find(std::begin(axes), std::end(axes), kNone) != std::end(axes)) {
                builder_.note("the heading line is ignored: it does not name columns x, y and z");
                headings_.clear();
                return;
            }
            std::copy(std::begin(axes), std::end(axes), named.position);
            for (std::size_t column = 0; column < headings_.size(); ++column)
                column += nameColumn(axes, column, named);
            columns_ = std::move(named);
        }

        /// \return how many of the following columns belong to this one
        std::size_t nameColumn(std::size_t const (&axes)[3], std::size_t column, Columns& named) const
        {
            auto const isTriple = [&](std::initializer_list<std::string_view> first,
                                      std::initializer_list<std::string_view> second,
                                      std::initializer_list<std::string_view> third) {
                return column + 2 < headings_.size() && isWordOf(lowerCase(headings_[column]), first)
                    && isWordOf(lowerCase(headings_[column + 1]), second)
                    && isWordOf(lowerCase(headings_[column + 2]), third);
            };
            if (std::find(std::begin(axes), std::end(axes), column) != std::end(axes))
                return 0;
            if (named.color == kNone && isTriple({"r", "red"}, {"g", "green"}, {"b", "blue"})) {
                named.color = column;
                return 2;
            }
            if (named.normal == kNone
                && isTriple(
                    {"nx", "normalx", "normal_x"}, {"ny", "normaly", "normal_y"}, {"nz", "normalz", "normal_z"})) {
                named.normal = column;
                return 2;
            }
            named.others.push_back({headings_[column], column});
            return 0;
        }

        /// The columns of the first row, which all others have too.
        void countColumns()
        {
            in_.skipEmptyLines();
            if (in_.atEnd())
                return;
            std::vector<Coordinate> row;
            readValues(in_, row);
            std::size_t const count = row.size();
            bool const isKnown = count == 3 || count == 4 || count == 6 || count == 7 || count == 9;
            if (!headings_.empty() && count != headings_.size())
                in_.refuse("there are " + std::to_string(count) + " values, but the heading line names "
                    + std::to_string(headings_.size()) + " columns");
            if (headings_.empty() && !isKnown)
                in_.refuse("there are " + std::to_string(count)
                    + " values; without a heading line that names the columns, 3, 4, 6, 7 or 9 make a point");
            columnCount_ = count;
        }

        std::uint64_t rowCount() const { return starts_.back(); }

        void requireDeclaredCount() const
        {
            if (declaredCount_ && *declaredCount_ != rowCount())
                in_.refuse("the file is cut off or damaged: it declares " + std::to_string(*declaredCount_)
                    + " points and holds " + std::to_string(rowCount()));
        }

        void joinTraits(TextParts<XyzPart> const& parts)
        {
            traits_.resize(std::max(columnCount_, headings_.size())); // there may be no row
            for (XyzPart const* const part : parts.pointers())
                for (std::size_t column = 0; column != columnCount_; ++column)
                    traits_[column].add(part->traits[column]);
        }

        bool areColors(std::size_t column) const
        {
            return traits_[column].areBytes && traits_[column + 1].areBytes && traits_[column + 2].areBytes
                && !traits_[column].areAxes;
        }

        Columns guessColumns()
        {
            Columns columns;
            if (columnCount_ == 4)
                columns.others = {{"intensity", 3}};
            if (columnCount_ == 6)
                (areColors(3) ? columns.color : columns.normal) = 3;
            if (columnCount_ == 7) {
                bool const beginsWithIntensity = areColors(4);
                if (beginsWithIntensity && areColors(3))
                    builder_.note("columns 4 to 7 could be a color and an intensity, or the other way round; they are "
                                  "read as intensity, red, green, blue, and a heading line would decide");
                std::size_t const triple = beginsWithIntensity ? 4 : 3;
                (areColors(triple) ? columns.color : columns.normal) = triple;
                columns.others = {{"intensity", beginsWithIntensity ? 3u : 6u}};
            }
            if (columnCount_ == 9) {
                if (!areColors(3) && !areColors(6) && !traits_[3].areUnit && !traits_[6].areUnit)
                    in_.refuse("columns 4 to 9 are not a color and a normal; a heading line has to name them");
                bool const beginsWithColor = areColors(3) || (!areColors(6) && traits_[6].areUnit);
                columns.color = beginsWithColor ? 3 : 6;
                columns.normal = beginsWithColor ? 6 : 3;
            }
            return columns;
        }

        /// Colors whose range is not that of bytes look like normals that are not unit vectors.
        void noteDoubtfulNormals()
        {
            builder_.note("columns " + std::to_string(columns_.normal + 1) + " to "
                + std::to_string(columns_.normal + 3)
                + " are read as normals, although some do not have length 1; if they are colors, a heading line (x y z "
                  "r "
                  "g b) has to say so");
        }

        void addProperties(TextParts<XyzPart> const& parts)
        {
            if (std::size_t const column = columns_.color; column != kNone) {
                if (traits_[column].areBytes && traits_[column + 1].areBytes && traits_[column + 2].areBytes)
                    addColumns<unsigned char>("color", column, 3, parts);
                else
                    addColumns<float>("color", column, 3, parts);
            }
            if (columns_.normal != kNone)
                addColumns<float>("normal", columns_.normal, 3, parts);
            for (Columns::Named const& other : columns_.others) {
                if (traits_[other.column].fitFloat)
                    addColumns<float>(other.name, other.column, 1, parts);
                else
                    addColumns<double>(other.name, other.column, 1, parts);
            }
        }

        template <class Scalar>
        void addColumns(std::string const& name, std::size_t first, std::size_t count, TextParts<XyzPart> const& parts)
        {
            auto const target = builder_.addProperty<Scalar>(name, sPointComp, count, rowCount());
            forEachPart(parts.count(), [&](std::size_t part) {
                std::byte* to = target->data + starts_[part] * count * sizeof(Scalar);
                Orvan::Array<double> const& values = parts[part].values;
                for (std::uint64_t rowStart = 0; rowStart < values.size; rowStart += columnCount_) {
                    for (std::size_t i = 0; i < count; ++i, to += sizeof(Scalar)) {
                        // Rows without a finite position, which are left out later, are not covered by the traits.
                        double const value = values[rowStart + first + i];
                        bool const fits = !std::is_integral_v<Scalar> || (value >= 0 && value <= 255);
                        auto const scalar = fits ? static_cast<Scalar>(value) : Scalar{};
                        std::memcpy(to, &scalar, sizeof(Scalar));
                    }
                }
            });
        }

        InputFile const& file_;
        TextScanner in_;
        GeometryBuilder builder_;
        std::optional<std::uint64_t> declaredCount_;
        std::vector<std::string> headings_; // empty if no line names x, y and z
        Columns columns_;
        std::size_t columnCount_ = 0;
        std::vector<std::uint64_t> starts_; // the first row of each part, and the number of all rows
        std::vector<Traits> traits_; // one entry per column
    };

}

GeometryFile readXyz(InputFile const& file, ReadOptions const& options)
{
    return readXyz(file, options, kTextPartBytes);
}

GeometryFile readXyz(InputFile const& file, ReadOptions const& options, std::size_t partBytes)
{
    file.load();
    return XyzReader(file, options).read(partBytes);
}

}
