#pragma once

#include "PolygonPlane.h"

#include <span>

namespace Modeling::Internal {

/// Cuts a quad at its sharpest ear. Gives the same result as ear clipping, to the bit, but measures all four corners at
/// once.
/// \param rotation  from `findPlane`
/// \return false if no ear is left before the end; `triangles` is then unchanged
bool cutQuad(std::span<float3 const, 4> corners, Quaternion const& rotation, std::span<unsigned int, 6> triangles);

}
