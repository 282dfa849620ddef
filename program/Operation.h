#pragma once

#include "Report.h"

#include <TessaraObject/Object.h>

#include <filesystem>
#include <functional>
#include <vector>

namespace ModelingProgram {

// The frame of a command that makes a file from files:
//
//     requireWritable(out);
//     Orvan::MutablePtr<Tessara::Object> const mesh = loadGeometry(in, report);
//     refuse what the operation cannot take
//     runOperation(report, [&] { Geometry::Mesh::...(*mesh); });
//     saveGeometry(*mesh, out, report);
//     reportOperation(before, after, report);
//
// Each step ends the command with a `Failure` or `FileError` where it cannot do its work, and where the user has
// cancelled the job. Before `saveGeometry` nothing is written; that replaces a file only by a complete one.

/// Looks at the name before time is spent: the format, and the folder the file is to go to.
void requireWritable(std::filesystem::path const& file);
/// The latter alone.
void requirePlace(std::filesystem::path const& file);

/// Reads a file as the report's options say. If it is centered, files that are read later get the same center.
Orvan::MutablePtr<Tessara::Object> readGeometry(std::filesystem::path const& file, Report& report);

/// The sentence that tells what has been subtracted from all positions.
/// \pre  there is an origin
std::string centerOf(ReadOptions const& reading);

/// Reads a file, and has the host's validator look at it.
Orvan::MutablePtr<Tessara::Object> loadGeometry(std::filesystem::path const& file, Report& report);

/// Refuses an object that the validator finds fault with. `file` is where it comes from.
void requireValid(Tessara::Object const& object, std::filesystem::path const& file);

/// Refuses an object of another kind.
void requirePointCloud(char const* command, Tessara::Object const& object, std::filesystem::path const& file);

/// Refuses the input where an operation has done so.
void requireDone(char const* command, bool isDone);

/// Runs and times an operation of the library.
void runOperation(Report& report, std::function<void()> const& operation);

/// Validates the result and writes it.
void saveGeometry(Tessara::Object const& object, std::filesystem::path const& file, Report& report);

/// The numbers of elements: points, corners, faces, strands.
Json countsOf(Tessara::Object const& object);

/// Ends the report with a table of the numbers before and after, kept ("keptProperties" of the document, where it is
/// there) and dropped properties, time and peak memory.
void reportOperation(
    Json const& before, Json const& after, std::vector<std::string> const& droppedProperties, Report& report);

/// Ends the report with time, peak memory and the file written, for commands without such a table.
void reportRun(Report& report);

}
