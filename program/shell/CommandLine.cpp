#include "CommandLine.h"

#include "Failure.h"
#include "Suggestion.h"
#include "files/Streams.h"

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include <algorithm>
#include <charconv>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <sstream>
#include <type_traits>

namespace ModelingProgram {

namespace {

    constexpr std::size_t kHelpColumns = 100;

    double numberIn(std::string const& text)
    {
        char* end = nullptr;
        double const number = std::strtod(text.c_str(), &end);
        return !text.empty() && end == text.c_str() + text.size() ? number : std::nan("");
    }

    /// The bytes in "1.5GB" or "2 MiB", or nullopt if the text is not such an amount or is less than one byte.
    std::optional<std::uint64_t> bytesIn(std::string const& text)
    {
        constexpr std::string_view kPrefixes = "kmgtpe";
        std::size_t const unitStart = std::min(text.find_first_not_of("0123456789."), text.size());
        double bytes = numberIn(text.substr(0, unitStart));
        std::string unit = CLI::detail::to_lower(CLI::detail::trim_copy(text.substr(unitStart)));
        if (unit.ends_with('b'))
            unit.pop_back();
        double const base = unit.size() == 2 && unit[1] == 'i' ? 1024 : 1000;
        if (!unit.empty()) {
            std::size_t const power = kPrefixes.find(unit[0]);
            if (power == std::string_view::npos || unit.substr(1) != (base == 1000 ? "" : "i"))
                return std::nullopt;
            bytes *= std::pow(base, static_cast<double>(power + 1));
        }
        constexpr double kMost = 1e19;
        return bytes >= 1 && bytes <= kMost ? std::optional(static_cast<std::uint64_t>(bytes)) : std::nullopt;
    }

    template <class T> struct ValueOf {
        using Type = T;
    };
    template <class T> struct ValueOf<std::optional<T>> : ValueOf<T> {
    };
    template <class T> struct ValueOf<std::vector<T>> : ValueOf<T> {
    };

    template <class T> constexpr bool kIsList = false;
    template <class T> constexpr bool kIsList<std::vector<T>> = true;

