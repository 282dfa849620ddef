#pragma once

#include <TessaraGeometry/Export.h>
#include <TessaraObject/Object.h>

namespace Tessara::Geometry {

// Give an object the components (with the count 0) and the standard data properties (with empty arrays; offset arrays
// with their one entry 0) of its kind, each with `sDefault`. Other keys of the object are left alone. When memory runs
// out (std::bad_alloc) the object is as it was; so are those of the functions for single geo properties, which replace
// all properties of the object they are given.

TESSARAGEOMETRY_EXPORT void populateMesh(Object& object);
TESSARAGEOMETRY_EXPORT void populatePointCloud(Object& object);
TESSARAGEOMETRY_EXPORT void populateStrand(Object& object);

/// Makes `component` a component geo property with that count.
TESSARAGEOMETRY_EXPORT void populateComponentGeoProperty(unsigned int count, Object& component);

/// Makes `tag` a boolean data geo property with these values and that target; its default is false.
TESSARAGEOMETRY_EXPORT void populateTag(
    Orvan::String const& target, Orvan::Ptr<Orvan::Array<bool>> const& values, Object& tag);

/// Makes `range` a range geo property. False, with nothing changed, where `indices` is null.
TESSARAGEOMETRY_EXPORT bool populateRangeGeoProperty(
    Orvan::Ptr<Orvan::Array<unsigned int>> indices, Orvan::String const& target, Object& range);

}
