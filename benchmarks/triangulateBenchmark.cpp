#include "Measuring.h"
#if defined(MODELING_HAS_CGAL) || defined(MODELING_HAS_VTK)
#include "peers/triangulators.h"
#endif

#include "support/PolygonMesh.h"

#include <Modeling/triangulate.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>

#include <cmath>
#include <functional>
#include <map>

using TestSupport::float3;
using TestSupport::PolygonMesh;
using namespace Tessara::Geometry;

namespace {

/// What is measured: a mesh of so many faces.
using MakeMesh = PolygonMesh (*)(std::size_t faces);

PolygonMesh bentQuads(std::size_t faces)
{
    auto const segments = static_cast<unsigned int>(std::sqrt(static_cast<double>(faces)));
    return PolygonMesh::quads(segments).withNoise(0.2f, 1); // not planar
}

PolygonMesh concavePolygons(std::size_t faces)
{
    return PolygonMesh::stars(faces, 4, 12, 1);
}

/// One polygon with as many corners as asked for.
PolygonMesh comb(std::size_t corners)
{
    std::vector<float3> outline;
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

PolygonMesh const& madeOnce(MakeMesh make, std::size_t size)
{
    static std::map<std::pair<MakeMesh, std::size_t>, PolygonMesh> made;
    auto const [entry, isNew] = made.try_emplace({make, size});
    if (isNew)
        entry->second = make(size);
    return entry->second;
}

PolygonMesh const& meshOf(benchmark::State const& state, MakeMesh make)
{
    return madeOnce(make, static_cast<std::size_t>(state.range(0)));
}

std::size_t triangleCountOf(PolygonMesh const& mesh)
{
    return mesh.faceVertex.size() - 2 * mesh.faceCount();
}

void measure(benchmark::State& state, PolygonMesh const& mesh, Tessara::Object const& source)
{
    for (auto _ : state) {
        Tessara::Object object = source; // shares the arrays, as a host's document does
        Geometry::Mesh::triangulate("*", object);
        state.PauseTiming();
        object.eraseAllProperties();
        state.ResumeTiming();
    }
    Benchmarks::countElements(state, triangleCountOf(mesh));
}

void triangulateMesh(benchmark::State& state, MakeMesh make)
{
    PolygonMesh const& mesh = meshOf(state, make);
    auto const source = mesh.build();
    measure(state, mesh, *source);

    Tessara::Object object = *source;
    std::int64_t const peak = Benchmarks::peakBytesOf([&] { Geometry::Mesh::triangulate("*", object); });
    auto const resultBytes = static_cast<std::int64_t>(triangleCountOf(mesh) * 4 * sizeof(unsigned int));
    state.counters["working bytes/element"] =
        static_cast<double>(peak - resultBytes) / static_cast<double>(triangleCountOf(mesh));
}

/// With a normal and a texture coordinate at each corner, and a number and a text at each face.
void triangulateWithAttributes(benchmark::State& state, MakeMesh make)
{
    PolygonMesh const& mesh = meshOf(state, make);
    auto const source = mesh.build();
    using namespace Tessara::Math;
    std::size_t const corners = mesh.faceVertex.size();
    addDataProperty("normal", sFaceVertexComp, Orvan::Array<float3>(corners, float3{0, 0, 1}), *source);
    addDataProperty("uv", sFaceVertexComp, Orvan::Array<float2>(corners, float2{0.5f, 0.25f}), *source);
    addDataProperty("weight", sFaceVertexComp, Orvan::Array<double>(corners, 0.5), *source);
    addDataProperty("material", sFaceComp, Orvan::Array<int>(mesh.faceCount(), 3), *source);
    measure(state, mesh, *source);
}

/// The standard arrays of the result.
void copyTriangles(benchmark::State& state, MakeMesh make)
{
    std::size_t const triangles = triangleCountOf(meshOf(state, make));
    Benchmarks::copyBytes(state, triangles * 4 * sizeof(unsigned int));
    Benchmarks::countElements(state, triangles);
}

/// The standard arrays and the attributes.
void copyTrianglesWithAttributes(benchmark::State& state, MakeMesh make)
{
    std::size_t const triangles = triangleCountOf(meshOf(state, make));
    Benchmarks::copyBytes(state, triangles * (4 * 4 + 3 * (12 + 8 + 8) + 4));
    Benchmarks::countElements(state, triangles);
}

template <class Peer> void measurePeer(benchmark::State& state, MakeMesh make)
{
    PolygonMesh const& mesh = meshOf(state, make);
    Peer const source(mesh);
    for (auto _ : state) {
        state.PauseTiming();
        {
            Peer copy(source);
            state.ResumeTiming();
            copy.triangulate();
            state.PauseTiming();
        }
        state.ResumeTiming();
    }
    Benchmarks::countElements(state, triangleCountOf(mesh));
}

#ifdef MODELING_HAS_CGAL
void cgal(benchmark::State& state, MakeMesh make)
{
    measurePeer<Benchmarks::CgalTriangulator>(state, make);
}
#endif

#ifdef MODELING_HAS_VTK
void vtk(benchmark::State& state, MakeMesh make)
{
    measurePeer<Benchmarks::VtkTriangulator>(state, make);
}
#endif

#define MODELING_SIZES(small, middle, large) Arg(small)->Arg(middle)->Arg(large)->UseRealTime()
#define MODELING_QUADS MODELING_SIZES(10'000, 102'400, 1'000'000)
#define MODELING_POLYGONS MODELING_SIZES(2'000, 20'000, 200'000)
BENCHMARK_CAPTURE(triangulateMesh, quads, bentQuads)->Name("triangulate quads")->MODELING_QUADS;
BENCHMARK_CAPTURE(copyTriangles, quads, bentQuads)->Name("triangulate quads:memcpy")->MODELING_QUADS;
BENCHMARK_CAPTURE(triangulateWithAttributes, quads, bentQuads)->Name("triangulate attributes")->MODELING_QUADS;
BENCHMARK_CAPTURE(copyTrianglesWithAttributes, quads, bentQuads)->Name("triangulate attributes:memcpy")->MODELING_QUADS;
BENCHMARK_CAPTURE(triangulateMesh, polygons, concavePolygons)->Name("triangulate polygons")->MODELING_POLYGONS;
BENCHMARK_CAPTURE(copyTriangles, polygons, concavePolygons)->Name("triangulate polygons:memcpy")->MODELING_POLYGONS;
BENCHMARK_CAPTURE(triangulateMesh, comb, comb)->Name("triangulate comb")->MODELING_SIZES(100, 1'000, 10'000);
#ifdef MODELING_HAS_CGAL
BENCHMARK_CAPTURE(cgal, quads, bentQuads)->Name("triangulate quads:CGAL")->MODELING_QUADS;
BENCHMARK_CAPTURE(cgal, polygons, concavePolygons)->Name("triangulate polygons:CGAL")->MODELING_POLYGONS;
#endif
#ifdef MODELING_HAS_VTK
BENCHMARK_CAPTURE(vtk, quads, bentQuads)->Name("triangulate quads:VTK")->MODELING_QUADS;
BENCHMARK_CAPTURE(vtk, polygons, concavePolygons)->Name("triangulate polygons:VTK")->MODELING_POLYGONS;
#endif

}
