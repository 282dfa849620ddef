#include "Program.h"

#include "commands/Commands.h"
#include "commands/Operation.h"
#include "files/GeometryFile.h"
#include "files/Streams.h"
#include "geometry/MeshRequirements.h"
#include "shell/Cancellation.h"
#include "shell/Failure.h"
#include "shell/MemoryLimit.h"
#include "shell/Progress.h"
#include "shell/ShellWords.h"

#include <fmt/format.h>
#include <tbb/global_control.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <new>
#include <optional>

#include <fcntl.h>

namespace ModelingProgram {

namespace {

    constexpr void (*kCommands[])(CommandLine&, Invocation&) = {addInfo, addValidate, addConvert, addAddPoints,
        addDeletePoints, addDeleteFaces, addMerge, addTriangulate, addSubdivide, addMakeVolume, addSmooth,
        addRemoveSlivers, addRepair, addStitch, addRun, addPage, addHelp, addCompletion, addManual};

    constexpr char kFooter[] =
        R"(The file name extension determines the format. Read: .obj .ply .stl .off .xyz .glb .gltf .h5;
written: .obj .ply .stl .vtp .glb .h5. FILE.h5#NAME is one of several objects in an HDF5 file. An
existing file is replaced only with --force, even if OUT is IN, and only by a complete file; if
anything fails it stays unchanged. Results are printed to standard output, messages to standard
error. - is standard input or output, whose format --format names; if geometry is written to
standard output, results are printed to standard error.

Exit codes:
  0  done
  1  unexpected failure: a bug in the program
  2  the command line is wrong
  3  a file or standard output cannot be read or written
  4  a file contains invalid geometry
  5  the operation refuses its input; the message says why
  6  cancelled by Ctrl-C, SIGTERM or SIGHUP; nothing was written
  7  out of memory, or beyond --max-memory
  8  done, but there are warnings about the result, with --strict

"modeling COMMAND --help" explains a command.)";

    constexpr char kOutOfMemory[] = "out of memory";

    int reportFailure(Failure const& failure, bool asJson, Report& report)
    {
        printMessage(fmt::format("modeling: {}", failure.what()));
        for (std::string const& reason : failure.reasons)
            printMessage(fmt::format("  - {}", reason));
        if (asJson) {
            report.document["exitCode"] = static_cast<int>(failure.code);
            report.document["error"] = {{"message", failure.what()}, {"reasons", failure.reasons}};
            // If this fails too, the exit code already reports a failure.
            [[maybe_unused]] bool const isWritten = writeToStandardOutput(toText(report.document) + "\n");
        }
        return static_cast<int>(failure.code);
    }

    std::string jsonOf(Report const& report)
    {
        std::string text;
        for (Json const& line : report.lines)
            text += line.dump(-1, ' ', false, Json::error_handler_t::replace) + "\n";
        return report.lines.empty() ? toText(report.document) + "\n" : text;
    }

    std::string extensionOf(std::string const& format)
    {
        return format.empty() ? format : "." + format;
    }

    /// Gives the output of the command its format. If it is standard output, the report goes to standard error.
    void prepareOutput(Invocation const& invocation)
    {
        auto const output = invocation.outputs.find(invocation.command);
        auto const list = invocation.lists.find(invocation.command);
        std::filesystem::path file;
        if (output != invocation.outputs.end()) {
            output->second->format = extensionOf(invocation.format);
            file = output->second->file;
        } else if (list != invocation.lists.end()) {
            list->second->out.format = extensionOf(invocation.format);
            file = outputOf(*list->second);
        }
        if (isStandardOutput(file))
            reserveStandardOutput();
    }

