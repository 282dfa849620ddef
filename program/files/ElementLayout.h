#pragma once

#include <TessaraGeometry/ElementTypes.h>

#include <type_traits>

namespace ModelingProgram {

// Element types as files see them: a fixed number of scalars of the same type.

/// Other types, such as strings and records, have 0 components.
template <class T> struct ElementLayout {
    using Scalar = void;
    static constexpr unsigned int components = 0;
};

template <class T>
requires std::is_arithmetic_v<T>
struct ElementLayout<T> {
    using Scalar = T;
    static constexpr unsigned int components = 1;
};

template <class T>
requires requires(T vector)
{
    vector.x;
}
struct ElementLayout<T> {
    using Scalar = decltype(T::x);
    static constexpr unsigned int components = sizeof(T) / sizeof(Scalar);
};

template <class T>
requires requires(T matrix)
{
    matrix.rows;
}
struct ElementLayout<T> {
    using Scalar = std::remove_all_extents_t<decltype(T::rows)>;
    static constexpr unsigned int components = sizeof(T) / sizeof(Scalar);
};

template <class T> char const* elementTypeName()
{
    char const* result = "";
    Tessara::Geometry::forEachElementTypeName([&]<class U>(Tessara::Geometry::ElementType<U> type) {
        if constexpr (std::is_same_v<T, U>)
            result = type.name;
    });
    return result;
}

/// Calls `visit` with the first element type of this number of scalars: float4 rather than float2x2. Returns false if
/// there is none.
template <class Scalar, class Visit> bool visitElementTypeOf(std::uint64_t components, Visit&& visit)
{
    bool found = false;
    Tessara::Geometry::forEachElementTypeName([&]<class T>(Tessara::Geometry::ElementType<T> type) {
        if constexpr (std::is_same_v<typename ElementLayout<T>::Scalar, Scalar>) {
            if (!found && ElementLayout<T>::components == components) {
                found = true;
                visit(type);
            }
        }
    });
    return found;
}

}
