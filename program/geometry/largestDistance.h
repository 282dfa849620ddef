#pragma once

#include "MeshArrays.h"

namespace ModelingProgram {

/// The largest distance from a point of `before` that a face uses to the surface `after`, for operations that renumber
/// points. If few points moved, only the faces near them are searched.
double largestDistance(MeshArrays const& before, MeshArrays const& after);

}
