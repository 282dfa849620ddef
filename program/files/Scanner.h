#pragma once

#include "GeometryFile.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <limits>
#include <memory>
#include <string_view>
#include <vector>

namespace ModelingProgram {

/// Changes the letters A to Z only, whatever the locale.
inline char lowerCase(char c)
{
    return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}
std::string lowerCase(std::string_view text);

/// The bytes of a file, read at once, or at first only the beginning: readers that know where everything is in the file
/// then read it straight to its place.
struct InputFile {
    enum class Loading { Whole, Beginning };
    static constexpr std::size_t kBeginningBytes = std::size_t{1} << 20;

    explicit InputFile(std::filesystem::path const& file, Loading loading = Loading::Whole);
    /// Reads the rest of the file, if only its beginning has been read. Scanners need the whole file.
    void load() const;
    /// Gives back the memory of what has been read, which scanners must not read again unless it is loaded again.
    void unload() const;

    /// Null if they have not been loaded.
    char const* loadedBytes(std::size_t offset, std::size_t count) const
    {
        return offset <= loadedSize_ && count <= loadedSize_ - offset ? bytes.get() + offset : nullptr;
    }

    /// Copies bytes of the file. Threads may do so concurrently.
    /// \pre  they are inside the file
    void read(std::size_t offset, std::size_t count, void* target) const;

    /// For readers that find other bytes when they read a part again.
    [[noreturn]] void refuseChanged() const;

    std::filesystem::path path;
    std::size_t size = 0;
    std::unique_ptr<char[]> bytes; // memory for all of them, which takes up space only when they are loaded

private:
    struct Descriptor {
        int number = -1;
        Descriptor() = default;
        Descriptor(Descriptor const&) = delete;
        Descriptor& operator=(Descriptor const&) = delete;
        ~Descriptor();
    };

    void loadTo(std::size_t end) const;

    Descriptor descriptor_;
    mutable std::size_t loadedSize_ = 0;
};

/// A coordinate in double precision. Rounded to single precision, it is the float nearest to the number in the file.
struct Coordinate {
    double value = 0;
    bool losesDigits = false; // if rounded to single precision
};

/// The coordinate of a binary number.
template <class T> Coordinate coordinateOf(T value)
{
    auto const wide = static_cast<double>(value);
    return {wide, static_cast<double>(static_cast<float>(wide)) != wide};
}

/// The current position of a reader in a file. All errors in the file are reported through `refuse`, which adds the
/// position.
class Scanner {
public:
    Scanner(InputFile const& file, std::size_t start)
        : Scanner(file, start, file.size)
    {
    }
    /// For the part of a file up to `end`.
    Scanner(InputFile const& file, std::size_t start, std::size_t end)
        : file_(file)
        , at_(file.bytes.get() + start)
        , end_(file.bytes.get() + end)
        , counted_(start)
    {
    }
    Scanner(Scanner const&) = delete;
    Scanner& operator=(Scanner const&) = delete;
    virtual ~Scanner() = default;

    [[noreturn]] void refuse(std::string const& why) const
    {
        throw FileError(file_.path.string() + ", " + location() + ": " + why);
    }

    /// Refuses the file as a whole, without the position.
    [[noreturn]] void refuseWhole(std::string const& why) const
    {
        throw FileError(file_.path.string() + " cannot be read: " + why);
    }

    /// Refuses a declared number of elements that cannot fit in the rest of the file.
    void requirePossible(std::uint64_t count, char const* elements, std::uint64_t leastBytesEach) const
    {
        // The last line of a text may have no line end.
        if (leastBytesEach != 0 && count > (remaining() + 1) / leastBytesEach)
            refuse("the file is cut off: it declares " + std::to_string(count) + " " + elements + ", but only "
                + std::to_string(remaining()) + " bytes follow");
    }

    /// Reading a file counts as its bytes in `workMeter`: half of them when they are loaded, and half when they are
    /// scanned. A reader that scans them twice sets 4 for both scanners.
    void setWorkShare(std::size_t divisor) { workShare_ = divisor; }
    /// Counts what has been scanned since the last chunk of work.
    void countWorkLeft() { countChunk(); }

    std::size_t position() const { return static_cast<std::size_t>(at_ - file_.bytes.get()); }
    std::size_t remaining() const { return static_cast<std::size_t>(end_ - at_); }
    bool atEnd() const { return at_ == end_; }

protected:
    virtual std::string location() const = 0;

    /// Counts what has been scanned, in chunks.
    void countWork()
    {
        constexpr std::size_t kChunk = std::size_t{1} << 20;
        if (position() - counted_ >= kChunk)
            countChunk();
    }

    InputFile const& file_;
    char const* at_;
    char const* end_;

private:
    void countChunk();

