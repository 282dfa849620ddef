#pragma once

#include <TessaraObject/Object.h>

#include <gtest/gtest.h>

namespace TestSupport {

/// Same keys in the same order with values of the same types and bits, also inside objects and arrays. Otherwise names
/// the first difference: key, element and both values.
testing::AssertionResult sameContents(Tessara::Object const& actual, Tessara::Object const& expected);

/// A copy that shares nothing with the object.
Orvan::MutablePtr<Tessara::Object> deepCopy(Tessara::Object const& object);

}
