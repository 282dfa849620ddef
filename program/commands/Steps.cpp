#include "Steps.h"

#include "PageOfRun.h"
#include "shell/Cancellation.h"
#include "shell/Failure.h"
#include "shell/Phase.h"
#include "shell/ShellWords.h"
#include "shell/Suggestion.h"

#include <fmt/format.h>

#include <algorithm>

namespace ModelingProgram {

namespace {

    /// The options of an edit without those of a command on files.
    void declare(EditKind const& kind, Edit& edit, CommandLine& line)
    {
        Command command = line.addCommand(kind.help);
        edit.declareFiles(command);
        edit.declareOptions(command);
    }

    CommandLine lineOfStep()
    {
        return CommandLine("modeling run IN... OUT --do", "", "", "");
    }

    /// Runs a part of a step. If it fails, the message names the step.
    template <class Part> void inStep(std::size_t number, Step const& step, Part const& part)
    {
        std::string const title = titleOf(number, step.kind->help.name);
        try {
            part();
        } catch (Failure const& failure) {
            throw StepFailure(number, {failure.code, fmt::format("{}: {}", title, failure.what()), failure.reasons});
        } catch (FileError const& error) {
            throw StepFailure(number, {ExitCode::File, fmt::format("{}: {}", title, error.what())});
        }
    }

    /// The type of the last result, or None if it depends on the input.
    GeometryType resultOf(std::vector<Step> const& steps)
    {
        GeometryType type = GeometryType::None;
        for (Step const& step : steps)
            if (step.kind->gives != GeometryType::None)
                type = step.kind->gives;
        return type;
    }

    /// Whether an option of a step after this one names the attribute, which then need not be written.
    bool isUsedAfter(std::size_t i, std::string const& attribute, std::vector<Step> const& steps)
    {
        for (std::size_t later = i + 1; later < steps.size(); ++later)
            for (OptionDescription const& option : steps[later].options.options)
                if (std::find(option.given.begin(), option.given.end(), attribute) != option.given.end())
                    return true;
        return false;
    }

    void requireValidResult(Tessara::Object const& object)
    {
        if (auto const status = validate(object); !status)
            throw Failure(ExitCode::Unexpected, fmt::format("the result is invalid: {}", status.message().view()));
    }

    /// One step after another on the same geometry, each with a report of its own.
    class Chain {
    public:
        Chain(std::vector<Step>& steps, Report& report)
            : steps_(steps)
            , report_(report)
        {
            for (std::size_t i = 0; i != steps.size(); ++i)
                reports_.push_back(report.ofStep(i + 1, steps[i].kind->help.name));
            report.document["steps"] = Json::array();
        }

        void checkBefore(Output const& out)
        {
            requireFit(steps_, out);
            requirePlace(out);
            for (std::size_t i = 0; i != steps_.size(); ++i)
                runPart(i, [&] { steps_[i].edit->readFiles(reports_[i]); });
        }

        Subject read(std::vector<std::filesystem::path> const& files)
        {
            Edit& first = *steps_[0].edit;
            Subject subject;
            auto const readFiles = [&] { subject = first.readSubject(files, report_); };
            if (steps_[0].kind->takesManyFiles)
                guard(0, readFiles);
            else
                readFiles();
            return subject;
        }

        void run(Subject& subject)
        {
            for (std::size_t i = 0; i != steps_.size(); ++i) {
                runPart(i, [&] { runStep(i, subject); });
                subject.name = fmt::format("the result of step {}", i + 1);
                steps_[i].edit.reset();
            }
        }

    private:
        /// Runs a part of a step that may fail.
        template <class Part> void guard(std::size_t i, Part const& part)
        {
            try {
                inStep(i + 1, steps_[i], part);
            } catch (...) {
                report_.document["steps"].push_back(reports_[i].document);
                report_.document["failedStep"] = i + 1;
                throw;
            }
        }

        /// The same for a part that may also read files.
        template <class Part> void runPart(std::size_t i, Part const& part)
        {
            reports_[i].reading = report_.reading;
            guard(i, part);
            report_.reading = reports_[i].reading;
            report_.hasWarned = report_.hasWarned || reports_[i].hasWarned;
        }

        void runStep(std::size_t i, Subject& subject)
        {
            Edit& edit = *steps_[i].edit;
            Report& report = reports_[i];
            Phase phase(report, &Times::report, kReportTitle);
            edit.runLimited([&] {
                requireSubject(*steps_[i].kind, subject);
                edit.run(subject, report);
                if (i + 1 != steps_.size()) // the last result is validated before it is written
                    requireValidResult(*subject.object);
                stopIfCancelled();
            });
            edit.report(report);
            report_.times += timesOf(report);
            report_.document["steps"].push_back(report.document);
            report_.text += fmt::format("{}\n\n{}\n", titleOf(i + 1, steps_[i].kind->help.name), report.text);
            Json& seconds = report_.document["seconds"];
            seconds = (seconds.is_null() ? 0.0 : seconds.get<double>()) + report.document["seconds"].get<double>();
        }

