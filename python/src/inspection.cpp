#include "Bindings.h"
#include "Cancellation.h"
#include "Errors.h"
#include "Facts.h"

#include "geometry/FaceMeasures.h"
#include "geometry/Geometry.h"
#include "geometry/MeshTopology.h"
#include "geometry/Shape.h"

#include <pybind11/stl.h>

#include <algorithm>
#include <array>
#include <cstddef>
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

    template <std::size_t kSize> struct Literal {
        char text[kSize];
        constexpr Literal(char const (&literal)[kSize]) { std::copy_n(literal, kSize, text); }
    };

    /// A string that is made once per process: for a few faces, making the names of all facts takes longest.
    template <Literal kName> py::handle interned()
    {
        static PyObject* const string = PyUnicode_InternFromString(kName.text);
        if (!string)
            throw py::error_already_set();
        return string;
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
        values[interned<"triangles">()] = topology.triangleCount;
        values[interned<"quads">()] = topology.quads.count;
        values[interned<"polygons">()] = topology.polygons.count;
        values[interned<"faces_below_three_corners">()] = topology.facesBelowThreeCorners.count;
        values[interned<"faces_with_repeated_points">()] = topology.facesWithRepeatedPoints.count;
        values[interned<"edges">()] = topology.edgeCount;
        values[interned<"parts">()] = topology.partCount;
        values[interned<"open_edges">()] = topology.boundaryEdges.count;
        values[interned<"non_manifold_edges">()] = topology.nonManifoldEdges.count;
        values[interned<"winding_conflicts">()] = topology.windingConflicts.count;
        values[interned<"pinched_points">()] = topology.nonManifoldPoints.count;
        values[interned<"isolated_points">()] = topology.isolatedPoints.count;
        values[interned<"coincident_points">()] = coincidentPoints;
        values[interned<"closed_manifold">()] = topology.isClosedManifold();
        values[interned<"genus">()] = topology.genus;
        values[interned<"slivers">()] = py::make_tuple(slivers[0], slivers[1], slivers[2]);
        values[interned<"volume">()] = facts.shape.volume;
        values[interned<"area">()] = facts.shape.area;
        values[interned<"fold_overs">()] = facts.shape.foldOvers;
        values[interned<"diagonal">()] = facts.shape.diagonal;
        return values;
    }

}

void bindInspection(py::module_& module)
{
    module.def("validate", &validateObject);
    module.def("topology", &topologyOf);
}

}
