#include "Commands.h"
#include "shell/Completion.h"
#include "shell/Manual.h"

#include <memory>

namespace ModelingProgram {

void addHelp(CommandLine& program, Invocation& invocation)
{
    auto const name = std::make_shared<std::string>();
    constexpr CommandHelp kHelp = {"help", "Explain a command",
        "The same as \"modeling COMMAND --help\", or without COMMAND as \"modeling --help\".",
        "  modeling help smooth"};
    Command command = program.addCommand(kHelp);
    command.addOption("COMMAND", *name, "Command to explain").synopsis(" ");
    onSelected(command, invocation, [&program, name](Report& report) { report.text = program.helpOf(*name); });
}

void addCompletion(CommandLine& program, Invocation& invocation)
{
    auto const shell = std::make_shared<std::string>();
    constexpr CommandHelp kHelp = {"completion", "Print a script that completes commands and options in a shell",
        "Packages install these scripts; without a package, load one in the startup file of the shell.",
        "  source <(modeling completion bash)\n"
        "  modeling completion zsh > \"${fpath[1]}/_modeling\"\n"
        "  modeling completion fish > ~/.config/fish/completions/modeling.fish"};
    Command command = program.addCommand(kHelp);
    command.addOption("SHELL", *shell, "bash, zsh or fish").required().synopsis(" ").oneOf({"bash", "zsh", "fish"});
    onSelected(command, invocation, [&program, shell](Report& report) {
        ProgramDescription const described = program.describe();
        report.text = *shell == "bash" ? bashCompletion(described)
            : *shell == "zsh"          ? zshCompletion(described)
                                       : fishCompletion(described);
    });
}

void addManual(CommandLine& program, Invocation& invocation)
{
    constexpr CommandHelp kHelp = {"man", "Print the manual page",
        "The text is in the language of man(1). Packages install it; \"man modeling\" shows it then.",
        "  modeling man | man -l -"};
    Command command = program.addCommand(kHelp);
    onSelected(command, invocation, [&program](Report& report) { report.text = manualPage(program.describe()); });
}

}
