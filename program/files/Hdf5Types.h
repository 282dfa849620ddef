#pragma once

#include "ElementLayout.h"
#include "Hdf5Library.h"
#include "Hdf5Outline.h"

#include <bit>
#include <optional>
#include <vector>

namespace ModelingProgram {

static_assert(std::endian::native == std::endian::little, "values are stored as in memory");

/// An element type in a file: extents of scalars, numbers in rows and columns, without extents for other types.
struct Hdf5ElementType {
    Hdf5Type scalar;
    std::vector<hsize_t> extents;

    /// The type of one element.
    Hdf5Type whole() const
    {
        return Hdf5Type(extents.empty()
                ? H5Tcopy(scalar)
                : H5Tarray_create2(scalar, static_cast<unsigned int>(extents.size()), extents.data()));
    }
};

Hdf5Type hdf5Interpolation();
/// A type for the absence of a value, distinguished by its tag.
Hdf5Type hdf5Absent(char const* tag);
inline constexpr char const* kNothing = "nothing";
inline constexpr char const* kNullObject = "null object";
Hdf5Type hdf5Text(std::size_t bytes);

namespace Internal {
    template <class T> Hdf5Type hdf5Number()
    {
        if constexpr (std::is_same_v<T, float>)
            return Hdf5Type(H5Tcopy(H5T_IEEE_F32LE));
        else if constexpr (std::is_same_v<T, double>)
            return Hdf5Type(H5Tcopy(H5T_IEEE_F64LE));
        else if constexpr (sizeof(T) == 1)
            return Hdf5Type(H5Tcopy(std::is_signed_v<T> ? H5T_STD_I8LE : H5T_STD_U8LE));
        else if constexpr (sizeof(T) == 2)
            return Hdf5Type(H5Tcopy(std::is_signed_v<T> ? H5T_STD_I16LE : H5T_STD_U16LE));
        else if constexpr (sizeof(T) == 4)
            return Hdf5Type(H5Tcopy(std::is_signed_v<T> ? H5T_STD_I32LE : H5T_STD_U32LE));
        else
            return Hdf5Type(H5Tcopy(std::is_signed_v<T> ? H5T_STD_I64LE : H5T_STD_U64LE));
    }

    Hdf5Type hdf5Boolean();
    Hdf5Type hdf5GeometryType();
    Hdf5Type hdf5FaceEdge();
    Hdf5Type hdf5Transforms();
}

/// The type in the file, which has the same bytes as in memory.
template <class T> Hdf5ElementType hdf5ElementType()
{
    using namespace Tessara::Geometry;
    static_assert(!kIsComposed<T> && std::is_trivially_copyable_v<T>);
    using Scalar = typename ElementLayout<T>::Scalar;
    if constexpr (std::is_same_v<T, bool>)
        return {Internal::hdf5Boolean(), {}};
    else if constexpr (std::is_same_v<T, Common::GeometryType>)
        return {Internal::hdf5GeometryType(), {}};
    else if constexpr (std::is_same_v<T, Mesh::FaceEdge>)
        return {Internal::hdf5FaceEdge(), {}};
    else if constexpr (std::is_same_v<T, Transform::GraphTransforms>)
        return {Internal::hdf5Transforms(), {}};
    else if constexpr (std::is_arithmetic_v<T>)
        return {Internal::hdf5Number<T>(), {}};
    else if constexpr (requires(T matrix) { matrix.rows; })
        return {
            Internal::hdf5Number<Scalar>(), {std::extent_v<decltype(T::rows), 0>, std::extent_v<decltype(T::rows), 1>}};
    else
        return {Internal::hdf5Number<Scalar>(), {ElementLayout<T>::components}};
}

}
