#pragma once

#include "files/GeometryFile.h"
#include "geometry/Geometry.h"
#include "shell/Report.h"

#include <TessaraObject/Object.h>

#include <filesystem>
#include <functional>
#include <vector>

namespace ModelingProgram {

// The frame of a command that makes a file from files:
//
//     requireWritable(out, GeometryType::Mesh);
//     Orvan::MutablePtr<Tessara::Object> const mesh = loadGeometry(in, report);
//     refuse what the operation cannot take
//     runOperation(report, [&] { Geometry::Mesh::...(*mesh); });
//     saveGeometry(*mesh, out, report);
//     reportOperation(before, after, report);
//
// Each step ends the command with a `Failure` or `FileError` if it cannot do its work, or if the user has cancelled the
// job. Before `saveGeometry` nothing is written; that replaces a file only by a complete one.

/// A file to write.
struct Output {
    std::filesystem::path file;
    bool replaces = false; // an existing file, which is otherwise refused

    Existing existing() const { return replaces ? Existing::Replace : Existing::Keep; }
};

/// Refuses, before time is spent, what `saveGeometry` would refuse: a format that cannot hold this type of geometry, and
/// what `requirePlace` refuses. `GeometryType::None` stands for a type that is not known yet.
void requireWritable(Output const& out, GeometryType type);
/// Refuses a folder that does not exist or cannot be written, and an existing file that is not to be replaced.
void requirePlace(Output const& out);
/// Refuses a mesh with faces that the format of the file cannot hold.
void requireWritableFaces(Output const& out, Tessara::Object const& mesh);
/// Refuses a file whose format cannot hold a new attribute, which `option` asks for.
void requireAttribute(Output const& out, char const* option, std::string const& name);

/// Reads a file as the report's options say. If it is centered, files that are read later get the same center.
Orvan::MutablePtr<Tessara::Object> readGeometry(std::filesystem::path const& file, Report& report);

/// The sentence that tells what has been subtracted from all positions.
/// \pre  there is an origin
std::string centerOf(ReadOptions const& reading);

/// Reads a file, and has the host's validator look at it.
Orvan::MutablePtr<Tessara::Object> loadGeometry(std::filesystem::path const& file, Report& report);

/// Refuses an object that the validator finds fault with. `file` is where it comes from.
void requireValid(Tessara::Object const& object, std::filesystem::path const& file);

/// Refuses an object of another kind. One without points becomes an empty point cloud.
void requirePointCloud(char const* command, Tessara::Object& object, std::filesystem::path const& file);

/// Refuses the input where an operation has done so.
void requireDone(char const* command, bool isDone);

/// Runs and times an operation of the library.
void runOperation(Report& report, std::function<void()> const& operation);

/// Validates the result and writes it.
void saveGeometry(Tessara::Object const& object, Output const& out, Report& report);

/// Ends the report with a table of the numbers before and after, kept ("keptProperties" of the document, where it is
/// there) and dropped properties, time and peak memory.
void reportOperation(
    Json const& before, Json const& after, std::vector<std::string> const& droppedProperties, Report& report);

/// Ends the report with time, peak memory and the file written, for commands without such a table.
void reportRun(Report& report);

}
