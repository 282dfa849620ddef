#include "Inputs.h"

#include "frame/ParallelFor.h"

#include <Modeling/StitchTemplate.h>

#include <tbb/global_control.h>

#include <algorithm>

using namespace Benchmarks;
using Tessara::Modeling::StitchTemplate;
using Weights = Orvan::Array<float>;

namespace {

Row const coordinates("stitch coordinates", {{200'000}}, [](Run& run) {
    StitchTemplate made;
    made.setErrors("");
    Weights weights(9);
    auto const forEachPoint = [&, polygons = drawnPolygons(run.size())](auto const& use) {
        for (DrawnPolygon const& polygon : polygons) {
            made.setPolySize(static_cast<unsigned int>(polygon.corners.size));
            for (float3 const& point : polygon.points) {
                std::fill(weights.begin(), weights.end(), 0.0f);
                DoNotOptimize(made.computeMeanValueCoordinates(polygon.corners, point, weights, 1));
                use();
            }
        }
    };
    timeRuns(run, run.size(), [&] { forEachPoint([] {}); });
    double sum = 0; // of the first two coordinates of each point
    forEachPoint([&] { sum += static_cast<double>(weights[0] + 2 * weights[1]); });
    run.reportResult(sum);
    if (!made.getErrors().empty())
        run.state.SkipWithError("a point is outside its polygon");
});

Orvan::Ptr<Points> square()
{
    return Orvan::makePtr<Points>(Points{{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}});
}

/// Two strands across a square.
StitchTemplate crossing()
{
    auto const points = Orvan::makePtr<Points>(arrayOf(10, [](std::size_t i) {
        float const t = 0.25f * static_cast<float>(i % 5);
        return i < 5 ? float3{t, 0.6f, -0.1f} : float3{0.4f, t, 0.1f};
    }));
    return {square(), points, Orvan::makePtr<Indices>(Indices{0, 5, 10}), false};
}

/// One control point after the other in a quad that stays in the nearest cache.
Row const controlPoints("stitch findControlPointPos", {}, [](Run& run) {
    StitchTemplate const made = crossing();
    Points const quad{{0, 0, 0}, {1, 0, 0.5f}, {1, 1, 0}, {0, 1, 0.2f}};
    auto const& strand = made.getStrands()[0].controlPoints;
    float3 position{};
    timeRuns(run, strand.size, [&] {
        for (Weights const& weights : strand) {
            made.findControlPointPos(quad, weights, 1, false, position);
            DoNotOptimize(position);
        }
    });
});

/// That many strands of eight control points from one edge of a square to the opposite one.
Row const fill("stitch fill", {{1'000}, {10'000}, {100'000}}, [](Run& run) {
    auto const polygon = square(), points = Orvan::makePtr<Points>(arrayOf(8 * run.size(), [&](std::size_t i) {
        auto const place = static_cast<float>(i / 8 * 7919 % run.size()) / static_cast<float>(run.size());
        return float3{0.1f + 0.8f * place, static_cast<float>(i % 8) / 7, 0};
    }));
    auto const offsets = Orvan::makePtr<Indices>(
        arrayOf(run.size() + 1, [](std::size_t strand) { return static_cast<unsigned int>(8 * strand); }));
    timeRuns(run, points->size, [&] { DoNotOptimize(StitchTemplate(polygon, points, offsets, false)); });
});

/// Lays a template on each quad of a bent mesh, with as many threads as the argument says.
Row const lay("stitch lay on a million quads, threads", {{1}, {2}}, [](Run& run) {
    StitchTemplate const made = crossing();
    PolygonMesh const mesh = Meshes::bentQuads(1'000'000);
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
    tbb::global_control const allowed(tbb::global_control::max_allowed_parallelism, run.size());
    tbb::blocked_range<std::size_t> const quads(0, mesh.faceCount(), Modeling::kElementGrain);
    timeRuns(run, laid.size, [&] { Modeling::parallelFor(quads, layOnRange); }); // each quad writes its own stretch
});

}
