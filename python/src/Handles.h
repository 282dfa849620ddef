#pragma once

#include <TessaraObject/Object.h>

#include <pybind11/pybind11.h>

#include <memory>
#include <utility>

namespace ModelingPython {

namespace py = pybind11;

struct Facts;

/// What the Python classes `Mesh`, `PointCloud` and `StrandSet` hold: a reference to an object that nobody changes. Each
/// change makes a new object, which shares all arrays that did not change, and replaces the reference.
class Handle {
public:
    explicit Handle(Orvan::Ptr<Tessara::Object> object)
        : object_(std::move(object))
    {
    }

    /// A reference of the caller's own: whenever Python code runs, or the interpreter lock is released, the handle may
    /// get another object.
    Orvan::Ptr<Tessara::Object> object() const { return object_; }
    void replace(Orvan::Ptr<Tessara::Object> object)
    {
        object_ = std::move(object);
        facts_.reset();
    }

    /// What is known about the object (`Facts.h`), so that it is checked once; null if nothing is.
    std::shared_ptr<Facts> const& facts() const { return facts_; }
    void setFacts(std::shared_ptr<Facts> facts) { facts_ = std::move(facts); }

private:
    Orvan::Ptr<Tessara::Object> object_;
    std::shared_ptr<Facts> facts_;
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
