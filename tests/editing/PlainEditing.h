#pragma once

#include <TessaraMathSupport/Types.h>
#include <TessaraObject/Object.h>

// The operations once more, written plainly: one property after the other, each array copied and then edited element by
// element. For any property bag.

namespace PlainEditing {

using Flags = Orvan::Array<bool>;
using Indices = Orvan::Array<unsigned int>;

bool addPoints(Orvan::Array<Tessara::Math::float3> const& positions, Orvan::String const& tag, Tessara::Object& object);
Indices mapping(Flags const& deleted);
bool deleteComponents(Indices const& remap, Orvan::String const& component, Tessara::Object& object);
bool deletePoints(Indices const& indices, Tessara::Object& object);
bool deleteFaces(Flags const& deleted, Tessara::Object& mesh);

}
