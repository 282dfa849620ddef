#pragma once

#include <TessaraGeometry/Export.h>
#include <TessaraObject/Object.h>

namespace Tessara::Geometry {

// Prototypes for `Object::isA`, which decides by content. Each call gives a further reference to one shared object.

/// Matches objects with the three components and three standard data properties of a mesh.
TESSARAGEOMETRY_EXPORT Orvan::Ptr<Object> getMeshPrototype();
/// Matches objects with points and positions, and no component of a mesh or a strand set.
TESSARAGEOMETRY_EXPORT Orvan::Ptr<Object> getPointCloudPrototype();
/// Matches objects with points, strands, positions and strand offsets.
TESSARAGEOMETRY_EXPORT Orvan::Ptr<Object> getStrandPrototype();

// The three kinds of geo property. They exclude one another.

/// Matches what declares a class of elements.
TESSARAGEOMETRY_EXPORT Orvan::Ptr<Object> getComponentGeoPropPrototype();
/// Matches what holds an index for each element of its target.
TESSARAGEOMETRY_EXPORT Orvan::Ptr<Object> getRangeGeoPropPrototype();
/// Matches what holds a value for each element of its target. `sGenericDataGeoProp` asks for data of any type (also
/// without `sDefault`, and with an empty value under `sData`); any other name gives null.
TESSARAGEOMETRY_EXPORT Orvan::Ptr<Object> getDataGeoPropPrototype(Orvan::String const& name);

}
