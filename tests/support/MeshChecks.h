#pragma once

#include <TessaraGeometry/Makers.h>

#include <gtest/gtest.h>

#include <cstdint>
#include <vector>

namespace TestSupport {

struct Counts {
    long points = 0;
    long corners = 0;
    long faces = 0;

    friend bool operator==(Counts const&, Counts const&) = default;
};

/// The values of a data property; empty if it is missing or has another type.
template <class T> std::vector<T> valuesOf(Tessara::Object const& object, Orvan::String const& name)
{
    auto const values = Tessara::Geometry::dataOf<T>(object, name);
    return values ? std::vector<T>(values->begin(), values->end()) : std::vector<T>();
}

Counts countsOf(Tessara::Object const& mesh);

/// Points minus edges plus faces; points that belong to no face are not counted.
long eulerCharacteristic(Tessara::Object const& mesh);

/// Every directed edge once and with its opposite, one fan of faces around each point, no point twice in a face.
/// Otherwise names the first edge or point where that fails.
testing::AssertionResult isClosedManifold(Tessara::Object const& mesh);

/// Passes the host's validator for a mesh, strand set or point cloud.
testing::AssertionResult isValid(Tessara::Object const& geometry);

/// A hash of the bits of the standard arrays.
std::uint64_t fingerprint(Tessara::Object const& mesh);

}
