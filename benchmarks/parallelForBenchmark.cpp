#include "Measuring.h"

#include "frame/Arrays.h"
#include "frame/PointCorners.h"

#include "support/MeshBuilder.h"

#include <string>

using namespace Modeling;
using Benchmarks::sizeOf;

namespace {

void addOne(benchmark::State& state)
{
    Orvan::Array<float> values(sizeOf(state));
    float* const value = values.data;
    for (auto _ : state) {
        parallelFor(tbb::blocked_range<std::size_t>(0, values.size, kElementGrain), [=](auto const& range) {
            for (std::size_t i = range.begin(); i != range.end(); ++i)
                value[i] += 1.0f;
        });
        benchmark::ClobberMemory();
    }
}

void copyArray(benchmark::State& state)
{
    Orvan::Array<float> const source(sizeOf(state));
    for (auto _ : state)
        benchmark::DoNotOptimize(copyOfFirst(source.size, source).data);
}

void fillArray(benchmark::State& state)
{
    for (auto _ : state)
        benchmark::DoNotOptimize(filledArray(sizeOf(state), 1.5f).data);
}

void sumOffsets(benchmark::State& state)
{
    Orvan::Array<unsigned char> const counts(sizeOf(state), static_cast<unsigned char>(3));
    unsigned char const* const count = counts.data;
    for (auto _ : state)
        benchmark::DoNotOptimize(
            offsetsFromCounts(counts.size, [=](std::size_t i) -> unsigned int { return count[i]; }).data);
}

/// The corners around each point of a sphere; the second argument shuffles points and faces.
void listCornersByPoint(benchmark::State& state)
{
    auto mesh = TestSupport::MeshBuilder::sphereWithFaces(sizeOf(state));
    if (state.range(1) != 0)
        mesh = std::move(mesh).shuffled(1);
    auto const pointCount = static_cast<unsigned int>(mesh.points.size());
    for (auto _ : state)
        benchmark::DoNotOptimize(cornersByPoint(pointCount, mesh.faces[0].data(), 3 * mesh.faces.size()).corners.data);
    Benchmarks::countElements(state, mesh.faces.size());
}

[[maybe_unused]] bool const areRowsAdded = [] {
    Benchmarks::Sizes const sizes{{1'000}, {1'000'000}, {30'000'000}};
    auto const addWithCopy = [&](std::string const& name, void (*run)(benchmark::State&)) {
        Benchmarks::addRow(name.c_str(), sizes, [=](benchmark::State& state) {
            run(state);
            Benchmarks::countElements(state, sizeOf(state));
        });
        Benchmarks::addRow((name + ":memcpy").c_str(), sizes,
            [](benchmark::State& state) { Benchmarks::copyBytes(state, sizeOf(state) * sizeof(float), 0); });
    };
    addWithCopy("parallelForAddsOne", addOne);
    addWithCopy("copyArray", copyArray);
    addWithCopy("fillArray", fillArray);
    addWithCopy("sumOffsets", sumOffsets);
    Benchmarks::addRow("listCornersByPoint", {{30'000, 0}, {1'000'000, 0}, {1'000'000, 1}}, listCornersByPoint);
    return true;
}();

}