    std::size_t counted_;
    std::size_t workShare_ = 2;
};

/// Reads binary numbers, optionally with swapped bytes. Positions are reported as elements, counted from 0.
class BinaryScanner final : public Scanner {
public:
    BinaryScanner(InputFile const& file, std::size_t start, bool swapsBytes)
        : Scanner(file, start)
        , swapsBytes_(swapsBytes)
    {
    }

    void beginElement(char const* kind, std::uint64_t index)
    {
        kind_ = kind;
        index_ = index;
        countWork();
    }
    void endElement() { }

    template <class T> T number(char const* what)
    {
        if (remaining() < sizeof(T))
            refuse(std::string("the file ends before ") + what);
        char bytes[sizeof(T)];
        std::memcpy(bytes, at_, sizeof(T));
        at_ += sizeof(T);
        if (swapsBytes_)
            std::reverse(std::begin(bytes), std::end(bytes));
        T value;
        std::memcpy(&value, bytes, sizeof(T));
        return value;
    }

    bool swapsBytes() const { return swapsBytes_; }
    void skip(std::size_t bytes) { at_ += std::min(bytes, remaining()); }

protected:
    std::string location() const override { return std::string(kind_) + " " + std::to_string(index_); }

private:
    bool swapsBytes_;
    char const* kind_ = "byte";
    std::uint64_t index_ = 0;
};

/// Reads words and numbers from lines of text. Positions are reported as lines, counted from 1.
class TextScanner final : public Scanner {
public:
    enum class Syntax {
        Plain,
        Comments, // from # to the end of the line
        CommentsAndMarks, // in addition, words end at commas and semicolons
        CommentsAndJoinedLines, // in addition, a line that ends with \ continues in the next one
    };

    TextScanner(InputFile const& file, std::size_t start, Syntax syntax)
        : TextScanner(file, start, file.size, syntax)
    {
    }
    /// For lines of a file from `start` up to `end`.
    TextScanner(InputFile const& file, std::size_t start, std::size_t end, Syntax syntax)
        : Scanner(file, start, end)
        , comments_(syntax != Syntax::Plain)
        , hasMarks_(syntax == Syntax::CommentsAndMarks)
        , joinsLines_(syntax == Syntax::CommentsAndJoinedLines)
    {
        if (start == 0)
            skipByteOrderMark();
    }

    /// True if the rest of the line is blank or a comment.
    bool atLineEnd()
    {
        skipBlanks();
        return at_ == end_ || *at_ == '\n' || (comments_ && *at_ == '#');
    }

    void skipAll() { at_ = end_; }
    void skipTo(std::size_t position) { at_ = file_.bytes.get() + position; }

    /// Advances to the end. \return the number of lines that are not empty
    std::uint64_t countLines();

    void nextLine()
    {
        at_ = lineEnd();
        countWork();
    }

    void skipEmptyLines()
    {
        while (!atEnd() && atLineEnd())
            nextLine();
    }

    void expectLineEnd()
    {
        if (!atLineEnd())
            refuse(quoted(peekWord()) + " is unexpected at the end of the line");
        nextLine();
    }

    /// Each element is one line; empty lines do not count.
    void beginElement(char const* kind, std::uint64_t index)
    {
        skipEmptyLines();
        if (atEnd())
            refuse("the file is cut off before " + std::string(kind) + " " + std::to_string(index));
    }
    void endElement() { expectLineEnd(); }

    /// The next word of the line, without advancing; empty at the end of the line.
    std::string_view peekWord()
    {
        if (atLineEnd())
            return {};
        return {at_,
            static_cast<std::size_t>(std::find_if(at_, end_, [&](char const& c) { return isTokenEnd(&c); }) - at_)};
    }

    std::string_view word()
    {
        std::string_view const text = peekWord();
        at_ += text.size();
        return text;
    }

    bool isAt(char character) const { return at_ != end_ && *at_ == character; }
    bool accept(char character)
    {
        bool const isThere = isAt(character);
        at_ += isThere ? 1 : 0;
        return isThere;
    }

    template <class T> T number(char const* what)
    {
        skipBlanks();
        T value{};
        char const* const first = at_ + (hasPlusSign() ? 1 : 0); // from_chars does not accept it
        auto const [rest, error] = std::from_chars(first, end_, value);
        if (error != std::errc{} || !isTokenEnd(rest))
            return unusualNumber<T>(what);
        at_ = rest;
        return value;
    }

    Coordinate coordinate(char const* what = "a coordinate")
    {
        skipBlanks();
        double value = 0;
        char const* const first = at_ + (hasPlusSign() ? 1 : 0);
        auto const [rest, error] = std::from_chars(first, end_, value);
        if (error != std::errc{} || !isTokenEnd(rest))
            return {unusualNumber<float>(what)};
        if (std::isfinite(value) && !std::isfinite(static_cast<float>(value)))
            refuseNumber(what);
        at_ = rest;
        return decimalCoordinate({first, static_cast<std::size_t>(rest - first)}, value);
    }

