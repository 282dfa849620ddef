#include "replacePositions.h"

#include <TessaraGeometry/Names.h>

#include <utility>

namespace ModelingProgram {

void replacePositions(Orvan::Array<float3> positions, Tessara::Object& object)
{
    using namespace Tessara::Geometry;
    auto const held = object.getProperty(sPointPosition);
    auto property = Orvan::MutablePtr<Tessara::Object>::make(**held.get<Orvan::Ptr<Tessara::Object>>());
    property->setProperty(sData, Orvan::makePtr<Orvan::Array<float3>>(std::move(positions)));
    object.setProperty(sPointPosition, Orvan::Ptr<Tessara::Object>(std::move(property)));
}

}
