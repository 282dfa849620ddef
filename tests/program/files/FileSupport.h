#pragma once

#include "GeometryFile.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Validators.h>

#include <cstdlib>
#include <cstring>
#include <fstream>
#include <iterator>

namespace ModelingProgram {

/// A folder that goes with what is in it.
class TemporaryFolder {
public:
    TemporaryFolder()
    {
        std::string name = (std::filesystem::temp_directory_path() / "modeling-files-XXXXXX").string();
        if (!::mkdtemp(name.data()))
            throw std::runtime_error("no temporary folder");
        path_ = name;
    }
    TemporaryFolder(TemporaryFolder const&) = delete;
    TemporaryFolder& operator=(TemporaryFolder const&) = delete;
    ~TemporaryFolder() { std::filesystem::remove_all(path_); }

    std::filesystem::path operator/(std::string const& name) const { return path_ / name; }
    auto entryCount() const
    {
        return std::distance(std::filesystem::directory_iterator(path_), std::filesystem::directory_iterator());
    }

private:
    std::filesystem::path path_;
};

inline void store(std::filesystem::path const& file, std::string_view content)
{
    std::filesystem::remove(file); // for writing over it can wait for the disk
    std::ofstream(file, std::ios::binary) << content;
}

inline std::string contentOf(std::filesystem::path const& file)
{
    std::ifstream stream(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(stream), {}};
}

inline GeometryFile readContent(std::string const& extension, std::string_view content)
{
    TemporaryFolder const folder;
    store(folder / ("file" + extension), content);
    return readGeometryFile(folder / ("file" + extension));
}

/// What is said about a file behind its name; empty where it is read.
inline std::string refusalOf(std::string const& extension, std::string_view content)
{
    try {
        readContent(extension, content);
    } catch (FileError const& error) {
        std::string const name = "file" + extension;
        std::string const text = error.what();
        return text.substr(std::min(text.size(), text.find(name) + name.size()));
    }
    return {};
}

/// Goes through a file and back.
inline GeometryFile writtenAndRead(Tessara::Object const& object, std::string const& extension)
{
    TemporaryFolder const folder;
    writeGeometryFile(object, folder / ("file" + extension));
    return readGeometryFile(folder / ("file" + extension));
}

template <class T> std::vector<T> valuesOf(Tessara::Object const& object, char const* name)
{
    auto const values = Tessara::Geometry::dataOf<T>(object, name);
    return values ? std::vector<T>(values->begin(), values->end()) : std::vector<T>();
}

/// The bytes of numbers, one after the other, the first or the last byte of each in front.
template <class... T> std::string bytesOf(std::endian order, T... numbers)
{
    std::string result;
    auto const add = [&](auto number) {
        std::string bytes(sizeof(number), '\0');
        std::memcpy(bytes.data(), &number, sizeof(number));
        result += order == std::endian::native ? bytes : std::string(bytes.rbegin(), bytes.rend());
    };
    (add(numbers), ...);
    return result;
}

}
