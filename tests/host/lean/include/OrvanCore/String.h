#pragma once

#include <cstring>
#include <string>

namespace Orvan {

class String {
public:
    String() = default;
    String(char const* text)
        : text_(text)
    {
    }
    String& operator=(char const* text)
    {
        text_ = text;
        return *this;
    }
    String& operator+=(char const* text)
    {
        text_ += text;
        return *this;
    }

    char const* c_str() const noexcept { return text_.c_str(); }
    bool empty() const noexcept { return text_.empty(); }
    bool operator==(String const& other) const noexcept { return text_ == other.text_; }
    bool operator!=(String const& other) const noexcept { return text_ != other.text_; }

private:
    std::string text_;
};

inline bool operator==(String const& a, char const* b)
{
    return std::strcmp(a.c_str(), b) == 0;
}

}
