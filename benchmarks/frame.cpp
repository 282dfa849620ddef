#include "Inputs.h"

#include "frame/Arrays.h"
#include "frame/ElementTypes.h"
#include "frame/PointCorners.h"

using namespace Benchmarks;
using namespace Modeling;

namespace {

/// Finding the type of one property's array: the argument is 0 for the first type of the list, 1 for the last.
void dispatch(benchmark::State& state)
{
    Run run{state};
    using First = signed char;
    using Last = Tessara::Geometry::Transform::GraphTransforms;
    Tessara::PropertyValue const value = state.range(0) == 0
        ? Tessara::PropertyValue(Orvan::makePtr<Orvan::Array<First>>())
        : Tessara::PropertyValue(Orvan::makePtr<Orvan::Array<Last>>());
    timeRuns(run, 1, [&] {
        bool result = false;
        forEachElementType<AllElementTypes, ArrayForm>(&value, &result, [](auto& array) { return !array->empty(); });
        DoNotOptimize(result);
    });
}
BENCHMARK(dispatch)->Arg(0)->Arg(1);

// Loops over floats, beside the time for copying them.
Sizes const kLoops{{1'000}, {1'000'000}, {30'000'000}};

RowBesideCopy const adding("parallelForAddsOne", kLoops, [](Run& run) {
    if (run.copies(run.size() * sizeof(float)))
        return;
    Orvan::Array<float> values(run.size());
    float* const value = values.data;
    timeRuns(run, values.size, [=, count = values.size] {
        parallelFor(tbb::blocked_range<std::size_t>(0, count, kElementGrain), [=](auto const& range) {
            for (std::size_t i = range.begin(); i != range.end(); ++i)
                value[i] += 1.0f;
        });
    });
});

RowBesideCopy const copying("copyArray", kLoops, [](Run& run) {
    Orvan::Array<float> const source(run.size());
    if (!run.copies(run.size() * sizeof(float)))
        timeRuns(run, run.size(), [&] { DoNotOptimize(copyOfFirst(source.size, source).data); });
});

RowBesideCopy const filling("fillArray", kLoops, [](Run& run) {
    if (!run.copies(run.size() * sizeof(float)))
        timeRuns(run, run.size(), [&] { DoNotOptimize(filledArray(run.size(), 1.5f).data); });
});

RowBesideCopy const summing("sumOffsets", kLoops, [](Run& run) {
    Orvan::Array<unsigned char> const counts(run.size(), static_cast<unsigned char>(3));
    auto const countOf = [count = counts.data](std::size_t i) -> unsigned int { return count[i]; };
    if (!run.copies(run.size() * sizeof(float)))
        timeRuns(run, counts.size, [&] { DoNotOptimize(offsetsFromCounts(counts.size, countOf).data); });
});

/// The corners around each point of a sphere; the second argument shuffles points and faces.
Row const listing("listCornersByPoint", {{30'000, 0}, {1'000'000, 0}, {1'000'000, 1}}, [](Run& run) {
    FlatMesh const mesh(run.size(1) == 0 ? Meshes::sphere : Meshes::shuffled, run.size());
    timeRuns(run, mesh.faceCount(), [&] {
        DoNotOptimize(cornersByPoint(mesh.pointCount(), mesh.faceVertex.data, mesh.faceVertex.size).corners.data);
    });
});

}
