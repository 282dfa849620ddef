#pragma once

#include <TessaraGeometry/Export.h>
#include <TessaraObject/Object.h>

namespace Tessara::Geometry {

// Prototypes for `Object::isA`, which decides by content. Each call returns another reference to one shared object.

/// Matches objects with the three components and three standard data properties of a mesh.
TESSARAGEOMETRY_EXPORT Orvan::Ptr<Object> getMeshPrototype();
/// Matches objects with points and positions, but without the other components of meshes and strand sets.
TESSARAGEOMETRY_EXPORT Orvan::Ptr<Object> getPointCloudPrototype();
/// Matches objects with points, strands, positions and strand offsets.
TESSARAGEOMETRY_EXPORT Orvan::Ptr<Object> getStrandPrototype();

// The three kinds of geo properties. They exclude one another.

/// Matches geo properties that declare a class of elements.
TESSARAGEOMETRY_EXPORT Orvan::Ptr<Object> getComponentGeoPropPrototype();
/// Matches geo properties that hold an index per element of their target.
TESSARAGEOMETRY_EXPORT Orvan::Ptr<Object> getRangeGeoPropPrototype();
/// Matches geo properties that hold a value per element of their target. `sGenericDataGeoProp` selects data of any
/// type, also without `sDefault` or with an empty value under `sData`; the result is null for any other name.
TESSARAGEOMETRY_EXPORT Orvan::Ptr<Object> getDataGeoPropPrototype(Orvan::String const& name);

}
