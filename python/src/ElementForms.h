#pragma once

#include "files/ElementLayout.h"

#include <TessaraGeometry/ElementTypes.h>

#include <pybind11/numpy.h>

#include <algorithm>
#include <array>
#include <string>
#include <type_traits>

namespace ModelingPython {

namespace py = pybind11;

// The element types of the host as NumPy has them; docs/python.md has the table. An array of n scalars has the shape
// (n,), of vectors (n, 3), of matrices (n, 2, 3), rows first. Records have the fields of the C++ structure. Strings and
// locations are objects, and therefore copies; all others are views.

template <class T> inline constexpr bool kIsRecord =
    std::is_same_v<T,
        Tessara::Geometry::Common::
            GeometryType> || std::is_same_v<T, Tessara::Geometry::Mesh::FaceEdge> || std::is_same_v<T, Tessara::Geometry::Transform::GraphTransforms>;

/// Whether NumPy can read arrays of this type in place.
template <class T> inline constexpr bool kIsViewable =
    kIsRecord<T> || ModelingProgram::ElementLayout<T>::components != 0;

/// The fields of a record.
py::dtype recordType(Tessara::Geometry::ElementType<Tessara::Geometry::Common::GeometryType>);
py::dtype recordType(Tessara::Geometry::ElementType<Tessara::Geometry::Mesh::FaceEdge>);
py::dtype recordType(Tessara::Geometry::ElementType<Tessara::Geometry::Transform::GraphTransforms>);

/// The type of NumPy's elements: scalars, records, or objects for the types that are no views.
template <class T> py::dtype numpyType()
{
    if constexpr (kIsRecord<T>)
        return recordType(Tessara::Geometry::ElementType<T>{});
    else if constexpr (kIsViewable<T>)
        return py::dtype::of<typename ModelingProgram::ElementLayout<T>::Scalar>();
    else
        return py::dtype("O");
}

/// The dimensions after the first one.
template <class T> constexpr auto elementShape()
{
    if constexpr (requires(T matrix) { matrix.rows; })
        return std::array<py::ssize_t, 2>{std::extent_v<decltype(T::rows), 0>, std::extent_v<decltype(T::rows), 1>};
    else if constexpr (ModelingProgram::ElementLayout<T>::components > 1)
        return std::array<py::ssize_t, 1>{ModelingProgram::ElementLayout<T>::components};
    else
        return std::array<py::ssize_t, 0>{};
}

/// Whether an array has elements of this type, in any byte order and with any strides.
template <class T> bool hasElements(py::array const& array)
{
    constexpr auto shape = elementShape<T>();
    if (array.ndim() != static_cast<py::ssize_t>(shape.size()) + 1
        || !std::equal(shape.begin(), shape.end(), array.shape() + 1))
        return false;
    py::dtype const type = array.dtype();
    if constexpr (kIsRecord<T>) {
        return type.equal(numpyType<T>());
    } else {
        using Scalar = typename ModelingProgram::ElementLayout<T>::Scalar;
        constexpr char kKind = std::is_same_v<Scalar, bool> ? 'b'
            : std::is_floating_point_v<Scalar>              ? 'f'
            : std::is_signed_v<Scalar>                      ? 'i'
                                                            : 'u';
        return type.kind() == kKind && type.itemsize() == static_cast<py::ssize_t>(sizeof(Scalar));
    }
}

/// "float64 of shape (4, 2)".
std::string describe(py::array const& array);

/// The shapes that the element types with the scalars of this array have: "(n,), (n, 2), (n, 2, 3)". Empty if there is
/// no such type.
std::string possibleShapes(py::array const& array);

}
