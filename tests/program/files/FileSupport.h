#pragma once

#include "GeometryFile.h"

#include "program/TemporaryFolder.h"
#include "support/Testing.h"

#include <TessaraGeometry/Validators.h>

#include <gmock/gmock.h>

#include <bit>
#include <cstring>

namespace ModelingProgram {

using namespace Tessara::Math;
using namespace TestSupport;

inline GeometryFile readContent(std::string const& extension, std::string_view content, ReadOptions const& options = {})
{
    TemporaryFolder const folder;
    store(folder / ("file" + extension), content);
    return readGeometryFile(folder / ("file" + extension), options);
}

/// The error message after the name of the file; empty if the file is read.
inline std::string refusalOf(std::string const& extension, std::string_view content, ReadOptions const& options = {})
{
    try {
        readContent(extension, content, options);
    } catch (FileError const& error) {
        std::string const name = "file" + extension;
        std::string const text = error.what();
        return text.substr(std::min(text.size(), text.find(name) + name.size()));
    }
    return {};
}

/// The same, with its keys in alphabetical order.
inline Orvan::MutablePtr<Tessara::Object> sorted(Tessara::Object const& object)
{
    auto keys = *object.keys();
    std::sort(keys.begin(), keys.end());
    Orvan::MutablePtr<Tessara::Object> result = Tessara::createObject();
    for (Orvan::String const& key : keys)
        result->setProperty(key, object.getProperty(key));
    return result;
}

/// The bytes of consecutive numbers in a byte order.
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
