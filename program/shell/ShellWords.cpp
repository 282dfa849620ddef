#include "ShellWords.h"

#include "Failure.h"

#include <fmt/format.h>

namespace ModelingProgram {

namespace {

    /// Reads one word, which ends before a separator that is not quoted.
    std::string wordAt(std::string_view text, std::size_t& at)
    {
        std::string word;
        std::size_t const start = at;
        char quote = 0;
        for (; at != text.size(); ++at) {
            char const c = text[at];
            bool const isLast = at + 1 == text.size();
            if (quote == 0 && std::string_view(" \t;\n").find(c) != std::string_view::npos)
                break;
            if (quote == 0 && (c == '\'' || c == '"'))
                quote = c;
            else if (c == quote)
                quote = 0;
            else if (c == '\\' && !isLast
                && (quote == 0 || (quote == '"' && (text[at + 1] == '"' || text[at + 1] == '\\'))))
                word += text[++at];
            else
                word += c;
        }
        if (quote != 0)
            throw Failure(ExitCode::CommandLine,
                fmt::format("the quotation that begins at {} has no end", text.substr(start, at - start)));
        return word;
    }

}

std::vector<std::vector<std::string>> splitCommands(std::string_view text)
{
    std::vector<std::vector<std::string>> commands(1);
    for (std::size_t at = 0; at != text.size();) {
        if (text[at] == ';' || text[at] == '\n')
            commands.emplace_back();
        else if (text[at] != ' ' && text[at] != '\t') {
            commands.back().push_back(wordAt(text, at));
            continue;
        }
        ++at;
    }
    std::erase_if(commands, [](auto const& words) { return words.empty(); });
    return commands;
}

std::string quotedCommand(std::vector<std::string> const& words)
{
    constexpr std::string_view kPlain = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789_-+=./,:@%^#";
    std::string line;
    for (std::string const& word : words) {
        line += line.empty() ? "" : " ";
        if (!word.empty() && word.find_first_not_of(kPlain) == std::string::npos && word[0] != '#') {
            line += word;
            continue;
        }
        line += '\'';
        for (char const c : word)
            c == '\'' ? line += "'\\''" : line += c;
        line += '\'';
    }
    return line;
}

}
