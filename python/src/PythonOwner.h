#pragma once

#include <pybind11/pybind11.h>

namespace ModelingPython {

namespace py = pybind11;

/// A reference to a Python object that arrays of the library hold, so that it may be released on any thread, with or
/// without the interpreter lock. It never waits for the lock, because a thread that holds it may be waiting for this one:
/// without the lock, the object is released soon afterwards on the main thread.
class PythonOwner {
public:
    explicit PythonOwner(py::object object);
    PythonOwner(PythonOwner&& other) noexcept;
    PythonOwner& operator=(PythonOwner&&) = delete;
    ~PythonOwner();

private:
    struct Node {
        PyObject* object;
        Node* next;
    };

    static int releasePending(void*);

    Node* node_; // allocated beforehand, so that releasing cannot fail
};

}
