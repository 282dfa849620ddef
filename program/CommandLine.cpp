#include "CommandLine.h"

#include "Failure.h"

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <filesystem>

namespace ModelingProgram {

namespace {

    double numberIn(std::string const& text)
    {
        char* end = nullptr;
        double const number = std::strtod(text.c_str(), &end);
        return !text.empty() && end == text.c_str() + text.size() ? number : std::nan("");
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

Option& Option::check(std::function<std::string(std::string const&)> const& fault, char const* shown)
{
    option_->check(CLI::Validator([fault](std::string const& text) { return fault(text); }, shown));
    return *this;
}

Option& Option::between(double least, double most, char const* shown)
{
    return check(
        [=](std::string const& text) {
            double const number = numberIn(text);
            return number >= least && number <= most
                ? std::string()
                : fmt::format("{} is not a number from {} to {}", text, least, most);
        },
        shown);
}

Option& Option::positive()
{
    return check(
        [](std::string const& text) {
            auto const number = static_cast<float>(numberIn(text));
            return number > 0 && std::isfinite(number) ? std::string() : text + " is not a positive number";
        },
        "> 0");
}

Option& Option::oneOf(std::vector<std::string> const& texts)
{
    option_->check(CLI::IsMember(texts));
    return *this;
}

Option& Option::bytes()
{
    option_->transform(CLI::AsSizeValue(true));
    return *this;
}

std::string Command::name() const
{
    return app_->get_name();
}

template <class T> Option Command::addOption(char const* name, T& value, std::string const& description)
{
    return Option(*app_->add_option(name, value, description));
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

void Command::addFlag(char const* name, bool& isSet, char const* description)
{
    app_->add_flag(name, isSet, description);
}

Command Command::addChoice(char const* title, std::string const& description)
{
    CLI::App& choice = *app_->add_option_group(title, description);
    choice.require_option(1);
    return Command(choice);
}

void Command::onSelected(std::function<void()> run)
{
    app_->callback(std::move(run));
}

CommandLine::CommandLine(char const* name, char const* version, char const* description, char const* footer)
    : app_(std::make_unique<CLI::App>(description, name))
{
    app_->set_version_flag("--version", version, "Print the version and exit");
    app_->set_help_flag("-h,--help", "Print this help and exit");
    app_->footer(footer);
    app_->require_subcommand(1);
}

CommandLine::~CommandLine() = default;

Command CommandLine::addCommand(CommandHelp const& help)
{
    CLI::App& command = *app_->add_subcommand(help.name, help.summary);
    command.set_help_flag("-h,--help", "Print this help and exit");
    command.footer(fmt::format("{}\n\nExamples:\n{}", help.details, help.examples));
    return Command(command);
}

std::optional<int> CommandLine::parse(int argumentCount, char const* const* arguments)
{
    constexpr int kMistake = static_cast<int>(ExitCode::CommandLine);
    try {
        app_->parse(argumentCount, arguments);
        return std::nullopt;
    } catch (CLI::RequiredError const& error) {
        bool const isUnknown = app_->get_subcommands().empty() && !app_->remaining().empty();
        std::string const message = isUnknown ? "There is no command " + app_->remaining()[0] : error.what();
        std::fprintf(stderr, "%s\nRun with --help for more information.\n", message.c_str());
        return kMistake;
    } catch (CLI::ParseError const& error) {
        return app_->exit(error) == 0 ? 0 : kMistake;
    }
}

}
