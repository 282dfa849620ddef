#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Populate.h>

#include "GeoProps.h"

namespace Tessara::Geometry {

namespace {

    template <class T>
    void addStandardData(char const* name, char const* component, std::initializer_list<T> values, Object& object)
    {
        addDataProperty<T>(name, component, Orvan::Array<T>(values), object);
    }

}

void populateMesh(Object& object)
{
    addComponent(sPointComp, 0, object);
    addComponent(sFaceVertexComp, 0, object);
    addComponent(sFaceComp, 0, object);
    addStandardData<Math::float3>(sPointPosition, sPointComp, {}, object);
    addStandardData<unsigned int>(sFaceVertex, sFaceVertexComp, {}, object);
    addStandardData<unsigned int>(sFaceOffset, sFaceComp, {0}, object);
}

void populatePointCloud(Object& object)
{
    addComponent(sPointComp, 0, object);
    addStandardData<Math::float3>(sPointPosition, sPointComp, {}, object);
}

void populateStrand(Object& object)
{
    addComponent(sPointComp, 0, object);
    addComponent(sStrandComp, 0, object);
    addStandardData<Math::float3>(sPointPosition, sPointComp, {}, object);
    addStandardData<unsigned int>(sStrandOffset, sStrandComp, {0}, object);
}

void populateComponentGeoProperty(unsigned int count, Object& component)
{
    component.eraseAllProperties();
    component.setProperty(Internal::sElementCount, count);
}

void populateTag(Orvan::String const& target, Orvan::Ptr<Orvan::Array<bool>> const& values, Object& tag)
{
    tag = *makeDataProperty<bool>(target, values);
}

bool populateRangeGeoProperty(
    Orvan::Ptr<Orvan::Array<unsigned int>> indices, Orvan::String const& target, Object& range)
{
    if (!indices)
        return false;
    range.eraseAllProperties();
    range.setProperty(sIndices, std::move(indices));
    range.setProperty(sTarget, Orvan::String(target));
    return true;
}

}