    int runCommand(Invocation const& invocation)
    {
        CancelOnSignal const cancelOnSignal;
        std::optional<tbb::global_control> threadLimit;
        if (invocation.threads != 0)
            threadLimit.emplace(tbb::global_control::max_allowed_parallelism, invocation.threads);
        prepareOutput(invocation);
        Report report(invocation.command);
        report.commandLine = invocation.commandLine;
        report.isJson = invocation.asJson;
        report.isQuiet = invocation.isQuiet;
        report.isStrict = invocation.isStrict;
        report.reading = invocation.reading;
        report.reading.format = extensionOf(invocation.inFormat);
        report.reading.fallbackFormat = extensionOf(invocation.format);
        report.reading.onSize = [](std::uint64_t bytes) { requireMemory(bytes, "an array of the file"); };
        if (std::vector<double> const& center = invocation.center; !center.empty())
            report.reading.origin = {center[0], center[1], center[2]};
        std::optional<Progress> progress(
            std::in_place, invocation.isQuiet ? ProgressStyle::None : progressStyleOf(invocation.progress));
        try {
            report.requirements = parseRequirements(invocation.requirements);
            invocation.run(report);
            progress.reset(); // before the results are printed
            if (invocation.isStrict && report.hasWarned && report.exitCode == 0)
                report.exitCode = static_cast<int>(ExitCode::Warned);
            report.document["exitCode"] = report.exitCode;
            if (report.document.contains("center"))
                report.text += centerOf(report.reading) + "\n";
            std::string const results = invocation.asJson ? jsonOf(report) : invocation.isQuiet ? "" : report.text;
            if (!writeToStandardOutput(results))
                throw Failure(ExitCode::File, kCannotWriteOutput);
            return report.exitCode;
        } catch (...) {
            progress.reset();
            return reportFailure(currentFailure(), invocation.asJson, report);
        }
    }

    int printHelp(std::string const& help)
    {
        if (writeToStandardOutput(help))
            return static_cast<int>(ExitCode::Done);
        std::fprintf(stderr, "modeling: %s\n", kCannotWriteOutput);
        return static_cast<int>(ExitCode::File);
    }

    int parseAndRun(int argumentCount, char const* const* arguments)
    {
        Invocation invocation;
        std::vector<std::string> words{"modeling"};
        words.insert(words.end(), arguments + std::min(1, argumentCount), arguments + argumentCount);
        invocation.commandLine = quotedCommand(words);
        CommandLine program("modeling", "modeling " MODELING_VERSION,
            "Geometry algorithms for meshes, point clouds and strands, run on files.", kFooter);
        addCommands(program, invocation);
        CommandLine::Parsed const parsed =
            program.parse({arguments + std::min(1, argumentCount), arguments + argumentCount});
        if (!parsed.mistake.empty()) {
            printMessage(fmt::format("modeling: {}", parsed.mistake));
            printMessage(fmt::format("Run \"modeling{}{} --help\" for more information.",
                parsed.command.empty() ? "" : " ", parsed.command));
            return static_cast<int>(ExitCode::CommandLine);
        }
        return parsed.help.empty() ? runCommand(invocation) : printHelp(parsed.help);
    }

    /// Otherwise a file gets the number of a standard stream that is closed, and messages end up in it. Writing to the
    /// stream still fails.
    void openStandardStreams()
    {
        for (int stream = 0; stream <= 2; ++stream)
            if (::fcntl(stream, F_GETFD) < 0 && errno == EBADF)
                static_cast<void>(::open("/dev/null", O_RDONLY));
    }

}

void addCommands(CommandLine& program, Invocation& invocation)
{
    for (auto const add : kCommands)
        add(program, invocation);
}

Failure currentFailure()
{
    try {
        throw;
    } catch (Failure const& failure) {
        return failure;
    } catch (FileError const& error) {
        return {ExitCode::File, error.what()};
    } catch (Cancelled const&) {
        return {ExitCode::Cancelled, "cancelled; nothing was written"};
    } catch (std::bad_alloc const&) {
        return {ExitCode::OutOfMemory, kOutOfMemory};
    } catch (std::exception const& error) {
        return {ExitCode::Unexpected, fmt::format("unexpected failure: {}", error.what())};
    }
}

