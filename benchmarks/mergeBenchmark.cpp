#include "Measuring.h"
#ifdef MODELING_HAS_VTK
#include "peers/vtkAppend.h"
#endif

#include "support/MeshBuilder.h"

#include <Modeling/mergeMeshes.h>
#include <Modeling/mergePointClouds.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>

using namespace Benchmarks;
using namespace Tessara::Geometry;
using namespace Tessara::GeometryAlgorithms;

namespace {

using Inputs = Orvan::Array<Orvan::Ptr<Tessara::Object>>;
using Tessara::Math::float2;
using Tessara::Math::float3;

/// Spheres with 24 bytes per point (position, normal) and 44 per face: three corners with texture coordinates, offset and
/// material. The arguments are the number of inputs and about how many faces each has.
Inputs meshesOf(benchmark::State const& state)
{
    Inputs inputs;
    while (inputs.size != sizeOf(state)) {
        auto const sphere = TestSupport::MeshBuilder::sphereWithFaces(sizeOf(state, 1));
        auto mesh = sphere.build();
        addDataProperty("normal", sPointComp, Orvan::Array<float3>(sphere.points.size(), float3{0, 0, 1}), *mesh);
        addDataProperty("uv", sFaceVertexComp, Orvan::Array<float2>(3 * sphere.faces.size(), float2{1, 2}), *mesh);
        addDataProperty("material", sFaceComp, Orvan::Array<int>(sphere.faces.size(), 7), *mesh);
        inputs.append(std::move(mesh));
    }
    return inputs;
}

/// 32 bytes per point: position, color, weight, number, radius.
Inputs cloudsOf(benchmark::State const& state)
{
    Inputs inputs;
    auto const count = sizeOf(state, 1);
    while (inputs.size != sizeOf(state)) {
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

template <class Merge>
void measure(benchmark::State& state, Inputs const& inputs, Merge const& merge, char const* component)
{
    timeOnEach(state, Tessara::createObject, [&](auto& output) { merge(inputs, *output, nullptr); });
    countElements(state, countIn(inputs, component));
    auto output = Tessara::createObject();
    Memory const memory = memoryOf([&] { merge(inputs, *output, nullptr); });
    state.counters["peak/result"] = static_cast<double>(memory.peak) / static_cast<double>(memory.kept);
}

#ifdef MODELING_HAS_VTK
void appendWithVtk(benchmark::State& state, Inputs const& inputs, char const* component)
{
    VtkAppend const append(inputs);
    for (auto _ : state)
        append.run();
    countElements(state, component == sFaceComp ? append.faceCount() : append.pointCount());
}
#endif

[[maybe_unused]] bool const areRowsAdded = [] {
    Sizes const meshSizes{{2, 1'000'000}, {10, 200'000}, {100, 20'480}, {3'000, 500}};
    Sizes const cloudSizes{{10, 10'000}, {10, 100'000}, {10, 1'000'000}};
    addRow("mergeMeshes", meshSizes,
        [](benchmark::State& state) { measure(state, meshesOf(state), mergeMeshes, sFaceComp); });
    addRow("mergeMeshes:memcpy", meshSizes, [](benchmark::State& state) {
        Inputs const inputs = meshesOf(state);
        std::size_t const faces = countIn(inputs, sFaceComp);
        copyBytes(state, 24 * countIn(inputs, sPointComp) + 44 * faces, faces);
    });
    addRow("mergePointClouds", cloudSizes,
        [](benchmark::State& state) { measure(state, cloudsOf(state), mergePointClouds, sPointComp); });
    addRow("mergePointClouds:memcpy", cloudSizes, [](benchmark::State& state) {
        std::size_t const points = sizeOf(state) * sizeOf(state, 1);
        copyBytes(state, 32 * points, points);
    });
#ifdef MODELING_HAS_VTK
    addRow("mergeMeshes:VTK", meshSizes,
        [](benchmark::State& state) { appendWithVtk(state, meshesOf(state), sFaceComp); });
    addRow("mergePointClouds:VTK", cloudSizes,
        [](benchmark::State& state) { appendWithVtk(state, cloudsOf(state), sPointComp); });
#endif
    return true;
}();

}
