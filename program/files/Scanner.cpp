#include "Scanner.h"

#include "Streams.h"

#include <bit>
#include <cerrno>
#include <cstdio>

namespace ModelingProgram {

namespace {

    [[noreturn]] void refuseFile(std::filesystem::path const& file, std::string const& why)
    {
        throw FileError(file.string() + " cannot be read: " + why);
    }

    /// Half a unit of the last digit: a number within this distance is still written with the same digits. Infinite for
    /// up to six significant digits, which every float preserves.
    double leastReportedLoss(std::string_view number)
    {
        int digitCount = 0, decimalCount = 0, exponent = 0;
        bool isBehindPoint = false;
        for (char const* c = number.data(); c != number.data() + number.size(); ++c) {
            if (*c == 'e' || *c == 'E') {
                bool const hasPlus = c + 1 != number.data() + number.size() && c[1] == '+';
                std::from_chars(c + (hasPlus ? 2 : 1), number.data() + number.size(), exponent);
                break;
            }
            isBehindPoint = isBehindPoint || *c == '.';
            if (*c < '0' || *c > '9')
                continue;
            decimalCount += isBehindPoint;
            digitCount += digitCount != 0 || *c != '0';
        }
        if (digitCount <= std::numeric_limits<float>::digits10)
            return HUGE_VAL;
        constexpr double kUnits[] = {1e0, 1e-1, 1e-2, 1e-3, 1e-4, 1e-5, 1e-6, 1e-7, 1e-8, 1e-9, 1e-10};
        int const place = decimalCount - exponent;
        bool const isCommon = place >= 0 && place < static_cast<int>(std::size(kUnits)); // std::pow is slow
        return 0.500001 * (isCommon ? kUnits[place] : std::pow(10.0, -place));
    }

}

std::string lowerCase(std::string_view text)
{
    std::string result(text);
    for (char& c : result)
        c = lowerCase(c);
    return result;
}

InputFile::InputFile(std::filesystem::path const& file)
    : path(file)
{
    std::filesystem::path const regular = regularFileOf(file);
    std::unique_ptr<std::FILE, int (*)(std::FILE*)> const stream(std::fopen(regular.c_str(), "rb"), &std::fclose);
    if (!stream)
        refuseFile(file, std::strerror(errno));
    std::error_code error;
    std::uintmax_t const fileSize = std::filesystem::file_size(regular, error);
    if (error)
        refuseFile(file, error.message());
    bytes = std::make_unique_for_overwrite<char[]>(fileSize);
    size = std::fread(bytes.get(), 1, fileSize, stream.get());
    if (size != fileSize)
        refuseFile(file, std::ferror(stream.get()) ? std::strerror(errno) : "it changed while it was read");
}

/// Double rounding, first to double and then to single precision, can miss the nearest float if the double is halfway
/// between two floats. It is then moved towards the decimal number.
Coordinate TextScanner::decimalCoordinate(std::string_view digits, double value)
{
    auto rounded = static_cast<float>(value);
    if (static_cast<double>(rounded) == value || !std::isfinite(value))
        return {value};
    constexpr std::uint64_t kBelowFloat = (std::uint64_t{1} << 29) - 1;
    if ((std::bit_cast<std::uint64_t>(value) & kBelowFloat) == (kBelowFloat + 1) / 2) {
        std::from_chars(digits.data(), digits.data() + digits.size(), rounded);
        value = static_cast<float>(value) == rounded ? value : std::nextafter(value, static_cast<double>(rounded));
    }
    return {value, std::abs(value - static_cast<double>(rounded)) > leastReportedLoss(digits)};
}

std::string_view TextScanner::restOfLine(Rest kind)
{
    if (atLineEnd())
        return {};
    bool const endsAtHash = comments_ && kind == Rest::WithoutComments;
    char const* end = std::find_if(at_, end_, [&](char c) { return c == '\n' || (endsAtHash && c == '#'); });
    while (end != at_ && isBlank(end[-1]))
        --end;
    return {at_, static_cast<std::size_t>(end - at_)};
}

std::vector<std::string_view> TextScanner::fieldsOfLine()
{
    std::string_view rest = restOfLine();
    bool const hasMarks = rest.find_first_of(",;\t") != std::string_view::npos;
    std::vector<std::string_view> fields;
    while (!rest.empty()) {
        std::size_t const end = std::min(rest.size(), rest.find_first_of(hasMarks ? ",;\t" : " \v\f\r"));
        std::string_view field = rest.substr(0, end);
        while (!field.empty() && isBlank(field.front()))
            field.remove_prefix(1);
        while (!field.empty() && isBlank(field.back()))
            field.remove_suffix(1);
        if (hasMarks || !field.empty())
            fields.push_back(field);
        rest.remove_prefix(std::min(rest.size(), end + 1));
    }
    return fields;
}

TextScanner::Separator TextScanner::separator()
{
    char const* const valueEnd = at_;
    skipBlanks();
    bool const hasMark = at_ != end_ && isMark(*at_);
    bool const isTightComma = hasMark && *at_ == ',' && at_ == valueEnd && at_ + 1 != end_ && !isBlank(at_[1]);
    at_ += hasMark ? 1 : 0;
    if (atLineEnd())
        return Separator::None;
    return isTightComma ? Separator::TightComma : hasMark ? Separator::Mark : Separator::Blanks;
}

std::string TextScanner::quoted(std::string_view text)
{
    constexpr std::size_t kShown = 40;
    std::string result = "\"";
    for (char const c : text.substr(0, kShown))
        result += c >= ' ' && c <= '~' ? c : '?';
    return result + (text.size() > kShown ? "...\"" : "\"");
}

}
