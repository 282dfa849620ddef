#include "Bindings.h"
#include "Cancellation.h"
#include "Errors.h"
#include "Facts.h"
#include "arrays.h"

#include "geometry/Geometry.h"
#include "geometry/MeshArrays.h"
#include "geometry/TriangleBatch.h"

#include <Modeling/addPointsToPointCloud.h>
#include <Modeling/computeDeletedComponentMapping.h>
#include <Modeling/copyNonGeoProperties.h>
#include <Modeling/deleteComponents.h>
#include <Modeling/deleteFaces.h>
#include <Modeling/deletePointsInPointCloud.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Names.h>

#include <pybind11/stl.h>

#include <fmt/format.h>

namespace ModelingPython {

namespace {

    using namespace Tessara::Geometry;
    using namespace Tessara::GeometryAlgorithms;
    using Tessara::Object;
    using Objects = Orvan::Array<Orvan::Ptr<Object>>;

    void requireDone(char const* operation, bool isDone)
    {
        if (!isDone)
            refuse(fmt::format(
                "{} failed: the geometry or one of its attributes does not meet the requirements of the operation",
                operation));
    }

    /// Edits a copy of the object with `edit`, which returns false if it refuses.
    template <class Edit>
    Orvan::Ptr<Object> edited(char const* operation, Orvan::Ptr<Object> const& object, Edit const& edit)
    {
        auto result = withoutLock([&] {
            Orvan::MutablePtr<Object> copy = copyOf(object);
            return edit(*copy) ? std::move(copy) : nullptr;
        });
        requireDone(operation, static_cast<bool>(result));
        return result;
    }

    py::object addPoints(PointCloud& cloud, Values<float> const& positions, std::string const& tag)
    {
        Orvan::Ptr<Object> const object = validObjectOf(cloud);
        Orvan::Array<Tessara::Math::float3> const points = pointsOf(positions);
        if (tag == sPointPosition || tag == sPointComp)
            refuse(fmt::format("a tag named {} would replace the points", tag));
        if (!tag.empty() && object->hasProperty(tag.c_str()))
            warn(fmt::format("the tag replaces the attribute {}", tag));
        return makeValid<PointCloud>(edited("add_points_to_point_cloud", object,
            [&](Object& copy) { return addPointsToPointCloud(points, tag.c_str(), copy, nullptr); }));
    }

    /// The indices of the elements that a mask or indices select.
    Orvan::Array<unsigned int> indicesOf(py::array const& selected, unsigned int count)
    {
        if (selected.ndim() == 1 && !py::isinstance<Values<bool>>(selected)) {
            Orvan::Array<unsigned int> indices(static_cast<std::uint64_t>(selected.size()), Orvan::kUninitialized);
            forEachIndex(py::cast<Values<long long>>(selected), count,
                [next = indices.data](unsigned int element) mutable { *next++ = element; });
            return indices;
        }
        Orvan::Array<unsigned int> indices;
        auto const mask = maskOf(selected, count);
        for (unsigned int element = 0; element != count; ++element)
            if (mask[element])
                indices.append(element);
        return indices;
    }

    py::object deletePoints(PointCloud& cloud, py::array const& points)
    {
        Orvan::Ptr<Object> const object = validObjectOf(cloud);
        auto const deleted = indicesOf(points, getElementCount(*object, sPointComp));
        return makeValid<PointCloud>(edited("delete_points_in_point_cloud", object, [&](Object& copy) {
            return getElementCount(copy, sPointComp) == 0 || deletePointsInPointCloud(deleted, copy, nullptr);
        }));
    }

    void requireFacesWithCorners(Object const& object)
    {
        ModelingProgram::MeshArrays const mesh = ModelingProgram::arraysOf(object);
        unsigned int const* const offset = mesh.faceOffset->data;
        unsigned int const count = mesh.faceCount();
        if (ModelingProgram::areTriangles(mesh, 0, count))
            return;
        for (unsigned int face = 0; face != count; ++face)
            if (offset[face] == offset[face + 1])
                refuse(fmt::format(
                    "delete_faces needs faces with corners, but face {} of the mesh has none (counted from 0)", face));
    }

    py::object deleteFacesOf(Mesh& mesh, py::array const& faces)
    {
        Orvan::Ptr<Object> const object = validObjectOf(mesh);
        auto const deleted = maskOf(faces, getElementCount(*object, sFaceComp));
        auto result = edited("delete_faces", object, [&](Object& copy) {
            requireFacesWithCorners(copy);
            return deleted.empty() || deleteFaces(deleted, copy);
        });
        return makeValid<Mesh>(std::move(result), {.hasNoIsolatedPoints = !deleted.empty()});
    }

    py::object deleteElements(Handle& given, std::string const& component, py::array const& elements)
    {
        Handle handle = snapshotOf(given);
        Orvan::Ptr<Object> const object = validObjectOf(handle);
        auto const deleted = maskOf(elements, getElementCount(*object, component.c_str()));
        Orvan::Ptr<Object> const result = edited("delete_components", object, [&](Object& copy) {
            return deleted.empty()
                || deleteComponents(computeDeletedComponentMapping(deleted), component.c_str(), copy);
        });
        auto const type = typeOf(handle); // a deletion removes no component and no property
        if (auto const status = withoutLock([&] { return ModelingProgram::validateAs(type, *result); }); !status)
            refuse(fmt::format("delete_components cannot delete elements of {} here, because other properties refer to "
                               "them: {}",
                component, status.message().view()));
        return makeValidHandle(type, result);
    }

    py::array_t<unsigned int> computeMapping(Values<bool> const& mask)
    {
        auto const deleted = arrayOf<bool>(mask);
        return numbersOf<unsigned int>(withoutLock([&] { return computeDeletedComponentMapping(deleted); }));
    }

    py::object copyProperties(Handle& handle, std::vector<Handle*> const& from)
    {
        Objects inputs;
        for (Handle const* const input : from)
            if (input)
                inputs.append(input->object());
        Orvan::MutablePtr<Object> result = copyOf(handle.object());
        copyNonGeoProperties(inputs, *result);
        py::object copy = makeHandle(std::move(result));
        if (handle.facts())
            copy.cast<Handle&>().setFacts(std::make_shared<Facts>(*handle.facts()));
        factsOf(copy.cast<Handle&>()).isBare.reset();
        return copy;
    }

}

void bindEditing(py::module_& module)
{
    module.def("add_points_to_point_cloud", &addPoints);
    module.def("delete_points_in_point_cloud", &deletePoints);
    module.def("delete_faces", &deleteFacesOf);
    module.def("delete_components", &deleteElements);
    module.def("compute_deleted_component_mapping", &computeMapping);
    module.def("copy_non_geo_properties", &copyProperties);
}

}
