#include "Bindings.h"
#include "Cancellation.h"
#include "Creation.h"
#include "Facts.h"
#include "arrays.h"

#include "geometry/MeshArrays.h"

#include <Modeling/HalfEdgeDataStructure.h>

#include <fmt/format.h>

namespace ModelingPython {

namespace {

    using Geometry::Mesh::HalfEdge;
    using Geometry::Mesh::HalfEdgeDataStructure;

    /// The half-edges of a mesh. They do not change, and any number of threads may read them.
    class HalfEdges {
    public:
        HalfEdges(Orvan::Ptr<Tessara::Object> const& object)
            : pointCount_(ModelingProgram::arraysOf(*object).pointCount())
            , edges_(edgesOf(ModelingProgram::arraysOf(*object)))
        {
        }

        std::uint64_t size() const { return edges_.size(); }

        std::uint64_t valence(py::ssize_t point) const { return edges_.valence(checked(point)); }

        /// The face to the left of the directed edge, and its corner at the end of the edge; None if there is none.
        py::object find(py::ssize_t from, py::ssize_t to) const
        {
            HalfEdge const edge = edges_.halfEdge(checked(to), checked(from));
            if (edge == HalfEdge())
                return py::none();
            return py::make_tuple(edge.face, edge.corner);
        }

        py::array_t<unsigned int> neighbors(py::ssize_t point) const
        {
            Orvan::Array<unsigned int> points;
            for (auto const& [other, edge] : edges_.neighbors(checked(point)))
                points.append(other);
            return numbersOf<unsigned int>(std::move(points));
        }

    private:
        static HalfEdgeDataStructure edgesOf(ModelingProgram::MeshArrays const& mesh)
        {
            return {mesh.pointCount(), mesh.faceCount(), *mesh.faceVertex, *mesh.faceOffset};
        }

        unsigned int checked(py::ssize_t point) const
        {
            if (point < 0 || point >= py::ssize_t{pointCount_})
                throw py::index_error(fmt::format("there is no point {}: there are {}", point, pointCount_));
            return static_cast<unsigned int>(point);
        }

        unsigned int pointCount_;
        HalfEdgeDataStructure edges_;
    };

    constexpr char kDoc[] = R"(Half-edge adjacency of a mesh: for each point, the directed edges that end there.

Faces may have any number of corners. If several faces have the same directed edge, only that of the lowest face is
kept. Building takes linear time; looking up an edge is a short search.

>>> edges = HalfEdges(mesh)                                      # doctest: +SKIP
>>> edges.find(4, 7)   # the face with the edge from point 4 to point 7, and its corner at point 7  # doctest: +SKIP
(12, 2))";

    std::unique_ptr<HalfEdges> makeHalfEdges(Mesh& mesh)
    {
        Orvan::Ptr<Tessara::Object> const object = validObjectOf(mesh);
        return withoutLock([&] { return std::make_unique<HalfEdges>(object); });
    }

}

void bindHalfEdges(py::module_& module)
{
    py::class_<HalfEdges> halfEdges(module, "HalfEdges", kDoc);
    defineCreation(halfEdges, &makeHalfEdges, py::arg("mesh"));
    halfEdges.def("__len__", &HalfEdges::size, "The number of directed edges.")
        .def("valence", &HalfEdges::valence, py::arg("point"),
            "The number of directed edges that end at a point: its valence on a closed manifold.")
        .def("find", &HalfEdges::find, py::arg("start"), py::arg("end"),
            "The face that has the edge from point `start` to point `end`, and which of its corners is at `end` "
            "(modulo "
            "256). None if no face has it.")
        .def("neighbors", &HalfEdges::neighbors, py::arg("point"),
            "The points at which the edges that end at `point` start, ascending: shape (valence,), uint32.");
}

}
