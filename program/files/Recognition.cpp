#include "Recognition.h"

#include "Scanner.h"
#include "Streams.h"

#include <algorithm>
#include <array>
#include <fstream>

namespace ModelingProgram {

namespace {

    constexpr std::size_t kExaminedBytes = 1 << 16;

    /// The first words of the first line that is neither empty nor a comment.
    std::array<std::string_view, 2> firstWordsIn(std::string_view text)
    {
        constexpr std::string_view kBlanks = " \t\r\v\f";
        if (text.starts_with("\xEF\xBB\xBF"))
            text.remove_prefix(3);
        while (!text.empty()) {
            std::string_view line = text.substr(0, text.find('\n'));
            text.remove_prefix(std::min(line.size() + 1, text.size()));
            line = line.substr(0, line.find('#'));
            std::array<std::string_view, 2> words;
            for (std::string_view& word : words) {
                line.remove_prefix(std::min(line.find_first_not_of(kBlanks), line.size()));
                word = line.substr(0, line.find_first_of(kBlanks));
                line.remove_prefix(word.size());
            }
            if (!words[0].empty())
                return words;
        }
        return {};
    }

    bool beginsAsNumber(std::string_view word)
    {
        return !word.empty() && std::string_view("0123456789+-.").find(word[0]) != std::string_view::npos;
    }

    std::string formatOfText(std::string_view text)
    {
        auto const [first, second] = firstWordsIn(text);
        constexpr std::string_view kVectors[] = {"v", "vn", "vt"}, kNames[] = {"mtllib", "usemtl", "o", "g"},
                                   kOff[] = {"OFF", "COFF", "NOFF", "CNOFF", "NCOFF", "STOFF", "STCOFF", "STNOFF"};
        auto const isOneOf = [](std::string_view word, auto const& words) {
            return std::find(std::begin(words), std::end(words), word) != std::end(words);
        };
        if ((isOneOf(first, kVectors) && beginsAsNumber(second)) || isOneOf(first, kNames))
            return ".obj";
        if (isOneOf(first, kOff))
            return ".off";
        if (first == "solid")
            return ".stl";
        return first.starts_with('{') ? ".gltf" : "";
    }

    bool isBinaryStl(std::string_view start, std::uintmax_t fileBytes)
    {
        constexpr std::size_t kHeaderBytes = 84, kTriangleBytes = 50;
        std::uint32_t count = 0;
        if (start.size() < kHeaderBytes)
            return false;
        std::memcpy(&count, start.data() + kHeaderBytes - sizeof(count), sizeof(count));
        return fileBytes == kHeaderBytes + std::uintmax_t{count} * kTriangleBytes;
    }

}

std::string recognizedFormat(std::filesystem::path const& file)
{
    std::filesystem::path const regular = regularFileOf(file);
    std::ifstream stream(regular, std::ios::binary);
    std::string start(kExaminedBytes, '\0');
    stream.read(start.data(), static_cast<std::streamsize>(start.size()));
    start.resize(static_cast<std::size_t>(std::max<std::streamsize>(stream.gcount(), 0)));
    std::error_code ignored;
    constexpr std::pair<std::string_view, char const*> kBeginnings[] = {
        {"ply\n", ".ply"}, {"ply\r", ".ply"}, {"glTF", ".glb"}, {"\x89HDF\r\n\x1a\n", ".h5"}};
    for (auto const& [bytes, format] : kBeginnings)
        if (start.starts_with(bytes))
            return format;
    return isBinaryStl(start, std::filesystem::file_size(regular, ignored)) ? ".stl" : formatOfText(start);
}

}
