#pragma once

#include "Steps.h"
#include "shell/Report.h"

#include <filesystem>
#include <vector>

namespace ModelingProgram {

// A recipe is a JSON document of steps, such as
//
//     {"modeling": 1, "steps": [{"do": "triangulate"}, {"do": "subdivide", "relative": 0.01, "volume": "guide.vdb"}]}
//
// The keys of a step are the long names of its options and the names of its files. Values are true for flags, numbers,
// strings, or lists of them. docs/recipe.schema.json is its JSON schema.

/// Reads a recipe.
/// \throws Failure, FileError  that name the file, and the step if the fault is in one
std::vector<Step> readRecipe(std::filesystem::path const& file);

/// The recipe of these steps.
Json recipeOf(std::vector<Step> const& steps);

/// The JSON schema of recipes, made from the declarations of all options.
Json recipeSchema();

}
