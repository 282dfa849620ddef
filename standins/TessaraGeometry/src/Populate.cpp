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
    Object populated = object;
    addComponent(sPointComp, 0, populated);
    addComponent(sFaceVertexComp, 0, populated);
    addComponent(sFaceComp, 0, populated);
    addStandardData<Math::float3>(sPointPosition, sPointComp, {}, populated);
    addStandardData<unsigned int>(sFaceVertex, sFaceVertexComp, {}, populated);
    addStandardData<unsigned int>(sFaceOffset, sFaceComp, {0}, populated);
    object = std::move(populated);
}

void populatePointCloud(Object& object)
{
    Object populated = object;
    addComponent(sPointComp, 0, populated);
    addStandardData<Math::float3>(sPointPosition, sPointComp, {}, populated);
    object = std::move(populated);
}

void populateStrand(Object& object)
{
    Object populated = object;
    addComponent(sPointComp, 0, populated);
    addComponent(sStrandComp, 0, populated);
    addStandardData<Math::float3>(sPointPosition, sPointComp, {}, populated);
    addStandardData<unsigned int>(sStrandOffset, sStrandComp, {0}, populated);
    object = std::move(populated);
}

void populateComponentGeoProperty(unsigned int count, Object& component)
{
    Object populated;
    populated.setProperty(Internal::sElementCount, count);
    component = std::move(populated);
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
    Object populated;
    populated.setProperty(sIndices, std::move(indices));
    populated.setProperty(sTarget, Orvan::String(target));
    range = std::move(populated);
    return true;
}

}
