#include "Inputs.h"

#include <OpenMesh/Core/Mesh/TriMesh_ArrayKernelT.hh>
#include <OpenMesh/Tools/Smoother/JacobiLaplaceSmootherT.hh>
#include <OpenMesh/Tools/Subdivider/Adaptive/Composite/CompositeT.hh>
#include <OpenMesh/Tools/Subdivider/Adaptive/Composite/RulesT.hh>
#include <OpenMesh/Tools/Subdivider/Uniform/Sqrt3T.hh>

using namespace Benchmarks;

namespace {

using Plain = OpenMesh::TriMesh_ArrayKernelT<>;
using Adaptive = OpenMesh::TriMesh_ArrayKernelT<OpenMesh::Subdivider::Adaptive::CompositeTraits>;

template <class Mesh> Mesh build(PolygonMesh const& source)
{
    Mesh mesh;
    mesh.reserve(source.points.size(), source.faceVertex.size() / 2, source.faceCount());
    std::vector<typename Mesh::VertexHandle> points;
    for (auto const& p : source.points)
        points.push_back(mesh.add_vertex({p.x, p.y, p.z}));
    for (std::size_t corner = 0; corner != source.faceVertex.size(); corner += 3)
        mesh.add_face(points[source.faceVertex[corner]], points[source.faceVertex[corner + 1]],
            points[source.faceVertex[corner + 2]]);
    return mesh;
}

/// Of the tangential component, of the first order.
Row const smoothing("smooth triangles:OpenMesh", kTriangles, [](Run& run) {
    using Smoother = OpenMesh::Smoother::JacobiLaplaceSmootherT<Plain>;
    auto mesh = build<Plain>(made(Meshes::noisy, run.size()));
    mesh.request_face_normals();
    mesh.request_vertex_normals();
    mesh.update_normals();
    timeRuns(run, mesh.n_faces() * kSmoothingSteps, [&] {
        Smoother smoother(mesh);
        smoother.initialize(Smoother::Tangential, Smoother::C1);
        smoother.smooth(kSmoothingSteps);
    });
    Points points;
    for (auto const point : mesh.vertices())
        points.append({mesh.point(point)[0], mesh.point(point)[1], mesh.point(point)[2]});
    run.reportSimilarResult(meanRadius(points));
});

template <auto make> void measureHalfEdges(Run& run)
{
    PolygonMesh const& mesh = made(make, run.size());
    measureRefinement(run, [&] { return build<Plain>(mesh).n_halfedges() / 3; });
}
Row const halfEdges("halfEdges:OpenMesh", withoutLargest(kHalfEdges), measureHalfEdges<Meshes::sphere>);
Row const shuffled("halfEdges shuffled:OpenMesh", withoutLargest(kHalfEdges), measureHalfEdges<Meshes::shuffled>);

Row const uniform("subdivide uniform:OpenMesh", withoutLargest(kUniform), [](Run& run) {
    PolygonMesh const& source = made(Meshes::sphere, run.size());
    measureRefinement(run, [&] {
        auto mesh = build<Plain>(source);
        OpenMesh::Subdivider::Uniform::Sqrt3T<Plain, float> sqrt3;
        sqrt3.attach(mesh);
        sqrt3(kUniformSteps);
        sqrt3.detach();
        return mesh.n_faces();
    });
});

bool isLarge(Adaptive const& mesh, Adaptive::FaceHandle face, float tolerance)
{
    Adaptive::Point least(1e30f), most(-1e30f);
    for (auto const point : mesh.fv_range(face)) {
        least.minimize(mesh.point(point));
        most.maximize(mesh.point(point));
    }
    return (most - least).max() > 2 * tolerance;
}

/// By composite rules, until faces fit into twice the tolerance.
std::size_t refineAdaptively(PolygonMesh const& source, float tolerance)
{
    using namespace OpenMesh::Subdivider::Adaptive;
    auto mesh = build<::Adaptive>(source);
    CompositeT<::Adaptive> composite(mesh);
    composite.add<Tvv3<::Adaptive>>();
    composite.add<VF<::Adaptive>>();
    composite.add<FF<::Adaptive>>();
    composite.add<FVc<::Adaptive>>();
    if (!composite.initialize())
        return 0;
    for (bool hasMore = true; hasMore;) {
        hasMore = false;
        std::size_t const count = mesh.n_faces(); // those that come in this round have their turn in the next one
        for (std::size_t f = 0; f != count; ++f) {
            ::Adaptive::FaceHandle face(static_cast<int>(f));
            if (mesh.data(face).final() && isLarge(mesh, face, tolerance)) {
                composite.refine(face);
                hasMore = true;
            }
        }
    }
    return mesh.n_faces();
}

Row const adaptive("subdivide adaptive:OpenMesh", withoutLargest(kAdaptive), [](Run& run) {
    PolygonMesh const& source = made(Meshes::graded, run.size());
    measureRefinement(run, [&] { return refineAdaptively(source, toleranceFor(run.size())); });
});

}
