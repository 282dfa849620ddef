#pragma once

#include "files/VdbFile.h"
#include "geometry/GuideGrid.h"
#include "shell/CommandLine.h"
#include "shell/Report.h"

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace ModelingProgram {

class MemoryLimit;

/// The volume given on the command line.
struct GuideOptions {
    std::filesystem::path file; // empty for none
    std::string grid; // empty for the only float grid
    int tileSide = 4; // voxels along a tile
    std::optional<float> leastValue; // replaces smaller values
};

/// Adds the options to a command.
void addGuideOptions(GuideOptions& options, Command& command);

/// The number of the grid in the file.
/// \throws Failure  if there is no such float grid
std::size_t chooseGrid(GuideOptions const& options, std::vector<VdbGrid> const& grids);

/// Reads the grid and reports its contents. Warns about values that are not above 0, where faces are not refined.
/// \param limit  checked before values are read, unless null
/// \throws Failure, FileError  if there is no such grid, or the library cannot represent it
GuideGrid readGuide(GuideOptions const& options, Report& report, MemoryLimit const* limit = nullptr);

/// Reports how many faces of the mesh the volume covers.
void reportCoverage(GuideGrid const& guide, MeshArrays const& mesh, Report& report);

}
