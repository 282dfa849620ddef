#include "Measuring.h"
#include "peers/triangulators.h"

#include <Modeling/triangulate.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>

using namespace Benchmarks;
using namespace Tessara::Geometry;

namespace {

using MakeMesh = PolygonMesh (*)(std::size_t size);

PolygonMesh concavePolygons(std::size_t faces)
{
    return PolygonMesh::stars(faces, 4, 12, 1);
}

/// One polygon with that many corners.
PolygonMesh comb(std::size_t corners)
{
    auto const teeth = static_cast<float>(corners / 2 - 1);
    std::vector<float3> outline{{teeth / 2, -10, 0}, {teeth, 0, 0}};
    for (float tooth = teeth - 1; tooth >= 0; --tooth)
        outline.insert(outline.end(), {{tooth + 0.5f, 5, 0}, {tooth, 0, 0}});
    PolygonMesh mesh;
    mesh.addPolygon(outline);
    return mesh;
}

PolygonMesh const& meshOf(State const& state, MakeMesh make)
{
    return madeOnce(std::pair(make, sizeOf(state)), [](auto const& key) { return key.first(key.second); });
}

std::size_t triangleCountOf(PolygonMesh const& mesh)
{
    return mesh.faceVertex.size() - 2 * mesh.faceCount();
}

/// Normals, texture coordinates and weights at the corners, and numbers of faces.
void addAttributes(PolygonMesh const& mesh, Object& object)
{
    using Tessara::Math::float2;
    std::size_t const corners = mesh.faceVertex.size();
    addDataProperty("normal", sFaceVertexComp, Orvan::Array<float3>(corners, float3{0, 0, 1}), object);
    addDataProperty("uv", sFaceVertexComp, Orvan::Array<float2>(corners, float2{0.5f, 0.25f}), object);
    addDataProperty("weight", sFaceVertexComp, Orvan::Array<double>(corners, 0.5), object);
    addDataProperty("material", sFaceComp, Orvan::Array<int>(mesh.faceCount(), 3), object);
}

Row triangulation(char const* name, Sizes const& sizes, MakeMesh make, bool withAttributes = false)
{
    return Row(name, sizes, [=](State& state) {
        PolygonMesh const& mesh = meshOf(state, make);
        std::size_t const triangles = triangleCountOf(mesh);
        auto const source = mesh.build();
        auto const edit = [](Object& object) { Geometry::Mesh::triangulate("*", object); };
        if (withAttributes) {
            addAttributes(mesh, *source);
            timeOnCopies(state, triangles, *source, edit);
        } else
            measureEdit(state, triangles, triangles * 4 * sizeof(unsigned int), *source, edit);
    });
}

CopyRow copying(char const* name, Sizes const& sizes, MakeMesh make, std::size_t attributeBytes = 0)
{
    return CopyRow(name, sizes, [=](State const& state) -> CopyRow::Input {
        std::size_t const triangles = triangleCountOf(meshOf(state, make));
        return {triangles * (4 * sizeof(unsigned int) + attributeBytes), triangles};
    });
}

template <class Peer> [[maybe_unused]] Row triangulationBy(char const* name, Sizes const& sizes, MakeMesh make)
{
    return Row(name, sizes, [=](State& state) {
        PolygonMesh const& mesh = meshOf(state, make);
        timeOnCopies(state, triangleCountOf(mesh), Peer(mesh), [](Peer& peer) { peer.triangulate(); });
    });
}

Sizes const kQuads{{10'000}, {102'400}, {1'000'000}}, kPolygons{{2'000}, {20'000}, {200'000}};

[[maybe_unused]] Row const rows[]{
    triangulation("triangulate quads", kQuads, bentQuads),
    copying("triangulate quads", kQuads, bentQuads),
    triangulation("triangulate attributes", kQuads, bentQuads, true),
    copying("triangulate attributes", kQuads, bentQuads, 3 * (12 + 8 + 8) + 4),
    triangulation("triangulate polygons", kPolygons, concavePolygons),
    copying("triangulate polygons", kPolygons, concavePolygons),
    triangulation("triangulate comb", {{100}, {1'000}, {10'000}}, comb),
#ifdef MODELING_HAS_CGAL
    triangulationBy<CgalTriangulator>("triangulate quads:CGAL", kQuads, bentQuads),
    triangulationBy<CgalTriangulator>("triangulate polygons:CGAL", kPolygons, concavePolygons),
#endif
#ifdef MODELING_HAS_VTK
    triangulationBy<VtkTriangulator>("triangulate quads:VTK", kQuads, bentQuads),
    triangulationBy<VtkTriangulator>("triangulate polygons:VTK", kPolygons, concavePolygons),
#endif
};

}
