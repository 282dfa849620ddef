#pragma once

#include "Scanner.h"
#include "VdbFile.h"

#include <string>
#include <vector>

namespace ModelingProgram {

// OpenVDB trusts the sizes in a file: if one is wrong, it overruns buffers, allocates any amount of memory, or silently
// reads past the end of the file. Files are therefore checked first.

struct VdbGridEntry {
    std::string name; // "density", or "density[1]" if an earlier grid has that name
    std::string type; // "float", "vec3s", or as in the file if the tree has an unusual layout
    std::string uniqueName; // by which other entries refer to it
    std::string treeOwner; // the unique name of the grid whose values it shares; usually empty
    std::size_t descriptor = 0; // its start in the file
    std::uint64_t grid = 0; // the start of its data
};

/// The grids of a file, in its order.
/// \throws FileError  if it is not an OpenVDB file of the formats 222 (2013) to 224, or has no table of grids
std::vector<VdbGridEntry> readVdbOutline(InputFile const& file);

/// Parses the data of a float grid to its end. If this succeeds, OpenVDB can read the grid safely.
/// \throws FileError  if the file is cut off or inconsistent, or if the transform is not linear
VdbGridSize checkVdbFloatGrid(InputFile const& file, VdbGridEntry const& entry, std::vector<VdbGridEntry> const& all);

}
