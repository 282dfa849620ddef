#include "Measuring.h"
#ifdef MODELING_HAS_VTK
#include "peers/vtkAppend.h"
#endif

#include "support/MeshBuilder.h"

#include <Modeling/mergeMeshes.h>
#include <Modeling/mergePointClouds.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>

using TestSupport::MeshBuilder;
using namespace Tessara::Geometry;
using namespace Tessara::GeometryAlgorithms;

namespace {

using Inputs = Orvan::Array<Orvan::Ptr<Tessara::Object>>;
using Tessara::Math::float2;
using Tessara::Math::float3;

constexpr std::size_t kBytesPerPoint = 24; // position, normal
constexpr std::size_t kBytesPerFace = 3 * (4 + 8) + 4 + 4; // corners with a texture coordinate; offset, material

/// A sphere of about so many faces, with a float3 a point, a float2 a corner and an int a face.
Orvan::Ptr<Tessara::Object> attributedSphere(std::size_t faces)
{
    MeshBuilder const sphere = MeshBuilder::sphereWithFaces(faces);
    auto mesh = sphere.build();
    addDataProperty("normal", sPointComp, Orvan::Array<float3>(sphere.points.size(), float3{0, 0, 1}), *mesh);
    addDataProperty("uv", sFaceVertexComp, Orvan::Array<float2>(3 * sphere.faces.size(), float2{1, 2}), *mesh);
    addDataProperty("material", sFaceComp, Orvan::Array<int>(sphere.faces.size(), 7), *mesh);
    return mesh;
}

Inputs meshesOf(benchmark::State const& state)
{
    Inputs inputs;
    for (std::int64_t input = 0; input != state.range(0); ++input)
        inputs.append(attributedSphere(static_cast<std::size_t>(state.range(1))));
    return inputs;
}

/// 32 bytes a point: position, colour, weight, number, radius.
Inputs cloudsOf(benchmark::State const& state)
{
    Inputs inputs;
    auto const count = static_cast<std::uint64_t>(state.range(1));
    for (std::int64_t input = 0; input != state.range(0); ++input) {
        auto cloud = makePointCloud(Orvan::Array<float3>(count, float3{1, 2, 3}));
        addDataProperty("color", sPointComp, Orvan::Array<int>(count, 1), *cloud);
        addDataProperty("weight", sPointComp, Orvan::Array<double>(count, 0.5), *cloud);
        addDataProperty("id", sPointComp, Orvan::Array<unsigned int>(count, 3u), *cloud);
        addDataProperty("radius", sPointComp, Orvan::Array<float>(count, 1.0f), *cloud);
        inputs.append(std::move(cloud));
    }
    return inputs;
}

std::size_t countIn(Inputs const& inputs, char const* component)
{
    std::size_t count = 0;
    for (auto const& input : inputs)
        count += getElementCount(*input, component);
    return count;
}

using Merge = bool (*)(Inputs const&, Tessara::Object&, Orvan::RuntimeServices const*);

void measure(benchmark::State& state, Inputs const& inputs, Merge merge, std::size_t elements)
{
    for (auto _ : state) {
        auto output = Tessara::createObject();
        merge(inputs, *output, nullptr);
        state.PauseTiming();
        output = nullptr;
        state.ResumeTiming();
    }
    Benchmarks::countElements(state, elements);
    auto output = Tessara::createObject();
    Benchmarks::Memory const memory = Benchmarks::memoryOf([&] { merge(inputs, *output, nullptr); });
    state.counters["peak/result"] = static_cast<double>(memory.peak) / static_cast<double>(memory.kept);
}

std::size_t bytesOfMeshes(Inputs const& inputs)
{
    return kBytesPerPoint * countIn(inputs, sPointComp) + kBytesPerFace * countIn(inputs, sFaceComp);
}

void meshes(benchmark::State& state)
{
    Inputs const inputs = meshesOf(state);
    measure(state, inputs, mergeMeshes, countIn(inputs, sFaceComp));
}

void clouds(benchmark::State& state)
{
    Inputs const inputs = cloudsOf(state);
    measure(state, inputs, mergePointClouds, countIn(inputs, sPointComp));
}

void copyMeshes(benchmark::State& state)
{
    Inputs const inputs = meshesOf(state);
    Benchmarks::copyBytes(state, bytesOfMeshes(inputs));
    Benchmarks::countElements(state, countIn(inputs, sFaceComp));
}

void copyClouds(benchmark::State& state)
{
    auto const points = static_cast<std::size_t>(state.range(0) * state.range(1));
    Benchmarks::copyBytes(state, 32 * points);
    Benchmarks::countElements(state, points);
}

#ifdef MODELING_HAS_VTK
void vtkMeshes(benchmark::State& state)
{
    Benchmarks::VtkAppend const append(meshesOf(state));
    for (auto _ : state)
        append.run();
    Benchmarks::countElements(state, append.faceCount());
}

void vtkClouds(benchmark::State& state)
{
    Benchmarks::VtkAppend const append(cloudsOf(state));
    for (auto _ : state)
        append.run();
    Benchmarks::countElements(state, append.pointCount());
}
#endif

#define MODELING_MESHES                                                                                                \
    Args({2, 1'000'000})->Args({10, 200'000})->Args({100, 20'480})->Args({3'000, 500})->UseRealTime()
#define MODELING_CLOUDS Args({10, 10'000})->Args({10, 100'000})->Args({10, 1'000'000})->UseRealTime()
BENCHMARK(meshes)->Name("mergeMeshes")->MODELING_MESHES;
BENCHMARK(copyMeshes)->Name("mergeMeshes:memcpy")->MODELING_MESHES;
BENCHMARK(clouds)->Name("mergePointClouds")->MODELING_CLOUDS;
BENCHMARK(copyClouds)->Name("mergePointClouds:memcpy")->MODELING_CLOUDS;
#ifdef MODELING_HAS_VTK
BENCHMARK(vtkMeshes)->Name("mergeMeshes:VTK")->MODELING_MESHES;
BENCHMARK(vtkClouds)->Name("mergePointClouds:VTK")->MODELING_CLOUDS;
#endif

}
