#pragma once

#include "Report.h"

#include <CLI/CLI.hpp>

#include <filesystem>
#include <functional>
#include <string>

namespace ModelingProgram {

/// What the command line asked for.
struct Invocation {
    std::string command;
    bool asJson = false;
    unsigned int threads = 0; // at most so many; 0 for as many as there are
    std::function<void(Report&)> run;
};

struct CommandHelp {
    char const* name;
    char const* summary; // a line in the list of commands
    char const* details;
    char const* examples; // command lines
};

/// Adds a command with the options that all have in common.
CLI::App& addCommand(CommandHelp const& help, CLI::App& program, Invocation& invocation);

/// Adds a file that has to stand on the command line.
void addFile(char const* name, char const* description, std::filesystem::path& file, CLI::App& command);

/// The invocation becomes that of `command` where it is the one on the command line.
void onSelected(CLI::App& command, Invocation& invocation, std::function<void(Report&)> run);

/// Takes numbers from 0 to 1.
CLI::Validator isFraction();

// Each command is a source in commands/, and is listed in Program.cpp.
void addInfo(CLI::App& program, Invocation& invocation);
void addValidate(CLI::App& program, Invocation& invocation);
void addAddPoints(CLI::App& program, Invocation& invocation);
void addDeletePoints(CLI::App& program, Invocation& invocation);
void addDeleteFaces(CLI::App& program, Invocation& invocation);
void addMakeVolume(CLI::App& program, Invocation& invocation);
void addMerge(CLI::App& program, Invocation& invocation);
void addRemoveSlivers(CLI::App& program, Invocation& invocation);
void addSmooth(CLI::App& program, Invocation& invocation);
void addStitch(CLI::App& program, Invocation& invocation);
void addSubdivide(CLI::App& program, Invocation& invocation);
void addTriangulate(CLI::App& program, Invocation& invocation);

}
