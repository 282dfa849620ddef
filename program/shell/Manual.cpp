#include "Manual.h"

#include <fmt/format.h>

#include <algorithm>

namespace ModelingProgram {

namespace {

    /// Text of which nothing is a request or an escape.
    std::string escaped(std::string_view text)
    {
        std::string result;
        bool isLineStart = true;
        for (char const c : text) {
            if (isLineStart && (c == '.' || c == '\''))
                result += "\\&";
            if (c == '\\' || c == '-')
                result += c == '-' ? "\\-" : "\\e";
            else
                result += c;
            isLineStart = c == '\n';
        }
        return result;
    }

    std::string paragraphs(std::string_view text)
    {
        std::string result;
        while (!text.empty()) {
            std::size_t const end = std::min(text.find("\n\n"), text.size());
            result += fmt::format(".PP\n{}\n", escaped(text.substr(0, end)));
            text.remove_prefix(std::min(end + 2, text.size()));
        }
        return result;
    }

    std::string verbatim(std::string_view text)
    {
        return fmt::format(".PP\n.nf\n{}\n.fi\n", escaped(text));
    }

    std::string entry(std::string const& name, std::string const& values, std::string const& description)
    {
        return fmt::format(".TP\n\\fB{}\\fR{}{}\n{}\n", escaped(name), values.empty() ? "" : " ", escaped(values),
            escaped(description));
    }

    std::string entryOf(OptionDescription const& option)
    {
        std::string const name = "--" + option.name;
        return entry(option.shortName.empty() ? name : fmt::format("-{}, {}", option.shortName, name), option.synopsis,
            option.description);
    }

    /// "IN" or "[FILES...]"
    std::string synopsisOf(OptionDescription const& positional)
    {
        std::string name = positional.name;
        std::transform(name.begin(), name.end(), name.begin(),
            [](char c) { return c >= 'a' && c <= 'z' ? static_cast<char>(c - 'a' + 'A') : c; });
        if (positional.count == 0)
            name += "...";
        return positional.isRequired ? name : "[" + name + "]";
    }

    std::string sectionOf(CommandDescription const& command, std::string const& program)
    {
        std::string synopsis = fmt::format("{} {} [OPTIONS]", program, command.name), arguments, options;
        for (OptionDescription const& option : command.options) {
            if (option.isPositional) {
                synopsis += " " + synopsisOf(option);
                arguments += entry(synopsisOf(option), "", option.description);
            } else if (!option.isCommon)
                options += entryOf(option);
        }
        return fmt::format(".SS {}\n{}\n.PP\n\\fB{}\\fR\n{}{}{}.PP\nExamples:\n{}", escaped(command.name),
            escaped(command.summary), escaped(synopsis), paragraphs(command.details), arguments, options,
            verbatim(command.examples));
    }

    std::string commonOptions(ProgramDescription const& program)
    {
        std::string options;
        for (CommandDescription const& command : program.commands) {
            for (OptionDescription const& option : command.options)
                if (option.isCommon)
                    options += entryOf(option);
            if (!options.empty())
                break;
        }
        return options;
    }

}

std::string manualPage(ProgramDescription const& program)
{
    std::string list, sections;
    for (CommandDescription const& command : program.commands) {
        list += entry(command.name, "", command.summary);
        sections += sectionOf(command, program.name);
    }
    std::string title = program.name;
    std::transform(title.begin(), title.end(), title.begin(), [](char c) { return static_cast<char>(c - 'a' + 'A'); });
    return fmt::format(".TH {} 1 \"\" \"{}\"\n.SH NAME\n{} \\- {}\n.SH SYNOPSIS\n\\fB{}\\fR COMMAND [OPTIONS] "
                       "ARGUMENTS\n.SH DESCRIPTION\n{}.SH COMMANDS\n{}.SH OPTIONS OF EVERY COMMAND\n{}.SH DETAILS OF "
                       "THE COMMANDS\n{}",
        title, escaped(program.version), program.name, escaped(program.description), program.name,
        verbatim(program.footer), list, commonOptions(program), sections);
}

}
