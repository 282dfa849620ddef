#pragma once

#include <TessaraObject/Object.h>

namespace Tessara::Geometry {

Orvan::Ptr<Object> getMeshPrototype();
Orvan::Ptr<Object> getPointCloudPrototype();
Orvan::Ptr<Object> getComponentGeoPropPrototype();
Orvan::Ptr<Object> getRangeGeoPropPrototype();
Orvan::Ptr<Object> getDataGeoPropPrototype(Orvan::String const& name);

}
