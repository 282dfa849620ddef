#pragma once

#include "Bags.h"

#include "program/TemporaryFolder.h"

#include "files/GeometryFile.h"
#include "files/Scanner.h"

#include <TessaraGeometry/Validators.h>

#include <optional>
#include <string>

namespace Fuzzing {

using namespace ModelingProgram;

/// What a reader makes of a file: an object, or a refusal that names the file.
struct ReadResult {
    Orvan::MutablePtr<Object> object;
    std::string refusal;
};

/// The only file in a folder of its own, so that nothing else can be read by way of it.
inline std::filesystem::path const& storedFile(std::uint8_t const* data, std::size_t size)
{
    static TemporaryFolder const folder;
    static std::filesystem::path const file = folder / "file";
    store(file, {reinterpret_cast<char const*>(data), size});
    return file;
}

inline ReadOptions readOptions(bool isLenient)
{
    constexpr std::uint64_t kMostBytes = std::uint64_t{64} << 20;
    ReadOptions options{.isLenient = isLenient, .isCentered = isLenient};
    options.onSize = [](std::uint64_t bytes) {
        if (bytes > kMostBytes)
            throw FileError("file is too large");
    };
    return options;
}

/// Reads the file with `read(file, options)`, and checks the object.
template <class Read> ReadResult readChecked(std::filesystem::path const& path, bool isLenient, Read const& read)
{
    try {
        GeometryFile const file = read(InputFile(path), readOptions(isLenient));
        require(isValid(*file.object), "what is read is valid");
        require(reportProperties(*file.object).empty(), "properties that are read fit");
        return {deepCopy(*file.object), {}};
    } catch (FileError const& error) {
        std::string refusal = error.what();
        require(refusal.find("file") != std::string::npos, "a refusal names the file");
        return {nullptr, std::move(refusal)};
    }
}

inline void requireSame(ReadResult const& a, ReadResult const& b)
{
    require(a.refusal == b.refusal, "the same refusal: " + a.refusal + " | " + b.refusal);
    if (a.object)
        require(sameContents(*a.object, *b.object), "the same contents");
}

}
