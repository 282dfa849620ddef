#include "deletions.h"

#include <CGAL/Simple_cartesian.h>
#include <CGAL/Surface_mesh.h>
#include <CGAL/boost/graph/Euler_operations.h>

#include <memory>

namespace Benchmarks {

using Kernel = CGAL::Simple_cartesian<float>;
using Mesh = CGAL::Surface_mesh<Kernel::Point_3>;

PeerDeletion cgalFaceDeletion(PeerMesh const& input)
{
    auto const source = std::make_shared<Mesh>();
    for (auto const& p : input.positions)
        source->add_vertex({p.x, p.y, p.z});
    for (std::size_t corner = 0; corner != input.faceVertex.size; corner += 3)
        source->add_face(Mesh::Vertex_index(input.faceVertex[corner]), Mesh::Vertex_index(input.faceVertex[corner + 1]),
            Mesh::Vertex_index(input.faceVertex[corner + 2]));
    source->add_property_map<Mesh::Vertex_index, Kernel::Vector_3>("v:normal");
    source->add_property_map<Mesh::Halfedge_index, Kernel::Vector_2>("h:uv");
    source->add_property_map<Mesh::Face_index, int>("f:material");
    auto const mesh = std::make_shared<Mesh>();
    auto const deleted = std::make_shared<Orvan::Array<bool>>(input.deleted);
    return {[=] { *mesh = *source; },
        [=] {
            for (std::size_t face = 0; face != deleted->size; ++face)
                if ((*deleted)[face])
                    CGAL::Euler::remove_face(halfedge(Mesh::Face_index(static_cast<unsigned int>(face)), *mesh), *mesh);
            mesh->collect_garbage();
        },
        [=] { return mesh->number_of_faces(); }};
}

}
