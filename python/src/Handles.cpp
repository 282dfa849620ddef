#include "Handles.h"

#include "Bindings.h"

#include "Construction.h"
#include "Texts.h"
#include "Values.h"
#include "Views.h"

#include "geometry/Geometry.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>

#include <algorithm>
#include <memory>

namespace ModelingPython {

using namespace Tessara::Geometry;
using Tessara::Object;
using Tessara::Math::float3;
using Indices = Orvan::Ptr<Orvan::Array<unsigned int>>;

namespace {

    template <class T> Orvan::Ptr<Orvan::Array<T>> standardData(Handle const& handle, Orvan::String const& name)
    {
        auto values = dataOf<T>(*handle.object(), name);
        if (!values)
            raiseInvalidGeometry("the data property " + std::string(name.view()) + " is missing");
        return values;
    }

    py::array pointsOf(Handle const& handle)
    {
        static Orvan::String const name(sPointPosition); // views of points are made all the time
        return viewOf(standardData<float3>(handle, name));
    }

    void setPoints(Handle& handle, py::handle points)
    {
        handle.replace(withPositions(*handle.object(), points));
    }

    /// The corners of all faces as rows, if that is possible.
    py::array facesOf(::ModelingPython::Mesh const& mesh)
    {
        Indices const corners = standardData<unsigned int>(mesh, sFaceVertex);
        Indices const offsets = standardData<unsigned int>(mesh, sFaceOffset);
        if (offsets->size <= 1)
            return viewWithShape(corners, {0, 3});
        unsigned int const* const offset = offsets->data;
        std::uint64_t const faceCount = offsets->size - 1;
        unsigned int least = ~0u, most = 0;
        for (std::uint64_t face = 0; face != faceCount; ++face) {
            least = std::min(least, offset[face + 1] - offset[face]);
            most = std::max(most, offset[face + 1] - offset[face]);
        }
        if (least != most)
            raiseValueError("faces have " + std::to_string(least) + " to " + std::to_string(most)
                + " corners; use `face_vertices` and `face_offsets`");
        if (faceCount * least != corners->size)
            raiseInvalidGeometry("sFaceOffset does not match the corners in sFaceVertex");
        return viewWithShape(corners, {static_cast<py::ssize_t>(faceCount), static_cast<py::ssize_t>(least)});
    }

    py::object elementData(py::object const& self, char const* component)
    {
        return py::module_::import("modeling.data").attr("ElementData")(self, component);
    }

    /// A class of Python code, made for the object.
    py::object companion(py::object const& self, char const* className)
    {
        return py::module_::import("modeling.data").attr(className)(self);
    }

    template <class H> Orvan::Ptr<Object> emptyObject();

    template <> Orvan::Ptr<Object> emptyObject<::ModelingPython::Mesh>()
    {
        return makeMesh({}, {}, {});
    }

    template <> Orvan::Ptr<Object> emptyObject<PointCloud>()
    {
        return makePointCloud({});
    }

    template <> Orvan::Ptr<Object> emptyObject<StrandSet>()
    {
        return makeStrands({}, {});
    }

    PyObject* refuseNew(PyTypeObject*, PyObject*, PyObject*)
    {
        PyErr_SetString(PyExc_TypeError, "Geometry is abstract: make a Mesh, a PointCloud or a StrandSet");
        return nullptr;
    }

    /// `__new__`, which makes empty geometry: a handle without an object would crash all that use it.
    template <class H> PyObject* newEmpty(PyTypeObject* type, PyObject*, PyObject*)
    {
        try {
            auto const& classes = py::detail::all_type_info(type);
            if (classes.size() != 1)
                raiseTypeError("a class of one kind of geometry only can be derived");
            auto empty = std::make_unique<H>(emptyObject<H>());
            auto const self = py::reinterpret_steal<py::object>(py::detail::make_new_instance(type));
            auto* const instance = reinterpret_cast<py::detail::instance*>(self.ptr());
            py::detail::value_and_holder place = instance->get_value_and_holder(classes[0]);
            place.value_ptr() = empty.release();
            classes[0]->init_instance(instance, nullptr);
            return self.inc_ref().ptr();
        } catch (py::error_already_set& error) {
            error.restore();
        } catch (std::bad_alloc const&) {
            PyErr_NoMemory();
        }
        return nullptr;
    }

    template <class H> void setNew(PyHeapTypeObject* type)
    {
        type->ht_type.tp_new = &newEmpty<H>;
    }

    /// Objects are made by `__new__`, so `__init__` is a function as all others.
    template <class Initialize, class... Extra>
    void defineInit(py::handle type, Initialize const& initialize, Extra const&... extra)
    {
        type.attr("__init__") = py::cpp_function(initialize, py::name("initialize"), py::is_method(type), extra...);
    }

    /// What a derived class adds: None, its `__dict__`, or a pair of that and of the values in its slots.
    py::object stateOf(py::handle self)
    {
        PyTypeObject* const type = Py_TYPE(self.ptr());
        bool const isDerived = py::detail::all_type_info(type)[0]->type != type;
        return isDerived ? py::object(self.attr("__getstate__")()) : py::none();
    }

