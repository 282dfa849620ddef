#include "pointProperties.h"

#include "frame/Arrays.h"
#include "frame/Assert.h"
#include "frame/ElementTypes.h"
#include "host/GeoProperties.h"

#include <TessaraGeometry/Lookup.h>

#include <array>
#include <bit>
#include <type_traits>

namespace Geometry::Mesh::Internal {

using namespace Modeling;
using namespace Tessara::Geometry;
using Orvan::String;
using Tessara::Object;

namespace {

    // The types whose values have a mean. All other data of points is removed.
    using AveragedTypes = ElementTypeList<float, double, Tessara::Math::float2, Tessara::Math::float4,
        Tessara::Math::float3, Tessara::Math::float2x2, Tessara::Math::float2x3, Tessara::Math::float3x3,
        Tessara::Math::float4x4, Tessara::Math::double2, Tessara::Math::double3, Tessara::Math::double4,
        Tessara::Math::double2x2, Tessara::Math::double2x3, Tessara::Math::double3x3, Tessara::Math::double4x4>;

    /// A type made of doubles has their alignment.
    template <class T> using ScalarOf = std::conditional_t<alignof(T) == alignof(double), double, float>;
    template <class... T> constexpr std::size_t kDoubles = (std::size_t{std::is_same_v<ScalarOf<T>, double>} + ...);
    static_assert(kDoubles<Tessara::Math::double2, Tessara::Math::double3, Tessara::Math::double4, double> == 4
        && kDoubles<Tessara::Math::float2, Tessara::Math::float3, Tessara::Math::float4, Tessara::Math::float4x4> == 0);
    template <class T> using ScalarsOf = std::array<ScalarOf<T>, sizeof(T) / sizeof(ScalarOf<T>)>;

    constexpr float thirdOf(float sum)
    {
        return sum * 0.33333334f;
    }
    constexpr double thirdOf(double sum)
    {
        return sum * 0.3333333333333333;
    }

    template <class T> T meanOf(T const& a, T const& b, T const& c)
    {
        auto const p = std::bit_cast<ScalarsOf<T>>(a), q = std::bit_cast<ScalarsOf<T>>(b),
                   r = std::bit_cast<ScalarsOf<T>>(c);
        ScalarsOf<T> mean;
        for (std::size_t scalar = 0; scalar != mean.size(); ++scalar)
            mean[scalar] = thirdOf(0 + p[scalar] + q[scalar] + r[scalar]);
        return std::bit_cast<T>(mean);
    }

    template <class... T> bool canBeAveraged(ElementTypeList<T...>, Object const& object, String const& name)
    {
        return (readGeoPropData<T>(object, name) || ...);
    }

    /// Removes a property and those that target it, one level deep: what targets these is kept.
    void removeProperty(String const& name, Object& object)
    {
        Orvan::Array<String> const dependents = getGeoPropNamesByTarget(object, name);
        object.eraseProperty(name);
        for (String const& dependent : dependents)
            object.eraseProperty(dependent);
    }

    template <class Keep> void removeUnless(Keep const& keep, char const* component, Object& object)
    {
        Orvan::Array<String> const names = getGeoPropNamesByTarget(object, component);
        for (String const& name : names)
            if (!keep(name))
                removeProperty(name, object);
    }

    template <class T> void extend(SettledFaces const& faces, unsigned int numPoints, Orvan::Array<T>& values)
    {
        values.resize(faces.pointCount); // missing values are zero
        values.resize(numPoints, Orvan::kUninitialized);
        T* const value = values.data;
        // Each face reads values of old points and writes that of its own new point.
        parallelFor(
            tbb::blocked_range<unsigned int>(0, faces.newPointCount(), kFaceGrain), [&, value](auto const& ranks) {
                for (unsigned int rank = ranks.begin(); rank != ranks.end(); ++rank) {
                    unsigned int const* const c = faces.corners(faces.splitFaces[rank]);
                    value[faces.pointCount + rank] = meanOf(value[c[0]], value[c[1]], value[c[2]]);
                }
            });
    }

    /// \return false if the property has another type
    template <class T>
    bool extendProperty(SettledFaces const& faces, unsigned int numPoints, String const& name, Object& object)
    {
        {
            Orvan::Ptr<Orvan::Array<T>> const values = readGeoPropData<T>(object, name);
            if (!values)
                return false;
            if (faces.pointCount == numPoints && values->size == numPoints)
                return true; // a shared array remains shared
        }
        return editGeoPropData<T>(name, object, [&](Orvan::Array<T>& values) { extend(faces, numPoints, values); });
    }

    template <class... T> void extendProperty(
        ElementTypeList<T...>, SettledFaces const& faces, unsigned int numPoints, String const& name, Object& object)
    {
        (extendProperty<T>(faces, numPoints, name, object) || ...);
    }

}

void stripSubdivisionProperties(Object& object)
{
    auto const isKept = [&](String const& name) {
        return name == sPointPosition || canBeAveraged(AveragedTypes(), object, name);
    };
    removeUnless(isKept, sPointComp, object);
    removeUnless([](String const& name) { return name == sFaceOffset; }, sFaceComp, object);
    removeUnless([](String const& name) { return name == sFaceVertex; }, sFaceVertexComp, object);
}

void transferPointProperties(SettledFaces const& faces, unsigned int numPoints, Object& object)
{
    MODELING_ASSERT(numPoints >= faces.pointCount);
    Orvan::Array<String> const names = getGeoPropNamesByTarget(object, sPointComp);
    for (String const& name : names)
        if (!(name == sPointPosition))
            extendProperty(AveragedTypes(), faces, numPoints, name, object);
}

}
