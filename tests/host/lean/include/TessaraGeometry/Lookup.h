#pragma once

#include <TessaraObject/Object.h>

namespace Tessara::Geometry {

Orvan::Array<Orvan::String> getGeoPropNamesByPrototype(Object const& object, Object const& prototype);
Orvan::Array<Orvan::Ptr<Object>> getGeoPropsByPrototype(Object const& object, Object const& prototype);
Orvan::Array<Orvan::String> getGeoPropNamesByTarget(Object const& object, Orvan::String const& target);
Orvan::String getGeoPropTargetName(Object const& object, Orvan::String const& name);
Orvan::String getTargetComponent(Object const& object, Orvan::String const& name);
Orvan::Ptr<Object> getDataGeoProperty(Object const& object, Orvan::String const& name);
Orvan::Ptr<Object> getRangeGeoProperty(Object const& object, Orvan::String const& name);
Orvan::Ptr<Orvan::Array<unsigned int>> getRangeGeoPropIndices(Object const& range);
Orvan::Ptr<Orvan::Array<unsigned int>> getRangeGeoPropIndices(Object const& object, Orvan::String const& name);
bool setRangeGeoPropIndices(Orvan::String const& name, Orvan::Ptr<Orvan::Array<unsigned int>> indices, Object& object);

}
