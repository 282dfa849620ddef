#include "Commands.h"
#include "Operation.h"
#include "PageOfRun.h"
#include "Recipe.h"
#include "Steps.h"
#include "shell/Failure.h"

#include <fmt/format.h>

#include <memory>

namespace ModelingProgram {

namespace {

    struct RunOptions {
        FileList files;
        std::string steps;
        std::filesystem::path recipe;
        bool printsRecipe = false;
        bool printsSchema = false;
    };

    void printDocument(char const* key, Json const& document, Report& report)
    {
        report.document[key] = document;
        report.text = toText(document) + "\n";
    }

    void run(RunOptions& options, Report& report)
    {
        std::vector<Step> steps = options.recipe.empty() ? parseSteps(options.steps) : readRecipe(options.recipe);
        for (Step const& step : steps)
            if (!step.help.empty()) {
                report.text = step.help;
                return;
            }
        if (options.printsRecipe) {
            printDocument("recipe", recipeOf(steps), report);
            return;
        }
        chooseOutput("run", options.files);
        runSteps(steps, options.files.in, options.files.out, report);
    }

    std::string listOfSteps()
    {
        std::vector<std::string> names;
        for (EditKind const* const kind : editKinds())
            names.emplace_back(kind->help.name);
        return listOf(names);
    }

}

void addRun(CommandLine& program, Invocation& invocation)
{
    static std::string const details = fmt::format(
        R"(The steps are run on the geometry in memory, one after another, and only the last result is written. A step is
written like the command of the same name, without IN, OUT and the options of every command: names with blanks are quoted
as in a shell. Ratios such as --relative refer to the geometry at that step. The steps are: {}. merge joins the input
files, so it can only be the first step; without it there is one input.

If a step fails, nothing is written, and the message names the step. --do "smooth --help" explains the options of a step.

A recipe is a JSON file of steps, such as {{"modeling": 1, "steps": [{{"do": "triangulate"}}, {{"do": "smooth", "amount": 2,
"pin-boundary": true}}]}}. The keys are the long names of the options.)",
        listOfSteps());
    auto const options = std::make_shared<RunOptions>();
    CommandHelp const help = {"run", "Run several steps on files without writing what is between them", details.c_str(),
        "  modeling run cad.obj fine.stl --do \"triangulate; subdivide --relative 0.01; smooth --amount 1\"\n"
        "  modeling run a.ply b.ply all.ply --do \"merge; delete-points --attribute outlier\"\n"
        "  modeling run --do \"triangulate; remove-slivers\" --print-recipe > clean.json\n"
        "  modeling run part.obj part.vtp --recipe clean.json"};
    Command command = addCommand(help, program, invocation);
    addFiles(options->files, command, invocation, Needed::Sometimes);
    addPageOption(options->files.out, command);
    Command steps = command.addChoice("Steps", "one of these is required");
    steps.addOption("--do", options->steps, "Steps, separated by semicolons").valueName("STEPS");
    steps.addOption("--recipe", options->recipe, "A JSON file of steps").valueName("FILE");
    steps.addFlag("--print-schema", options->printsSchema, "Print the JSON schema of recipes and exit");
    command.addFlag("--print-recipe", options->printsRecipe, "Print the steps as a recipe and exit");
    onSelected(command, invocation, [options](Report& report) {
        if (options->printsSchema) {
            printDocument("schema", recipeSchema(), report);
            return;
        }
        run(*options, report);
    });
}

}
