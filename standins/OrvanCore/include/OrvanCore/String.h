#pragma once

#include <compare>
#include <string>
#include <string_view>

namespace Orvan {

/// A text value; immutable by convention. Short texts (up to 15 characters) take no memory of their own.
///
/// Concurrent reading is safe. A null `char const*` counts as the empty text.
class String {
public:
    String() = default;
    String(char const* text) // implicit on purpose: keys are written as plain text
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
