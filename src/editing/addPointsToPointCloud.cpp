#include <Modeling/addPointsToPointCloud.h>

#include "extendComponent.h"
#include "host/GeoProperties.h"

#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Prototypes.h>

namespace Tessara::GeometryAlgorithms {

using namespace Modeling;
using namespace Tessara::Geometry;

namespace {

    bool hasOtherComponents(Object const& object)
    {
        return getGeoPropsByPrototype(object, *getComponentGeoPropPrototype()).size >= 2;
    }

    bool hasPositions(Object const& object)
    {
        return readGeoPropData<Math::float3>(object, sPointPosition)
            && getGeoPropTargetName(object, sPointPosition) == sPointComp;
    }

}

bool addPointsToPointCloud(Orvan::Array<Math::float3> const& positions, Orvan::String const& tag, Object& object,
    Orvan::RuntimeServices const*)
{
    if (!Object::isA(object, *getPointCloudPrototype()) || hasOtherComponents(object) || !hasPositions(object))
        return false;
    bool const keepsPositions = tag != Orvan::String(sPointPosition); // read now: the tag may be stored in the object
    Modeling::Internal::NewValues const newPositions{sPointPosition, positions};
    return Modeling::Internal::extendComponent(sPointComp, positions.size, tag, newPositions, object) && keepsPositions;
}

}
