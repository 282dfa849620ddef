#pragma once

#include <span>
#include <string_view>

namespace ModelingProgram {

// The viewer in pages, which the build makes from viewer/. Texts are in parts, because compilers limit literals.

struct Viewer {
    std::span<std::string_view const> style;
    std::span<std::string_view const> script;
    std::string_view styleHash; // SHA-256 in base64, for the policy of the page
    std::string_view scriptHash;
};

Viewer const& viewer();

}
