#pragma once

#include <TessaraObject/Object.h>

#include <pybind11/pybind11.h>

namespace ModelingPython {

namespace py = pybind11;

// Geometry from what users pass to constructors. Everything is checked before an object is made.

/// \param faces    integers of shape (m, k), a sequence of sequences, or the corners of all faces if there are offsets
/// \param offsets  None, or the start of each face and the number of corners
/// \throws `modeling.InvalidGeometry`  if the arrays do not make a mesh; py::value_error, py::type_error
Orvan::Ptr<Tessara::Object> constructMesh(py::handle points, py::handle faces, py::handle offsets);
Orvan::Ptr<Tessara::Object> constructPointCloud(py::handle points);
/// \param points   of all strands if there are offsets, otherwise a sequence with the points of each strand
Orvan::Ptr<Tessara::Object> constructStrandSet(py::handle points, py::handle offsets);

/// Other positions for the same points, as constructors take them.
Orvan::Ptr<Tessara::Object> withPositions(Tessara::Object const& object, py::handle points);

/// \throws `modeling.InvalidGeometry`  with the sentence of the host's validator
void requireValid(Tessara::Object const& object);

/// A new instance of a class derived from `Handle`, made as its base in this module makes it: `__new__` of a derived class
/// may take arguments, and `__init__` is not called.
py::object newInstance(py::handle type);

}
