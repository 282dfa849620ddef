// What operations cost without Python, on the objects that the package holds. Each function calls the library as the package
// does: it copies the object, which shares its arrays, and edits the copy. It does so `count` times within one call.

#include "GuideHandle.h"
#include "Handles.h"

#include "geometry/FaceMeasures.h"
#include "geometry/Geometry.h"
#include "geometry/MeshArrays.h"
#include "geometry/MeshTopology.h"
#include "geometry/Shape.h"

#include <Modeling/HalfEdgeDataStructure.h>
#include <Modeling/addPointsToPointCloud.h>
#include <Modeling/computeDeletedComponentMapping.h>
#include <Modeling/copyNonGeoProperties.h>
#include <Modeling/deleteComponents.h>
#include <Modeling/deleteFaces.h>
#include <Modeling/deletePointsInPointCloud.h>
#include <Modeling/mergeMeshes.h>
#include <Modeling/mergePointClouds.h>
#include <Modeling/mergeStrands.h>
#include <Modeling/removeSlivers.h>
#include <Modeling/smooth.h>
#include <Modeling/subdivide.h>
#include <Modeling/subdivisionSteps.h>
#include <Modeling/triangulate.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Names.h>
#include <TessaraMathSupport/Loggers.h>

#include <pybind11/numpy.h>

#include <cstring>

