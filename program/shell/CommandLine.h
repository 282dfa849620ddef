#pragma once

#include <functional>
#include <map>
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

enum class ValueKind { Flag, Integer, Number, Size, Text, File }; // a size is in bytes, optionally with a unit

/// An option or positional argument as it was declared.
struct OptionDescription {
    std::string name; // without dashes; that of a positional argument in lower case
    std::string shortName; // without dash; mostly empty
    bool isPositional = false;
    bool isRequired = false;
    ValueKind kind = ValueKind::Flag;
    std::size_t count = 1; // of its values; 0 for any number
    bool isPositive = false;
    std::optional<double> least, most;
    std::vector<std::string> choices; // the only values, if there are any
    std::string defaultValue; // if the help shows it
    std::string synopsis; // of its values, as in the help
    std::string description;
    std::vector<std::string> needs; // names of options
    bool isCommon = false; // every command has it
    bool isOutput = false; // a file that is written
    int group = -1; // the number of the group of which exactly one option is required
    std::vector<std::string> given; // the values on the command line, after parsing
};

struct CommandDescription {
    std::string name;
    std::string summary;
    std::string details;
    std::string examples;
    std::vector<OptionDescription> options; // positional arguments too
};

/// Everything that --help says.
struct ProgramDescription {
    std::string name;
    std::string version;
    std::string description;
    std::string footer;
    std::vector<CommandDescription> commands;
};

/// An option of a command. Each function adds one property and can be chained.
class Option {
public:
    Option(CLI::Option& option, OptionDescription& declared)
        : option_(&option)
        , declared_(&declared)
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

    /// Says that the file is written, so that - is standard output. Otherwise - is standard input.
    Option& output();

    /// Says that every command has this option.
    Option& common();

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
    OptionDescription* declared_; // what cannot be asked of the option
};

using Declarations = std::map<CLI::Option const*, OptionDescription>;

/// A command, or a group of alternative options in it.
class Command {
public:
    Command(CLI::App& app, Declarations& declarations)
        : app_(&app)
        , declarations_(&declarations)
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
    Declarations* declarations_;
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
    CommandLine(CommandLine&&) noexcept;
    ~CommandLine();

    Command addCommand(CommandHelp const& help);

    struct Parsed {
        std::string command; // the selected one, if it is known
        std::string mistake; // why the arguments are wrong; empty if they are not
        std::string help; // to be printed instead of running the command, if the arguments ask for it
    };

    /// Sets the variables of the options and calls the function registered for the selected command.
    /// \param arguments  without the name of the program
    Parsed parse(std::vector<std::string> arguments);

    ProgramDescription describe() const;
    /// What `modeling COMMAND --help` prints, or `modeling --help` if the name is empty.
    /// \throws Failure  if there is no such command
    std::string helpOf(std::string const& command) const;

private:
    CommandDescription describe(CLI::App const& command) const;

    std::unique_ptr<CLI::App> app_;
    std::map<std::string, CommandHelp> helps_;
    std::unique_ptr<Declarations> declarations_;
};

}
