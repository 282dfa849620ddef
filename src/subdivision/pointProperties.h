#pragma once

#include "SettledFaces.h"

#include <TessaraObject/Object.h>

namespace Geometry::Mesh::Internal {

/// Removes what cannot be refined: all data and ranges of faces and of corners, and those of points except arrays of
/// `float` or `double` or of vectors or matrices of these. The standard properties are kept. Properties that target a
/// removed one are removed with it.
void stripSubdivisionProperties(Tessara::Object& object);

/// Extends the data of points, other than positions, to `numPoints` values: each new point gets the mean of the corners
/// of its face. Data that did not have one value per point is first cut or filled with zeros.
void transferPointProperties(SettledFaces const& faces, unsigned int numPoints, Tessara::Object& object);

}
