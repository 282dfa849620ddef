#include "Completion.h"

#include <fmt/format.h>

#include <algorithm>

namespace ModelingProgram {

namespace {

    std::vector<std::string> namesOf(OptionDescription const& option)
    {
        std::vector<std::string> names{"--" + option.name};
        if (!option.shortName.empty())
            names.push_back("-" + option.shortName);
        return names;
    }

    std::string joined(std::vector<std::string> const& words, char const* separator)
    {
        return fmt::format("{}", fmt::join(words, separator));
    }

    std::string replaced(std::string text, std::string_view from, std::string_view to)
    {
        for (std::size_t at = text.find(from); at != std::string::npos; at = text.find(from, at + to.size()))
            text.replace(at, from.size(), to);
        return text;
    }

    /// A literal of bash and zsh.
    std::string quoted(std::string const& text)
    {
        return "'" + replaced(text, "'", "'\\''") + "'";
    }

    std::string fishQuoted(std::string const& text)
    {
        return "'" + replaced(replaced(text, "\\", "\\\\"), "'", "\\'") + "'";
    }

    /// Sets the options of a command, and the values of those that have a fixed set.
    std::string bashCase(CommandDescription const& command)
    {
        std::vector<std::string> names{"--help"};
        std::string values;
        for (OptionDescription const& option : command.options) {
            if (!option.isPositional)
                for (std::string& name : namesOf(option))
                    names.push_back(std::move(name));
            if (!option.choices.empty())
                values += fmt::format("        {}) words={} ;;\n",
                    option.isPositional ? "*" : joined(namesOf(option), "|"), quoted(joined(option.choices, " ")));
        }
        if (!values.empty())
            values = fmt::format("        case $previous in\n{}        esac\n", values);
        return fmt::format(
            "    {})\n        options={}\n{}        ;;\n", command.name, quoted(joined(names, " ")), values);
    }

    /// Text in an argument of _arguments, where brackets and colons have a meaning.
    std::string zshText(std::string const& text)
    {
        return replaced(replaced(replaced(text, "[", "\\["), "]", "\\]"), ":", "\\:");
    }

    std::string zshValues(OptionDescription const& option)
    {
        if (option.kind == ValueKind::Flag)
            return {};
        std::string const action = !option.choices.empty() ? fmt::format("({})", joined(option.choices, " "))
            : option.kind == ValueKind::File               ? "_files"
                                                           : " ";
        std::string values;
        for (std::size_t i = 0; i != std::max<std::size_t>(1, option.count); ++i)
            values += fmt::format(":{}:{}", zshText(option.name), action);
        return values;
    }

    std::string zshCase(CommandDescription const& command)
    {
        std::string text = fmt::format("    ({})\n        _arguments '--help[Print help]' \\\n", command.name);
        std::string positional = "'*:file:_files'";
        for (OptionDescription const& option : command.options) {
            if (option.isPositional)
                positional = option.choices.empty() ? positional : quoted("1" + zshValues(option));
            else
                for (std::string const& name : namesOf(option))
                    text += fmt::format("            {} \\\n",
                        quoted(fmt::format("{}[{}]{}", name, zshText(option.description), zshValues(option))));
        }
        return text + "            " + positional + "\n        ;;\n";
    }

    std::string fishLine(OptionDescription const& option, std::string const& start)
    {
        std::string line = start;
        if (option.isPositional)
            line += " -f";
        else {
            line += " -l " + option.name;
            if (!option.shortName.empty())
                line += " -s " + option.shortName;
            if (option.kind != ValueKind::Flag)
                line += option.kind == ValueKind::File ? " -r -F" : " -x";
            line += " -d " + fishQuoted(option.description);
        }
        if (!option.choices.empty())
            line += " -a " + fishQuoted(joined(option.choices, " "));
        return line + "\n";
    }

}

std::string bashCompletion(ProgramDescription const& program)
{
    std::string commands, cases;
    for (CommandDescription const& command : program.commands) {
        commands += command.name + " ";
        cases += bashCase(command);
    }
    return fmt::format(R"(# Completion of {0} for bash. Values that are not listed here are completed as file names.
_{0}()
{{
    local current=${{COMP_WORDS[COMP_CWORD]}} previous=${{COMP_WORDS[COMP_CWORD-1]}} options= words=
    COMPREPLY=()
    if ((COMP_CWORD == 1)); then
        COMPREPLY=($(compgen -W '{1}--help --version' -- "$current"))
        return
    fi
    case ${{COMP_WORDS[1]}} in
{2}    esac
    if [[ $current == -* ]]; then
        COMPREPLY=($(compgen -W "$options" -- "$current"))
    elif [[ -n $words ]]; then
        COMPREPLY=($(compgen -W "$words" -- "$current"))
    fi
}}
complete -o bashdefault -o default -F _{0} {0}
)",
        program.name, commands, cases);
}

std::string zshCompletion(ProgramDescription const& program)
{
    std::string commands, cases;
    for (CommandDescription const& command : program.commands) {
        commands += fmt::format("        {}\n", quoted(command.name + ":" + zshText(command.summary)));
        cases += zshCase(command);
    }
    return fmt::format(R"(#compdef {0}
# Completion of {0} for zsh.
_{0}()
{{
    local curcontext=$curcontext state line
    local -a commands
    commands=(
{1}    )
    _arguments -C '--help[Print help]' '--version[Print the version]' '1: :->command' '*:: :->arguments'
    if [[ $state == command ]]; then
        _describe command commands
        return
    fi
    case $words[1] in
{2}    esac
}}
_{0} "$@"
)",
        program.name, commands, cases);
}

std::string fishCompletion(ProgramDescription const& program)
{
    std::string const start = fmt::format("complete -c {} -n ", program.name);
    std::string const first = start + "__fish_use_subcommand";
    std::string text = fmt::format("# Completion of {0} for fish.\n{1} -l help -d 'Print help'\n{1} -l version -d "
                                   "'Print the version'\n",
        program.name, first);
    for (CommandDescription const& command : program.commands) {
        text += fmt::format("{} -f -a {} -d {}\n", first, command.name, fishQuoted(command.summary));
        for (OptionDescription const& option : command.options)
            if (!option.isPositional || !option.choices.empty())
                text += fishLine(option, start + fishQuoted("__fish_seen_subcommand_from " + command.name));
    }
    return text;
}

}
