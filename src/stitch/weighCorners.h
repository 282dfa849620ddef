#pragma once

#include "frame/VectorMath.h"

#include <cstddef>
#include <span>

namespace Modeling::Internal {

constexpr unsigned int kNoEdge = 0xFFFFFFFF;

/// Where a point is with respect to a polygon in the plane.
struct PlaceInPolygon {
    bool isAtCorner = false; // closer than the tolerance: this corner has the weight 1, and the others are unchanged
    unsigned int edge = kNoEdge; // the first edge with the point on it: only its corners have been given weights
    std::size_t tooFarOutside = 0; // the number of weights that are below -0.2
};

/// Computes the mean value coordinates of a point, four corners at a time.
/// \param polygon        at least one corner
/// \param tolerance      a length, for corners
/// \param areaTolerance  for the triangles of the point and the edges
/// \param weights        one per corner; the coordinates of points off the edges are added to them and then normalized
/// \throws std::bad_alloc  only if there are more than 16 corners
PlaceInPolygon weighCorners(std::span<Tessara::Math::float3 const> polygon, Tessara::Math::float3 const& point,
    float tolerance, float areaTolerance, float* weights);

}
