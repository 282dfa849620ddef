#pragma once

#include "ElementForms.h"

#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <TessaraObject/PropertyValue.h>

#include <pybind11/numpy.h>

#include <string>

namespace ModelingPython {

namespace py = pybind11;

// NumPy arrays and arrays of the library share memory in both directions, by one rule: memory that nobody can write is
// shared, other memory is copied once.
//
// An array that comes out is a read-only view whose base holds a reference to the library's array. So copy on write
// leaves the view alone, and NumPy refuses to make it writable. Such a view, also a part of it that is contiguous, goes
// back in without a copy. So do arrays over `bytes`, and all that `adopt` returns.

/// A read-only view of an array, with the shape of its element type.
template <class T> py::array viewOf(Orvan::Ptr<Orvan::Array<T>> values);
/// The same for an array of any of the forty types; strings and locations are copied.
/// \return None for other values
py::object viewOf(Tessara::PropertyValue const& values);
/// The bytes of an array of a viewable type, without its shape.
py::array bytesOf(Tessara::PropertyValue const& values);

/// A view with other dimensions. The array must have as many scalars.
py::array viewWithShape(Orvan::Ptr<Orvan::Array<unsigned int>> const& values, std::array<py::ssize_t, 2> const& shape);

/// NumPy's array of what the user passed: an array, a list, anything that `numpy.asarray` takes.
/// \param what  names the values in messages: "property \"w\" of points"
py::array arrayFrom(py::handle values, std::string const& what);

/// The values of an array whose elements have this type, shared or copied as described above.
/// \pre  `hasElements<T>(array)`, for a viewable type
template <class T> Orvan::Ptr<Orvan::Array<T>> valuesFrom(py::array const& array);
/// The same for the element type that fits the array.
/// \throws py::value_error, py::type_error  if none does
Tessara::PropertyValue valuesFrom(py::array const& array, std::string const& what);

/// Values of the element type with this name in the memory of `owner`, a `memoryview`. They are copied if they are not
/// aligned, or if somebody can write them: only `bytes` and views of geometry are certain to stay as they are.
/// \return empty if there is no viewable type of that name
Tessara::PropertyValue valuesIn(std::string const& elementType, py::buffer_info const& memory, py::object const& owner);

/// Makes an array's memory one that nobody can write, if that is possible: see the docstring.
py::array adopt(py::handle values, bool checks);

}
