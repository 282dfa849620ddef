#pragma once

#include "PolygonPlane.h"

#include <cstddef>
#include <span>

namespace Modeling::Internal {

inline constexpr std::size_t kSmallPolygon = 16;

/// Ear clipping of a polygon with up to `kSmallPolygon` corners, whose sets of corners fit in words of bits. Gives the same
/// result as for larger polygons, but tests only the ears that may be cut next.
/// \param rotation  from `findPlane`
/// \return false if no ear is left before the end; the triangles written so far are then useless
bool clipSmallPolygon(std::span<float3 const> corners, Quaternion const& rotation, std::span<unsigned int> triangles);

}
