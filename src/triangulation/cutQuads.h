#pragma once

#include "frame/VectorMath.h"

#include <span>

namespace Modeling::Internal {

/// Cuts four quads at once, each at its sharpest ear, with the results of ear clipping to the bit.
/// \param corners    the four corners of each quad
/// \param triangles  for each quad, receives six corner numbers
/// \return bit q is set if quad q has been cut. Otherwise it is flat, has no ear, or has a corner that may be in an ear, and
///         its triangles are unspecified: use `triangulatePolygon`.
unsigned int cutQuads(std::span<float3 const, 16> corners, std::span<unsigned int, 24> triangles);

}
