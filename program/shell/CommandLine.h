#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

// Commands and their options. CLI11 stands behind them, in one source: whatever includes it takes ten seconds more to
// compile.
namespace CLI {
class App;
class Option;
}

namespace ModelingProgram {

/// An option of a command. Each function says one thing more about it.
class Option {
public:
    explicit Option(CLI::Option& option)
        : option_(&option)
    {
    }

    Option& required();
    /// Takes that many values; positional arguments may follow.
    Option& values(int count);
    /// What the help calls the value.
    Option& valueName(char const* name);
    /// What the help shows behind the name of the option, in place of the value's name and all else.
    Option& synopsis(char const* text);
    /// The value that the variable has by now is shown in the help.
    Option& showDefault();

    Option& needs(Option const& other);
    Option& excludes(Option const& other);

    // What a value has to be, besides a finite number if the variable is one; the help shows `shown`.

    Option& between(double least, double most, char const* shown = "");
    /// A number above 0 that single precision can hold.
    Option& positive();
    Option& oneOf(std::vector<std::string> const& texts);
    /// A positive number of bytes, optionally decimal and with a unit: 500MB, 1.5GB.
    Option& bytes();

private:
    CLI::Option* option_;
};

/// A command, or a choice in it.
class Command {
public:
    explicit Command(CLI::App& app)
        : app_(&app)
    {
    }

    std::string name() const;

    /// \tparam T  a type that is instantiated in CommandLine.cpp
    template <class T> Option addOption(char const* name, T& value, std::string const& description);
    Option addFlag(char const* names, bool& isSet, char const* description);
    /// Options of which exactly one has to be given.
    Command addChoice(char const* title, std::string const& description);

    void onSelected(std::function<void()> run);

private:
    CLI::App* app_;
};

struct CommandHelp {
    char const* name;
    char const* summary; // a line in the list of commands
    char const* details;
    char const* examples; // command lines
};

class CommandLine {
public:
    CommandLine(char const* name, char const* version, char const* description, char const* footer);
    ~CommandLine();

    Command addCommand(CommandHelp const& help);

    /// Sets the variables of options, and runs what is to be run for the command selected.
    /// \return the exit code where there is nothing to be done any more: help was asked for, or there is a mistake
    std::optional<int> parse(int argumentCount, char const* const* arguments);

private:
    std::unique_ptr<CLI::App> app_;
};

}
