#include "Scanner.h"

#include <cerrno>
#include <cstdio>

namespace ModelingProgram {

namespace {

    [[noreturn]] void refuseFile(std::filesystem::path const& file, std::string const& why)
    {
        throw FileError(file.string() + " cannot be read: " + why);
    }

}

InputFile::InputFile(std::filesystem::path const& file)
    : path(file)
{
    std::error_code error;
    std::filesystem::file_status const status = std::filesystem::status(file, error);
    if (status.type() == std::filesystem::file_type::not_found)
        refuseFile(file, "there is no such file");
    if (error)
        refuseFile(file, error.message());
    if (!std::filesystem::is_regular_file(status))
        refuseFile(file, "it is no regular file");

    std::unique_ptr<std::FILE, int (*)(std::FILE*)> const stream(std::fopen(file.c_str(), "rb"), &std::fclose);
    if (!stream)
        refuseFile(file, std::strerror(errno));
    std::uintmax_t const fileSize = std::filesystem::file_size(file, error);
    if (error)
        refuseFile(file, error.message());
    bytes = std::make_unique_for_overwrite<char[]>(fileSize);
    size = std::fread(bytes.get(), 1, fileSize, stream.get());
    if (size != fileSize)
        refuseFile(file, std::ferror(stream.get()) ? std::strerror(errno) : "it changed while it was read");
}

std::string TextScanner::quoted(std::string_view text)
{
    constexpr std::size_t kShown = 40;
    std::string result = "\"";
    for (char const c : text.substr(0, kShown))
        result += c > ' ' && c <= '~' ? c : '?';
    return result + (text.size() > kShown ? "...\"" : "\"");
}

}
