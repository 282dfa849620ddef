#include "Measuring.h"

#include "frame/ElementTypes.h"

#include <OrvanCore/Ptr.h>

using namespace Modeling;

namespace {

/// Finding the type of one property's array: the argument is 0 for the first type of the list, 1 for the last.
void dispatch(benchmark::State& state)
{
    using First = signed char;
    using Last = Tessara::Geometry::Transform::GraphTransforms;
    Tessara::PropertyValue const value = state.range(0) == 0
        ? Tessara::PropertyValue(Orvan::makePtr<Orvan::Array<First>>())
        : Tessara::PropertyValue(Orvan::makePtr<Orvan::Array<Last>>());
    for (auto _ : state) {
        bool result = false;
        forEachElementType<AllElementTypes, ArrayForm>(&value, &result, [](auto& array) { return !array->empty(); });
        benchmark::DoNotOptimize(result);
    }
    Benchmarks::countElements(state, 1);
}
BENCHMARK(dispatch)->Arg(0)->Arg(1);

}
