#pragma once

#include <TessaraObject/Object.h>

#include <pybind11/pybind11.h>

#include <utility>

namespace ModelingPython {

namespace py = pybind11;

/// What the Python classes `Mesh`, `PointCloud` and `StrandSet` hold: a reference to an object that nobody changes. Each
/// change makes a new object, which shares all arrays that did not change, and replaces the reference.
class Handle {
public:
    explicit Handle(Orvan::Ptr<Tessara::Object> object)
        : object_(std::move(object))
    {
    }

    Orvan::Ptr<Tessara::Object> const& object() const { return object_; }
    void replace(Orvan::Ptr<Tessara::Object> object) { object_ = std::move(object); }

private:
    Orvan::Ptr<Tessara::Object> object_;
};

class Mesh : public Handle {
public:
    using Handle::Handle;
};

class PointCloud : public Handle {
public:
    using Handle::Handle;
};

class StrandSet : public Handle {
public:
    using Handle::Handle;
};

/// The handle of the class that fits the type of the object.
/// \throws py::value_error  for an object of another type
py::object makeHandle(Orvan::Ptr<Tessara::Object> object);

}
