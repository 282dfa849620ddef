#include "smoothers.h"

#include <OpenMesh/Core/Mesh/TriMesh_ArrayKernelT.hh>
#include <OpenMesh/Tools/Smoother/JacobiLaplaceSmootherT.hh>

namespace Benchmarks {

using TriMesh = OpenMesh::TriMesh_ArrayKernelT<>;
using Smoother = OpenMesh::Smoother::JacobiLaplaceSmootherT<TriMesh>;

struct OpenMeshSmoother::Mesh {
    TriMesh triangles;
};

OpenMeshSmoother::OpenMeshSmoother(TestSupport::PolygonMesh const& mesh)
    : mesh_(std::make_unique<Mesh>())
{
    TriMesh& triangles = mesh_->triangles;
    for (auto const& p : mesh.points)
        triangles.add_vertex({p.x, p.y, p.z});
    for (std::size_t corner = 0; corner != mesh.faceVertex.size(); corner += 3)
        triangles.add_face(triangles.vertex_handle(mesh.faceVertex[corner]),
            triangles.vertex_handle(mesh.faceVertex[corner + 1]), triangles.vertex_handle(mesh.faceVertex[corner + 2]));
    triangles.request_face_normals();
    triangles.request_vertex_normals();
    triangles.update_normals();
}

OpenMeshSmoother::~OpenMeshSmoother() = default;

void OpenMeshSmoother::smooth(int steps)
{
    Smoother smoother(mesh_->triangles);
    smoother.initialize(Smoother::Tangential, Smoother::C1);
    smoother.smooth(static_cast<unsigned int>(steps));
}

}
