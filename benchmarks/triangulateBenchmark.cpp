#include "Measuring.h"
#if defined(MODELING_HAS_CGAL) || defined(MODELING_HAS_VTK)
#include "peers/triangulators.h"
#endif

#include "support/PolygonMesh.h"

#include <Modeling/triangulate.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>

#include <cmath>
#include <string>

using namespace Benchmarks;
using namespace Tessara::Geometry;
using TestSupport::PolygonMesh;

namespace {

using MakeMesh = PolygonMesh (*)(std::size_t size);

PolygonMesh bentQuads(std::size_t faces)
{
    auto const segments = static_cast<unsigned int>(std::sqrt(static_cast<double>(faces)));
    return PolygonMesh::quads(segments).withNoise(0.2f, 1); // not planar
}

PolygonMesh concavePolygons(std::size_t faces)
{
    return PolygonMesh::stars(faces, 4, 12, 1);
}

/// One polygon with that many corners.
PolygonMesh comb(std::size_t corners)
{
    std::vector<TestSupport::float3> outline;
    auto const teeth = static_cast<float>(corners / 2 - 1);
    for (std::size_t tooth = 0; tooth != corners / 2 - 1; ++tooth) {
        outline.push_back({static_cast<float>(tooth), 0, 0});
        outline.push_back({static_cast<float>(tooth) + 0.5f, 5, 0});
    }
    outline.push_back({teeth, 0, 0});
    outline.push_back({teeth / 2, -10, 0});
    PolygonMesh mesh;
    mesh.addPolygon({outline.rbegin(), outline.rend()});
    return mesh;
}

PolygonMesh const& meshOf(benchmark::State const& state, MakeMesh make)
{
    return madeOnce(std::pair(make, sizeOf(state)), [](auto const& key) { return key.first(key.second); });
}

std::size_t triangleCountOf(PolygonMesh const& mesh)
{
    return mesh.faceVertex.size() - 2 * mesh.faceCount();
}

/// Normals, texture coordinates and weights at the corners, and numbers of faces.
void addAttributes(PolygonMesh const& mesh, Tessara::Object& object)
{
    using namespace Tessara::Math;
    std::size_t const corners = mesh.faceVertex.size();
    addDataProperty("normal", sFaceVertexComp, Orvan::Array<float3>(corners, float3{0, 0, 1}), object);
    addDataProperty("uv", sFaceVertexComp, Orvan::Array<float2>(corners, float2{0.5f, 0.25f}), object);
    addDataProperty("weight", sFaceVertexComp, Orvan::Array<double>(corners, 0.5), object);
    addDataProperty("material", sFaceComp, Orvan::Array<int>(mesh.faceCount(), 3), object);
}

void triangulate(benchmark::State& state, MakeMesh make, bool withAttributes)
{
    PolygonMesh const& mesh = meshOf(state, make);
    std::size_t const triangles = triangleCountOf(mesh);
    auto const source = mesh.build();
    if (withAttributes)
        addAttributes(mesh, *source);
    auto const edit = [](Tessara::Object& object) { Geometry::Mesh::triangulate("*", object); };
    timeOnCopies(state, *source, edit);
    countElements(state, triangles);
    Tessara::Object object = *source;
    if (!withAttributes)
        countWorkingBytes(state, triangles, triangles * 4 * sizeof(unsigned int), [&] { edit(object); });
}

void addRows(std::string const& name, Sizes const& sizes, MakeMesh make, bool withAttributes = false)
{
    addRow(name.c_str(), sizes, [=](benchmark::State& state) { triangulate(state, make, withAttributes); });
    if (make == comb)
        return;
    addRow((name + ":memcpy").c_str(), sizes, [=](benchmark::State& state) {
        std::size_t const triangles = triangleCountOf(meshOf(state, make));
        std::size_t const attributeBytes = withAttributes ? 3 * (12 + 8 + 8) + 4 : 0;
        copyBytes(state, triangles * (4 * sizeof(unsigned int) + attributeBytes), triangles);
    });
}

template <class Peer> [[maybe_unused]] void addPeer(char const* name, Sizes const& sizes, MakeMesh make)
{
    addRow(name, sizes, [=](benchmark::State& state) {
        PolygonMesh const& mesh = meshOf(state, make);
        timePeer(state, Peer(mesh), triangleCountOf(mesh), [](Peer& peer) { peer.triangulate(); });
    });
}

[[maybe_unused]] bool const areRowsAdded = [] {
    Sizes const quads{{10'000}, {102'400}, {1'000'000}}, polygons{{2'000}, {20'000}, {200'000}};
    addRows("triangulate quads", quads, bentQuads);
    addRows("triangulate attributes", quads, bentQuads, true);
    addRows("triangulate polygons", polygons, concavePolygons);
    addRows("triangulate comb", {{100}, {1'000}, {10'000}}, comb);
#ifdef MODELING_HAS_CGAL
    addPeer<CgalTriangulator>("triangulate quads:CGAL", quads, bentQuads);
    addPeer<CgalTriangulator>("triangulate polygons:CGAL", polygons, concavePolygons);
#endif
#ifdef MODELING_HAS_VTK
    addPeer<VtkTriangulator>("triangulate quads:VTK", quads, bentQuads);
    addPeer<VtkTriangulator>("triangulate polygons:VTK", polygons, concavePolygons);
#endif
    return true;
}();

}
