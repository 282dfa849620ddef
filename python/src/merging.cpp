#include "Bindings.h"
#include "Cancellation.h"
#include "Errors.h"
#include "Facts.h"

#include "geometry/Geometry.h"
#include "shell/Failure.h"

#include <Modeling/mergeMeshes.h>
#include <Modeling/mergePointClouds.h>
#include <Modeling/mergeStrands.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Names.h>

#include <pybind11/stl.h>

#include <fmt/format.h>

#include <algorithm>

namespace ModelingPython {

namespace {

    using namespace ModelingProgram;
    using Tessara::Object;
    using Objects = Orvan::Array<Orvan::Ptr<Object>>;
    using MergeObjects = bool (*)(Objects const&, Object&, Orvan::RuntimeServices const*);

    /// Nobody sees an object without points as one of a certain kind: it becomes an empty one of the kind of the others.
    GeometryType giveOneKind(std::vector<GeometryType> types, Objects& objects)
    {
        if (std::all_of(types.begin(), types.end(), [&](GeometryType type) { return type == types.front(); }))
            return types.front();
        auto const isEmpty = [](auto const& object) {
            return Tessara::Geometry::getElementCount(*object, Tessara::Geometry::sPointComp) == 0;
        };
        auto const typical = std::find_if_not(objects.begin(), objects.end(), isEmpty);
        GeometryType const type =
            types[typical == objects.end() ? 0 : static_cast<std::size_t>(typical - objects.begin())];
        for (std::uint64_t i = 0; i != objects.size; ++i) {
            if (types[i] == type || !isEmpty(objects[i]))
                continue;
            Orvan::MutablePtr<Object> empty = copyOf(objects[i]);
            makeEmpty(type, *empty);
            objects[i] = std::move(empty);
            types[i] = type;
        }
        if (std::all_of(types.begin(), types.end(), [=](GeometryType other) { return other == type; }))
            return type;
        std::vector<std::string> kinds;
        for (std::uint64_t i = 0; i != objects.size; ++i)
            kinds.push_back(fmt::format("object {} is a {}", i, nameOf(types[i])));
        refuse(
            "merge joins meshes with meshes, point clouds with point clouds, or strand sets with strand sets", kinds);
    }

    /// The objects are validated here: the library would leave out invalid ones silently.
    /// \param types  if given, the type of each is added
    Objects objectsOf(std::vector<Handle*> const& handles, std::vector<GeometryType>* types = nullptr)
    {
        if (handles.empty())
            refuse("there is nothing to merge");
        Objects objects;
        for (std::size_t i = 0; i != handles.size(); ++i) {
            if (!handles[i])
                throw py::type_error("merging needs objects, not None");
            try {
                Handle handle = snapshotOf(*handles[i]);
                objects.append(validObjectOf(handle));
                if (types)
                    types->push_back(typeOf(handle));
            } catch (Failure const& failure) {
                refuseInvalid(fmt::format("object {}: {}", i, failure.what()));
            }
        }
        return objects;
    }

    template <class Kind> py::object mergeWith(MergeObjects merge, Objects const& objects)
    {
        Orvan::MutablePtr<Object> result = Tessara::createObject();
        if (!withoutLock([&] { return merge(objects, *result, nullptr); }))
            refuse("there would be more than 4,294,967,295 elements of one kind");
        return makeValid<Kind>(std::move(result));
    }

    template <class Kind, MergeObjects merge> py::object mergeAlike(std::vector<Kind*> const& handles)
    {
        return mergeWith<Kind>(merge, objectsOf({handles.begin(), handles.end()}));
    }

    void numberSources(std::string const& attribute, Objects& objects)
    {
        for (std::uint64_t i = 0; i != objects.size; ++i) {
            Orvan::MutablePtr<Object> numbered = copyOf(objects[i]);
            numberElements(attribute, static_cast<int>(i), fmt::format("object {}", i), *numbered);
            objects[i] = std::move(numbered);
        }
    }

    py::object mergeAny(std::vector<Handle*> const& handles, std::string const& sourceAttribute)
    {
        using namespace Tessara::GeometryAlgorithms;
        std::vector<GeometryType> types;
        Objects objects = objectsOf(handles, &types);
        GeometryType const type = giveOneKind(std::move(types), objects);
        if (!sourceAttribute.empty())
            withoutLock([&] { numberSources(sourceAttribute, objects); });
        switch (type) {
        case GeometryType::Mesh:
            return mergeWith<Mesh>(mergeMeshes, objects);
        case GeometryType::PointCloud:
            return mergeWith<PointCloud>(mergePointClouds, objects);
        default:
            return mergeWith<StrandSet>(mergeStrands, objects);
        }
    }

}

void bindMerging(py::module_& module)
{
    using namespace Tessara::GeometryAlgorithms;
    module.def("merge", &mergeAny);
    module.def("merge_meshes", &mergeAlike<Mesh, &mergeMeshes>);
    module.def("merge_point_clouds", &mergeAlike<PointCloud, &mergePointClouds>);
    module.def("merge_strands", &mergeAlike<StrandSet, &mergeStrands>);
}

}
