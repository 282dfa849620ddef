#pragma once

#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <OrvanCore/String.h>
#include <TessaraGeometry/Records.h>
#include <TessaraMathSupport/Types.h>

#include <type_traits>
#include <utility>
#include <variant>

namespace Tessara {

namespace Internal {

    template <class... T> struct StoredTypes {
        using Variant = std::variant<std::monostate, Orvan::Ptr<Object>, Geometry::Common::DataInterpolationMode, T...,
            Orvan::Ptr<Orvan::Array<T>>...>;
        template <class Value> static constexpr bool kHas =
            std::is_same_v<Value,
                Orvan::Ptr<
                    Object>> || std::is_same_v<Value, Geometry::Common::DataInterpolationMode> || (std::is_same_v<Value, T> || ...)
            || (std::is_same_v<Value, Orvan::Ptr<Orvan::Array<T>>> || ...);
    };

    using Stored = StoredTypes<signed char, short, int, long long, unsigned char, unsigned short, unsigned int,
        unsigned long long, bool, Orvan::String, float, double, Math::int2, Math::int2x2, Math::int2x3, Math::int3,
        Math::float2, Math::float4, Math::float3, Math::float2x2, Math::float2x3, Math::float3x3, Math::float4x4,
        Math::double2, Math::double3, Math::double4, Math::double2x2, Math::double2x3, Math::double3x3, Math::double4x4,
        Math::short2, Math::short2x2, Math::short2x3, Math::short3, Math::uchar3, Math::uchar4,
        Geometry::Common::GeometryType, Geometry::Common::GeoLocation, Geometry::Mesh::FaceEdge,
        Geometry::Transform::GraphTransforms>;

}

/// Stores the listed types only: others do not compile, neither when they are stored nor when they are asked for.
class PropertyValue {
public:
    PropertyValue() = default;

    template <class T>
    requires Internal::Stored::kHas<std::remove_cvref_t<T>> PropertyValue(T&& value)
        : value_(std::in_place_type<std::remove_cvref_t<T>>, std::forward<T>(value))
    {
    }

    template <class T> T const* get() const { return std::get_if<T>(&value_); }

private:
    Internal::Stored::Variant value_;
};

}