Command addCommand(CommandHelp const& help, CommandLine& program, Invocation& invocation)
{
    Command command = program.addCommand(help);
    command.addFlag("--json", invocation.asJson, "Print one JSON document instead of text, also on failure").common();
    command
        .addFlag("-q,--quiet", invocation.isQuiet,
            "Print only warnings and errors. Facts that only the results show are not computed, so a changed shape is "
            "only noticed with --strict or --json")
        .common();
    command
        .addOption("--progress", invocation.progress,
            "Progress of long work on standard error: a bar on a terminal (auto), lines (plain), or none")
        .oneOf({"auto", "plain", "none"})
        .showDefault()
        .common();
    command.addOption("--threads", invocation.threads, "Use at most N threads")
        .valueName("N")
        .between(1, 1024)
        .common();
    command
        .addFlag("--lenient", invocation.reading.isLenient,
            "Leave out broken elements of files, with a warning: points that are NaN, the faces at them, faces with "
            "fewer than three corners, bytes at the end")
        .common();
    Option const center = command
                              .addFlag("--center", invocation.reading.isCentered,
                                  "Subtract a rounded center from all positions, in double precision, and print it")
                              .common();
    command.addOption("--center-at", invocation.center, "Subtract this point instead")
        .synopsis("X Y Z")
        .values(3)
        .between(-1e18, 1e18)
        .excludes(center)
        .common();
    command
        .addOption("--format", invocation.format,
            "Format of -, pipes and files whose names do not tell it; of inputs only if their first bytes do not "
            "either")
        .valueName("EXT")
        .oneOf(geometryFormats())
        .common();
    command.addOption("--in-format", invocation.inFormat, "The same of inputs, whatever their first bytes are")
        .valueName("EXT")
        .oneOf(geometryFormats())
        .common();
    command
        .addOption("--require", invocation.requirements,
            "Refuse inputs that are not all of these, separated by commas: " + listOf(requirementNames()))
        .valueName("LIST")
        .common();
    command.addFlag("--strict", invocation.isStrict, "Exit with 8 if there is a warning about the result").common();
    return command;
}

void addFile(
    char const* name, std::string const& description, std::filesystem::path& file, Command& command, Needed needed)
{
    Option option = command.addOption(name, file, description).synopsis(" ");
    if (needed == Needed::Always)
        option.required();
}

void addOutput(std::string const& description, Output& out, Command& command, Invocation& invocation, Needed needed)
{
    Option option = command.addOption("OUT", out.file, description).synopsis(" ").output();
    if (needed == Needed::Always)
        option.required();
    addForce(out, command);
    invocation.outputs[command.name()] = &out;
}

void addForce(Output& out, Command& command)
{
    command.addFlag("-f,--force", out.replaces, "Replace the file to write if it exists");
    command.addOption("--compress", out.compression, "Compress an HDF5 file, from 1 (fast) to 9 (small)")
        .valueName("N")
        .between(1, 9);
}

void addFiles(FileList& files, Command& command, Invocation& invocation, Needed needed)
{
    Option option = command.addOption("FILES", files.in, "Files to read; without -o the last one is the output")
                        .synopsis("IN... [OUT]");
    if (needed == Needed::Always)
        option.required();
    command.addOption("-o,--output", files.out.file, "The output; all other names are inputs")
        .valueName("OUT")
        .output();
    addForce(files.out, command);
    invocation.lists[command.name()] = &files;
}

void onSelected(Command& command, Invocation& invocation, std::function<void(Report&)> run)
{
    command.onSelected([&invocation, name = command.name(), chosen = std::move(run)] {
        invocation.command = name;
        invocation.run = chosen;
    });
}

int runProgram(int argumentCount, char const* const* arguments)
{
    openStandardStreams();
    try {
        return parseAndRun(argumentCount, arguments);
    } catch (std::bad_alloc const&) {
        // The message could not be allocated.
        std::fprintf(stderr, "modeling: %s\n", kOutOfMemory);
        return static_cast<int>(ExitCode::OutOfMemory);
    }
}

}
