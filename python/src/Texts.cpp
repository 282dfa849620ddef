#include "Texts.h"

namespace ModelingPython {

py::str toPython(std::string_view text)
{
    PyObject* const result = PyUnicode_DecodeUTF8(text.data(), static_cast<Py_ssize_t>(text.size()), "surrogateescape");
    if (!result)
        throw py::error_already_set();
    return py::reinterpret_steal<py::str>(result);
}

std::string toText(py::handle text)
{
    if (!PyUnicode_Check(text.ptr()))
        raiseTypeError("a text is expected, not " + std::string(Py_TYPE(text.ptr())->tp_name));
    auto const bytes =
        py::reinterpret_steal<py::bytes>(PyUnicode_AsEncodedString(text.ptr(), "utf-8", "surrogateescape"));
    if (!bytes)
        throw py::error_already_set();
    return bytes;
}

void raise(py::handle exceptionClass, std::string const& sentence)
{
    PyErr_SetObject(exceptionClass.ptr(), toPython(sentence).ptr());
    throw py::error_already_set();
}

void raiseValueError(std::string const& sentence)
{
    raise(PyExc_ValueError, sentence);
}

void raiseTypeError(std::string const& sentence)
{
    raise(PyExc_TypeError, sentence);
}

void raiseKeyError(std::string const& sentence)
{
    raise(PyExc_KeyError, sentence);
}

void raiseInvalidGeometry(std::string const& sentence)
{
    raise(py::module_::import("modeling.errors").attr("InvalidGeometry"), sentence);
}

}
