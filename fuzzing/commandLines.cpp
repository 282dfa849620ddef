#include "Bags.h"

#include "Program.h"
#include "commands/Commands.h"
#include "commands/Recipe.h"
#include "files/GeometryFile.h"
#include "geometry/MeshRequirements.h"
#include "shell/ShellWords.h"

#include <string>
#include <string_view>
#include <vector>

// Command lines, one word per line, and recipes. Only the parsing: nothing is run, and no file is read or written.

namespace Fuzzing {

namespace {

    using namespace ModelingProgram;

    std::vector<std::string> linesOf(std::string_view text)
    {
        std::vector<std::string> lines;
        while (!text.empty()) {
            std::size_t const end = std::min(text.find('\n'), text.size());
            lines.emplace_back(text.substr(0, end));
            text.remove_prefix(std::min(end + 1, text.size()));
        }
        return lines;
    }

    /// Calls it, and requires that nothing but these failures is thrown.
    template <class Work> void mayFail(Work const& work)
    {
        try {
            work();
        } catch (Failure const& failure) {
            require(failure.what()[0] != '\0', "a failure says why");
        } catch (FileError const& error) {
            require(error.what()[0] != '\0', "a failure says why");
        }
    }

    void checkWords(std::vector<std::string> const& words)
    {
        auto const isPlain = [](std::string const& word) { return word.find('\0') == std::string::npos; };
        if (words.empty() || !std::all_of(words.begin(), words.end(), isPlain))
            return; // not possible on a command line
        require(splitCommands(quotedCommand(words)) == std::vector<std::vector<std::string>>{words},
            "quoted words are read again");
        Invocation invocation;
        CommandLine program("modeling", "", "", "");
        addCommands(program, invocation);
        CommandLine::Parsed const parsed = program.parse(words);
        bool const runs = parsed.mistake.empty() && parsed.help.empty();
        require(!runs || invocation.run, "a command is selected");
    }

    void checkSteps(std::vector<Step> const& steps)
    {
        for (std::string const& extension : geometryFormats())
            mayFail([&] { requireFit(steps, {"output." + extension}); });
        mayFail([&] { requireChain(steps, 1); });
    }

    void checkRecipeText(std::string_view text)
    {
        Recipe const recipe = parseRecipe(text);
        checkSteps(recipe.steps);
        Json const again = recipeOf(recipe.steps);
        require(recipeOf(parseRecipe(again.dump()).steps) == again, "a recipe that is written is read again");
    }

}

}

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size)
{
    using namespace Fuzzing;
    std::string_view const text(reinterpret_cast<char const*>(data), size);
    if (text.starts_with('{')) {
        mayFail([&] { checkRecipeText(text); });
        return 0;
    }
    checkWords(linesOf(text));
    mayFail([&] { checkSteps(parseSteps(std::string(text))); });
    mayFail([&] { parseRequirements(std::string(text)); });
    return 0;
}
