#include "Inputs.h"

#include <CGAL/Barycentric_coordinates_2/Mean_value_coordinates_2.h>
#include <CGAL/Exact_predicates_inexact_constructions_kernel.h>
#include <CGAL/Polygon_mesh_processing/measure.h>
#include <CGAL/Polygon_mesh_processing/polygon_soup_to_polygon_mesh.h>
#include <CGAL/Polygon_mesh_processing/repair_degeneracies.h>
#include <CGAL/Polygon_mesh_processing/triangulate_faces.h>
#include <CGAL/Simple_cartesian.h>
#include <CGAL/Surface_mesh.h>
#include <CGAL/boost/graph/Euler_operations.h>
#include <CGAL/subdivision_method_3.h>

#include <deque>

using namespace Benchmarks;
namespace Processing = CGAL::Polygon_mesh_processing;

namespace {

template <class Kernel> using Surface = CGAL::Surface_mesh<typename Kernel::Point_3>;
using InFloat = CGAL::Simple_cartesian<float>;
using InDouble = CGAL::Simple_cartesian<double>;

template <class Kernel> Surface<Kernel> surfaceOf(PolygonMesh const& mesh)
{
    Surface<Kernel> surface;
    for (auto const& p : mesh.points)
        surface.add_vertex({p.x, p.y, p.z});
    for (std::size_t face = 0; face != mesh.faceCount(); ++face) {
        std::vector<typename Surface<Kernel>::Vertex_index> corners;
        for (unsigned int corner = mesh.faceOffset[face]; corner != mesh.faceOffset[face + 1]; ++corner)
            corners.emplace_back(mesh.faceVertex[corner]);
        surface.add_face(corners);
    }
    return surface;
}

/// Collapses the needles that CGAL finds when the shortest edge is less than that ratio times the longest, as often as that
/// gives new ones.
Row const needles("removeSlivers:CGAL", kTriangles, [](Run& run) {
    constexpr double noCaps = -1; // a cosine that no angle is below
    std::size_t remaining = 0;
    timeOnCopies(run, run.size(), surfaceOf<InDouble>(made(Meshes::needled, run.size())), [&](auto& mesh) {
        Processing::experimental::remove_almost_degenerate_faces(mesh, noCaps, 1 / kSliverRatio, 0.0);
        mesh.collect_garbage();
        remaining = mesh.number_of_faces();
    });
    run.reportSimilarResult(static_cast<double>(remaining));
});

Row const deletion("deleteFaces:CGAL", kFaces, [](Run& run) {
    using Mesh = Surface<InFloat>;
    PatchedSphere const sphere(run.size());
    Mesh source = surfaceOf<InFloat>(made(Meshes::sphere, run.size()));
    source.add_property_map<Mesh::Vertex_index, InFloat::Vector_3>("v:normal");
    source.add_property_map<Mesh::Halfedge_index, InFloat::Vector_2>("h:uv");
    source.add_property_map<Mesh::Face_index, int>("f:material");
    std::size_t remaining = 0;
    timeOnCopies(run, sphere.faceCount(), source, [&](Mesh& mesh) {
        for (unsigned int face = 0; face != sphere.faceCount(); ++face)
            if (sphere.deleted[face])
                CGAL::Euler::remove_face(halfedge(Mesh::Face_index(face), mesh), mesh);
        mesh.collect_garbage();
        remaining = mesh.number_of_faces();
    });
    run.reportResult(static_cast<double>(remaining));
});

template <auto make> void measureTriangulation(Run& run)
{
    PolygonMesh const& mesh = made(make, run.size());
    auto const source = surfaceOf<CGAL::Exact_predicates_inexact_constructions_kernel>(mesh);
    timeOnCopies(run, mesh.triangleCount(), source, [](auto& surface) { Processing::triangulate_faces(surface); });
    auto triangles = source;
    Processing::triangulate_faces(triangles);
    run.reportResult(static_cast<double>(triangles.number_of_faces()));
    run.reportSimilarResult(Processing::area(triangles));
}
Row const quads("triangulate quads:CGAL", kQuads, measureTriangulation<Meshes::bentQuads>);
Row const polygons("triangulate polygons:CGAL", kPolygons, measureTriangulation<Meshes::concave>);

/// Takes the mesh from arrays in the time that is measured. `refine(surface)` returns the number of faces.
template <class Refine> void measureRefinement(Run& run, PolygonMesh const& mesh, Refine const& refine)
{
    std::vector<InFloat::Point_3> points;
    for (auto const& p : mesh.points)
        points.emplace_back(p.x, p.y, p.z);
    std::vector<std::array<std::size_t, 3>> faces;
    for (std::size_t corner = 0; corner != mesh.faceVertex.size(); corner += 3)
        faces.push_back({mesh.faceVertex[corner], mesh.faceVertex[corner + 1], mesh.faceVertex[corner + 2]});
    Benchmarks::measureRefinement(run, [&] {
        Surface<InFloat> surface;
        Processing::polygon_soup_to_polygon_mesh(points, faces, surface);
        return refine(surface);
    });
}

template <auto make> void measureHalfEdges(Run& run)
{
    measureRefinement(run, made(make, run.size()), [](auto& surface) { return surface.number_of_halfedges() / 3; });
}
Row const halfEdges("halfEdges:CGAL", withoutLargest(kHalfEdges), measureHalfEdges<Meshes::sphere>);
Row const shuffled("halfEdges shuffled:CGAL", withoutLargest(kHalfEdges), measureHalfEdges<Meshes::shuffled>);

Row const uniform("subdivide uniform:CGAL", withoutLargest(kUniform), [](Run& run) {
    measureRefinement(run, made(Meshes::sphere, run.size()), [](auto& surface) {
        CGAL::Subdivision_method_3::Sqrt3_subdivision(surface, CGAL::parameters::number_of_iterations(kUniformSteps));
        return surface.number_of_faces();
    });
});

/// Computes the coordinates of all points, with storage that is kept from run to run.
template <class Kernel> void measureCoordinates(Run& run)
{
    using Corners = std::vector<typename Kernel::Point_2>;
    using Coordinates = CGAL::Barycentric_coordinates::Mean_value_coordinates_2<Corners, Kernel>;
    auto const inPlane = [](Points const& points) {
        Corners converted;
        for (auto const& point : points)
            converted.emplace_back(point.x, point.y);
        return converted;
    };
    std::deque<Corners> corners, points; // whose elements stay in place
    std::deque<Coordinates> coordinates;
    for (auto const& polygon : drawnPolygons(run.size())) {
        points.push_back(inPlane(polygon.points));
        // Without a look for points on edges, which the library has.
        coordinates.emplace_back(
            corners.emplace_back(inPlane(polygon.corners)), CGAL::Barycentric_coordinates::Computation_policy_2::FAST);
    }
    std::vector<typename Kernel::FT> weights(64);
    auto const forEachPoint = [&](auto const& use) {
        for (std::size_t i = 0; i != points.size(); ++i)
            for (auto const& point : points[i]) {
                coordinates[i](point, weights.begin());
                use();
            }
    };
    timeRuns(run, run.size(), [&] { forEachPoint([] {}); });
    double sum = 0;
    forEachPoint([&] { sum += static_cast<double>(weights[0] + 2 * weights[1]); });
    run.reportResult(sum);
}
Row const inFloat("stitch coordinates:CGAL in float", {{200'000}}, measureCoordinates<InFloat>);
Row const inDouble("stitch coordinates:CGAL in double", {{200'000}}, measureCoordinates<InDouble>);

}
