#pragma once

#include <compare>
#include <string>
#include <string_view>

namespace Orvan {

/// A string value. Short strings (up to 15 bytes) are stored without an allocation.
///
/// Any number of threads may read and copy one string at once, and different threads may write different strings, even
/// if they are elements of the same array. A null `char const*` counts as the empty string.
class String {
public:
    String() = default;
    String(char const* text) // implicit, so that keys can be written as literals
        : text_(text ? text : "")
    {
    }
    explicit String(std::string_view text)
        : text_(text)
    {
    }

    String& operator=(char const* text)
    {
        text_ = text ? text : "";
        return *this;
    }

    String& operator+=(char const* text)
    {
        text_ += text ? text : "";
        return *this;
    }

    char const* c_str() const noexcept { return text_.c_str(); }
    bool empty() const noexcept { return text_.empty(); }
    std::string_view view() const noexcept { return text_; }

    friend bool operator==(String const&, String const&) = default;
    friend auto operator<=>(String const& a, String const& b) { return a.text_ <=> b.text_; }

private:
    std::string text_;
};

inline bool operator==(String const& a, char const* b)
{
    return a.view() == (b ? b : "");
}

}
