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

/// The values of a data property; none where it is not there or of another type.
template <class T> std::vector<T> valuesOf(Tessara::Object const& object, Orvan::String const& name)
{
    auto const values = Tessara::Geometry::dataOf<T>(object, name);
    return values ? std::vector<T>(values->begin(), values->end()) : std::vector<T>();
}

Counts countsOf(Tessara::Object const& mesh);

/// Points minus edges plus faces; points without a face do not count.
long eulerCharacteristic(Tessara::Object const& mesh);

/// Every directed edge once and with its opposite, one fan of faces around each point, no point twice in a face.
/// Otherwise says where not.
testing::AssertionResult isClosedManifold(Tessara::Object const& mesh);

/// Passes the host's validator, whichever of the kinds it is.
testing::AssertionResult isValid(Tessara::Object const& geometry);

/// A hash of the standard arrays: equal for equal bits.
std::uint64_t fingerprint(Tessara::Object const& mesh);

}