    void setState(py::handle self, py::handle state)
    {
        if (state.is_none())
            return;
        if (py::hasattr(self, "__setstate__")) {
            self.attr("__setstate__")(state);
            return;
        }
        bool const hasSlots = py::isinstance<py::tuple>(state) && py::len(state) == 2;
        py::object const attributes =
            hasSlots ? py::object(state[py::int_(0)]) : py::reinterpret_borrow<py::object>(state);
        if (!attributes.is_none())
            self.attr("__dict__").attr("update")(attributes);
        if (hasSlots)
            for (auto const& [name, value] : py::dict(state[py::int_(1)]))
                py::setattr(self, name, value);
    }

    py::object copyWithoutState(py::handle self)
    {
        py::object copy = newInstance(py::type::handle_of(self));
        copy.cast<Handle&>().replace(self.cast<Handle&>().object());
        return copy;
    }

    py::object copyOf(py::object const& self)
    {
        py::object copy = copyWithoutState(self);
        setState(copy, stateOf(self));
        return copy;
    }

    py::object deepCopyOf(py::object const& self, py::dict const& memo)
    {
        py::object copy = copyWithoutState(self);
        memo[py::int_(reinterpret_cast<std::uintptr_t>(self.ptr()))] = copy; // attributes may refer to the object
        setState(copy, py::module_::import("copy").attr("deepcopy")(stateOf(self), memo));
        return copy;
    }

    py::object isEqual(py::object const& self, py::object const& other)
    {
        if (!py::isinstance<Handle>(other))
            return py::reinterpret_borrow<py::object>(Py_NotImplemented);
        return py::bool_(haveSameContents(*self.cast<Handle&>().object(), *other.cast<Handle&>().object()));
    }

    py::list anomaliesOf(Handle const& handle)
    {
        py::list sentences;
        for (Orvan::String const& sentence : reportProperties(*handle.object()))
            sentences.append(toPython(sentence.view()));
        return sentences;
    }

    void bindGeometry(py::module_& module)
    {
        py::class_<Handle> geometry(module, "Geometry",
            py::custom_type_setup([](PyHeapTypeObject* type) { type->ht_type.tp_new = &refuseNew; }),
            R"(What meshes, point clouds and strand sets have in common.

Geometry is a value: a copy is independent of the original, and costs nothing, because arrays are shared until one of
the two changes. Arrays that come out are read-only views of the same memory; they keep their values whatever happens to
the geometry. To change values, assign a new array.)");
        geometry
            .def_property("points", &pointsOf, &setPoints,
                "Positions in scene units: float32 of shape (n, 3). May be assigned for the same number of points.")
            .def_property_readonly(
                "point_count", [](Handle const& h) { return getElementCount(*h.object(), sPointComp); },
                "The number of points.")
            .def_property_readonly(
                "point_data", [](py::object const& self) { return elementData(self, "points"); },
                "Properties of points: a mapping from names to arrays with one row per point.")
            .def(
                "data",
                [](py::object const& self, py::str const& target) {
                    return py::module_::import("modeling.data").attr("ElementData")(self, target);
                },
                py::arg("target"), "The properties of any component or range: `mesh.data(\"points\")` is `point_data`.")
            .def_property_readonly(
                "ranges", [](py::object const& self) { return companion(self, "Ranges"); },
                "Properties with one index per element, into values that several elements share.")
            .def_property_readonly(
                "components", [](py::object const& self) { return companion(self, "Components"); },
                "The number of elements of each component: a mapping from names to counts.")
            .def(
                "validate", [](Handle const& handle) { requireValid(*handle.object()); },
                "Raise InvalidGeometry if an array is missing or does not fit the others.")
            .def("anomalies", &anomaliesOf,
                "Sentences about properties that operations would pad, trim or drop; usually an empty list.")
            .def("__eq__", &isEqual, py::arg("other"),
                "Whether the other geometry has the same properties with the same values, to the bit.")
            .def("__copy__", &copyOf)
            .def("__deepcopy__", &deepCopyOf, py::arg("memo"))
            .def("copy", &copyOf, "An independent copy. Arrays are shared until one of the two changes.")
            .def("__repr__",
                [](py::object const& self) { return py::module_::import("modeling.display").attr("text")(self); })
            .def("_repr_html_",
                [](py::object const& self) { return py::module_::import("modeling.display").attr("html")(self); });
    }

