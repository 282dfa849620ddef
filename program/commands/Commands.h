#pragma once

#include "shell/CommandLine.h"
#include "shell/Report.h"

#include <filesystem>
#include <functional>
#include <map>
#include <string>

namespace ModelingProgram {

struct FileList;
struct Output;

/// The command to run, as parsed from the command line.
struct Invocation {
    std::string command;
    bool asJson = false;
    bool isQuiet = false; // no results as text, and no progress
    std::string progress = "auto";
    bool isStrict = false; // warnings about the result have an exit code of their own
    std::string requirements; // of inputs, as a list
    unsigned int threads = 0; // upper limit; 0 for all
    ReadOptions reading;
    std::vector<double> center; // three numbers, or empty
    std::string format; // of files whose names do not tell it; empty if it is not given
    std::string inFormat; // the same, of files that are read
    std::string commandLine;
    std::function<void(Report&)> run;
    // What each command writes: a file, or the last one of a list.
    std::map<std::string, Output*> outputs;
    std::map<std::string, FileList*> lists;
};

/// Adds a command with the options that all commands have.
Command addCommand(CommandHelp const& help, CommandLine& program, Invocation& invocation);

enum class Needed { Always, Sometimes };

/// Adds a positional argument that is a file name.
void addFile(char const* name, std::string const& description, std::filesystem::path& file, Command& command,
    Needed needed = Needed::Always);

/// Adds OUT and --force, which allows replacing an existing file.
void addOutput(std::string const& description, Output& out, Command& command, Invocation& invocation,
    Needed needed = Needed::Always);
/// Adds --force only.
void addForce(Output& out, Command& command);
/// Adds FILES, -o and --force.
void addFiles(FileList& files, Command& command, Invocation& invocation, Needed needed = Needed::Always);

/// Sets the invocation if `command` is the one on the command line.
void onSelected(Command& command, Invocation& invocation, std::function<void(Report&)> run);

// Each command has its own source here and is listed in Program.cpp.
void addHelp(CommandLine& program, Invocation& invocation);
void addCompletion(CommandLine& program, Invocation& invocation);
void addManual(CommandLine& program, Invocation& invocation);
void addInfo(CommandLine& program, Invocation& invocation);
void addValidate(CommandLine& program, Invocation& invocation);
void addAddPoints(CommandLine& program, Invocation& invocation);
void addConvert(CommandLine& program, Invocation& invocation);
void addDeletePoints(CommandLine& program, Invocation& invocation);
void addDeleteFaces(CommandLine& program, Invocation& invocation);
void addMakeVolume(CommandLine& program, Invocation& invocation);
void addMerge(CommandLine& program, Invocation& invocation);
void addPage(CommandLine& program, Invocation& invocation);
void addRemoveSlivers(CommandLine& program, Invocation& invocation);
void addRepair(CommandLine& program, Invocation& invocation);
void addRun(CommandLine& program, Invocation& invocation);
void addSmooth(CommandLine& program, Invocation& invocation);
void addStitch(CommandLine& program, Invocation& invocation);
void addSubdivide(CommandLine& program, Invocation& invocation);
void addTriangulate(CommandLine& program, Invocation& invocation);

}
