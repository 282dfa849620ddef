#pragma once

#include <TessaraGeometry/Export.h>
#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Records.h>
#include <TessaraMathSupport/Types.h>
#include <TessaraObject/Object.h>

namespace Tessara::Geometry {

// For host programs: make whole objects in one call. Arrays are moved in, or constructed in place from a span or a
// list:
//     makePointCloud({{0, 0, 0}, {1, 0, 0}})
//     makeMesh(Orvan::Array<float3>(positionSpan), ...)
// Nothing is checked here except the counts: 2^32 - 2 or more elements throw std::length_error, because the highest two
// indices are sentinels. The validators check whether the arrays match.

/// \param faceOffset  Face count + 1 entries; an empty array is replaced by the single entry 0.
TESSARAGEOMETRY_EXPORT Orvan::MutablePtr<Object> makeMesh(
    Orvan::Array<Math::float3> positions, Orvan::Array<unsigned int> faceVertex, Orvan::Array<unsigned int> faceOffset);
TESSARAGEOMETRY_EXPORT Orvan::MutablePtr<Object> makePointCloud(Orvan::Array<Math::float3> positions);
/// \param strandOffset  Strand count + 1 entries; an empty array is replaced by the single entry 0.
TESSARAGEOMETRY_EXPORT Orvan::MutablePtr<Object> makeStrands(
    Orvan::Array<Math::float3> positions, Orvan::Array<unsigned int> strandOffset);

/// Adds or replaces a component of the object.
TESSARAGEOMETRY_EXPORT void addComponent(Orvan::String const& name, unsigned int count, Object& object);

/// Adds or replaces a range property of the object.
TESSARAGEOMETRY_EXPORT void addRangeProperty(
    Orvan::String const& name, Orvan::String const& target, Orvan::Array<unsigned int> indices, Object& object);

/// A data geo property that is in no object yet. With type `bool` it equals a tag of `populateTag`.
template <class T> Orvan::MutablePtr<Object> makeDataProperty(
    Orvan::String const& target, Orvan::Ptr<Orvan::Array<T>> values, T defaultValue = T{})
{
    Orvan::MutablePtr<Object> property = createObject();
    property->setProperty(sData, std::move(values));
    property->setProperty(sTarget, Orvan::String(target));
    property->setProperty(sDependsOn, Orvan::makePtr<Orvan::Array<Orvan::String>>());
    property->setProperty(sDefault, std::move(defaultValue));
    property->setProperty(sInterp, Common::DataInterpolationMode::Linear);
    return property;
}

/// Adds or replaces a data property of the object; `target` is a component or a range.
template <class T> void addDataProperty(Orvan::String const& name, Orvan::String const& target, Orvan::Array<T> values,
    Object& object, T defaultValue = T{})
{
    auto shared = Orvan::makePtr<Orvan::Array<T>>(std::move(values));
    object.setProperty(
        name, Orvan::Ptr<Object>(makeDataProperty<T>(target, std::move(shared), std::move(defaultValue))));
}

/// The array of a data property of the object; null if there is none of that type.
template <class T> Orvan::Ptr<Orvan::Array<T>> dataOf(Object const& object, Orvan::String const& name)
{
    PropertyValue const property = object.getProperty(name);
    auto const* const geoProperty = property.get<Orvan::Ptr<Object>>();
    if (!geoProperty || !*geoProperty)
        return nullptr;
    static Orvan::String const dataKey(sData);
    PropertyValue const data = (*geoProperty)->getProperty(dataKey);
    auto const* const values = data.get<Orvan::Ptr<Orvan::Array<T>>>();
    return values ? *values : nullptr;
}

}
