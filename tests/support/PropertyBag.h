#pragma once

#include "Random.h"

#include <TessaraMathSupport/Types.h>
#include <TessaraObject/Object.h>

namespace TestSupport {

/// Sets a value inside a geo property; other holders of the property see no change.
void replaceIn(Orvan::String const& name, char const* key, Tessara::PropertyValue value, Tessara::Object& object);

/// Shortens a float3 point property to the number of points; other holders see no change.
void cutToElements(Orvan::String const& name, Tessara::Object& object);

/// Adds properties to a component: data of any of the forty element types, with and without a default, mostly as long
/// as the component, and ranges with and without data. Some hold null or no array.
void addRandomProperties(Orvan::String const& component, Random& random, Tessara::Object& object);

/// One data property of each of the forty element types, as long as the component and named after it and the type.
void addAllTypes(Orvan::String const& component, Random& random, Tessara::Object& object);

Orvan::Array<Tessara::Math::float3> randomPositions(std::size_t count, Random& random);

/// What another object shares with an object.
enum class Holders { None, Object, Properties, Arrays };

/// An object that shares all contents of another one, its geo properties, or only the arrays in those.
Tessara::Object held(Holders holders, Tessara::Object const& object);

}
