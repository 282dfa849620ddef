#pragma once

#include "shell/CommandLine.h"
#include "shell/Report.h"

#include <filesystem>
#include <functional>
#include <string>

namespace ModelingProgram {

struct Output;

/// What the command line asked for.
struct Invocation {
    std::string command;
    bool asJson = false;
    unsigned int threads = 0; // at most so many; 0 for as many as there are
    ReadOptions reading;
    std::vector<double> center; // three numbers if it is given
    std::function<void(Report&)> run;
};

/// Adds a command with the options that all have in common.
Command addCommand(CommandHelp const& help, CommandLine& program, Invocation& invocation);

enum class Needed { Always, Sometimes };

/// Adds a file that has to be on the command line.
void addFile(char const* name, char const* description, std::filesystem::path& file, Command& command,
    Needed needed = Needed::Always);

/// Adds OUT, and --force, which allows to replace an existing file.
void addOutput(char const* description, Output& out, Command& command, Needed needed = Needed::Always);
/// The latter alone.
void addForce(Output& out, Command& command);

/// The invocation becomes that of `command` where it is the one on the command line.
void onSelected(Command& command, Invocation& invocation, std::function<void(Report&)> run);

// Each command is a source in commands/, and is listed in Program.cpp.
void addInfo(CommandLine& program, Invocation& invocation);
void addValidate(CommandLine& program, Invocation& invocation);
void addAddPoints(CommandLine& program, Invocation& invocation);
void addDeletePoints(CommandLine& program, Invocation& invocation);
void addDeleteFaces(CommandLine& program, Invocation& invocation);
void addMakeVolume(CommandLine& program, Invocation& invocation);
void addMerge(CommandLine& program, Invocation& invocation);
void addRemoveSlivers(CommandLine& program, Invocation& invocation);
void addSmooth(CommandLine& program, Invocation& invocation);
void addStitch(CommandLine& program, Invocation& invocation);
void addSubdivide(CommandLine& program, Invocation& invocation);
void addTriangulate(CommandLine& program, Invocation& invocation);

}
