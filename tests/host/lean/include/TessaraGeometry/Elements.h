#pragma once

#include <TessaraObject/Object.h>

namespace Tessara::Geometry {

unsigned int getElementCount(Object const& object, Orvan::String const& component);
bool setElementCount(Orvan::String const& component, unsigned int count, Object& object);

}
