#pragma once

#include "PolygonPlane.h"

#include <span>

namespace Modeling::Internal {

/// Cuts a polygon of four corners by its sharpest ear: what clipping ears gives for four corners, to the bit, with all
/// four worked on at once.
/// \param rotation  lays the quad into its plane
/// \return false where it is not to be cut so; `triangles` is then to be written anew
bool cutQuad(std::span<float3 const, 4> corners, Quaternion const& rotation, std::span<unsigned int, 6> triangles);

}
