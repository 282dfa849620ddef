#pragma once

#include <Modeling/Export.h>
#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <TessaraObject/Object.h>

namespace Tessara::GeometryAlgorithms {

/// Gives an object what its inputs hold beside geometry: every key whose value is no data, component or range property.
/// Numbers, texts and arrays come along, and objects that are something else; held values are shared, not copied.
///
/// \param inputs  Any objects. The first one that has a key gives its value.
/// \param output  Keys that it has stay as they are.
/// \throws        std::bad_alloc, with part of the keys copied.
///
/// Runs on the calling thread: linear in the keys of all inputs.
MODELING_EXPORT void copyNonGeoProperties(
    Orvan::Array<Orvan::Ptr<Tessara::Object>> const& inputs, Tessara::Object& output);

}