    /// Says why a text is not a value of the type; empty if it is one.
    template <class T> std::string faultIn(std::string const& text)
    {
        if constexpr (std::is_integral_v<T>) {
            T value{};
            auto const [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
            if (error == std::errc::result_out_of_range)
                return text + " is too large";
            if (error != std::errc{} || end != text.data() + text.size())
                return text + (std::is_signed_v<T> ? " is not a whole number" : " is not a whole number of 0 or more");
            std::size_t const first = text[0] == '-' ? 1 : 0;
            if (text[first] == '0' && text.size() > first + 1) // the parser would take it for an octal number
                return text + " begins with a zero";
        } else if constexpr (std::is_floating_point_v<T>) {
            if (!std::isfinite(static_cast<T>(numberIn(text))))
                return text + " is not a number";
        }
        return {};
    }

    template <class T> constexpr ValueKind kindOf()
    {
        if constexpr (std::is_integral_v<T>)
            return ValueKind::Integer;
        else if constexpr (std::is_floating_point_v<T>)
            return ValueKind::Number;
        else
            return std::is_same_v<T, std::filesystem::path> ? ValueKind::File : ValueKind::Text;
    }

    bool isOption(std::string const& argument)
    {
        return argument.size() > 1 && argument[0] == '-' && std::isnan(numberIn(argument));
    }

    /// The options of a command and of its groups.
    std::vector<CLI::Option const*> optionsOf(CLI::App const& app)
    {
        std::vector<CLI::Option const*> options = app.get_options([](CLI::Option const*) { return true; });
        for (CLI::App const* group : app.get_subcommands([](CLI::App const* sub) { return sub->get_name().empty(); }))
            for (CLI::Option const* option : optionsOf(*group))
                options.push_back(option);
        return options;
    }

    std::vector<std::string> namesOf(std::vector<CLI::Option const*> const& options)
    {
        std::vector<std::string> names;
        for (CLI::Option const* option : options)
            if (option->nonpositional())
                names.push_back(option->get_name(false, false));
        return names;
    }

    /// The options of a command or group itself, except its --help.
    std::vector<CLI::Option const*> choicesOf(CLI::App const& group)
    {
        return group.get_options([&](CLI::Option const* option) { return option != group.get_help_ptr(); });
    }

    /// Gives - the name of the standard stream that it stands for.
    CLI::Validator nameStream(OptionDescription const& declared)
    {
        return CLI::Validator(
            [&declared](std::string& file) {
                if (file == "-")
                    file = declared.isOutput ? kStandardOutput : kStandardInput;
                return std::string();
            },
            "");
    }

    std::string describeUnknownOption(
        std::string const& argument, std::vector<std::string> const& names, CLI::App const& app)
    {
        std::string const name = argument.substr(0, argument.find('='));
        if (std::find(names.begin(), names.end(), name) != names.end())
            return fmt::format("{} belongs after the command: {} {}", name, app.get_name(), name);
        return fmt::format("{} has no option {}{}", app.get_name(), name, suggestionFor(name, names));
    }

    /// Describes the mistake in a command line without a known command.
    std::string describeWithoutCommand(CLI::App const& program)
    {
        std::vector<std::string> const arguments = program.remaining();
        auto const word = std::find_if_not(arguments.begin(), arguments.end(), isOption);
        if (word != arguments.end()) {
            std::vector<std::string> commands;
            for (CLI::App const* command : program.get_subcommands([](CLI::App const*) { return true; }))
                commands.push_back(command->get_name());
            return fmt::format("there is no command {}{}", *word, suggestionFor(*word, commands));
        }
        if (!arguments.empty())
            return describeUnknownOption(arguments[0], {"--help", "--version"}, program);
        return "no command is given";
    }

    /// Names the missing options, or the group of which none or several were given.
    std::string describeMissing(CLI::App const& command, std::string const& fallback)
    {
        std::vector<std::string> missing;
        for (CLI::Option const* option : optionsOf(command))
            if (option->get_required() && option->count() == 0)
                missing.push_back(option->get_name(option->get_positional(), false));
        if (!missing.empty())
            return fmt::format("{} needs {}", command.get_name(), fmt::join(missing, " and "));
        for (CLI::App const* group :
            command.get_subcommands([](CLI::App const* sub) { return sub->get_name().empty(); })) {
            std::vector<CLI::Option const*> const options = choicesOf(*group);
            auto const given = std::count_if(
                options.begin(), options.end(), [](CLI::Option const* option) { return option->count() != 0; });
            if (given != 1)
                return fmt::format("{} {} {}", command.get_name(), given == 0 ? "needs one of" : "takes only one of",
                    fmt::join(namesOf(options), ", "));
        }
        return fallback;
    }

    std::string describeMismatch(CLI::App const& command, std::string const& fallback)
    {
        for (CLI::Option const* option : optionsOf(command)) {
            auto const count = static_cast<int>(option->count());
            if (option->get_items_expected_max() == 0) // a flag
                continue;
            if (count > option->get_items_expected_max())
                return fmt::format(
                    "{} is given more than once, or with too many values", option->get_name(false, false));
            if (count != 0 && count < option->get_items_expected_min())
                return fmt::format("{} takes {} values, but {} {} given", option->get_name(false, false),
                    option->get_items_expected_min(), count, count == 1 ? "was" : "were");
        }
        for (CLI::Option const* option : optionsOf(command)) {
            std::string const name = option->get_name(false, false);
            if (fallback.starts_with(name + ":"))
                return name + " needs a value";
            if (fallback.starts_with(option->get_single_name() + " was given a disallowed"))
                return name + " takes no value";
        }
        return fallback;
    }

    std::string describeConversion(CLI::App const& command, std::string const& fallback)
    {
        for (CLI::Option const* option : optionsOf(command))
            if (fallback.find(option->get_name(false, false) + " = ") != std::string::npos)
                return option->get_name(false, false) + " takes no value"; // the parser only converts values of flags
        return fallback;
    }

    /// Describes the mistake in a command line. Unknown names are checked first, because a misspelled option also looks
    /// like a missing one.
    std::string describeMistake(CLI::ParseError const& error, CLI::App const& program)
    {
        std::vector<CLI::App*> const commands = program.get_subcommands();
        if (commands.empty())
            return describeWithoutCommand(program);
        CLI::App const& command = *commands[0];
        std::vector<std::string> const rest = program.remaining(true);
        auto const unknown = std::find_if(rest.begin(), rest.end(), isOption);
        if (unknown != rest.end())
            return describeUnknownOption(*unknown, namesOf(optionsOf(command)), command);
        if (dynamic_cast<CLI::RequiredError const*>(&error))
            return describeMissing(command, error.what());
        if (dynamic_cast<CLI::ArgumentMismatch const*>(&error))
            return describeMismatch(command, error.what());
        if (dynamic_cast<CLI::ConversionError const*>(&error))
            return describeConversion(command, error.what());
        if (!rest.empty())
            return fmt::format("\"{}\" is one argument too many for {}", rest[0], command.get_name());
        return error.what();
    }

    /// Replaces an empty argument, which the parser would drop or take for a missing value.
    constexpr char kEmpty[] = "\x01";

    struct Arguments {
        std::vector<std::string> texts;
        int firstEmpty = 0; // its position, counted from 1; 0 if none is empty
    };

    /// The arguments in their order, without the name of the program.
    Arguments argumentsOf(std::vector<std::string> arguments)
    {
        Arguments result;
        int position = 0;
        for (std::string& argument : arguments) {
            ++position;
            if (argument.empty() || (argument.starts_with("--") && argument.find('=') == argument.size() - 1)) {
                argument += kEmpty;
                result.firstEmpty = result.firstEmpty == 0 ? position : result.firstEmpty;
            }
            if (argument.starts_with("-.") && !std::isnan(numberIn(argument)))
                argument.insert(1, "0"); // the parser takes -.5 for an option, but not -0.5
            result.texts.push_back(std::move(argument));
        }
        return result;
    }

    /// Scripts pass an empty argument when a variable is not set. It is never a valid name or number, so it is refused
    /// rather than taken for a default.
    /// \param program  after parsing, whether or not that succeeded
    std::string describeEmpty(int position, CLI::App const& program)
    {
        for (CLI::App const* command : program.get_subcommands())
            for (CLI::Option const* option : optionsOf(*command))
                for (std::string const& value : option->results())
                    if (value == kEmpty)
                        return fmt::format("the {} is empty",
                            option->nonpositional() ? "value of " + option->get_name(false, false)
                                                    : "argument " + option->get_name(true, false));
        return fmt::format("argument {} is empty", position);
    }

    /// Wraps a text into lines of at most `width` characters; all lines but the first are indented.
    std::string wrapped(std::string const& text, std::size_t width, std::size_t indent)
    {
        std::string result;
        std::size_t column = 0;
        for (std::size_t start = 0; start < text.size();) {
            std::size_t const end = std::min(text.find(' ', start), text.size());
            if (column != 0 && column + 1 + end - start > width) {
                result += "\n" + std::string(indent, ' ');
                column = 0;
            }
            result += (column == 0 ? "" : " ") + text.substr(start, end - start);
            column += (column == 0 ? 0 : 1) + end - start;
            start = end + 1;
        }
        return result;
    }

    /// Rewraps paragraphs, separated by empty lines, to the width of the help. Those that begin with a blank are tables.
    std::string reflowed(std::string_view text)
    {
        std::string result;
        while (!text.empty()) {
            std::size_t const end = std::min(text.find("\n\n"), text.size());
            std::string paragraph(text.substr(0, end));
            if (!paragraph.starts_with(' ')) {
                std::replace(paragraph.begin(), paragraph.end(), '\n', ' ');
                paragraph = wrapped(paragraph, kHelpColumns, 0);
            }
            result += (result.empty() ? "" : "\n\n") + paragraph;
            text.remove_prefix(std::min(end + 2, text.size()));
        }
        return result;
    }

    /// Keeps the help within the width of a terminal.
    class HelpFormatter : public CLI::Formatter {
    public:
        std::string make_option(CLI::Option const* option, bool isPositional) const override
        {
            return row(make_option_name(option, isPositional) + make_option_opts(option), make_option_desc(option));
        }

        std::string make_description(CLI::App const* app) const override { return app->get_description() + "\n"; }

        std::string make_subcommand(CLI::App const* sub) const override
        {
            return row(sub->get_name(), sub->get_description());
        }

    private:
        std::string row(std::string const& name, std::string const& description) const
        {
            constexpr std::size_t kGroupIndent = 2; // additional indentation of options in a group
            std::size_t const left = get_column_width();
            std::string const start = "  " + name;
            std::string const gap =
                start.size() < left ? std::string(left - start.size(), ' ') : "\n" + std::string(left, ' ');
            return start + gap + wrapped(description, kHelpColumns - left - kGroupIndent, left) + "\n";
        }
    };

    OptionDescription describeOption(CLI::Option const& option, OptionDescription declared, int group)
    {
        auto const plain = [](CLI::Option const& named) {
            return named.nonpositional() ? named.get_lnames()[0] : CLI::detail::to_lower(named.get_name(true, false));
        };
        declared.name = plain(option);
        declared.shortName = option.get_snames().empty() ? "" : option.get_snames()[0];
        declared.isPositional = !option.nonpositional();
        declared.isRequired = option.get_required();
        declared.defaultValue = option.get_default_str();
        declared.synopsis = CLI::detail::trim_copy(HelpFormatter().make_option_opts(&option));
        declared.description = option.get_description();
        for (CLI::Option const* needed : option.get_needs())
            declared.needs.push_back(plain(*needed));
        std::sort(declared.needs.begin(), declared.needs.end());
        declared.group = group;
        declared.given = option.results();
        return declared;
    }

}

Option& Option::required()
{
    option_->required();
    return *this;
}

Option& Option::values(int count)
{
    option_->expected(count)->allow_extra_args(false);
    declared_->count = static_cast<std::size_t>(count);
    return *this;
}

Option& Option::valueName(char const* name)
{
    option_->type_name(name);
    return *this;
}

Option& Option::synopsis(char const* text)
{
    option_->option_text(text);
    return *this;
}

Option& Option::showDefault()
{
    option_->capture_default_str();
    return *this;
}

Option& Option::output()
{
    declared_->isOutput = true;
    return *this;
}

Option& Option::common()
{
    declared_->isCommon = true;
    return *this;
}

Option& Option::needs(Option const& other)
{
    option_->needs(other.option_);
    return *this;
}

Option& Option::excludes(Option const& other)
{
    option_->excludes(other.option_);
    return *this;
}

Option& Option::between(double least, double most, char const* shown)
{
    declared_->least = least;
    declared_->most = most;
    option_->check(CLI::Validator(
        [=](std::string const& text) {
            double const number = numberIn(text);
            return number >= least && number <= most
                ? std::string()
                : fmt::format("{} is not a number from {} to {}", text, least, most);
        },
        shown));
    return *this;
}

Option& Option::positive()
{
    declared_->isPositive = true;
    option_->check(CLI::Validator(
        [](std::string const& text) {
            auto const number = static_cast<float>(numberIn(text));
            return number > 0 && std::isfinite(number) ? std::string() : text + " is not a positive number";
        },
        "> 0"));
    return *this;
}

Option& Option::oneOf(std::vector<std::string> const& texts)
{
    declared_->choices = texts;
    option_->check(CLI::IsMember(texts));
    return *this;
}

Option& Option::bytes()
{
    declared_->kind = ValueKind::Size;
    option_->transform(CLI::Validator(
        [](std::string& text) {
            std::optional<std::uint64_t> const bytes = bytesIn(text);
            if (!bytes)
                return text
                    + " is not an amount of memory: a number above 0, in bytes or with a unit, such as 500MB, 1.5GB or "
                      "2GiB";
            text = std::to_string(*bytes);
            return std::string();
        },
        ""));
    return *this;
}

std::string Command::name() const
{
    return app_->get_name();
}

template <class T> Option Command::addOption(char const* name, T& value, std::string const& description)
{
    CLI::Option& option = *app_->add_option(name, value, description);
    option.check(CLI::Validator([](std::string const& text) { return faultIn<typename ValueOf<T>::Type>(text); }, ""));
    OptionDescription& declared = (*declarations_)[&option];
    declared.kind = kindOf<typename ValueOf<T>::Type>();
    declared.count = kIsList<T> ? 0 : 1;
    if (declared.kind == ValueKind::File)
        option.transform(nameStream(declared));
    return Option(option, declared);
}

template Option Command::addOption(char const*, double&, std::string const&);
template Option Command::addOption(char const*, float&, std::string const&);
template Option Command::addOption(char const*, int&, std::string const&);
template Option Command::addOption(char const*, unsigned int&, std::string const&);
template Option Command::addOption(char const*, std::uint64_t&, std::string const&);
template Option Command::addOption(char const*, std::string&, std::string const&);
template Option Command::addOption(char const*, std::filesystem::path&, std::string const&);
template Option Command::addOption(char const*, std::optional<double>&, std::string const&);
template Option Command::addOption(char const*, std::optional<float>&, std::string const&);
template Option Command::addOption(char const*, std::vector<double>&, std::string const&);
template Option Command::addOption(char const*, std::vector<float>&, std::string const&);
template Option Command::addOption(char const*, std::vector<std::filesystem::path>&, std::string const&);

Option Command::addFlag(char const* names, bool& isSet, char const* description)
{
    CLI::Option& option = *app_->add_flag(names, isSet, description);
    option.disable_flag_override(); // --flag=false
    return Option(option, (*declarations_)[&option]);
}

Command Command::addChoice(char const* title, std::string const& description)
{
    CLI::App& choice = *app_->add_option_group(title, description);
    choice.require_option(1);
    return Command(choice, *declarations_);
}

void Command::onSelected(std::function<void()> run)
{
    app_->callback(std::move(run));
}

CommandLine::CommandLine(char const* name, char const* version, char const* description, char const* footer)
    : app_(std::make_unique<CLI::App>(description, name))
    , declarations_(std::make_unique<Declarations>())
{
    app_->set_version_flag("--version", version, "Print the version and exit");
    app_->set_help_flag("-h,--help", "Print this help and exit");
    app_->footer(footer);
    app_->require_subcommand(1);
    app_->formatter(std::make_shared<HelpFormatter>());
}

CommandLine::CommandLine(CommandLine&&) noexcept = default;
CommandLine::~CommandLine() = default;

Command CommandLine::addCommand(CommandHelp const& help)
{
    CLI::App& command = *app_->add_subcommand(help.name, help.summary);
    command.set_help_flag("-h,--help", "Print this help and exit");
    command.footer(fmt::format("{}\n\nExamples:\n{}", reflowed(help.details), help.examples));
    helps_.emplace(help.name, help);
    return Command(command, *declarations_);
}

CommandLine::Parsed CommandLine::parse(std::vector<std::string> arguments)
{
    Parsed result;
    Arguments given = argumentsOf(std::move(arguments));
    std::reverse(given.texts.begin(), given.texts.end()); // the parser expects them in reverse order
    try {
        app_->parse(std::move(given.texts));
    } catch (CLI::ParseError const& error) {
        if (error.get_exit_code() != 0)
            result.mistake = describeMistake(error, *app_);
        else {
            std::ostringstream text; // the parser reports help and version as an error
            app_->exit(error, text, text);
            result.help = text.str();
        }
    }
    if (given.firstEmpty != 0)
        result.mistake = describeEmpty(given.firstEmpty, *app_);
    for (CLI::App const* command : app_->get_subcommands())
        result.command = command->get_name();
    return result;
}

std::string CommandLine::helpOf(std::string const& command) const
{
    auto const help = [&](CLI::App const& app, std::string const& path) {
        return app.get_formatter()->make_help(&app, path, CLI::AppFormatMode::Normal);
    };
    if (command.empty())
        return help(*app_, app_->get_name());
    std::vector<std::string> names;
    for (CLI::App const* known : app_->get_subcommands([](CLI::App const*) { return true; })) {
        if (known->get_name() == command)
            return help(*known, app_->get_name() + " " + command);
        names.push_back(known->get_name());
    }
    throw Failure(
        ExitCode::CommandLine, fmt::format("there is no command {}{}", command, suggestionFor(command, names)));
}

ProgramDescription CommandLine::describe() const
{
    ProgramDescription program{app_->get_name(), app_->version(), app_->get_description(), app_->get_footer(), {}};
    for (CLI::App const* command : app_->get_subcommands([](CLI::App const*) { return true; }))
        program.commands.push_back(describe(*command));
    return program;
}

CommandDescription CommandLine::describe(CLI::App const& command) const
{
    CommandHelp const& help = helps_.at(command.get_name());
    CommandDescription result{help.name, help.summary, help.details, help.examples, {}};
    auto const addOptions = [&](CLI::App const& app, int group) {
        for (CLI::Option const* option : choicesOf(app))
            result.options.push_back(describeOption(*option, declarations_->at(option), group));
    };
    addOptions(command, -1);
    int group = 0;
    for (CLI::App const* sub : command.get_subcommands([](CLI::App const* sub) { return sub->get_name().empty(); }))
        addOptions(*sub, group++);
    return result;
}

}
