#include "Measuring.h"
#include "peers/meanValues.h"

#include "frame/ParallelFor.h"
#include "support/Random.h"

#include <Modeling/StitchTemplate.h>

#include <tbb/global_control.h>
#include <tbb/task_arena.h>

#include <algorithm>
#include <cmath>

using namespace Benchmarks;
using Tessara::Modeling::StitchTemplate;
using Points = Orvan::Array<float3>;
using Weights = Orvan::Array<float>;

namespace {

float3 onCircle(float turn, float radius)
{
    return {radius * std::cos(turn * 6.2831853f), radius * std::sin(turn * 6.2831853f), 0};
}

/// Polygons of 4 to 8 corners, mostly concave, each with a hundred points inside that are not on edges.
std::vector<DrawnPolygon> drawnPolygons(std::size_t pointCount)
{
    TestSupport::Random random(1);
    std::vector<DrawnPolygon> polygons(pointCount / 100);
    for (DrawnPolygon& polygon : polygons) {
        unsigned int const corners = 4 + random.below(5);
        for (unsigned int i = 0; i != corners; ++i)
            polygon.corners.append(
                onCircle(static_cast<float>(i) / static_cast<float>(corners), 0.8f + 0.2f * random.coordinate()));
        while (polygon.points.size != 100)
            polygon.points.append(onCircle(random.coordinate(), 0.15f + 0.14f * random.coordinate()));
    }
    return polygons;
}

Row const coordinates("stitch coordinates", {{200'000}}, [](State& state) {
    StitchTemplate made;
    made.setErrors("");
    Weights weights(9);
    timeRuns(state, sizeOf(state), [&, polygons = drawnPolygons(sizeOf(state))] {
        for (DrawnPolygon const& polygon : polygons) {
            made.setPolySize(static_cast<unsigned int>(polygon.corners.size));
            for (float3 const& point : polygon.points) {
                std::fill(weights.begin(), weights.end(), 0.0f);
                benchmark::DoNotOptimize(made.computeMeanValueCoordinates(polygon.corners, point, weights, 1));
            }
        }
    });
    if (!made.getErrors().empty())
        state.SkipWithError("a point is outside its polygon");
});

[[maybe_unused]] Row coordinatesByCgal(char const* name, decltype(&cgalMeanValuesInFloat) makeRun)
{
    return {name, {{200'000}},
        [=](State& state) { timeRuns(state, sizeOf(state), makeRun(drawnPolygons(sizeOf(state)))); }};
}
#ifdef MODELING_HAS_CGAL
Row const inFloat = coordinatesByCgal("stitch coordinates:CGAL in float", cgalMeanValuesInFloat);
Row const inDouble = coordinatesByCgal("stitch coordinates:CGAL in double", cgalMeanValuesInDouble);
#endif

Orvan::Ptr<Points> square()
{
    return Orvan::makePtr<Points>(Points{{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}});
}

/// Two strands across a square.
StitchTemplate crossing()
{
    Points points(10);
    for (std::size_t i = 0; i != 5; ++i) {
        float const t = 0.25f * static_cast<float>(i);
        points[i] = {t, 0.6f, -0.1f};
        points[5 + i] = {0.4f, t, 0.1f};
    }
    return {square(), Orvan::makePtr<Points>(points), Orvan::makePtr<Indices>(Indices{0, 5, 10}), false};
}

/// One control point after the other in a quad that stays in the nearest cache.
Row const controlPoints("stitch findControlPointPos", {}, [](State& state) {
    StitchTemplate const made = crossing();
    Points const quad{{0, 0, 0}, {1, 0, 0.5f}, {1, 1, 0}, {0, 1, 0.2f}};
    auto const& strand = made.getStrands()[0].controlPoints;
    float3 position{};
    timeRuns(state, strand.size, [&] {
        for (Weights const& weights : strand) {
            made.findControlPointPos(quad, weights, 1, false, position);
            benchmark::DoNotOptimize(position);
        }
    });
});

/// That many strands of eight control points from one edge of a square to the opposite one.
Row const fill("stitch fill", {{1'000}, {10'000}, {100'000}}, [](State& state) {
    Points positions;
    Indices offsets{0};
    for (std::size_t strand = 0; strand != sizeOf(state); ++strand) {
        auto const place = static_cast<float>((strand * 7919) % sizeOf(state)) / static_cast<float>(sizeOf(state));
        for (int point = 0; point != 8; ++point)
            positions.append({0.1f + 0.8f * place, static_cast<float>(point) / 7, 0});
        offsets.append(static_cast<unsigned int>(positions.size));
    }
    auto const polygon = square(), points = Orvan::makePtr<Points>(positions);
    auto const starts = Orvan::makePtr<Indices>(offsets);
    timeRuns(state, positions.size, [&] { benchmark::DoNotOptimize(StitchTemplate(polygon, points, starts, false)); });
});

/// Lays a template on each quad of a bent mesh, with as many threads as the argument says.
Row const lay("stitch lay on a million quads, threads", {{1}, {2}}, [](State& state) {
    StitchTemplate const made = crossing();
    PolygonMesh const mesh = bentQuads(1'000'000);
    std::size_t const perQuad = 2 * made.getStrands()[0].controlPoints.size;
    Points laid(mesh.faceCount() * perQuad);
    auto const layOnRange = [&](tbb::blocked_range<std::size_t> const& quads) {
        Points corners(4);
        for (std::size_t quad = quads.begin(); quad != quads.end(); ++quad) {
            for (std::size_t i = 0; i != 4; ++i)
                corners[i] = mesh.points[mesh.faceVertex[4 * quad + i]];
            float3* position = laid.data + quad * perQuad;
            for (auto const& strand : made.getStrands())
                for (Weights const& weights : strand.controlPoints)
                    made.findControlPointPos(corners, weights, 0.001f, false, *position++);
        }
    };
    tbb::global_control const allowed(tbb::global_control::max_allowed_parallelism, sizeOf(state));
    tbb::task_arena arena(static_cast<int>(state.range(0)));
    tbb::blocked_range<std::size_t> const quads(0, mesh.faceCount(), Modeling::kElementGrain);
    timeRuns(state, laid.size, [&] { // each quad writes its own stretch
        arena.execute([&] { Modeling::parallelFor(quads, layOnRange); });
    });
});

}
