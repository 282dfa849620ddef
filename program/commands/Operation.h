#pragma once

#include "files/GeometryFile.h"
#include "geometry/Geometry.h"
#include "geometry/MeshTopology.h"
#include "shell/Report.h"

#include <TessaraObject/Object.h>

#include <filesystem>
#include <functional>
#include <optional>
#include <vector>

namespace ModelingProgram {

// What a command that reads files and writes one consists of (`Edit.h` says who does what):
//
//     requireWritable(out, GeometryType::Mesh);
//     Orvan::MutablePtr<Tessara::Object> const mesh = loadInput(in, report);
//     refuse what the operation cannot handle
//     runOperation(report, [&] { Geometry::Mesh::...(*mesh); });
//     saveGeometry(*mesh, out, report);
//     reportOperation(before, after, dropped, report);
//
// Each part throws `Failure` or `FileError`, which ends the command, if it fails or the user has cancelled the job.
// Nothing is written before `saveGeometry`, which replaces a file only with a complete one.

/// A file to write.
struct Output {
    std::filesystem::path file;
    std::string format = {}; // if the name does not tell it, as an extension: ".ply"
    bool replaces = false; // otherwise an existing file is refused
    unsigned int compression = 0; // of an HDF5 file, 1 to 9
    std::filesystem::path page = {}; // that shows the geometry before and after; mostly empty

    Existing existing() const { return replaces ? Existing::Replace : Existing::Keep; }
};

/// The files of a command that takes many: IN... OUT, or IN... -o OUT.
struct FileList {
    std::vector<std::filesystem::path> in; // ends with the output if `out` is not given
    Output out;
};

/// The output, which may be at the end of the list; empty if there is none.
std::filesystem::path outputOf(FileList const& files);
/// Moves the output from the end of the list to `out`, unless that is given.
void chooseOutput(char const* command, FileList& files);

/// Refuses before any work what `saveGeometry` would refuse: a format that cannot hold this type of geometry, and what
/// `requirePlace` refuses. `GeometryType::None` means that the type is not known yet.
void requireWritable(Output const& out, GeometryType type);
/// Refuses a format that cannot hold this type of geometry.
void requireHolds(Output const& out, GeometryType type);
/// Refuses a format that cannot hold this geometry.
void requireHolds(Output const& out, Tessara::Object const& object);
/// Refuses a folder that does not exist or is not writable, and an existing file without --force.
void requirePlace(Output const& out);
/// Refuses a file whose format cannot hold the new attribute that `option` requests.
void requireAttribute(Output const& out, char const* option, std::string const& name);

/// Reads a file with the report's options. If it is centered, the same center is subtracted from files read later.
Orvan::MutablePtr<Tessara::Object> readGeometry(std::filesystem::path const& file, Report& report);

/// A sentence on the center that was subtracted from all positions.
/// \pre  there is an origin
std::string centerOf(ReadOptions const& reading);

/// The title of the phase in which requirements of an operation are checked, and the facts for the report are computed.
inline constexpr char kReportTitle[] = "checking and measuring";

/// The bytes of files that can be read, for `workMeter`.
std::uint64_t bytesOf(std::vector<std::filesystem::path> const& files);

/// Reads and validates a file.
Orvan::MutablePtr<Tessara::Object> loadGeometry(std::filesystem::path const& file, Report& report);

/// An input of the command, and what is known of it.
struct Input {
    Orvan::MutablePtr<Tessara::Object> object;
    std::optional<MeshTopology> topology; // if a requirement needed it
};

/// Reads and validates an input, which has to have the properties that --require lists.
Input loadInput(std::filesystem::path const& file, Report& report);

/// Refuses an invalid object, which was read from `file`.
void requireValid(Tessara::Object const& object, std::filesystem::path const& file);

/// Throws if the operation returned false.
void requireDone(char const* command, bool isDone);

/// Runs and times an operation of the library.
/// \throws Failure  if the job is cancelled
void runOperation(Report& report, std::function<void()> const& operation);

/// Validates the result and writes it.
void saveGeometry(Tessara::Object const& object, Output const& out, Report& report);

/// Ends the report with a table of the values before and after, the kept properties (if the document has
/// "keptProperties"), the dropped properties, times, and peak memory and the written file if there is one.
void reportOperation(
    Json const& before, Json const& after, std::vector<std::string> const& droppedProperties, Report& report);

/// Ends the report with times, peak memory and the written file, as far as they apply: for commands without such a table.
void reportRun(Report& report);

}
