#include <Modeling/StitchTemplate.h>

#include "frame/VectorMath.h"
#include "support/Testing.h"

#include <algorithm>
#include <bit>
#include <limits>
#include <string>
#include <vector>

using namespace Modeling;
using namespace TestSupport;
using Tessara::Modeling::pair;
using Tessara::Modeling::StitchTemplate;
using Points = Orvan::Array<float3>;
using Indices = Orvan::Array<unsigned int>;
using Ends = Orvan::Array<pair>;
using Weights = Orvan::Array<float>;

namespace {

template <class T> auto shared(Orvan::Array<T> const& array)
{
    return Orvan::makePtr<Orvan::Array<T>>(array);
}

StitchTemplate filled(Points const& polygon, Points const& positions, Indices const& offsets, bool strict)
{
    return {shared(polygon), shared(positions), shared(offsets), strict};
}

Points square(float side = 1, float z = 0)
{
    return {{0, 0, 0}, {side, 0, 0}, {side, side, z}, {0, side, 0}};
}

/// Corners at ascending angles around the origin.
Points randomPolygon(unsigned int corners, bool isConvex, bool isClockwise, Random& random)
{
    Points polygon(corners);
    for (unsigned int i = 0; i != corners; ++i) {
        float const angle =
            6.2831853f * (static_cast<float>(i) + 0.3f * random.coordinate()) / static_cast<float>(corners);
        float const radius = isConvex ? 1 : 0.65f + 0.35f * random.coordinate();
        polygon[isClockwise ? corners - 1 - i : i] = {radius * std::cos(angle), radius * std::sin(angle), 0};
    }
    return polygon;
}

float3 between(float3 const& a, float3 const& b, float t)
{
    return a + (b - a) * t;
}

/// On an edge, at its middle (so that several strands end there), on its line, inside, near a corner, or anywhere.
float3 randomPoint(Points const& polygon, Random& random)
{
    unsigned int const i = random.below(polygon.size);
    float3 const &a = polygon[i], &b = polygon[(i + 1) % polygon.size];
    float3 const onEdge = between(a, b, 0.5f + 0.5f * random.coordinate());
    float3 const points[] = {onEdge, onEdge, between(a, b, 0.5f), between(a, b, 2 * random.coordinate()),
        between({0, 0, random.coordinate()}, onEdge, 0.5f), {a.x + 0.03f * random.coordinate(), a.y, 0},
        {2 * random.coordinate(), 2 * random.coordinate(), random.coordinate()}};
    return points[random.below(std::size(points))];
}

/// Two ends are sorted by the weight of the edge's first corner. More than two are sorted by the weight of its second
/// corner, and of several at the same place only the last is kept.
Ends inOrder(Ends recorded, StitchTemplate const& made, unsigned int edge)
{
    auto const weightOf = [&](pair const& place, unsigned int corner) {
        auto const& points = made.getStrands()[place.strand].controlPoints;
        return points[place.end ? points.size - 1 : 0][corner % made.getPolySize()];
    };
    if (recorded.size == 2 && weightOf(recorded[1], edge) > weightOf(recorded[0], edge))
        std::swap(recorded[0], recorded[1]);
    if (recorded.size <= 2)
        return recorded;
    std::map<float, pair> lasts;
    for (pair const& place : recorded)
        lasts.insert_or_assign(weightOf(place, edge + 1), place);
    Ends sorted;
    for (auto const& [weight, place] : lasts)
        sorted.append(place);
    return sorted;
}

TEST(StitchTemplate, KeepsCoordinatesAndRecordsEndsInOrder)
{
    for (unsigned int seed = 0; seed != 600; ++seed) {
        SCOPED_TRACE(seed);
        Random random(seed);
        unsigned int const corners = seed % 8 == 0 ? 16 + random.below(3) : 3 + random.below(7);
        Points polygon = randomPolygon(corners, random.below(2) == 0, random.below(2) == 0, random);
        if (seed % 100 == 99)
            polygon = Points(corners, float3{1, 1, 0}); // divisions by zero are not guarded
        Points positions;
        Indices offsets{0};
        for (unsigned int strand = random.below(30); strand != 0; --strand) {
            for (unsigned int point = random.below(4); point != 0; --point)
                positions.append(randomPoint(polygon, random));
            offsets.append(static_cast<unsigned int>(positions.size));
        }
        offsets.append(offsets[offsets.size - 1]);
        bool const strict = random.below(2) == 0;
        StitchTemplate const made = filled(polygon, positions, offsets, strict);

        float perimeter = 0;
        for (unsigned int i = 0; i != corners; ++i)
            perimeter += length(polygon[(i + 1) % corners] - polygon[i]);
        float const scale = perimeter / static_cast<float>(corners);
        EXPECT_EQ(made.getTol(), 0.02f * scale);
        ASSERT_EQ(made.getStrands().size, offsets.size - 1);
        StitchTemplate single; // computes coordinates point by point, and collects the expected errors
        single.setErrors("");
        single.setPolySize(corners);
        single.setTol(made.getTol());
        auto const expectError = [&](char const* error) {
            Orvan::String errors = single.getErrors();
            errors += error;
            single.setErrors(errors);
        };
        Orvan::Array<Ends> onEdges(corners);
        for (unsigned int strand = 0; strand + 1 != offsets.size; ++strand) {
            auto const& points = made.getStrands()[strand].controlPoints;
            ASSERT_EQ(points.size, offsets[strand + 1] - offsets[strand]);
            for (unsigned int point = 0; point != points.size; ++point) {
                Weights weights(corners + 1);
                unsigned int const edge =
                    single.computeMeanValueCoordinates(polygon, positions[offsets[strand] + point], weights, scale);
                ASSERT_EQ(points[point].size, weights.size);
                EXPECT_EQ(std::memcmp(points[point].data, weights.data, weights.size * sizeof(float)), 0);
                for (bool const isEnd : {false, true})
                    if (point != (isEnd ? points.size - 1 : 0))
                        continue;
                    else if (edge != 0xFFFFFFFF)
                        onEdges[edge].append(pair{strand, isEnd});
                    else if (strict)
                        expectError(isEnd ? "---strand ending point not on polygon edge---"
                                          : "---strand starting point not on polygon edge---");
            }
        }
        for (unsigned int edge = 0; edge != corners; ++edge) {
            bool const isRefused = strict && onEdges[edge].size != 1 && onEdges[edge].size != 2;
            if (isRefused)
                expectError("---polygon edge contains too few/many strand end points---");
            EXPECT_EQ(made.getEdgeEndpoints()[edge], isRefused ? onEdges[edge] : inOrder(onEdges[edge], made, edge));
        }
        EXPECT_EQ(made.getErrors(), single.getErrors());
    }
}

TEST(StitchTemplate, ReportsFaultsOfItsInput)
{
    Points const across{{0.5f, 0, 0}, {0.5f, 0.5f, 0}, {0.5f, 1, 0}};
    Indices const one{0, 3};
    struct {
        Points polygon, positions;
        Indices offsets;
        bool strict;
        char const* errors;
    } const cases[] = {
        {{}, across, one, false, "---invalid input: polygon is empty---"},
        {{{0, 0, 0}, {1, 0, 0}}, across, one, false, "---invalid input: polygon is degenerated---"},
        {square(), across, {0}, false, "---invalid input: empty input strands offset---"},
        {square(1, 0.02f), across, one, false, ""},
        {square(10, 0.3f), {}, {0, 0}, false, "---invalid input: input polygon must lie in the xy plane---"},
        {square(10, 0.19f), {}, {0, 0}, false, ""},
        {square(), across, one, true,
            "---polygon edge contains too few/many strand end points---"
            "---polygon edge contains too few/many strand end points---"},
        {square(), {{0, 0, 0}}, {0, 1}, false, "---control point too close to polygon vertex---"},
        {square(), {{0.5f, 3, 0}}, {0, 1}, false,
            "---point lies too far out side of polygon------point lies too far out side of polygon---"},
        // Decreasing offsets, and offsets beyond the positions.
        {square(), across, {2, 1, 4}, false, ""},
    };
    for (auto const& c : cases)
        EXPECT_EQ(filled(c.polygon, c.positions, c.offsets, c.strict).getErrors(), c.errors);
    EXPECT_TRUE(filled(square(), across, {2, 1, 4}, false).getStrands()[1].controlPoints.empty());
    EXPECT_EQ(StitchTemplate(shared(square()), nullptr, shared(one), false).getErrors(),
        "---invalid input: missing polygon or strand---");

    // Ends so close to corners that the other weight of the edge rounds to 0.
    StitchTemplate loose;
    loose.setErrors("");
    loose.setTol(1e-12f);
    loose.construct(shared(square()), shared(Points{{1e-9f, 0, 0}, {1, 1e-9f, 0}}), shared(Indices{0, 2}), false);
    EXPECT_EQ(loose.getErrors(),
        "---strand starting point on edge but outside of polygon------strand ending point on edge but outside of "
        "polygon---");
}

TEST(StitchTemplate, TakesThePolygonFromTheOnlyFace)
{
    auto const strands = makeStrands({{0.5f, 0, 0}, {0.5f, 1, 0}}, {0, 2});
    auto const errorsOf = [&](auto const& mesh) { return StitchTemplate(mesh, *strands, false).getErrors(); };
    auto const mesh = makeMesh({{9, 9, 9}, {0, 1, 0}, {1, 1, 0}, {1, 0, 0}, {0, 0, 0}}, {4, 3, 2, 1}, {0, 4});
    StitchTemplate const expected = filled(square(), *dataOf<float3>(*strands, sPointPosition), {0, 2}, false);
    EXPECT_EQ(errorsOf(*mesh), "");
    EXPECT_EQ(StitchTemplate(*mesh, *strands, false).getStrands(), expected.getStrands());
    EXPECT_EQ(errorsOf(*makeMesh(square(), {0, 1, 2, 0, 2, 3}, {0, 3, 6})), "---input mesh not single polygon---");
    EXPECT_EQ(errorsOf(*makeMesh(square(), {0, 1, 2, 4}, {0, 4})), "---invalid input: missing polygon or strand---");
    EXPECT_EQ(StitchTemplate(*mesh, *mesh, false).getErrors(), "---invalid input: missing polygon or strand---");
    mesh->eraseProperty(sPointPosition);
    EXPECT_EQ(errorsOf(*mesh), "---input poly missing point_positions property---");
    mesh->eraseProperty(sFaceVertex);
    EXPECT_EQ(errorsOf(*mesh), "---input poly missing face_vertices property---");
}

TEST(StitchTemplate, AddsToWhatItHoldsWhenFilled)
{
    StitchTemplate made;
    EXPECT_EQ(made.getErrors(), "---empty stitch template---");
    EXPECT_EQ(made.getTol(), 0.02f);
    auto const fill = [&](Points const& polygon, Points const& positions) {
        made.construct(shared(polygon), shared(positions), shared(Indices{0, 2}), false);
    };
    fill(square(10), {{5, 0, 0}, {5, 10, 0}});
    EXPECT_EQ(made.getTol(), 0.02f * 10);
    fill(square(10), {{2.5f, 0, 0}, {10, 5, 0}});
    EXPECT_EQ(made.getTol(), 0.02f * 10 * 10);
    EXPECT_EQ(made.getStrands().size, 2);
    EXPECT_EQ(made.getEdgeEndpoints()[0], (Ends{{0, false}, {0, false}}));
    fill({{0, 0, 0}, {90, 0, 0}, {0, 90, 0}}, {{30, 0, 0}, {30, 60, 0}}); // fewer corners than the earlier strands have
    EXPECT_EQ(made.getEdgeEndpoints().size, 3);

    // Ends of missing strands, and of one with too few weights for edge 3.
    made.setEdgeEndpoints({{{99, true}, {98, true}}, {}, {}, {{2, true}, {50, false}, {2, true}}});
    fill({{0, 0, 0}, {2, 0, 0}, {3, 1, 0}, {2, 2, 0}, {0, 2, 0}}, {{1, 0, 0}, {1, 1, 0}});
    EXPECT_EQ(made.getPolySize(), 5);
    EXPECT_EQ(made.getEdgeEndpoints()[3], (Ends{{2, true}}));

    // A weight that is NaN is sorted as 0.
    auto const withWeight = [](float second) { return Tessara::Modeling::LocalStrand{3, {Weights{0, second, 0, 0}}}; };
    made.setStrands({withWeight(kNan), withWeight(0.5f), withWeight(-0.5f)});
    made.setEdgeEndpoints({{{1, false}, {0, false}, {2, false}}, {}, {}});
    fill({{0, 0, 0}, {90, 0, 0}, {0, 90, 0}}, {{30, 30, 0}, {31, 31, 0}});
    EXPECT_EQ(made.getEdgeEndpoints()[0], (Ends{{2, false}, {0, false}, {1, false}}));
}

TEST(StitchTemplate, ComputesMeanValueCoordinates)
{
    for (unsigned int seed = 0; seed != 400; ++seed) {
        SCOPED_TRACE(seed);
        Random random(seed);
        unsigned int const corners = 3 + random.below(18);
        bool const isConvex = seed % 2 == 0;
        Points const polygon = randomPolygon(corners, isConvex, seed % 4 < 2, random);
        float const along = 0.5f + 0.4f * random.coordinate();
        float3 const onEdge = between(polygon[0], polygon[1], along);
        float3 const point = between({0, 0, random.coordinate()}, onEdge, 0.4f);
        StitchTemplate made;
        made.setPolySize(corners);
        made.setTol(1e-4f);
        Weights edgeWeights(corners + 1), weights(corners + 1), expected(corners);
        EXPECT_EQ(made.computeMeanValueCoordinates(polygon, onEdge, edgeWeights, 0.5f), 0u);
        EXPECT_NEAR(edgeWeights[1], along, 1e-5f);
        EXPECT_EQ(edgeWeights[1], 1 - edgeWeights[0]);
        EXPECT_EQ(std::count(edgeWeights.begin(), edgeWeights.end(), 0.0f), corners - 1);

        // From the tangents of half the angles that the edges subtend at the point.
        EXPECT_EQ(made.computeMeanValueCoordinates(polygon, point, weights, 0.5f), 0xFFFFFFFF);
        float sum = 0;
        for (unsigned int i = 0; i != corners; ++i) {
            float3 const to = polygon[i] - float3{point.x, point.y, 0};
            for (unsigned int const j : {(i + 1) % corners, (i + corners - 1) % corners}) {
                float3 const other = polygon[j] - float3{point.x, point.y, 0};
                float const turn = std::atan2(cross(to, other).z, dot(to, other));
                expected[i] += std::tan((j == (i + 1) % corners ? turn : -turn) / 2) / length(to);
            }
            sum += expected[i];
        }
        for (unsigned int i = 0; i != corners; ++i) {
            EXPECT_NEAR(weights[i], expected[i] / sum, 2e-4f);
            EXPECT_TRUE(!isConvex || weights[i] > 0);
        }
        EXPECT_EQ(weights[corners], point.z / 0.5f);
        for (float const side : {1.0f, -1.0f}) {
            float3 const there{point.x, point.y, side * point.z};
            float3 found[2];
            made.findControlPointPos(polygon, weights, 0.5f, side < 0, found[0]);
            made.findControlPointPos(polygon, weights, 0.5f, Points(corners, float3{0, 0, 3}), side < 0, found[1]);
            EXPECT_LT(length(found[1] - there), 2e-5f);
            bool const isUp = cross(polygon[1] - polygon[0], polygon[2] - polygon[0]).z > 0;
            EXPECT_LT(length(found[0] - float3{there.x, there.y, isUp ? there.z : -there.z}), 2e-5f);
        }
    }
}

struct Weighed {
    unsigned int edge = 0xFFFFFFFF;
    std::string errors = {};
};

/// Mean value coordinates corner by corner, in the order of operations that results depend on.
Weighed weighOneByOne(Points const& polygon, float3 const& point, float tolerance, float scale, Weights& weights)
{
    unsigned int const corners = static_cast<unsigned int>(polygon.size);
    auto const next = [=](unsigned int i) { return (i + 1) % corners; };
    std::vector<float> x, y, r, area, dot;
    weights[corners] = point.z / scale;
    for (unsigned int i = 0; i != corners; ++i) {
        x.push_back(polygon[i].x - point.x);
        y.push_back(polygon[i].y - point.y);
        r.push_back(std::sqrt(x[i] * x[i] + y[i] * y[i]));
        if (tolerance > r[i]) {
            weights[i] = 1;
            return {.errors = "---control point too close to polygon vertex---"};
        }
    }
    float const areaTolerance = tolerance * scale;
    for (unsigned int i = 0; i != corners; ++i) {
        area.push_back((y[next(i)] * x[i] - y[i] * x[next(i)]) * 0.5f);
        dot.push_back(y[i] * y[next(i)] + x[i] * x[next(i)]);
        if (areaTolerance > std::abs(area[i]) && 0 > dot[i]) {
            weights[i] = r[next(i)] / (r[next(i)] + r[i]);
            weights[next(i)] = 1 - weights[i];
            return {.edge = i};
        }
    }
    float sum = 0;
    for (unsigned int i = 0; i != corners; ++i) {
        unsigned int const previous = (i + corners - 1) % corners;
        if (std::abs(area[previous]) >= areaTolerance)
            weights[i] += (r[previous] - dot[previous] / r[i]) / area[previous];
        if (std::abs(area[i]) >= areaTolerance)
            weights[i] += (r[next(i)] - dot[i] / r[i]) / area[i];
        sum += weights[i];
    }
    Weighed weighed;
    for (unsigned int i = 0; i != corners; ++i) {
        weights[i] /= sum;
        if (-0.2f > weights[i])
            weighed.errors += "---point lies too far out side of polygon---";
    }
    return weighed;
}

/// The bits of weights; all NaN are one, because compilers may swap operands.
std::vector<std::uint32_t> bitsOf(Weights const& weights)
{
    std::vector<std::uint32_t> bits;
    for (float const weight : weights)
        bits.push_back(std::bit_cast<std::uint32_t>(std::isnan(weight) ? kNan : weight));
    return bits;
}

TEST(StitchTemplate, KeepsTheOrderOfOperations)
{
    float const infinity = std::numeric_limits<float>::infinity();
    for (unsigned int seed = 0; seed != 20'000; ++seed) {
        SCOPED_TRACE(seed);
        Random random(seed);
        unsigned int const corners = 1 + random.below(18); // any number in the last group of four
        Points polygon = randomPolygon(corners, random.below(2) == 0, random.below(2) == 0, random);
        float3 point = randomPoint(polygon, random);
        for (float* const value : {&polygon[random.below(corners)].y, &point.x})
            if (random.below(40) == 0)
                *value = std::vector<float>{kNan, infinity, -infinity, 1e20f, -1e-30f}[random.below(5)];
        Weights weights(corners + 1);
        if (random.below(4) == 0) // sums start from what is there
            std::generate(
                weights.begin(), weights.end(), [&] { return random.below(3) == 0 ? -0.0f : random.coordinate(); });
        Weights expected = weights;
        StitchTemplate made;
        made.setErrors("");
        made.setPolySize(corners);
        made.setTol(std::vector<float>{0.02f, 0.02f, 1e-4f, 0, -1}[random.below(5)]);
        float const scale = random.below(4) == 0 ? random.coordinate() : 1;
        auto const [edge, errors] = weighOneByOne(polygon, point, made.getTol(), scale, expected);
        EXPECT_EQ(made.computeMeanValueCoordinates(polygon, point, weights, scale), edge);
        EXPECT_EQ(bitsOf(weights), bitsOf(expected));
        EXPECT_EQ(made.getErrors(), errors.c_str());
    }
}

TEST(StitchTemplate, ExcludesTolerancesAndRightAnglesFromEdges)
{
    StitchTemplate made;
    float3 found{};
    Weights weights(5);
    made.setPolySize(4);
    made.setTol(0.25f); // times the scale, the area of the triangles of the point and the edges at corner 0
    EXPECT_EQ(made.computeMeanValueCoordinates(square(), {0.25f, 0.25f, 0}, weights, 0.5f), 0xFFFFFFFF);
    made.findControlPointPos(square(), weights, 0.5f, false, found);
    EXPECT_LT(length(found - float3{0.25f, 0.25f, 0}), 1e-6f);
    StitchTemplate withoutCorners;
    Weights height(1);
    EXPECT_EQ(withoutCorners.computeMeanValueCoordinates({}, {1, 2, 3}, height, 2), 0xFFFFFFFF);
    EXPECT_EQ(height, Weights{1.5f});
    // A short edge subtends a right angle at the point, in a triangle smaller than the tolerance.
    EXPECT_EQ(made.computeMeanValueCoordinates({{0.25f, 0, 0}, {1, 0, 0}, {0, 1, 0}, {0, 0.25f, 0}}, {}, weights, 0.5f),
        0xFFFFFFFF);
}

TEST(StitchTemplate, LetsStrandsMeetOnSharedEdges)
{
    // Mirrored ends on edges 1 and 3; the second quad is bent and shares edge 1 of the first.
    StitchTemplate const made = filled(square(), {{0, 0.25f, 0}, {0.5f, 0.5f, 0.2f}, {1, 0.25f, 0}}, {0, 3}, false);
    Points const left{{0, 0, 0}, {2, 0.5f, 1}, {3, 2, 1}, {0, 2, 0.5f}}, right{left[1], {5, 1, 0}, {4, 4, 1}, left[2]};
    float3 end{}, start{};
    made.findControlPointPos(left, made.getStrands()[0].controlPoints[2], 1, false, end);
    made.findControlPointPos(right, made.getStrands()[0].controlPoints[0], 1, false, start);
    EXPECT_EQ(std::memcmp(&end, &start, sizeof end), 0);

    // Short arrays are read up to their end; without a height or a triangle there is no offset.
    Weights quarters{0.25f, 0.25f, 0.25f, 0.25f, 9};
    quarters.resize(4); // the 9 remains in memory behind the end
    made.findControlPointPos(square(), quarters, 1, false, end);
    EXPECT_EQ(end, (float3{0.5f, 0.5f, 0}));
    made.findControlPointPos(Points{{4, 8, 0}}, quarters, 1, false, end);
    EXPECT_EQ(end, (float3{1, 2, 0}));
    made.findControlPointPos(Points{{4, 8, 0}, {4, 8, 4}}, quarters, 1, Points{}, false, end);
    EXPECT_EQ(end, (float3{2, 4, 1}));
}

TEST(StitchTemplate, StaysUsableWhenMemoryRunsOut)
{
    Random random(1);
    auto const polygon = shared(randomPolygon(17, true, false, random));
    auto const positions = shared(Points(6, between((*polygon)[0], (*polygon)[1], 0.5f)));
    auto const offsets = shared(Indices{0, 2, 4, 6});
    sweepFailingAllocations([&](Attempt const& attempt) {
        StitchTemplate made;
        if (!attempt([&] { made.construct(polygon, positions, offsets, false); }))
            made = StitchTemplate(polygon, positions, offsets, false);
        EXPECT_EQ(made.getStrands().size, 3);
        EXPECT_EQ(made.getEdgeEndpoints()[0], (Ends{{2, true}}));
    });
}

}