    /// A whole number, which may be followed by other characters.
    long long leadingInteger(char const* what)
    {
        skipBlanks();
        long long value = 0;
        auto const [rest, error] = std::from_chars(at_, end_, value);
        if (error != std::errc{})
            refuseNumber(what);
        at_ = rest;
        return value;
    }

    [[noreturn]] void refuseNumber(char const* what)
    {
        if (atLineEnd())
            refuse(std::string("the line ends before ") + what);
        refuse(quoted(peekWord()) + " is not a valid number for " + what);
    }

    enum class Rest {
        WithoutComments,
        WithHashes // a # begins a comment only if nothing precedes it
    };
    /// The rest of the line without comments and without blanks at both ends. Advances past the blanks before it.
    std::string_view restOfLine(Rest kind = Rest::WithoutComments);
    /// The same, split at commas, semicolons and tabs if there are any, otherwise at blanks.
    std::vector<std::string_view> fieldsOfLine();

    /// The separator of two values in a line.
    enum class Separator {
        Blanks,
        TightComma, // with no blank beside it, as in 1,5
        Mark, // any other comma or semicolon
        None // the line has ended
    };
    /// Advances past the separator.
    Separator separator();

    /// Cuts a file from `begin` on into parts of about `partBytes` bytes, so that no line, and no line joined to the next
    /// one, is in two of them. \return where each part begins, and the end of the file
    static std::vector<std::size_t> partsOf(InputFile const& file, std::size_t begin, std::size_t partBytes);

    bool atTokenEnd() const { return isTokenEnd(at_); }

    static std::string quoted(std::string_view text);

protected:
    std::string location() const override
    {
        return "line " + std::to_string(1 + std::count(static_cast<char const*>(file_.bytes.get()), at_, '\n'));
    }

private:
    static Coordinate decimalCoordinate(std::string_view digits, double value);

    /// Editors and spreadsheets write a byte order mark at the start of text. The one of UTF-8 is skipped; the one of
    /// UTF-16 means two bytes per character, which cannot be read.
    void skipByteOrderMark()
    {
        std::string_view const text(at_, remaining());
        if (text.starts_with("\xFF\xFE") || text.starts_with("\xFE\xFF"))
            refuse("the text is UTF-16; UTF-8 and ASCII are read");
        if (text.starts_with("\xEF\xBB\xBF"))
            at_ += 3;
    }

    /// The start of the next line.
    char const* lineEnd() const
    {
        auto const* const newline = static_cast<char const*>(std::memchr(at_, '\n', remaining()));
        return newline ? newline + 1 : end_;
    }

    static bool isBlank(char c) { return c == ' ' || c == '\t' || c == '\r' || c == '\v' || c == '\f'; }

    static bool isMark(char c) { return c == ',' || c == ';'; }

    /// The line end if the \ at `backslash` joins two lines; null if it is an ordinary character.
    char const* joinedLine(char const* backslash) const
    {
        char const* newline = backslash + 1;
        while (newline != end_ && isBlank(*newline))
            ++newline;
        return newline != end_ && *newline == '\n' ? newline : nullptr;
    }

    void skipBlanks()
    {
        for (; at_ != end_; ++at_) {
            if (isBlank(*at_))
                continue;
            char const* const newline = joinsLines_ && *at_ == '\\' ? joinedLine(at_) : nullptr;
            if (!newline)
                return;
            at_ = newline;
        }
    }

    bool isTokenEnd(char const* c) const
    {
        return c == end_ || *c == '\n' || isBlank(*c) || (comments_ && *c == '#') || (hasMarks_ && isMark(*c))
            || (joinsLines_ && *c == '\\' && joinedLine(c));
    }

    bool hasPlusSign() const { return isAt('+') && at_ + 1 != end_ && at_[1] != '-'; }

    /// Numbers too small for their type are rounded towards 0; all others that do not fit are refused.
    template <class T> T unusualNumber(char const* what)
    {
        if constexpr (std::is_floating_point_v<T>) {
            std::string_view const text = peekWord();
            double wide = 0;
            auto const [rest, error] =
                std::from_chars(text.data() + (hasPlusSign() ? 1 : 0), text.data() + text.size(), wide);
            bool const isWhole = !text.empty() && rest == text.data() + text.size();
            bool const hasNegativeExponent = text.find_first_of("eE") + 1 == text.find('-', 1);
            bool const isTiny = error == std::errc::result_out_of_range
                ? hasNegativeExponent
                : error == std::errc{} && std::abs(wide) < std::numeric_limits<T>::min();
            if (isWhole && isTiny) {
                at_ = rest;
                return static_cast<T>(wide);
            }
        }
        refuseNumber(what);
    }

    bool comments_;
    bool hasMarks_;
    bool joinsLines_;
};

}
