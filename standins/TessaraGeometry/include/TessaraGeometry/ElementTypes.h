#pragma once

#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <OrvanCore/String.h>
#include <TessaraGeometry/Records.h>
#include <TessaraMathSupport/Types.h>
#include <TessaraObject/PropertyValue.h>

namespace Tessara::Geometry {

/// An element type of data properties, and the name that host programs display for it.
template <class T> struct ElementType {
    using Type = T;
    char const* name;
};

/// Calls `visit(ElementType<T>)` for each of the forty element types, always in the same order.
template <class Visit> constexpr void forEachElementTypeName(Visit&& visit)
{
    using namespace Math;
    visit(ElementType<signed char>{"char"});
    visit(ElementType<short>{"short"});
    visit(ElementType<int>{"int"});
    visit(ElementType<long long>{"long"});
    visit(ElementType<unsigned char>{"uchar"});
    visit(ElementType<unsigned short>{"ushort"});
    visit(ElementType<unsigned int>{"uint"});
    visit(ElementType<unsigned long long>{"ulong"});
    visit(ElementType<bool>{"bool"});
    visit(ElementType<Orvan::String>{"string"});
    visit(ElementType<float>{"float"});
    visit(ElementType<double>{"double"});
    visit(ElementType<int2>{"int2"});
    visit(ElementType<int2x2>{"int2x2"});
    visit(ElementType<int2x3>{"int2x3"});
    visit(ElementType<int3>{"int3"});
    visit(ElementType<float2>{"float2"});
    visit(ElementType<float4>{"float4"});
    visit(ElementType<float3>{"float3"});
    visit(ElementType<float2x2>{"float2x2"});
    visit(ElementType<float2x3>{"float2x3"});
    visit(ElementType<float3x3>{"float3x3"});
    visit(ElementType<float4x4>{"float4x4"});
    visit(ElementType<double2>{"double2"});
    visit(ElementType<double3>{"double3"});
    visit(ElementType<double4>{"double4"});
    visit(ElementType<double2x2>{"double2x2"});
    visit(ElementType<double2x3>{"double2x3"});
    visit(ElementType<double3x3>{"double3x3"});
    visit(ElementType<double4x4>{"double4x4"});
    visit(ElementType<short2>{"short2"});
    visit(ElementType<short2x2>{"short2x2"});
    visit(ElementType<short2x3>{"short2x3"});
    visit(ElementType<short3>{"short3"});
    visit(ElementType<uchar3>{"uchar3"});
    visit(ElementType<uchar4>{"uchar4"});
    visit(ElementType<Common::GeometryType>{"GeometryType"});
    visit(ElementType<Common::GeoLocation>{"GeoLocation"});
    visit(ElementType<Mesh::FaceEdge>{"FaceEdge"});
    visit(ElementType<Transform::GraphTransforms>{"GraphTransforms"});
}

/// Calls `visit(array, elementType)` with the array that a value holds (`Orvan::Array<T> const&`) and its type. Returns
/// false, with nothing called, for a null array and all other values.
template <class Visit> bool visitArray(PropertyValue const& value, Visit&& visit)
{
    bool visited = false;
    forEachElementTypeName([&]<class T>(ElementType<T> elementType) {
        auto const* const array = value.get<Orvan::Ptr<Orvan::Array<T>>>();
        if (array && *array) {
            visit(**array, elementType);
            visited = true;
        }
    });
    return visited;
}

}
