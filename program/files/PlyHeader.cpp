#include "PlyHeader.h"

#include <map>

namespace ModelingProgram {

namespace {

    class PlyHeaderReader {
    public:
        explicit PlyHeaderReader(TextScanner& scanner)
            : in_(scanner)
        {
        }

        PlyHeader read()
        {
            if (in_.word() != "ply")
                in_.refuse("the file does not begin with \"ply\"");
            in_.nextLine();
            while (readLine()) { }
            for (PlyElement const& element : header_.elements)
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
            static std::map<std::string_view, PlyEncoding> const encodings{{"ascii", PlyEncoding::Text},
                {"binary_little_endian", PlyEncoding::LittleEndian}, {"binary_big_endian", PlyEncoding::BigEndian}};
            std::string_view const name = in_.word();
            auto const encoding = encodings.find(name);
            if (encoding == encodings.end() || in_.word() != "1.0")
                in_.refuse("the format " + TextScanner::quoted(name) + " is not known, or not of version 1.0");
            header_.encoding = encoding->second;
        }

        void readElement()
        {
            std::string const name(in_.word());
            for (PlyElement const& element : header_.elements) {
                if (element.name == name)
                    in_.refuse("the element " + TextScanner::quoted(name) + " is declared twice");
            }
            header_.elements.push_back({name, in_.number<std::uint64_t>("the number of elements"), {}});
        }

        void readProperty()
        {
            if (header_.elements.empty())
                in_.refuse("a property comes before the first element");
            PlyProperty property;
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
            for (PlyProperty const& other : header_.elements.back().properties) {
                if (other.name == property.name)
                    in_.refuse("the property " + TextScanner::quoted(property.name) + " is declared twice");
            }
            header_.elements.back().properties.push_back(std::move(property));
        }

        PlyScalar readType()
        {
            static std::map<std::string_view, PlyScalar> const types{{"char", PlyScalar::Char},
                {"int8", PlyScalar::Char}, {"uchar", PlyScalar::UChar}, {"uint8", PlyScalar::UChar},
                {"short", PlyScalar::Short}, {"int16", PlyScalar::Short}, {"ushort", PlyScalar::UShort},
                {"uint16", PlyScalar::UShort}, {"int", PlyScalar::Int}, {"int32", PlyScalar::Int},
                {"uint", PlyScalar::UInt}, {"uint32", PlyScalar::UInt}, {"float", PlyScalar::Float},
                {"float32", PlyScalar::Float}, {"double", PlyScalar::Double}, {"float64", PlyScalar::Double}};
            std::string_view const name = in_.word();
            auto const type = types.find(name);
            if (type == types.end())
                in_.refuse("the type " + TextScanner::quoted(name) + " is not known");
            return type->second;
        }

        /// The minimum size of an element in the file: a digit and a blank per number, or the length of an empty list.
        std::size_t leastBytes(PlyElement const& element) const
        {
            std::size_t bytes = 0;
            for (PlyProperty const& property : element.properties)
                bytes +=
                    header_.encoding == PlyEncoding::Text ? 2 : sizeOf(property.lengthType.value_or(property.type));
            return bytes;
        }

        static constexpr int kMostLines = 10'000; // each name is compared with all names before it

        TextScanner& in_;
        PlyHeader header_;
        int lineCount_ = 0;
    };

}

PlyHeader readPlyHeader(TextScanner& scanner)
{
    return PlyHeaderReader(scanner).read();
}

}
