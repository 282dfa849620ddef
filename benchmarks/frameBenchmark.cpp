#include "Measuring.h"

#include "frame/Arrays.h"
#include "frame/ElementTypes.h"
#include "frame/PointCorners.h"

using namespace Benchmarks;
using namespace Modeling;
using benchmark::DoNotOptimize;

namespace {

/// Finding the type of one property's array: the argument is 0 for the first type of the list, 1 for the last.
void dispatch(State& state)
{
    using First = signed char;
    using Last = Tessara::Geometry::Transform::GraphTransforms;
    Tessara::PropertyValue const value = state.range(0) == 0
        ? Tessara::PropertyValue(Orvan::makePtr<Orvan::Array<First>>())
        : Tessara::PropertyValue(Orvan::makePtr<Orvan::Array<Last>>());
    timeRuns(state, 1, [&] {
        bool result = false;
        forEachElementType<AllElementTypes, ArrayForm>(&value, &result, [](auto& array) { return !array->empty(); });
        DoNotOptimize(result);
    });
}
BENCHMARK(dispatch)->Arg(0)->Arg(1);

/// A row for a loop over floats, beside the time for copying them.
struct LoopRow : Row {
    LoopRow(std::string const& name, std::function<void(State&)> const& run)
        : Row(name, kSizes, run)
    {
        CopyRow(name, kSizes, [](State const& state) -> CopyRow::Input { return {sizeOf(state) * sizeof(float), 0}; });
    }
    inline static Sizes const kSizes{{1'000}, {1'000'000}, {30'000'000}};
};

LoopRow const addsOne("parallelForAddsOne", [](State& state) {
    Orvan::Array<float> values(sizeOf(state));
    float* const value = values.data;
    timeRuns(state, values.size, [=, count = values.size] {
        parallelFor(tbb::blocked_range<std::size_t>(0, count, kElementGrain), [=](auto const& range) {
            for (std::size_t i = range.begin(); i != range.end(); ++i)
                value[i] += 1.0f;
        });
    });
});

LoopRow const copies("copyArray", [](State& state) {
    Orvan::Array<float> const source(sizeOf(state));
    timeRuns(state, source.size, [&] { DoNotOptimize(copyOfFirst(source.size, source).data); });
});

LoopRow const fills("fillArray", [](State& state) {
    timeRuns(state, sizeOf(state), [&] { DoNotOptimize(filledArray(sizeOf(state), 1.5f).data); });
});

LoopRow const sums("sumOffsets", [](State& state) {
    Orvan::Array<unsigned char> const counts(sizeOf(state), static_cast<unsigned char>(3));
    auto const countOf = [count = counts.data](std::size_t i) -> unsigned int { return count[i]; };
    timeRuns(state, counts.size, [&] { DoNotOptimize(offsetsFromCounts(counts.size, countOf).data); });
});

/// The corners around each point of a sphere; the second argument shuffles points and faces.
Row const lists("listCornersByPoint", {{30'000, 0}, {1'000'000, 0}, {1'000'000, 1}}, [](State& state) {
    FlatMesh const mesh((state.range(1) == 0 ? sphereOf : shuffledSphereOf)(sizeOf(state)).polygons());
    timeRuns(state, mesh.faceCount(), [&] {
        DoNotOptimize(cornersByPoint(mesh.pointCount(), mesh.faceVertex.data, mesh.faceVertex.size).corners.data);
    });
});

}
