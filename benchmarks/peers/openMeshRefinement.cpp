#include "openMeshRefinement.h"

#include <OpenMesh/Core/Mesh/TriMesh_ArrayKernelT.hh>
#include <OpenMesh/Tools/Subdivider/Adaptive/Composite/CompositeT.hh>
#include <OpenMesh/Tools/Subdivider/Adaptive/Composite/RulesT.hh>
#include <OpenMesh/Tools/Subdivider/Uniform/Sqrt3T.hh>

#include <algorithm>
#include <cmath>
#include <vector>

namespace Benchmarks {

namespace {

    template <class Mesh> Mesh build(TestSupport::MeshBuilder const& builder)
    {
        Mesh mesh;
        mesh.reserve(builder.points.size(), builder.faces.size() * 3 / 2, builder.faces.size());
        std::vector<typename Mesh::VertexHandle> points;
        for (auto const& p : builder.points)
            points.push_back(mesh.add_vertex({p.x, p.y, p.z}));
        for (auto const& face : builder.faces)
            mesh.add_face(points[face[0]], points[face[1]], points[face[2]]);
        return mesh;
    }

    using Plain = OpenMesh::TriMesh_ArrayKernelT<>;
    using Adaptive = OpenMesh::TriMesh_ArrayKernelT<OpenMesh::Subdivider::Adaptive::CompositeTraits>;

    bool isLarge(Adaptive const& mesh, Adaptive::FaceHandle face, float tolerance)
    {
        Adaptive::Point least(1e30f), most(-1e30f);
        for (auto const point : mesh.fv_range(face)) {
            least.minimize(mesh.point(point));
            most.maximize(mesh.point(point));
        }
        return (most - least).max() > 2 * tolerance;
    }

}

std::size_t buildOpenMesh(TestSupport::MeshBuilder const& mesh)
{
    return build<Plain>(mesh).n_halfedges();
}

std::size_t refineOpenMesh(TestSupport::MeshBuilder const& builder, unsigned int steps)
{
    Plain mesh = build<Plain>(builder);
    OpenMesh::Subdivider::Uniform::Sqrt3T<Plain, float> sqrt3;
    sqrt3.attach(mesh);
    sqrt3(steps);
    sqrt3.detach();
    return mesh.n_faces();
}

std::size_t refineOpenMeshAdaptively(TestSupport::MeshBuilder const& builder, float tolerance)
{
    using namespace OpenMesh::Subdivider::Adaptive;
    Adaptive mesh = build<Adaptive>(builder);
    CompositeT<Adaptive> composite(mesh);
    composite.add<Tvv3<Adaptive>>();
    composite.add<VF<Adaptive>>();
    composite.add<FF<Adaptive>>();
    composite.add<FVc<Adaptive>>();
    if (!composite.initialize())
        return 0;
    for (bool hasMore = true; hasMore;) {
        hasMore = false;
        std::size_t const count = mesh.n_faces(); // those that come in this round have their turn in the next one
        for (std::size_t f = 0; f != count; ++f) {
            Adaptive::FaceHandle face(static_cast<int>(f));
            if (mesh.data(face).final() && isLarge(mesh, face, tolerance)) {
                composite.refine(face);
                hasMore = true;
            }
        }
    }
    return mesh.n_faces();
}

}
