#include "Measuring.h"
#include "peers/meanValues.h"

#include "frame/ParallelFor.h"
#include "support/PolygonMesh.h"
#include "support/Random.h"

#include <Modeling/StitchTemplate.h>

#include <tbb/global_control.h>
#include <tbb/task_arena.h>

#include <algorithm>
#include <cmath>

using namespace Benchmarks;
using Tessara::Math::float3;
using Tessara::Modeling::StitchTemplate;
using Points = Orvan::Array<float3>;
using Indices = Orvan::Array<unsigned int>;
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

void computeCoordinates(benchmark::State& state)
{
    auto const polygons = drawnPolygons(sizeOf(state));
    StitchTemplate made;
    made.setErrors("");
    Weights weights(9);
    for (auto _ : state)
        for (DrawnPolygon const& polygon : polygons) {
            made.setPolySize(static_cast<unsigned int>(polygon.corners.size));
            for (float3 const& point : polygon.points) {
                std::fill(weights.begin(), weights.end(), 0.0f);
                benchmark::DoNotOptimize(made.computeMeanValueCoordinates(polygon.corners, point, weights, 1));
            }
        }
    if (!made.getErrors().empty())
        state.SkipWithError("a point is outside its polygon");
    countElements(state, sizeOf(state));
}

StitchTemplate filledSquare(Points const& positions, Indices const& offsets)
{
    return {Orvan::makePtr<Points>(Points{{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}}),
        Orvan::makePtr<Points>(positions), Orvan::makePtr<Indices>(offsets), false};
}

/// Two strands across a square.
StitchTemplate crossing()
{
    Points positions;
    for (float const t : {0.0f, 0.25f, 0.5f, 0.75f, 1.0f})
        positions.append({t, 0.6f, -0.1f});
    for (float const t : {0.0f, 0.25f, 0.5f, 0.75f, 1.0f})
        positions.append({0.4f, t, 0.1f});
    return filledSquare(positions, {0, 5, 10});
}

/// One control point after the other in a quad that stays in the nearest cache.
void findPositions(benchmark::State& state)
{
    StitchTemplate const made = crossing();
    Points const quad{{0, 0, 0}, {1, 0, 0.5f}, {1, 1, 0}, {0, 1, 0.2f}};
    auto const& controlPoints = made.getStrands()[0].controlPoints;
    float3 position{};
    for (auto _ : state)
        for (Weights const& weights : controlPoints) {
            made.findControlPointPos(quad, weights, 1, false, position);
            benchmark::DoNotOptimize(position);
        }
    countElements(state, controlPoints.size);
}

/// That many strands of eight control points from one edge of a square to the opposite one.
void fillTemplate(benchmark::State& state)
{
    auto const strandCount = static_cast<unsigned int>(state.range(0));
    Points positions;
    Indices offsets{0};
    for (unsigned int strand = 0; strand != strandCount; ++strand) {
        auto const place = static_cast<float>((strand * 7919ull) % strandCount) / static_cast<float>(strandCount);
        for (int point = 0; point != 8; ++point)
            positions.append({0.1f + 0.8f * place, static_cast<float>(point) / 7, 0});
        offsets.append(static_cast<unsigned int>(positions.size));
    }
    auto const polygon = Orvan::makePtr<Points>(Points{{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}});
    auto const points = Orvan::makePtr<Points>(positions);
    auto const starts = Orvan::makePtr<Indices>(offsets);
    for (auto _ : state) {
        StitchTemplate made(polygon, points, starts, false);
        benchmark::DoNotOptimize(made);
    }
    countElements(state, positions.size);
}

/// Lays a template on each quad of a bent mesh, with as many threads as the argument says.
void layOnQuads(benchmark::State& state)
{
    StitchTemplate const made = crossing();
    auto const mesh = TestSupport::PolygonMesh::quads(1000).withNoise(0.2f, 1);
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
    for (auto _ : state)
        arena.execute([&] { // each quad writes its own stretch
            Modeling::parallelFor(
                tbb::blocked_range<std::size_t>(0, mesh.faceCount(), Modeling::kElementGrain), layOnRange);
        });
    countElements(state, laid.size);
}

[[maybe_unused]] bool const areRowsAdded = [] {
    addRow("stitch coordinates", {{200'000}}, computeCoordinates);
#ifdef MODELING_HAS_CGAL
    auto const addCgal = [](char const* name, auto const& makeRun) {
        addRow(name, {{200'000}}, [=](benchmark::State& state) {
            auto const run = makeRun(drawnPolygons(sizeOf(state)));
            for (auto _ : state)
                run();
            countElements(state, sizeOf(state));
        });
    };
    addCgal("stitch coordinates:CGAL in float", cgalMeanValuesInFloat);
    addCgal("stitch coordinates:CGAL in double", cgalMeanValuesInDouble);
#endif
    addRow("stitch findControlPointPos", {}, findPositions);
    addRow("stitch fill", {{1'000}, {10'000}, {100'000}}, fillTemplate);
    addRow("stitch lay on a million quads, threads", {{1}, {2}}, layOnQuads);
    return true;
}();

}
