#include "Bindings.h"
#include "Cancellation.h"
#include "Errors.h"
#include "Facts.h"

#include "geometry/FaceMeasures.h"
#include "geometry/Geometry.h"
#include "geometry/MeshTopology.h"
#include "geometry/Shape.h"

#include <pybind11/stl.h>

#include <array>
#include <vector>

namespace ModelingPython {

namespace {

    using namespace ModelingProgram;

    /// \return why the object is invalid (empty if it is valid), and what is suspicious about its properties
    py::tuple validateObject(Handle const& handle)
    {
        Orvan::Ptr<Tessara::Object> const object = handle.object();
        auto const status = withoutLock([&] { return validate(*object); });
        py::list suspicious;
        for (Orvan::String const& sentence : Tessara::Geometry::reportProperties(*object))
            suspicious.append(textOf(std::string(sentence.view())));
        return py::make_tuple(textOf(std::string(status.message().view())), suspicious);
    }

    struct MeshFacts {
        ExaminedMesh mesh;
        std::vector<std::uint64_t> slivers;
        std::uint64_t coincidentPoints = 0;
    };

    py::dict topologyOf(Mesh& mesh)
    {
        Orvan::Ptr<Tessara::Object> const object = validObjectOf(mesh);
        auto const [facts, slivers, coincidentPoints] = withoutLock([&] {
            MeshArrays const arrays = arraysOf(*object);
            return MeshFacts{
                examine(arrays), countSlivers(arrays, {0.1f, 0.05f, 0.01f}), countCoincidentPoints(arrays)};
        });
        MeshTopology const& topology = facts.topology;
        py::dict values;
        values["triangles"] = topology.triangleCount;
        values["quads"] = topology.quads.count;
        values["polygons"] = topology.polygons.count;
        values["faces_below_three_corners"] = topology.facesBelowThreeCorners.count;
        values["faces_with_repeated_points"] = topology.facesWithRepeatedPoints.count;
        values["edges"] = topology.edgeCount;
        values["parts"] = topology.partCount;
        values["open_edges"] = topology.boundaryEdges.count;
        values["non_manifold_edges"] = topology.nonManifoldEdges.count;
        values["winding_conflicts"] = topology.windingConflicts.count;
        values["pinched_points"] = topology.nonManifoldPoints.count;
        values["isolated_points"] = topology.isolatedPoints.count;
        values["coincident_points"] = coincidentPoints;
        values["closed_manifold"] = topology.isClosedManifold();
        values["genus"] = topology.genus;
        values["slivers"] = py::make_tuple(slivers[0], slivers[1], slivers[2]);
        values["volume"] = facts.shape.volume;
        values["area"] = facts.shape.area;
        values["fold_overs"] = facts.shape.foldOvers;
        values["diagonal"] = facts.shape.diagonal;
        return values;
    }

}

void bindInspection(py::module_& module)
{
    module.def("validate", &validateObject);
    module.def("topology", &topologyOf);
}

}