    void bindMesh(py::module_& module)
    {
        using Class = ::ModelingPython::Mesh;
        py::class_<Class, Handle> mesh(module, "Mesh", py::custom_type_setup(&setNew<Class>),
            R"(Points and faces of any number of corners, with properties of points, faces and corners.

Mesh(points, faces)
    points: (n, 3) in scene units. faces: point indices, of shape (m, k) or a list with a list for each face.
Mesh(points, corners, offsets=offsets)
    corners: the point indices of all faces, one after the other. offsets: where each face begins, and the number of
    corners: m + 1 integers.

Positions other than float32 are narrowed, with a PrecisionWarning if that moves a point by more than a millionth of the
bounding box's diagonal. Raises InvalidGeometry with the array and the element if the arrays do not make a mesh.)");
        defineInit(
            mesh,
            [](Class& self, py::object const& points, py::object const& faces, py::object const& offsets) {
                self.replace(constructMesh(points, faces, offsets));
            },
            py::arg("points") = py::tuple(), py::arg("faces") = py::tuple(), py::kw_only(),
            py::arg("offsets") = py::none());
        mesh.def_property_readonly("faces", &facesOf,
                "The point indices of each face, uint32 of shape (m, k), if all faces have k corners; else a "
                "ValueError.")
            .def_property_readonly(
                "face_vertices", [](Class const& m) { return viewOf(standardData<unsigned int>(m, sFaceVertex)); },
                "The point of each face corner, face after face: uint32 of shape (corners,).")
            .def_property_readonly(
                "face_offsets", [](Class const& m) { return viewOf(standardData<unsigned int>(m, sFaceOffset)); },
                "Where the corners of each face begin, and the number of corners: uint32 of shape (faces + 1,).")
            .def_property_readonly(
                "face_count", [](Class const& m) { return getElementCount(*m.object(), sFaceComp); },
                "The number of faces.")
            .def_property_readonly(
                "corner_count", [](Class const& m) { return getElementCount(*m.object(), sFaceVertexComp); },
                "The number of face corners.")
            .def_property_readonly(
                "face_data", [](py::object const& self) { return elementData(self, "faces"); },
                "Properties of faces: a mapping from names to arrays with one row per face.")
            .def_property_readonly(
                "corner_data", [](py::object const& self) { return elementData(self, "corners"); },
                "Properties of face corners: a mapping from names to arrays with one row per corner.");
    }

    void bindPointCloud(py::module_& module)
    {
        py::class_<PointCloud, Handle> cloud(module, "PointCloud", py::custom_type_setup(&setNew<PointCloud>),
            R"(Points with properties.

PointCloud(points)
    points: (n, 3) in scene units; narrowed to float32 as those of a Mesh.)");
        defineInit(
            cloud, [](PointCloud& self, py::object const& points) { self.replace(constructPointCloud(points)); },
            py::arg("points") = py::tuple());
    }

    void bindStrandSet(py::module_& module)
    {
        py::class_<StrandSet, Handle> strands(module, "StrandSet", py::custom_type_setup(&setNew<StrandSet>),
            R"(Polylines with properties of points and strands.

StrandSet(points, offsets=offsets)
    points: (n, 3) in scene units, strand after strand. offsets: where each strand begins, and the number of points.
StrandSet([points_of_first, points_of_second, ...])
    Each of shape (k, 3).)");
        defineInit(
            strands,
            [](StrandSet& self, py::object const& points, py::object const& offsets) {
                self.replace(constructStrandSet(points, offsets));
            },
            py::arg("points") = py::tuple(), py::kw_only(), py::arg("offsets") = py::none());
        strands
            .def_property_readonly(
                "strand_offsets",
                [](StrandSet const& s) { return viewOf(standardData<unsigned int>(s, sStrandOffset)); },
                "Where each strand begins, and the number of points: uint32 of shape (strands + 1,).")
            .def_property_readonly(
                "strand_count", [](StrandSet const& s) { return getElementCount(*s.object(), sStrandComp); },
                "The number of strands.")
            .def_property_readonly(
                "strand_data", [](py::object const& self) { return elementData(self, "strands"); },
                "Properties of strands: a mapping from names to arrays with one row per strand.");
    }

}

py::object newInstance(py::handle type)
{
    auto const& classes = py::detail::all_type_info(reinterpret_cast<PyTypeObject*>(type.ptr()));
    auto instance = py::reinterpret_steal<py::object>(
        classes.at(0)->type->tp_new(reinterpret_cast<PyTypeObject*>(type.ptr()), py::tuple().ptr(), nullptr));
    if (!instance)
        throw py::error_already_set();
    return instance;
}

py::object makeHandle(Orvan::Ptr<Object> object)
{
    using ModelingProgram::GeometryType;
    switch (object ? ModelingProgram::typeOf(*object) : GeometryType::None) {
    case GeometryType::Mesh:
        return py::cast(::ModelingPython::Mesh(std::move(object)));
    case GeometryType::PointCloud:
        return py::cast(PointCloud(std::move(object)));
    case GeometryType::Strands:
        return py::cast(StrandSet(std::move(object)));
    case GeometryType::None:
        break;
    }
    throw py::value_error("the object lacks the components and standard properties of any kind of geometry");
}

void bindHandles(py::module_& module)
{
    bindGeometry(module);
    bindMesh(module);
    bindPointCloud(module);
    bindStrandSet(module);
}

}
