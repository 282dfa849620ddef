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

using Benchmarks::DrawnPolygon;
using Tessara::Math::float3;
using Tessara::Modeling::LocalStrand;
using Tessara::Modeling::StitchTemplate;
using TestSupport::PolygonMesh;
using TestSupport::Random;
using Points = Orvan::Array<float3>;

namespace {

constexpr std::size_t kPointsOfPolygon = 100;

float3 onCircle(float turn, float radius)
{
    return {radius * std::cos(turn * 6.2831853f), radius * std::sin(turn * 6.2831853f), 0};
}

/// Polygons of 4 to 8 corners, mostly concave, with points inside and not on edges.
std::vector<DrawnPolygon> drawnPolygons(std::size_t pointCount)
{
    Random random(1);
    std::vector<DrawnPolygon> polygons(pointCount / kPointsOfPolygon);
    for (DrawnPolygon& polygon : polygons) {
        unsigned int const corners = 4 + random.below(5);
        for (unsigned int i = 0; i != corners; ++i)
            polygon.corners.append(
                onCircle(static_cast<float>(i) / static_cast<float>(corners), 0.8f + 0.2f * random.coordinate()));
        for (std::size_t i = 0; i != kPointsOfPolygon; ++i)
            polygon.points.append(onCircle(random.coordinate(), 0.15f + 0.14f * random.coordinate()));
    }
    return polygons;
}

StitchTemplate openTemplate(unsigned int polySize)
{
    StitchTemplate made;
    made.setErrors("");
    made.setPolySize(polySize);
    return made;
}

void computeCoordinates(benchmark::State& state)
{
    auto const pointCount = static_cast<std::size_t>(state.range(0));
    auto const polygons = drawnPolygons(pointCount);
    StitchTemplate made = openTemplate(0);
    Orvan::Array<float> weights(9);
    for (auto _ : state) {
        for (DrawnPolygon const& polygon : polygons) {
            made.setPolySize(static_cast<unsigned int>(polygon.corners.size));
            for (float3 const& point : polygon.points) {
                std::fill(weights.begin(), weights.end(), 0.0f);
                benchmark::DoNotOptimize(made.computeMeanValueCoordinates(polygon.corners, point, weights, 1));
            }
        }
    }
    if (!made.getErrors().empty())
        state.SkipWithError("points were to be inside");
    Benchmarks::countElements(state, pointCount);
}

#ifdef MODELING_HAS_CGAL
void cgal(benchmark::State& state, std::function<void()> (*make)(std::vector<DrawnPolygon> const&))
{
    auto const pointCount = static_cast<std::size_t>(state.range(0));
    auto const run = make(drawnPolygons(pointCount));
    for (auto _ : state)
        run();
    Benchmarks::countElements(state, pointCount);
}
#endif

/// Two strands across a square.
StitchTemplate crossing()
{
    Points positions;
    Orvan::Array<unsigned int> offsets{0};
    for (bool const isUpright : {false, true}) {
        for (float const t : {0.0f, 0.25f, 0.5f, 0.75f, 1.0f}) {
            float const height = isUpright ? 0.1f : -0.1f;
            positions.append(isUpright ? float3{0.4f, t, height} : float3{t, 0.6f, height});
        }
        offsets.append(static_cast<unsigned int>(positions.size));
    }
    return {Orvan::makePtr<Points>(Points{{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}}),
        Orvan::makePtr<Points>(positions), Orvan::makePtr<Orvan::Array<unsigned int>>(offsets), false};
}

/// One control point after the other in a quad that stays in the nearest cache.
void findPositions(benchmark::State& state)
{
    StitchTemplate const made = crossing();
    Points const quad{{0, 0, 0}, {1, 0, 0.5f}, {1, 1, 0}, {0, 1, 0.2f}};
    auto const& controlPoints = made.getStrands()[0].controlPoints;
    float3 position{};
    for (auto _ : state) {
        for (Orvan::Array<float> const& weights : controlPoints) {
            made.findControlPointPos(quad, weights, 1, false, position);
            benchmark::DoNotOptimize(position);
        }
    }
    Benchmarks::countElements(state, controlPoints.size);
}

/// So many strands of eight control points from one edge of a square to the opposite one.
void fillTemplate(benchmark::State& state)
{
    auto const strandCount = static_cast<unsigned int>(state.range(0));
    Points positions;
    Orvan::Array<unsigned int> offsets{0};
    for (unsigned int strand = 0; strand != strandCount; ++strand) {
        float const x =
            0.1f + 0.8f * static_cast<float>((strand * 7919ull) % strandCount) / static_cast<float>(strandCount);
        for (int point = 0; point != 8; ++point)
            positions.append({x, static_cast<float>(point) / 7, 0});
        offsets.append(static_cast<unsigned int>(positions.size));
    }
    auto const polygon = Orvan::makePtr<Points>(Points{{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}});
    auto const points = Orvan::makePtr<Points>(positions);
    auto const starts = Orvan::makePtr<Orvan::Array<unsigned int>>(offsets);
    for (auto _ : state) {
        StitchTemplate made(polygon, points, starts, false);
        benchmark::DoNotOptimize(made);
    }
    Benchmarks::countElements(state, positions.size);
}

/// Lays a template on each quad of a bent mesh, with as many threads as the argument says.
void layOnQuads(benchmark::State& state)
{
    StitchTemplate const made = crossing();
    PolygonMesh const mesh = PolygonMesh::quads(1000).withNoise(0.2f, 1);
    std::size_t const perQuad = 2 * made.getStrands()[0].controlPoints.size;
    Points laid(mesh.faceCount() * perQuad);
    tbb::global_control const allowed(
        tbb::global_control::max_allowed_parallelism, static_cast<std::size_t>(state.range(0)));
    tbb::task_arena arena(static_cast<int>(state.range(0)));
    for (auto _ : state) {
        arena.execute([&] {
            // Each quad writes its own stretch.
            Modeling::parallelFor(
                tbb::blocked_range<std::size_t>(0, mesh.faceCount(), Modeling::kElementGrain), [&](auto const& quads) {
                    Points corners(4);
                    for (std::size_t quad = quads.begin(); quad != quads.end(); ++quad) {
                        for (std::size_t i = 0; i != 4; ++i)
                            corners[i] = mesh.points[mesh.faceVertex[4 * quad + i]];
                        float3* position = laid.data + quad * perQuad;
                        for (LocalStrand const& strand : made.getStrands())
                            for (Orvan::Array<float> const& weights : strand.controlPoints)
                                made.findControlPointPos(corners, weights, 0.001f, false, *position++);
                    }
                });
        });
    }
    Benchmarks::countElements(state, laid.size);
}

BENCHMARK(computeCoordinates)->Name("stitch coordinates")->Arg(200'000)->UseRealTime();
#ifdef MODELING_HAS_CGAL
BENCHMARK_CAPTURE(cgal, float, Benchmarks::cgalMeanValuesInFloat)
    ->Name("stitch coordinates:CGAL in float")
    ->Arg(200'000)
    ->UseRealTime();
BENCHMARK_CAPTURE(cgal, double, Benchmarks::cgalMeanValuesInDouble)
    ->Name("stitch coordinates:CGAL in double")
    ->Arg(200'000)
    ->UseRealTime();
#endif
BENCHMARK(findPositions)->Name("stitch findControlPointPos")->UseRealTime();
BENCHMARK(fillTemplate)->Name("stitch fill")->Arg(1'000)->Arg(10'000)->Arg(100'000)->UseRealTime();
BENCHMARK(layOnQuads)->Name("stitch lay on a million quads, threads")->Arg(1)->Arg(2)->UseRealTime();

}
