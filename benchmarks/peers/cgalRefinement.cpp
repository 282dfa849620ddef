#include "cgalRefinement.h"

#include <CGAL/Polygon_mesh_processing/polygon_soup_to_polygon_mesh.h>
#include <CGAL/Simple_cartesian.h>
#include <CGAL/Surface_mesh.h>
#include <CGAL/subdivision_method_3.h>

#include <array>
#include <vector>

namespace Benchmarks {

using Kernel = CGAL::Simple_cartesian<float>;
using Surface = CGAL::Surface_mesh<Kernel::Point_3>;

struct CgalRefinement::Mesh {
    std::vector<Kernel::Point_3> points;
    std::vector<std::array<std::size_t, 3>> faces;

    Surface build() const
    {
        Surface surface;
        CGAL::Polygon_mesh_processing::polygon_soup_to_polygon_mesh(points, faces, surface);
        return surface;
    }
};

CgalRefinement::CgalRefinement(TestSupport::MeshBuilder const& mesh)
    : mesh_(std::make_unique<Mesh>())
{
    for (auto const& p : mesh.points)
        mesh_->points.emplace_back(p.x, p.y, p.z);
    for (auto const& face : mesh.faces)
        mesh_->faces.push_back({face[0], face[1], face[2]});
}

CgalRefinement::~CgalRefinement() = default;

std::size_t CgalRefinement::buildAdjacency() const
{
    return mesh_->build().number_of_halfedges();
}

std::size_t CgalRefinement::refine(unsigned int steps) const
{
    Surface surface = mesh_->build();
    CGAL::Subdivision_method_3::Sqrt3_subdivision(surface, CGAL::parameters::number_of_iterations(steps));
    return surface.number_of_faces();
}

}
