#include "Inputs.h"

#include "frame/Arrays.h"
#include "frame/ElementTypes.h"
#include "frame/PointCorners.h"

using namespace Benchmarks;
using namespace Modeling;

namespace {

/// Finding the type of one property's array: the argument is 0 for the first type of the list, 1 for the last.
Row const dispatch("dispatch", {{0}, {1}}, [](Run& run) {
    using First = signed char;
    using Last = Tessara::Geometry::Transform::GraphTransforms;
    Tessara::PropertyValue const value = run.size() == 0 ? Tessara::PropertyValue(Orvan::makePtr<Orvan::Array<First>>())
                                                         : Tessara::PropertyValue(Orvan::makePtr<Orvan::Array<Last>>());
    timeRuns(run, 1, [&] {
        bool result = false;
        forEachElementType<AllElementTypes, ArrayForm>(&value, &result, [](auto& array) { return !array->empty(); });
        DoNotOptimize(result);
    });
});

Sizes const kLoops{{1'000}, {1'000'000}, {30'000'000}};

/// Times `work(values)` on floats, beside the time for copying them.
Row rowOfLoop(char const* name, void (*work)(Orvan::Array<float>& values))
{
    return Row(name, kLoops, kBesideCopy, [=](Run& run) {
        Orvan::Array<float> values(run.size());
        if (!run.copies(run.size() * sizeof(float)))
            timeRuns(run, run.size(), [&] { work(values); });
    });
}

Row const adding = rowOfLoop("parallelForAddsOne", [](auto& values) {
    parallelFor(
        tbb::blocked_range<std::size_t>(0, values.size, kElementGrain), [value = values.data](auto const& range) {
            for (std::size_t i = range.begin(); i != range.end(); ++i)
                value[i] += 1.0f;
        });
});
Row const copying = rowOfLoop("copyArray", [](auto& source) { DoNotOptimize(copyOfFirst(source.size, source).data); });
Row const filling = rowOfLoop("fillArray", [](auto& values) { DoNotOptimize(filledArray(values.size, 1.5f).data); });

Row const summing("sumOffsets", kLoops, kBesideCopy, [](Run& run) {
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
