#pragma once

#include <TessaraGeometry/Export.h>
#include <TessaraObject/Object.h>

namespace Tessara::Geometry {

// Lookups of geo properties. If a property is missing or of another kind, the result is null, an empty string or an
// empty array. Any number of threads may look up the same object at once. Lists are in the order of the object's keys.

TESSARAGEOMETRY_EXPORT Orvan::Array<Orvan::String> getGeoPropNamesByPrototype(
    Object const& object, Object const& prototype);
TESSARAGEOMETRY_EXPORT Orvan::Array<Orvan::Ptr<Object>> getGeoPropsByPrototype(
    Object const& object, Object const& prototype);
/// The names of the geo properties with that `sTarget`.
TESSARAGEOMETRY_EXPORT Orvan::Array<Orvan::String> getGeoPropNamesByTarget(
    Object const& object, Orvan::String const& target);

/// The `sTarget` of the geo property `name`.
TESSARAGEOMETRY_EXPORT Orvan::String getGeoPropTargetName(Object const& object, Orvan::String const& name);
/// The component that the geo property `name` belongs to: data leads to its range, a range to its target, until a
/// component is reached. Empty for chains that are broken or cyclic, and for a component's own name.
TESSARAGEOMETRY_EXPORT Orvan::String getTargetComponent(Object const& object, Orvan::String const& name);

TESSARAGEOMETRY_EXPORT Orvan::Ptr<Object> getDataGeoProperty(Object const& object, Orvan::String const& name);
TESSARAGEOMETRY_EXPORT Orvan::Ptr<Object> getRangeGeoProperty(Object const& object, Orvan::String const& name);

TESSARAGEOMETRY_EXPORT Orvan::Ptr<Orvan::Array<unsigned int>> getRangeGeoPropIndices(Object const& range);
TESSARAGEOMETRY_EXPORT Orvan::Ptr<Orvan::Array<unsigned int>> getRangeGeoPropIndices(
    Object const& object, Orvan::String const& name);
/// Returns false, with nothing changed, if the object has no range of that name.
TESSARAGEOMETRY_EXPORT bool setRangeGeoPropIndices(
    Orvan::String const& name, Orvan::Ptr<Orvan::Array<unsigned int>> indices, Object& object);

}
