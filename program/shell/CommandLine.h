#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

// Commands and their options. Only one source includes CLI11, which adds ten seconds to the compilation of each source
// that includes it.
namespace CLI {
class App;
class Option;
}

namespace ModelingProgram {

/// An option of a command. Each function adds one property and can be chained.
class Option {
public:
    explicit Option(CLI::Option& option)
        : option_(&option)
    {
    }

    Option& required();
    /// Takes exactly this many values, so that positional arguments may follow.
    Option& values(int count);
    /// Sets the name of the value in the help.
    Option& valueName(char const* name);
    /// Sets the text after the name of the option in the help, which replaces the value's name, range and default.
    Option& synopsis(char const* text);
    /// Shows the current value of the variable as the default in the help.
    Option& showDefault();

    Option& needs(Option const& other);
    Option& excludes(Option const& other);

    // Checks of the value. Values of numeric variables must also be finite numbers. The help shows `shown`.

    Option& between(double least, double most, char const* shown = "");
    /// A positive number that fits in single precision.
    Option& positive();
    Option& oneOf(std::vector<std::string> const& texts);
    /// A positive number of bytes, optionally decimal and with a unit: 500MB, 1.5GB.
    Option& bytes();

private:
    CLI::Option* option_;
};

/// A command, or a group of alternative options in it.
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
    /// Adds a group of options of which exactly one is required.
    Command addChoice(char const* title, std::string const& description);

    void onSelected(std::function<void()> run);

private:
    CLI::App* app_;
};

struct CommandHelp {
    char const* name;
    char const* summary; // one line in the list of commands
    char const* details;
    char const* examples; // command lines
};

class CommandLine {
public:
    CommandLine(char const* name, char const* version, char const* description, char const* footer);
    ~CommandLine();

    Command addCommand(CommandHelp const& help);

    /// Sets the variables of the options and calls the function registered for the selected command.
    /// \return the exit code if nothing else is to be done: help was printed, or the command line is wrong
    std::optional<int> parse(int argumentCount, char const* const* arguments);

private:
    std::unique_ptr<CLI::App> app_;
};

}
