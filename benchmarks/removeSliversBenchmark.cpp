#include "Measuring.h"
#ifdef MODELING_HAS_CGAL
#include "peers/cgalNeedles.h"
#endif

#include "frame/Arrays.h"
#include "frame/PointCorners.h"
#include "frame/VectorMath.h"

#include "support/MeshBuilder.h"

#include <Modeling/removeSlivers.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Names.h>

#include <unordered_map>

using namespace Modeling;
using TestSupport::MeshBuilder;

namespace {

constexpr float kRatio = 0.05f;

/// A sphere with needles, 23,520 of them at 500,000 faces: each cut makes two.
MeshBuilder const& needledSphere(std::size_t faces)
{
    static std::unordered_map<std::size_t, MeshBuilder> made; // takes longer than what is measured
    auto const [entry, isNew] = made.try_emplace(faces);
    if (isNew)
        entry->second = MeshBuilder::sphereWithFaces(faces).withNeedles(faces * 1176 / 50'000);
    return entry->second;
}

std::size_t facesOf(benchmark::State const& state)
{
    return static_cast<std::size_t>(state.range(0));
}

std::size_t bytesOf(std::size_t pointCount, std::size_t faceCount)
{
    return pointCount * sizeof(float3) + faceCount * 4 * sizeof(unsigned int); // corners and offsets
}

void removeSliversOfSphere(benchmark::State& state)
{
    auto const source = needledSphere(facesOf(state)).build();
    for (auto _ : state) {
        state.PauseTiming();
        auto mesh = Tessara::createObject();
        *mesh = *source; // shares the arrays, as a host's document does
        state.ResumeTiming();
        Geometry::Mesh::removeSlivers(kRatio, *mesh);
        state.PauseTiming();
        mesh = nullptr;
        state.ResumeTiming();
    }
    Benchmarks::countElements(state, facesOf(state));

    Tessara::Object mesh = *source;
    std::int64_t const peak = Benchmarks::peakBytesOf([&] { Geometry::Mesh::removeSlivers(kRatio, mesh); });
    auto const pointCount = Tessara::Geometry::getElementCount(mesh, Tessara::Geometry::sPointComp);
    auto const faceCount = Tessara::Geometry::getElementCount(mesh, Tessara::Geometry::sFaceComp);
    auto const resultBytes = static_cast<std::int64_t>(bytesOf(pointCount, faceCount));
    state.counters["working bytes/element"] =
        static_cast<double>(peak - resultBytes) / static_cast<double>(state.range(0));
}

/// The shortest edges of all faces lead to one of two hubs.
void removeSliversOfWheel(benchmark::State& state)
{
    auto const source = MeshBuilder::wheel(static_cast<unsigned int>(facesOf(state) / 2)).build();
    for (auto _ : state) {
        Tessara::Object mesh = *source; // shares the arrays
        Geometry::Mesh::removeSlivers(0.5f, mesh);
    }
    Benchmarks::countElements(state, facesOf(state));
}

/// What cannot be done without: adjacency, normals and one measuring sweep over flat arrays, and the copy that is
/// edited.
void flatPasses(benchmark::State& state)
{
    MeshBuilder const& mesh = needledSphere(facesOf(state));
    auto const faceCount = static_cast<unsigned int>(mesh.faces.size());
    auto const pointCount = static_cast<unsigned int>(mesh.points.size());
    unsigned int const* const corner = mesh.faces[0].data();
    float3 const* const position = mesh.points.data();
    for (auto _ : state) {
        PointCorners const around = cornersByPoint(pointCount, corner, std::size_t{3} * faceCount);
        auto adjacency = uninitializedArray<unsigned int>(std::uint64_t{3} * faceCount);
        auto normals = uninitializedArray<float3>(faceCount);
        auto ratios = uninitializedArray<float>(faceCount);
        parallelFor(tbb::blocked_range<unsigned int>(0, faceCount, 1), [&](auto const& faces) {
            for (unsigned int face = faces.begin(); face != faces.end(); ++face) {
                unsigned int const* const c = corner + std::size_t{3} * face;
                for (unsigned int k = 0; k != 3; ++k) {
                    unsigned int const end = c[k == 2 ? 0 : k + 1];
                    unsigned int twin = Tessara::Geometry::kInvalidIndex;
                    for (unsigned int i = around.offsets[end]; i != around.offsets[end + 1]; ++i) {
                        unsigned int const other = around.corners[i];
                        unsigned int const next = other % 3 == 2 ? other - 2 : other + 1;
                        if (corner[next] == c[k]) {
                            twin = other / 3;
                            break;
                        }
                    }
                    adjacency[std::size_t{3} * face + k] = twin;
                }
                float3 const a = position[c[0]], b = position[c[1]], d = position[c[2]];
                normals[face] = cross(safeNormalize(b - a), safeNormalize(d - a));
                float const ab = length(b - a), bd = length(d - b), da = length(a - d);
                ratios[face] = std::min({ab, bd, da}) / std::max({ab, bd, da});
            }
        });
        benchmark::DoNotOptimize(adjacency.data);
        benchmark::DoNotOptimize(normals.data);
        benchmark::DoNotOptimize(ratios.data);
    }
    Benchmarks::countElements(state, facesOf(state));
}

void copyMesh(benchmark::State& state)
{
    MeshBuilder const& mesh = needledSphere(facesOf(state));
    Benchmarks::copyBytes(state, bytesOf(mesh.points.size(), mesh.faces.size()));
    Benchmarks::countElements(state, facesOf(state));
}

#ifdef MODELING_HAS_CGAL
void cgalNeedles(benchmark::State& state)
{
    Benchmarks::CgalMesh const source(needledSphere(facesOf(state)));
    for (auto _ : state) {
        state.PauseTiming();
        Benchmarks::CgalMesh mesh(source);
        state.ResumeTiming();
        mesh.removeNeedles(kRatio);
    }
    Benchmarks::countElements(state, facesOf(state));
}
#endif

#define MODELING_SIZES Arg(5'000)->Arg(50'000)->Arg(500'000)->UseRealTime()
BENCHMARK(removeSliversOfSphere)->Name("removeSlivers")->MODELING_SIZES;
BENCHMARK(removeSliversOfWheel)->Name("removeSlivers:hubs")->MODELING_SIZES;
BENCHMARK(flatPasses)->Name("removeSlivers:flat passes")->MODELING_SIZES;
BENCHMARK(copyMesh)->Name("removeSlivers:memcpy")->MODELING_SIZES;
#ifdef MODELING_HAS_CGAL
BENCHMARK(cgalNeedles)->Name("removeSlivers:CGAL")->MODELING_SIZES;
#endif

}
