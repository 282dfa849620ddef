#pragma once

#include "host/OptionalFeatures.h"

#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <OrvanCore/String.h>
#include <TessaraGeometry/Records.h>
#include <TessaraMathSupport/Types.h>
#include <TessaraObject/PropertyValue.h>

#include <type_traits>

namespace Modeling {

template <class... T> struct ElementTypeList {
};

/// The element types that operations can copy, pad with defaults and transfer. Dispatch tries them in this order.
using CoreElementTypes = ElementTypeList<signed char, short, int, long long, unsigned char, unsigned short,
    unsigned int, unsigned long long, bool, Orvan::String, float, double, Tessara::Math::int2, Tessara::Math::int2x2,
    Tessara::Math::int2x3, Tessara::Math::int3, Tessara::Math::float2, Tessara::Math::float4, Tessara::Math::float3,
    Tessara::Math::float2x2, Tessara::Math::float2x3, Tessara::Math::float3x3, Tessara::Math::float4x4,
    Tessara::Math::double2, Tessara::Math::double3, Tessara::Math::double4, Tessara::Math::double2x2,
    Tessara::Math::double2x3, Tessara::Math::double3x3, Tessara::Math::double4x4, Tessara::Math::short2,
    Tessara::Math::short2x2, Tessara::Math::short2x3, Tessara::Math::short3, Tessara::Math::uchar3,
    Tessara::Math::uchar4>;

namespace Internal {

    template <class List, class... Further> struct Appended;
    template <class... T, class... Further> struct Appended<ElementTypeList<T...>, Further...> {
        using Type = ElementTypeList<T..., Further...>;
    };

}

/// All element types of data properties: the core ones, then those of the host's own records.
using AllElementTypes = Internal::Appended<CoreElementTypes, Tessara::Geometry::Common::GeometryType,
    Tessara::Geometry::Common::GeoLocation, Tessara::Geometry::Mesh::FaceEdge,
    Tessara::Geometry::Transform::GraphTransforms>::Type;

namespace Internal {

    template <class Element, class... T> constexpr unsigned char placeIn(ElementTypeList<T...>)
    {
        unsigned char place = 0;
        static_cast<void>(((std::is_same_v<Element, T> || (++place, false)) || ...));
        return place;
    }

}

/// The index of an element type in `AllElementTypes`: stored by types that are not templates over `T`.
template <class T> constexpr unsigned char kPlaceOfElementType = Internal::placeIn<T>(AllElementTypes{});

// The two forms in which an element type occurs; they are different types to a property value.

/// `Ptr<Array<T>>`, the value of `sData`.
struct ArrayForm {
    template <class T> using Of = Orvan::Ptr<Orvan::Array<T>>;
};
/// `T`, the value of `sDefault`.
struct PlainForm {
    template <class T> using Of = T;
};

/// Runs a rule for the element type of a value, and stores the rule's answer.
///
/// The rule takes `Form::Of<T>&`, deduced: `[&]<class T>(Orvan::Ptr<Orvan::Array<T>>& shared) { ...; return true; }`.
/// It gets a copy of what the value holds, so an array is shared with the value while the rule runs, and `makeMutable`
/// copies it. The rule must not modify `*value`. If `value` is null or empty, or holds no listed type in that form, no
/// rule runs and `*result` is unchanged: the caller sets it to false beforehand and decides what a missing match means.
template <class Form, class Rule, class... T> void forEachElementType(
    ElementTypeList<T...>, Form, Tessara::PropertyValue const* value, bool* result, Rule const& rule)
{
    if (!value || isKnownToBeEmpty(*value))
        return;
    // A value holds one type, so at most one entry of the list matches.
    auto const tryType = [&]<class Held>(Held const* held) {
        if (held) {
            Held own = *held;
            *result = rule(own);
        }
    };
    (tryType(value->get<typename Form::template Of<T>>()), ...);
}

template <class List, class Form, class Rule>
void forEachElementType(Tessara::PropertyValue const* value, bool* result, Rule const& rule)
{
    forEachElementType(List{}, Form{}, value, result, rule);
}

}
