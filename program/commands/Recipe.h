#pragma once

#include "Operation.h"
#include "Steps.h"
#include "shell/Failure.h"
#include "shell/Report.h"

#include <compare>
#include <filesystem>
#include <map>
#include <string>
#include <string_view>
#include <vector>

namespace ModelingProgram {

// A recipe is a JSON document of steps, such as
//
//     {"modeling": 1, "steps": [{"do": "triangulate"}, {"do": "subdivide", "relative": 0.01, "volume": "guide.vdb"}],
//      "output": {"format": "ply"}}
//
// The keys of a step are the long names of its options and the names of its files. Values are true for flags, numbers,
// strings, or lists of them. "output" is for those who run a recipe on many files: `modeling run` is told its output.
// docs/recipe.schema.json is its JSON schema.

/// A key of a recipe, or of one of its steps.
struct RecipePlace {
    std::size_t step = 0; // counted from 1; 0 for the recipe itself
    std::string key = {}; // empty for all of the step or recipe

    auto operator<=>(RecipePlace const&) const = default;
};

/// The lines of a document, counted from 1, on which keys and steps begin.
using RecipeLines = std::map<RecipePlace, std::size_t>;

/// A fault of a recipe. The sentence names the step, but neither file nor line.
class RecipeFailure : public Failure {
public:
    RecipeFailure(Failure const& failure, RecipePlace where, std::size_t onLine = 0)
        : Failure(failure)
        , place(std::move(where))
        , line(onLine)
    {
    }

    RecipePlace place;
    std::size_t line; // counted from 1; 0 if it is unknown
};

struct Recipe {
    std::vector<Step> steps;
    Output output; // without a file; its format is empty if the recipe names none
    RecipeLines lines;
};

/// Parses a recipe.
/// \throws RecipeFailure  with the exit code File if the text is not JSON, and CommandLine if a step is wrong
Recipe parseRecipe(std::string_view text);

/// Refuses steps that would fail on any single file, or whose result the format of the output cannot hold. The format is
/// not checked if it is empty.
/// \throws RecipeFailure
void checkRecipe(Recipe const& recipe, std::string const& format);

/// Reads the steps of a recipe.
/// \throws Failure, FileError  that name the file, the line, and the step if the fault is in one
std::vector<Step> readRecipe(std::filesystem::path const& file);

/// The recipe of these steps.
Json recipeOf(std::vector<Step> const& steps);

/// The JSON schema of recipes, made from the declarations of all options.
Json recipeSchema();

}
