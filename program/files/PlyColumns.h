#pragma once

#include <string_view>

namespace ModelingProgram {

/// Columns of a PLY file that form one property. Writers use the first of several groups for a property.
struct PlyColumns {
    std::string_view property;
    unsigned int components;
    std::string_view names; // separated by spaces
};

// If a group is a prefix of another, the longer one comes first.
inline constexpr PlyColumns kPlyColumns[] = {
    {"normal", 3, "nx ny nz"},
    {"color", 4, "red green blue alpha"},
    {"color", 3, "red green blue"},
    {"uv", 2, "s t"},
    {"uv", 2, "u v"},
    {"uv", 2, "texture_u texture_v"},
};

/// The name of the face lists with the texture coordinates of their corners, two numbers per corner.
inline constexpr std::string_view kPlyCornerTextures = "texcoord";

}
