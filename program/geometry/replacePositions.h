#pragma once

#include "Vectors.h"

#include <OrvanCore/Array.h>
#include <TessaraObject/Object.h>

namespace ModelingProgram {

/// Gives the points of valid geometry other positions. What their property holds besides, such as a default, stays.
void replacePositions(Orvan::Array<float3> positions, Tessara::Object& object);

}
