#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <TessaraObject/Object.h>

namespace Tessara::GeometryAlgorithms {

/// Copies to an object what the inputs hold besides geometry: every key whose value is not a component, data or range
/// property, such as numbers, strings, arrays, and other objects. Arrays and objects are shared, not duplicated.
///
/// \param inputs  Any objects; null ones are skipped. Each key gets its value from the first input in which it is not a
///                component, data or range property.
/// \param output  Keys that it already has are kept unchanged.
/// \throws        std::bad_alloc, with some of the keys copied.
///
/// Runs on the calling thread. Linear in the number of keys of all inputs.
MODELING_EXPORT void copyNonGeoProperties(
    Orvan::Array<Orvan::Ptr<Tessara::Object>> const& inputs, Tessara::Object& output);

}
