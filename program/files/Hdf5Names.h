#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace ModelingProgram {

// Keys of an object may contain any bytes, names in HDF5 files neither '/' nor null characters, and they are neither
// empty nor ".". Such names are written with percent escapes, as docs/file-layout.md describes.

inline std::string escapedName(std::string_view key)
{
    constexpr char kDigits[] = "0123456789ABCDEF";
    if (key.empty())
        return "%";
    bool const isDot = key == ".";
    std::string name;
    for (char const c : key) {
        auto const byte = static_cast<unsigned char>(c);
        if (byte < ' ' || byte == 0x7F || c == '/' || c == '%' || isDot)
            name += {'%', kDigits[byte / 16], kDigits[byte % 16]};
        else
            name += c;
    }
    return name;
}

/// Nullopt if a percent sign is not followed by two hexadecimal digits.
inline std::optional<std::string> unescapedName(std::string_view name)
{
    auto const digit = [](char c) {
        return c >= '0' && c <= '9' ? c - '0'
            : c >= 'A' && c <= 'F'  ? c - 'A' + 10
            : c >= 'a' && c <= 'f'  ? c - 'a' + 10
                                    : -1;
    };
    if (name == "%")
        return std::string();
    std::string key;
    for (std::size_t i = 0; i != name.size(); ++i) {
        if (name[i] != '%') {
            key += name[i];
            continue;
        }
        if (name.size() - i < 3 || digit(name[i + 1]) < 0 || digit(name[i + 2]) < 0)
            return std::nullopt;
        key += static_cast<char>(16 * digit(name[i + 1]) + digit(name[i + 2]));
        i += 2;
    }
    return key;
}

}
