#include "Measuring.h"

#include "frame/Arrays.h"
#include "frame/PointCorners.h"

#include "support/MeshBuilder.h"

using namespace Modeling;

namespace {

constexpr std::int64_t kSmall = 1'000, kMiddle = 1'000'000, kLarge = 30'000'000;

std::size_t sizeOf(benchmark::State const& state)
{
    return static_cast<std::size_t>(state.range(0));
}

void parallelForAddsOne(benchmark::State& state)
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
    Benchmarks::countElements(state, values.size);
}

void copyArray(benchmark::State& state)
{
    Orvan::Array<float> const source(sizeOf(state));
    for (auto _ : state)
        benchmark::DoNotOptimize(copyOfFirst(source.size, source).data);
    Benchmarks::countElements(state, source.size);
}

void fillArray(benchmark::State& state)
{
    for (auto _ : state)
        benchmark::DoNotOptimize(filledArray(sizeOf(state), 1.5f).data);
    Benchmarks::countElements(state, sizeOf(state));
}

void sumOffsets(benchmark::State& state)
{
    Orvan::Array<unsigned char> const counts(sizeOf(state), static_cast<unsigned char>(3));
    unsigned char const* const count = counts.data;
    for (auto _ : state)
        benchmark::DoNotOptimize(
            offsetsFromCounts(counts.size, [=](std::size_t i) -> unsigned int { return count[i]; }).data);
    Benchmarks::countElements(state, counts.size);
}

void copyFloats(benchmark::State& state)
{
    Benchmarks::copyBytes(state, sizeOf(state) * sizeof(float));
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

#define MODELING_SIZES Arg(kSmall)->Arg(kMiddle)->Arg(kLarge)->UseRealTime()
BENCHMARK(parallelForAddsOne)->MODELING_SIZES;
BENCHMARK(copyArray)->MODELING_SIZES;
BENCHMARK(fillArray)->MODELING_SIZES;
BENCHMARK(sumOffsets)->MODELING_SIZES;
BENCHMARK(copyFloats)->Name("parallelForAddsOne:memcpy")->MODELING_SIZES;
BENCHMARK(copyFloats)->Name("copyArray:memcpy")->MODELING_SIZES;
BENCHMARK(copyFloats)->Name("fillArray:memcpy")->MODELING_SIZES;
BENCHMARK(copyFloats)->Name("sumOffsets:memcpy")->MODELING_SIZES;
BENCHMARK(listCornersByPoint)->Args({30'000, 0})->Args({1'000'000, 0})->Args({1'000'000, 1})->UseRealTime();

}
