#pragma once

#include "BinaryRecords.h"

#include <TessaraMathSupport/Types.h>

#include <optional>

namespace ModelingProgram {

struct WeldedPoints {
    Orvan::Array<Tessara::Math::float3> positions; // distinct ones, in order of first appearance
    Orvan::Array<unsigned int> numbers; // of the position of each corner
};

/// Numbers the distinct positions among the corners in records of a file, in order of first appearance; 0 and -0 are
/// equal. Three positions are at `offset` in each record. Corners are distributed by a hash of their position, and equal
/// ones are found within each part, in parallel. Needs about 24 bytes per corner.
/// \return nullopt if a position is not finite
/// \pre  there are fewer than 2^32 - 2 corners
std::optional<WeldedPoints> weldRecords(BinaryRecords const& records, std::size_t offset, InputFile const& file);

}
