#include "triangulators.h"

#include <CGAL/Exact_predicates_inexact_constructions_kernel.h>
#include <CGAL/Polygon_mesh_processing/triangulate_faces.h>
#include <CGAL/Surface_mesh.h>

namespace Benchmarks {

using Kernel = CGAL::Exact_predicates_inexact_constructions_kernel;
using SurfaceMesh = CGAL::Surface_mesh<Kernel::Point_3>;

struct CgalTriangulator::Mesh {
    SurfaceMesh surface;
};

CgalTriangulator::CgalTriangulator(TestSupport::PolygonMesh const& mesh)
    : mesh_(std::make_unique<Mesh>())
{
    for (auto const& p : mesh.points)
        mesh_->surface.add_vertex({p.x, p.y, p.z});
    for (std::size_t face = 0; face != mesh.faceCount(); ++face) {
        std::vector<SurfaceMesh::Vertex_index> corners;
        for (unsigned int corner = mesh.faceOffset[face]; corner != mesh.faceOffset[face + 1]; ++corner)
            corners.emplace_back(mesh.faceVertex[corner]);
        mesh_->surface.add_face(corners);
    }
}

CgalTriangulator::CgalTriangulator(CgalTriangulator const& other)
    : mesh_(std::make_unique<Mesh>(*other.mesh_))
{
}

CgalTriangulator::~CgalTriangulator() = default;

void CgalTriangulator::triangulate()
{
    CGAL::Polygon_mesh_processing::triangulate_faces(mesh_->surface);
}

}
