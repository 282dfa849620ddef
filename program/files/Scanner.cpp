#include "Scanner.h"

#include "Streams.h"
#include "WorkMeter.h"

#include "frame/ParallelFor.h"

#include <bit>
#include <cerrno>

#include <fcntl.h>
#include <sys/mman.h>
#include <unistd.h>

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

InputFile::InputFile(std::filesystem::path const& file, Loading loading)
    : path(file)
{
    std::filesystem::path const regular = regularFileOf(file);
    descriptor_.number = ::open(regular.c_str(), O_RDONLY | O_CLOEXEC);
    if (descriptor_.number < 0)
        refuseFile(file, std::strerror(errno));
    std::error_code error;
    std::uintmax_t const fileSize = std::filesystem::file_size(regular, error);
    if (error)
        refuseFile(file, error.message());
    size = fileSize;
    bytes = std::make_unique_for_overwrite<char[]>(size);
    loadTo(loading == Loading::Whole ? size : std::min(size, kBeginningBytes));
}

InputFile::Descriptor::~Descriptor()
{
    if (number >= 0)
        ::close(number);
}

void InputFile::load() const
{
    loadTo(size);
}

void InputFile::unload() const
{
    // Scanners keep their positions: the addresses remain valid, only the pages are given back.
    auto const page = static_cast<std::size_t>(::sysconf(_SC_PAGESIZE));
    auto const address = reinterpret_cast<std::uintptr_t>(bytes.get());
    std::uintptr_t const first = (address + page - 1) / page * page, end = (address + loadedSize_) / page * page;
    if (first < end)
        ::madvise(bytes.get() + (first - address), end - first, MADV_DONTNEED);
    loadedSize_ = 0;
}

void InputFile::loadTo(std::size_t end) const
{
    constexpr std::size_t kPartBytes = std::size_t{1} << 22;
    std::size_t const begin = loadedSize_, partCount = (end - begin + kPartBytes - 1) / kPartBytes;
    // Each part has its own bytes.
    Modeling::parallelFor(
        tbb::blocked_range<std::size_t>(0, partCount, Modeling::kCoarseGrain), [&](auto const& parts) {
            for (std::size_t part = parts.begin(); part != parts.end(); ++part) {
                std::size_t const first = begin + part * kPartBytes;
                std::size_t const count = std::min(kPartBytes, end - first);
                read(first, count, bytes.get() + first);
                workMeter.add(count / 2); // the other half of the work is to scan them
            }
        });
    loadedSize_ = end;
}

void InputFile::read(std::size_t offset, std::size_t count, void* target) const
{
    auto* to = static_cast<char*>(target);
    while (count != 0) {
        ssize_t const done = ::pread(descriptor_.number, to, count, static_cast<off_t>(offset));
        if (done < 0 && errno == EINTR)
            continue;
        if (done < 0)
            refuseFile(path, std::strerror(errno));
        if (done == 0)
            refuseChanged();
        to += done;
        offset += static_cast<std::size_t>(done);
        count -= static_cast<std::size_t>(done);
    }
}

void InputFile::refuseChanged() const
{
    refuseFile(path, "it changed while it was read");
}

void Scanner::countChunk()
{
    workMeter.add((position() - counted_) / workShare_);
    counted_ = position();
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

/// In most files all lines begin with a character that is neither a blank nor #. As long as that is so, line ends are
/// counted, which compilers do for many bytes at a time.
std::uint64_t TextScanner::countLines()
{
    constexpr std::ptrdiff_t kBlock = 255; // so that a byte can count the line ends of a block
    auto const isPlain = [](char c) { return static_cast<unsigned char>(c) > '#'; };
    std::uint64_t count = atLineEnd() ? 0 : 1;
    for (char const *block = at_, *next = at_; block != end_; block = next) {
        next = block + std::min(kBlock, end_ - block);
        unsigned char lineEnds = 0, plainLines = 0;
        for (char const* c = block; next != end_ && c != next; ++c) {
            lineEnds = static_cast<unsigned char>(lineEnds + (*c == '\n'));
            plainLines = static_cast<unsigned char>(plainLines + ((*c == '\n') & isPlain(c[1])));
        }
        if (next != end_ && lineEnds == plainLines) {
            count += lineEnds;
            continue;
        }
        for (char const* c = std::find(block, next, '\n'); c != next; c = std::find(c + 1, next, '\n')) {
            at_ = c + 1;
            count += atLineEnd() ? 0 : 1;
        }
    }
    skipAll();
    return count;
}

std::vector<std::size_t> TextScanner::partsOf(InputFile const& file, std::size_t begin, std::size_t partBytes)
{
    std::string_view const text(file.bytes.get(), file.size);
    std::vector<std::size_t> parts{begin};
    for (std::size_t at = begin + partBytes; at < text.size();) {
        std::size_t const newline = text.find('\n', at);
        if (newline == std::string_view::npos)
            break;
        std::size_t last = newline;
        while (last != 0 && isBlank(text[last - 1]))
            --last;
        bool const mayBeJoined = last != 0 && text[last - 1] == '\\';
        if (!mayBeJoined)
            parts.push_back(newline + 1);
        at = newline + (mayBeJoined ? 1 : partBytes);
    }
    if (parts.back() != text.size() || parts.size() == 1)
        parts.push_back(text.size());
    return parts;
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
