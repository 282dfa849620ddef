#pragma once

#include "SettledFaces.h"

#include <TessaraObject/Object.h>

namespace Geometry::Mesh::Internal {

/// Drops what cannot follow a refinement: data and ranges of faces and of corners, and of points what is no array of
/// floating point numbers, vectors or matrices. With each property go those that target it.
void stripSubdivisionProperties(Tessara::Object& object);

/// Extends the data of points, other than positions, to `numPoints` values: at a new point the mean of the corners of
/// its face.
void transferPointProperties(SettledFaces const& faces, unsigned int numPoints, Tessara::Object& object);

}
