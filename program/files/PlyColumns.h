#pragma once

#include <string_view>

namespace ModelingProgram {

/// Columns of a PLY file that make up one property. Of several groups for one property, writers take the first.
struct PlyColumns {
    std::string_view property;
    unsigned int components;
    std::string_view names; // separated by blanks
};

// Where one group begins like another, the longer one stands first.
inline constexpr PlyColumns kPlyColumns[] = {
    {"normal", 3, "nx ny nz"},
    {"color", 4, "red green blue alpha"},
    {"color", 3, "red green blue"},
    {"uv", 2, "s t"},
    {"uv", 2, "u v"},
    {"uv", 2, "texture_u texture_v"},
};

/// The name of the lists of the faces that hold texture coordinates of their corners, two numbers each.
inline constexpr std::string_view kPlyCornerTextures = "texcoord";

}
