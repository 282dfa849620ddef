#pragma once

#include "Random.h"

#include <TessaraGeometry/Makers.h>
#include <TessaraMathSupport/Types.h>
#include <TessaraObject/Object.h>

#include <gtest/gtest.h>

#include <cstdint>
#include <vector>

namespace TestSupport {

/// Same keys in the same order with values of the same types and bits, also inside objects and arrays. Otherwise names
/// the first difference: key, element and both values.
testing::AssertionResult sameContents(Tessara::Object const& actual, Tessara::Object const& expected);

/// A copy that shares nothing with the object.
Orvan::MutablePtr<Tessara::Object> deepCopy(Tessara::Object const& object);

/// Sets a value inside a geo property; other holders of the property see no change.
void replaceIn(Orvan::String const& name, char const* key, Tessara::PropertyValue value, Tessara::Object& object);

/// Shortens a float3 point property to the number of points; other holders see no change.
void cutToElements(Orvan::String const& name, Tessara::Object& object);

/// Adds properties to a component: data of any of the forty element types, with and without a default, mostly as long
/// as the component, and ranges with and without data. Some hold null or no array.
void addRandomProperties(Orvan::String const& component, Random& random, Tessara::Object& object);

/// One data property of each of the forty element types, as long as the component and named after it and the type.
void addAllTypes(Orvan::String const& component, Random& random, Tessara::Object& object, bool withDefaults = false);

Orvan::Array<Tessara::Math::float3> randomPositions(std::size_t count, Random& random);

/// What another object shares with an object.
enum class Holders { None, Object, Properties, Arrays };

/// An object that shares all contents of another one, its geo properties, or only the arrays in those.
Tessara::Object held(Holders holders, Tessara::Object const& object);

struct Counts {
    long points = 0;
    long corners = 0;
    long faces = 0;

    /// Points minus edges plus faces, of a closed triangle mesh.
    long eulerCharacteristic() const { return points - corners / 2 + faces; }
    friend bool operator==(Counts const&, Counts const&) = default;
};

/// The values of a data property; empty if it is missing or has another type.
template <class T> std::vector<T> valuesOf(Tessara::Object const& object, Orvan::String const& name)
{
    auto const values = Tessara::Geometry::dataOf<T>(object, name);
    return values ? std::vector<T>(values->begin(), values->end()) : std::vector<T>();
}

Counts countsOf(Tessara::Object const& mesh);

/// Every directed edge once and with its opposite, one fan of faces around each point, no point twice in a face.
/// Otherwise names the first edge or point where that fails.
testing::AssertionResult isClosedManifold(Tessara::Object const& mesh);

/// Passes the host's validator for a mesh, strand set or point cloud.
testing::AssertionResult isValid(Tessara::Object const& geometry);

/// A hash of the bits of the standard arrays that there are.
std::uint64_t fingerprint(Tessara::Object const& geometry);

}