namespace {

namespace py = pybind11;
using namespace Tessara::Geometry;
using namespace Tessara::GeometryAlgorithms;
using ModelingPython::Handle;
using Tessara::Object;
using Tessara::Math::float3;
using Objects = Orvan::Array<Orvan::Ptr<Object>>;

template <class Work> void repeat(unsigned int count, Work const& work)
{
    py::gil_scoped_release const unlocked;
    for (unsigned int i = 0; i != count; ++i)
        work();
}

/// Edits copies of the object.
template <class Edit> void repeatEdit(Handle const& handle, unsigned int count, Edit const& edit)
{
    Orvan::Ptr<Object> const object = handle.object();
    repeat(count, [&] {
        auto copy = Orvan::MutablePtr<Object>::make(*object);
        edit(*copy);
    });
}

template <class T> Orvan::Array<T> arrayOf(py::array_t<T> const& values)
{
    Orvan::Array<T> result(static_cast<std::uint64_t>(values.size()));
    if (!result.empty())
        std::memcpy(result.data, values.data(), result.size * sizeof(T));
    return result;
}

void addPoint(Handle const& cloud, unsigned int count)
{
    Orvan::Array<float3> const point{{0, 0, 1}};
    repeatEdit(cloud, count, [&](Object& copy) { addPointsToPointCloud(point, "", copy, nullptr); });
}

void deletePoints(Handle const& cloud, py::array_t<unsigned int> const& points, unsigned int count)
{
    repeatEdit(cloud, count,
        [&, deleted = arrayOf(points)](Object& copy) { deletePointsInPointCloud(deleted, copy, nullptr); });
}

void deleteMarkedFaces(Handle const& mesh, py::array_t<bool> const& faces, unsigned int count)
{
    repeatEdit(mesh, count, [&, deleted = arrayOf(faces)](Object& copy) { deleteFaces(deleted, copy); });
}

void deleteMarked(
    Handle const& handle, std::string const& component, py::array_t<bool> const& marks, unsigned int count)
{
    repeatEdit(handle, count, [&, deleted = arrayOf(marks)](Object& copy) {
        deleteComponents(computeDeletedComponentMapping(deleted), component.c_str(), copy);
    });
}

void computeMapping(py::array_t<bool> const& marks, unsigned int count)
{
    repeat(count, [deleted = arrayOf(marks)] { computeDeletedComponentMapping(deleted); });
}

void copyProperties(Handle const& handle, unsigned int count)
{
    Objects inputs;
    inputs.append(handle.object());
    repeatEdit(handle, count, [&](Object& copy) { copyNonGeoProperties(inputs, copy); });
}

template <auto merge> void mergeTwo(Handle const& handle, unsigned int count)
{
    Objects inputs;
    inputs.append(handle.object());
    inputs.append(handle.object());
    repeat(count, [&] {
        Orvan::MutablePtr<Object> result = Tessara::createObject();
        merge(inputs, *result, nullptr);
    });
}

void triangulate(Handle const& mesh, unsigned int count)
{
    repeatEdit(mesh, count, [](Object& copy) { Geometry::Mesh::triangulate("*", copy); });
}

void subdivide(Handle const& mesh, float tolerance, unsigned int count)
{
    repeatEdit(mesh, count, [&](Object& copy) { Geometry::Mesh::subdivide(tolerance, copy); });
}

void subdivideByVolume(Handle const& mesh, ModelingPython::Guide const& guide, float tolerance, unsigned int count)
{
    repeatEdit(mesh, count, [&](Object& copy) { guide.grid().refine(tolerance, copy); });
}

void markLargeFaces(Handle const& mesh, float tolerance, unsigned int count)
{
    Orvan::Ptr<Object> const object = mesh.object();
    repeat(count, [&] {
        ModelingProgram::MeshArrays const arrays = ModelingProgram::arraysOf(*object);
        Orvan::Array<bool> marks(arrays.faceCount());
        Geometry::Mesh::Internal::markForSubdivision(
            tolerance, arrays.faceCount(), *arrays.positions, *arrays.faceVertex, *arrays.faceOffset, marks);
    });
}

void smooth(Handle const& mesh, float amount, unsigned int count)
{
    repeatEdit(mesh, count, [&](Object& copy) {
        ModelingProgram::MeshArrays const arrays = ModelingProgram::arraysOf(copy);
        Orvan::Array<float3> positions = *arrays.positions;
        Geometry::Mesh::smooth(amount, arrays.pointCount(), arrays.faceCount(), *arrays.faceVertex, *arrays.faceOffset,
            nullptr, positions, CoreGL::NOPLogger());
        addDataProperty(sPointPosition, sPointComp, std::move(positions), copy);
    });
}

void removeSlivers(Handle const& mesh, float ratio, unsigned int count)
{
    repeatEdit(mesh, count, [&](Object& copy) { Geometry::Mesh::removeSlivers(ratio, copy); });
}

void findHalfEdges(Handle const& mesh, unsigned int count)
{
    Orvan::Ptr<Object> const object = mesh.object();
    repeat(count, [&] {
        ModelingProgram::MeshArrays const arrays = ModelingProgram::arraysOf(*object);
        Geometry::Mesh::HalfEdgeDataStructure const edges(
            arrays.pointCount(), arrays.faceCount(), *arrays.faceVertex, *arrays.faceOffset);
    });
}

void validateObject(Handle const& handle, unsigned int count)
{
    Orvan::Ptr<Object> const object = handle.object();
    repeat(count, [&] {
        static_cast<void>(ModelingProgram::validate(*object));
        static_cast<void>(reportProperties(*object));
    });
}

void findTopology(Handle const& mesh, unsigned int count)
{
    using namespace ModelingProgram;
    Orvan::Ptr<Object> const object = mesh.object();
    repeat(count, [&] {
        MeshArrays const arrays = arraysOf(*object);
        static_cast<void>(examine(arrays));
        static_cast<void>(countSlivers(arrays, {0.1f, 0.05f, 0.01f}));
        static_cast<void>(countCoincidentPoints(arrays));
    });
}

}

PYBIND11_MODULE(modeling_reference, module)
{
    py::module_::import("modeling._modeling"); // registers the classes of the arguments
    module.def("empty", [](py::object const&) {});
    module.def("add_points_to_point_cloud", &addPoint);
    module.def("delete_points_in_point_cloud", &deletePoints);
    module.def("delete_faces", &deleteMarkedFaces);
    module.def("delete_components", &deleteMarked);
    module.def("compute_deleted_component_mapping", &computeMapping);
    module.def("copy_non_geo_properties", &copyProperties);
    module.def("merge_meshes", &mergeTwo<&mergeMeshes>);
    module.def("merge_point_clouds", &mergeTwo<&mergePointClouds>);
    module.def("merge_strands", &mergeTwo<&mergeStrands>);
    module.def("triangulate", &triangulate);
    module.def("subdivide", &subdivide);
    module.def("subdivide_by_volume", &subdivideByVolume);
    module.def("large_faces", &markLargeFaces);
    module.def("smooth", &smooth);
    module.def("remove_slivers", &removeSlivers);
    module.def("HalfEdges", &findHalfEdges);
    module.def("validate", &validateObject);
    module.def("topology", &findTopology);
}
