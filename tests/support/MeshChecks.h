#pragma once

#include <TessaraObject/Object.h>

#include <gtest/gtest.h>

#include <cstdint>

namespace TestSupport {

struct Counts {
    long points = 0;
    long corners = 0;
    long faces = 0;

    friend bool operator==(Counts const&, Counts const&) = default;
};

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
