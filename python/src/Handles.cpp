#include "Handles.h"

#include "Bindings.h"

#include "geometry/Geometry.h"

namespace ModelingPython {

py::object makeHandle(Orvan::Ptr<Tessara::Object> object)
{
    using ModelingProgram::GeometryType;
    switch (ModelingProgram::typeOf(*object)) {
    case GeometryType::Mesh:
        return py::cast(Mesh(std::move(object)));
    case GeometryType::PointCloud:
        return py::cast(PointCloud(std::move(object)));
    case GeometryType::Strands:
        return py::cast(StrandSet(std::move(object)));
    case GeometryType::None:
        break;
    }
    throw py::value_error("an object of unknown kind");
}

void bindHandles(py::module_& module)
{
    py::class_<Handle>(module, "Geometry");
    py::class_<Mesh, Handle>(module, "Mesh");
    py::class_<PointCloud, Handle>(module, "PointCloud");
    py::class_<StrandSet, Handle>(module, "StrandSet");
}

}
