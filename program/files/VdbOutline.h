#pragma once

#include "Scanner.h"
#include "VdbFile.h"

#include <string>
#include <vector>

namespace ModelingProgram {

// OpenVDB takes the sizes that a file states as they are: where one is wrong, it writes past buffers, takes any amount
// of memory, or reads on behind the end of the file without a word. So files are walked through first.

struct VdbGridEntry {
    std::string name; // "density", or "density[1]" where an earlier grid has that name
    std::string type; // "float", "vec3s", or as the file has it where the layout of the tree is an unusual one
    std::string uniqueName; // what other entries refer to it by
    std::string treeOwner; // the unique name of the grid whose values it shares; mostly empty
    std::size_t descriptor = 0; // where it begins in the file
    std::uint64_t grid = 0; // where its data begins
};

/// The grids of a file, in its order.
/// \throws FileError  for what is no OpenVDB file of the formats 222 (2013) to 224, or has no table of its grids
std::vector<VdbGridEntry> readVdbOutline(InputFile const& file);

/// Follows the data of a float grid to its end. What passes can be read with OpenVDB.
/// \throws FileError  for what is cut off or contradicts itself, and for transforms that are not linear
VdbGridSize checkVdbFloatGrid(InputFile const& file, VdbGridEntry const& entry, std::vector<VdbGridEntry> const& all);

}
