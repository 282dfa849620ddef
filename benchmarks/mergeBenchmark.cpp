#include "Measuring.h"
#include "peers/vtkAppend.h"

#include <Modeling/mergeMeshes.h>
#include <Modeling/mergePointClouds.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Makers.h>

using namespace Benchmarks;
using namespace Tessara::Geometry;
using Tessara::Math::float2;

namespace {

using Inputs = Orvan::Array<Orvan::Ptr<Object>>;

/// A sphere with 24 bytes per point (position, normal) and 44 per face: three corners with texture coordinates, offset and
/// material.
Orvan::MutablePtr<Object> makeSphere(std::size_t faces)
{
    MeshBuilder const& sphere = sphereOf(faces);
    auto mesh = sphere.build();
    addDataProperty("normal", sPointComp, Orvan::Array<float3>(sphere.points.size(), float3{0, 0, 1}), *mesh);
    addDataProperty("uv", sFaceVertexComp, Orvan::Array<float2>(3 * sphere.faces.size(), float2{1, 2}), *mesh);
    addDataProperty("material", sFaceComp, Orvan::Array<int>(sphere.faces.size(), 7), *mesh);
    return mesh;
}

/// 32 bytes per point: position, color, weight, number, radius.
Orvan::MutablePtr<Object> makeCloud(std::size_t points)
{
    auto cloud = makePointCloud(Orvan::Array<float3>(points, float3{1, 2, 3}));
    addDataProperty("color", sPointComp, Orvan::Array<int>(points, 1), *cloud);
    addDataProperty("weight", sPointComp, Orvan::Array<double>(points, 0.5), *cloud);
    addDataProperty("id", sPointComp, Orvan::Array<unsigned int>(points, 3u), *cloud);
    addDataProperty("radius", sPointComp, Orvan::Array<float>(points, 1.0f), *cloud);
    return cloud;
}

/// What is merged: the arguments of a row are the number of inputs and about how many elements each has.
struct Kind {
    Orvan::MutablePtr<Object> (*makeInput)(std::size_t elements);
    decltype(&Tessara::GeometryAlgorithms::mergeMeshes) merge;
    char const* component; // of the elements
    std::size_t bytesPerPoint, bytesPerFace;

    Inputs inputsOf(State const& state) const
    {
        Inputs inputs;
        while (inputs.size != sizeOf(state))
            inputs.append(makeInput(sizeOf(state, 1)));
        return inputs;
    }
};

std::size_t countIn(Inputs const& inputs, char const* component)
{
    return inputs.size * getElementCount(*inputs[0], component); // all are alike
}

bool addRows(std::string const& name, Sizes const& sizes, Kind const& kind)
{
    Row(name, sizes, [=](State& state) {
        Inputs const inputs = kind.inputsOf(state);
        auto const merge = [&](Object& output) { kind.merge(inputs, output, nullptr); };
        timeOnCopies(state, countIn(inputs, kind.component), Object(), merge);
        Object output;
        Memory const memory = memoryOf([&] { merge(output); });
        state.counters["peak/result"] = static_cast<double>(memory.peak) / static_cast<double>(memory.kept);
    });
    CopyRow(name, sizes, [=](State const& state) -> CopyRow::Input {
        Inputs const inputs = kind.inputsOf(state);
        std::size_t const points = countIn(inputs, sPointComp), faces = countIn(inputs, sFaceComp);
        return {kind.bytesPerPoint * points + kind.bytesPerFace * faces, faces == 0 ? points : faces};
    });
#ifdef MODELING_HAS_VTK
    Row(name + ":VTK", sizes, [=](State& state) {
        Inputs const inputs = kind.inputsOf(state);
        VtkAppend const append(inputs);
        timeRuns(state, countIn(inputs, kind.component), [&] { append.run(); });
    });
#endif
    return true;
}

using namespace Tessara::GeometryAlgorithms;
Sizes const kMeshes{{2, 1'000'000}, {10, 200'000}, {100, 20'480}, {3'000, 500}};
Sizes const kClouds{{10, 10'000}, {10, 100'000}, {10, 1'000'000}};
[[maybe_unused]] bool const areRowsAdded = addRows("mergeMeshes", kMeshes, {makeSphere, mergeMeshes, sFaceComp, 24, 44})
    && addRows("mergePointClouds", kClouds, {makeCloud, mergePointClouds, sPointComp, 32, 0});

}
