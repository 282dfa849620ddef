#pragma once

#include <TessaraGeometry/Export.h>
#include <TessaraObject/Object.h>

namespace Tessara::Geometry {

// The first three give an object the components of its kind, with count 0, and the standard data properties, each with
// `sDefault` and an empty array; offset arrays have the single entry 0. Other keys of the object are kept. The
// functions for single geo properties replace all properties of their object. All of them throw std::bad_alloc with the
// object unchanged.

TESSARAGEOMETRY_EXPORT void populateMesh(Object& object);
TESSARAGEOMETRY_EXPORT void populatePointCloud(Object& object);
TESSARAGEOMETRY_EXPORT void populateStrand(Object& object);

/// Makes `component` a component geo property with that count.
TESSARAGEOMETRY_EXPORT void populateComponentGeoProperty(unsigned int count, Object& component);

/// Makes `tag` a boolean data geo property with these values and that target; its default is false.
TESSARAGEOMETRY_EXPORT void populateTag(
    Orvan::String const& target, Orvan::Ptr<Orvan::Array<bool>> const& values, Object& tag);

/// Makes `range` a range geo property. Returns false, with nothing changed, if `indices` is null.
TESSARAGEOMETRY_EXPORT bool populateRangeGeoProperty(
    Orvan::Ptr<Orvan::Array<unsigned int>> indices, Orvan::String const& target, Object& range);

}