        std::vector<Step>& steps_;
        Report& report_;
        std::vector<Report> reports_;
    };

}

std::string titleOf(std::size_t number, std::string const& name)
{
    return fmt::format("step {} ({})", number, name);
}

EditKind const& editKindOf(std::string const& name, std::size_t number)
{
    std::vector<std::string> names;
    for (EditKind const* const kind : editKinds()) {
        if (name == kind->help.name)
            return *kind;
        names.emplace_back(kind->help.name);
    }
    throw Failure(ExitCode::CommandLine,
        fmt::format("step {}: there is no step \"{}\"{}", number, name, suggestionFor(name, names)));
}

CommandDescription describeStep(EditKind const& kind)
{
    CommandLine line = lineOfStep();
    auto const edit = kind.create();
    declare(kind, *edit, line);
    return line.describe().commands.front();
}

Step parseStep(std::vector<std::string> const& words, std::size_t number)
{
    EditKind const& kind = editKindOf(words[0], number);
    Step step{&kind, kind.create(), {}, {}};
    CommandLine line = lineOfStep();
    declare(kind, *step.edit, line);
    CommandLine::Parsed const parsed = line.parse(words);
    if (!parsed.mistake.empty())
        throw Failure(ExitCode::CommandLine, fmt::format("{}: {}", titleOf(number, words[0]), parsed.mistake));
    step.options = line.describe().commands.front();
    step.help = parsed.help;
    return step;
}

std::vector<Step> parseSteps(std::string const& text)
{
    std::vector<Step> steps;
    for (std::vector<std::string> const& words : splitCommands(text))
        steps.push_back(parseStep(words, steps.size() + 1));
    if (steps.empty())
        throw Failure(ExitCode::CommandLine, "--do has no step");
    return steps;
}

void requireChain(std::vector<Step> const& steps, std::size_t fileCount)
{
    auto const refuse = [&](std::size_t i, std::string const& why) {
        throw StepFailure(
            i + 1, {ExitCode::CommandLine, fmt::format("{}: {}", titleOf(i + 1, steps[i].kind->help.name), why)});
    };
    if (fileCount == 0)
        throw Failure(ExitCode::CommandLine, "run needs at least one input file: modeling run IN... -o OUT");
    GeometryType type = GeometryType::None;
    for (std::size_t i = 0; i != steps.size(); ++i) {
        EditKind const& kind = *steps[i].kind;
        if (kind.takesManyFiles && i != 0)
            refuse(i, "it can only be the first step, because it takes the input files");
        if (type != GeometryType::None && kind.takes != GeometryType::None && kind.takes != type)
            refuse(i, fmt::format("it needs a {}, but step {} makes a {}", nameOf(kind.takes), i, nameOf(type)));
        if (kind.gives != GeometryType::None)
            type = kind.gives;
        else if (kind.takes != GeometryType::None)
            type = kind.takes;
    }
    if (fileCount != 1 && !steps[0].kind->takesManyFiles)
        refuse(0, fmt::format("it takes one file, but {} are given; begin with merge to join them", fileCount));
}

void requireFit(std::vector<Step> const& steps, Output const& out)
{
    for (std::size_t i = 0; i != steps.size(); ++i)
        inStep(i + 1, steps[i], [&] { steps[i].edit->checkOptions(); });
    requireHolds(out, resultOf(steps));
    for (std::size_t i = 0; i != steps.size(); ++i)
        if (Edit::NewAttribute const attribute = steps[i].edit->newAttribute(); !isUsedAfter(i, attribute.name, steps))
            inStep(i + 1, steps[i], [&] { requireAttribute(attribute, out); });
}

void runSteps(
    std::vector<Step>& steps, std::vector<std::filesystem::path> const& files, Output const& out, Report& report)
{
    requireChain(steps, files.size());
    Chain chain(steps, report);
    chain.checkBefore(out);
    PageOfRun page(out, files.size(), report);
    Subject subject = chain.read(files);
    page.addBefore(*steps[0].edit, subject);
    if (std::all_of(steps.begin(), steps.end(), [](Step const& step) { return step.kind->keepsFaces; }))
        requireHolds(out, *subject.object);
    chain.run(subject);
    requireHolds(out, *subject.object);
    saveGeometry(*subject.object, out, report);
    page.addAfter(*subject.object, subject.topology ? &*subject.topology : nullptr);
    report.text.pop_back(); // the table begins with an empty line too
    reportRun(report);
    page.finish();
}

}
