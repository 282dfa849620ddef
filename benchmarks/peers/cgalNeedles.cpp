#include "cgalNeedles.h"

#include <CGAL/Polygon_mesh_processing/repair_degeneracies.h>
#include <CGAL/Simple_cartesian.h>
#include <CGAL/Surface_mesh.h>

namespace Benchmarks {

using Kernel = CGAL::Simple_cartesian<double>;

struct CgalMesh::Mesh {
    CGAL::Surface_mesh<Kernel::Point_3> surface;
};

CgalMesh::CgalMesh(TestSupport::MeshBuilder const& mesh)
    : mesh_(std::make_unique<Mesh>())
{
    using Vertex = CGAL::Surface_mesh<Kernel::Point_3>::Vertex_index;
    for (auto const& point : mesh.points)
        mesh_->surface.add_vertex({point.x, point.y, point.z});
    for (auto const& face : mesh.faces)
        mesh_->surface.add_face(Vertex(face[0]), Vertex(face[1]), Vertex(face[2]));
}

CgalMesh::CgalMesh(CgalMesh const& other)
    : mesh_(std::make_unique<Mesh>(*other.mesh_))
{
}

CgalMesh::~CgalMesh() = default;

void CgalMesh::removeNeedles(float ratio)
{
    constexpr double kNoCaps = -1; // a cosine that no angle is below
    CGAL::Polygon_mesh_processing::experimental::remove_almost_degenerate_faces(
        mesh_->surface, kNoCaps, 1 / ratio, 0.0);
    mesh_->surface.collect_garbage();
}

std::size_t CgalMesh::faceCount() const
{
    return mesh_->surface.number_of_faces();
}

}
