#pragma once

#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <OrvanCore/String.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Populate.h>
#include <TessaraGeometry/Records.h>
#include <TessaraMathSupport/Types.h>
#include <TessaraObject/Object.h>

#include <initializer_list>
#include <set>
#include <string>
#include <vector>

/// Makes and reads objects by the interface alone.
namespace HostTests {

using namespace Tessara::Geometry;
using Orvan::Ptr;
using Tessara::Object;
using Tessara::PropertyValue;
using Tessara::Math::float3;

using Text = Orvan::String;
using Indices = Orvan::Array<unsigned int>;
using Texts = std::vector<std::string>;

template <class T> Orvan::Array<T> arrayOf(std::initializer_list<T> values)
{
    Orvan::Array<T> array;
    for (T const& value : values)
        array.append(value);
    return array;
}

// The elements in a form that can be compared; those of a null array are {}.

template <class T> std::vector<T> elementsOf(Ptr<Orvan::Array<T>> const& array)
{
    return array ? std::vector<T>(array->data, array->data + array->size) : std::vector<T>();
}

inline Texts elementsOf(Ptr<Orvan::Array<Text>> const& array)
{
    Texts texts;
    for (std::uint64_t i = 0; array && i < array->size; ++i)
        texts.push_back(array->data[i].c_str());
    return texts;
}

inline std::vector<float> elementsOf(Ptr<Orvan::Array<float3>> const& array)
{
    return array ? std::vector<float>(&array->data->x, &array->data->x + 3 * array->size) : std::vector<float>();
}

inline std::multiset<std::string> namesIn(Orvan::Array<Text> const& names)
{
    std::multiset<std::string> found;
    for (std::uint64_t i = 0; i < names.size; ++i)
        found.insert(names.data[i].c_str());
    return found;
}

template <class T> T valueIn(PropertyValue const& value)
{
    T const* const held = value.get<T>();
    return held ? *held : T{};
}

inline Ptr<Object> propertyOf(Object const& object, Text const& name)
{
    return valueIn<Ptr<Object>>(object.getProperty(name));
}

template <class T> Ptr<Orvan::Array<T>> dataOf(Object const& object, Text const& name)
{
    Ptr<Object> const property = propertyOf(object, name);
    return property ? valueIn<Ptr<Orvan::Array<T>>>(property->getProperty(sData)) : nullptr;
}

template <class T> void setData(Text const& name, Orvan::Array<T> values, Object& object)
{
    Orvan::MutablePtr<Object> property = makeMutable(propertyOf(object, name));
    property->setProperty(sData, Orvan::makePtr<Orvan::Array<T>>(std::move(values)));
    object.setProperty(name, Ptr<Object>(std::move(property)));
}

/// Adds a data property. The array moves into it, so that nobody else holds it.
template <class T>
void addData(Text const& name, Text const& target, Orvan::Array<T> values, T defaultValue, Object& object)
{
    Orvan::MutablePtr<Object> property = Tessara::createObject();
    property->setProperty(sData, Orvan::makePtr<Orvan::Array<T>>(std::move(values)));
    property->setProperty(sTarget, Text(target));
    property->setProperty(sDefault, std::move(defaultValue));
    property->setProperty(sInterp, static_cast<Common::DataInterpolationMode>(1));
    property->setProperty(sDependsOn, Orvan::makePtr<Orvan::Array<Text>>());
    object.setProperty(name, Ptr<Object>(std::move(property)));
}

inline void addRange(Text const& name, Text const& target, Indices indices, Object& object)
{
    Orvan::MutablePtr<Object> range = Tessara::createObject();
    populateRangeGeoProperty(Orvan::makePtr<Indices>(std::move(indices)), target, *range);
    object.setProperty(name, Ptr<Object>(std::move(range)));
}

template <class T>
void fillComponent(Text const& component, Text const& name, std::uint64_t count, Orvan::Array<T> values, Object& object)
{
    setElementCount(component, static_cast<unsigned int>(count), object);
    setData(name, std::move(values), object);
}

inline Orvan::MutablePtr<Object> makeCloud(Orvan::Array<float3> positions)
{
    auto cloud = Tessara::createObject();
    populatePointCloud(*cloud);
    fillComponent(sPointComp, sPointPosition, positions.size, positions, *cloud);
    return cloud;
}

/// \param faceOffset  Face count + 1 entries.
inline Orvan::MutablePtr<Object> makeMesh(Orvan::Array<float3> positions, Indices faceVertex, Indices faceOffset)
{
    auto mesh = Tessara::createObject();
    populateMesh(*mesh);
    fillComponent(sPointComp, sPointPosition, positions.size, positions, *mesh);
    fillComponent(sFaceVertexComp, sFaceVertex, faceVertex.size, faceVertex, *mesh);
    fillComponent(sFaceComp, sFaceOffset, faceOffset.size - 1, faceOffset, *mesh);
    return mesh;
}

inline Orvan::MutablePtr<Object> makeTriangles(Orvan::Array<float3> positions, Indices faceVertex)
{
    Indices faceOffset;
    for (unsigned int corner = 0; corner <= faceVertex.size; corner += 3)
        faceOffset.append(corner);
    return makeMesh(std::move(positions), std::move(faceVertex), std::move(faceOffset));
}

inline Orvan::MutablePtr<Object> makeStrands(Orvan::Array<float3> positions, Indices strandOffset)
{
    auto strands = Tessara::createObject();
    populateStrand(*strands);
    fillComponent(sPointComp, sPointPosition, positions.size, positions, *strands);
    fillComponent(sStrandComp, sStrandOffset, strandOffset.size - 1, strandOffset, *strands);
    return strands;
}

inline Orvan::Array<float3> octahedronPoints()
{
    return arrayOf<float3>({{1, 0, 0}, {0, 1, 0}, {-1, 0, 0}, {0, -1, 0}, {0, 0, 1}, {0, 0, -1}});
}

inline Orvan::MutablePtr<Object> makeOctahedron()
{
    return makeTriangles(octahedronPoints(),
        arrayOf<unsigned int>({0, 1, 4, 1, 2, 4, 2, 3, 4, 3, 0, 4, 1, 0, 5, 2, 1, 5, 3, 2, 5, 0, 3, 5}));
}

}
