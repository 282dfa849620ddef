#include <Modeling/StitchTemplate.h>

#include "frame/VectorMath.h"
#include "support/Testing.h"

#include <bit>

using namespace Modeling;
using namespace TestSupport;
using Tessara::Modeling::pair;
using Tessara::Modeling::StitchTemplate;
using Points = Orvan::Array<float3>;
using Indices = Orvan::Array<unsigned int>;
using Ends = Orvan::Array<pair>;
using Weights = Orvan::Array<float>;

namespace {

/// What a template is to hold: written as it is defined, corner by corner, with no care for time or memory.
struct PlainTemplate {
    unsigned int polySize = 0;
    Orvan::Array<Tessara::Modeling::LocalStrand> strands;
    Orvan::Array<Ends> edges;
    std::string errors;
    float tol = 0.02f;

    unsigned int coordinates(Points const& polygon, float3 const& point, Weights& weights, float scale)
    {
        unsigned int const n = polySize;
        weights[n] = point.z / scale;
        std::vector<float3> way(n);
        std::vector<float> r(n), area(n), dot(n);
        for (unsigned int i = 0; i < n; ++i) {
            way[i] = polygon[i] - point;
            r[i] = std::sqrt(way[i].x * way[i].x + way[i].y * way[i].y);
            if (tol > r[i]) {
                weights[i] = 1;
                errors += "---control point too close to polygon vertex---";
                return 0xFFFFFFFF;
            }
        }
        float const areaTol = tol * scale;
        for (unsigned int i = 0; i < n; ++i) {
            unsigned int const j = (i + 1) % n;
            area[i] = (way[j].y * way[i].x - way[i].y * way[j].x) * 0.5f;
            dot[i] = way[i].y * way[j].y + way[i].x * way[j].x;
            if (areaTol > std::fabs(area[i]) && 0.0f > dot[i]) {
                weights[i] = r[j] / (r[j] + r[i]);
                weights[j] = 1.0f - weights[i];
                return i; // both are from 0 to 1
            }
        }
        float sum = 0;
        for (unsigned int i = 0; i < n; ++i) {
            unsigned int const j = (i + 1) % n, h = (i + n - 1) % n;
            if (std::fabs(area[h]) >= areaTol)
                weights[i] += (r[h] - dot[h] / r[i]) / area[h];
            if (std::fabs(area[i]) >= areaTol)
                weights[i] += (r[j] - dot[i] / r[i]) / area[i];
            sum += weights[i];
        }
        for (unsigned int i = 0; i < n; ++i) {
            weights[i] /= sum;
            if (-0.2f > weights[i])
                errors += "---point lies too far out side of polygon---";
        }
        return 0xFFFFFFFF;
    }

    void fill(Points const& polygon, Points const& positions, Indices const& offsets, bool strict)
    {
        polySize = static_cast<unsigned int>(polygon.size);
        edges.resize(polySize);
        float scale = 0;
        for (unsigned int i = 0; i < polySize; ++i) {
            float3 const edge = polygon[(i + 1) % polySize] - polygon[i];
            scale += std::sqrt(edge.x * edge.x + edge.y * edge.y);
        }
        tol *= scale /= static_cast<float>(polySize);
        for (unsigned int strand = 0; strand + 1 < offsets.size; ++strand) {
            strands.append({polySize, {}});
            for (unsigned int p = offsets[strand]; p < offsets[strand + 1]; ++p) {
                Weights weights(polySize + 1);
                unsigned int const edge = coordinates(polygon, positions[p], weights, scale);
                if (p == offsets[strand])
                    end({strand, false}, edge, weights, strict);
                if (p == offsets[strand + 1] - 1)
                    end({strand, true}, edge, weights, strict);
                strands[strand].controlPoints.append(weights);
            }
        }
        for (unsigned int i = 0; i < polySize; ++i)
            order(i, strict);
    }

    void end(pair const& place, unsigned int edge, Weights const& weights, bool strict)
    {
        std::string const which = place.end ? "---strand ending point " : "---strand starting point ";
        if (edge != 0xFFFFFFFF && weights[edge] > 0 && weights[(edge + 1) % polySize] > 0)
            edges[edge].append(place);
        else if (edge != 0xFFFFFFFF || strict)
            errors += which + (edge == 0xFFFFFFFF ? "not on polygon edge---" : "on edge but outside of polygon---");
    }

    void order(unsigned int i, bool strict)
    {
        auto const weightOf = [this](pair const& place, unsigned int corner) {
            auto const& points = strands[place.strand].controlPoints;
            return points[place.end ? points.size - 1 : 0][corner];
        };
        Ends& ends = edges[i];
        if (ends.size == 2) {
            if (weightOf(ends[1], i) > weightOf(ends[0], i))
                std::swap(ends[0], ends[1]);
        } else if (ends.size != 1 && strict) {
            errors += "---polygon edge contains too few/many strand end points---";
        } else if (ends.size > 2) {
            std::map<float, pair> places;
            for (pair const& place : std::exchange(ends, {}))
                places.insert_or_assign(weightOf(place, (i + 1) % polySize), place);
            for (auto const& [weight, place] : places)
                ends.append(place);
        }
    }
};

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

/// Corners around the origin at angles that ascend.
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

/// Their bits, since not all are numbers.
std::vector<unsigned int> bitsOf(Orvan::Array<Tessara::Modeling::LocalStrand> const& strands)
{
    std::vector<unsigned int> bits;
    for (auto const& strand : strands) {
        bits.insert(bits.end(), {strand.polySize, static_cast<unsigned int>(strand.controlPoints.size)});
        for (Weights const& weights : strand.controlPoints)
            for (float const weight : weights)
                bits.push_back(std::bit_cast<unsigned int>(weight));
    }
    return bits;
}

/// On an edge, in its middle (where several strands end), on its line, inside, near a corner, or anywhere.
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

TEST(StitchTemplate, AgreesWithPlainTemplates)
{
    for (unsigned int seed = 0; seed != 600; ++seed) {
        SCOPED_TRACE(seed);
        Random random(seed);
        unsigned int const corners = seed % 8 == 0 ? 16 + random.below(3) : 3 + random.below(7);
        Points polygon = randomPolygon(corners, random.below(2) == 0, random.below(2) == 0, random);
        if (seed % 100 == 99)
            polygon = Points(corners, float3{1, 1, 0}); // nothing guards the divisions
        Points positions;
        Indices offsets{0};
        for (unsigned int strand = random.below(30); strand != 0; --strand) {
            for (unsigned int point = random.below(4); point != 0; --point)
                positions.append(randomPoint(polygon, random));
            offsets.append(static_cast<unsigned int>(positions.size));
        }
        offsets.append(offsets[offsets.size - 1]);
        bool const strict = random.below(2) == 0;
        PlainTemplate plain;
        plain.fill(polygon, positions, offsets, strict);
        StitchTemplate const made = filled(polygon, positions, offsets, strict);
        EXPECT_EQ(made.getErrors(), plain.errors.c_str());
        EXPECT_EQ(made.getTol(), plain.tol);
        EXPECT_EQ(bitsOf(made.getStrands()), bitsOf(plain.strands));
        EXPECT_EQ(made.getEdgeEndpoints(), plain.edges);
    }
}

TEST(StitchTemplate, TellsWhatIsWrong)
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
        // Offsets that fall, or lead beyond the positions.
        {square(), across, {2, 1, 4}, false, ""},
    };
    for (auto const& c : cases)
        EXPECT_EQ(filled(c.polygon, c.positions, c.offsets, c.strict).getErrors(), c.errors);
    EXPECT_TRUE(filled(square(), across, {2, 1, 4}, false).getStrands()[1].controlPoints.empty());
    EXPECT_EQ(StitchTemplate(shared(square()), nullptr, shared(one), false).getErrors(),
        "---invalid input: missing polygon or strand---");

    // Ends so near to corners that the other weight of the edge rounds to 0.
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

TEST(StitchTemplate, FillingClearsNothing)
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
    fill({{0, 0, 0}, {90, 0, 0}, {0, 90, 0}}, {{30, 0, 0}, {30, 60, 0}}); // fewer corners than the old strands have
    EXPECT_EQ(made.getEdgeEndpoints().size, 3);

    // Of no strand, and of one with too few weights for edge 3.
    made.setEdgeEndpoints({{{99, true}, {98, true}}, {}, {}, {{2, true}, {50, false}, {2, true}}});
    fill({{0, 0, 0}, {2, 0, 0}, {3, 1, 0}, {2, 2, 0}, {0, 2, 0}}, {{1, 0, 0}, {1, 1, 0}});
    EXPECT_EQ(made.getPolySize(), 5);
    EXPECT_EQ(made.getEdgeEndpoints()[3], (Ends{{2, true}}));
}

TEST(StitchTemplate, CoordinatesGivePointsBack)
{
    for (unsigned int seed = 0; seed != 200; ++seed) {
        Random random(seed);
        unsigned int const corners = 3 + random.below(18);
        Points const polygon = randomPolygon(corners, true, false, random);
        float3 const point = between({0, 0, random.coordinate()}, between(polygon[0], polygon[1], 0.5f), 0.4f);
        StitchTemplate made;
        made.setPolySize(corners);
        made.setTol(1e-4f);
        Weights weights(corners + 1);
        EXPECT_EQ(made.computeMeanValueCoordinates(polygon, point, weights, 0.5f), 0xFFFFFFFF);
        EXPECT_GT(*std::min_element(weights.begin(), weights.end() - 1), 0);
        for (float const side : {1.0f, -1.0f}) {
            float3 const expected{point.x, point.y, side * point.z};
            float3 found[2];
            made.findControlPointPos(polygon, weights, 0.5f, side < 0, found[0]);
            made.findControlPointPos(polygon, weights, 0.5f, Points(corners, float3{0, 0, 3}), side < 0, found[1]);
            EXPECT_TRUE(length(found[0] - expected) < 1e-5f && length(found[1] - expected) < 1e-5f);
        }
    }
}

TEST(StitchTemplate, TolerancesAndRightAnglesDoNotCountAsNear)
{
    StitchTemplate made;
    float3 found{};
    Weights weights(5);
    made.setPolySize(4);
    made.setTol(0.125f); // the area of the point and edge 3
    EXPECT_EQ(made.computeMeanValueCoordinates(square(), {0.25f, 0.5f, 0}, weights, 1), 0xFFFFFFFF);
    made.findControlPointPos(square(), weights, 1, false, found);
    EXPECT_LT(length(found - float3{0.25f, 0.5f, 0}), 1e-6f);
    // The point sees a short edge under a right angle, in a triangle that is smaller than the tolerance.
    EXPECT_EQ(made.computeMeanValueCoordinates({{0.25f, 0, 0}, {1, 0, 0}, {0, 1, 0}, {0, 0.25f, 0}}, {}, weights, 1),
        0xFFFFFFFF);

    Weights noHeight{0.25f, 0.25f, 0.25f, 0.25f, 9};
    noHeight.resize(4); // the 9 is still in the memory behind
    made.findControlPointPos(square(), noHeight, 1, false, found);
    EXPECT_TRUE(found.x == 0.5f && found.y == 0.5f && found.z == 0);
}

TEST(StitchTemplate, StrandsMeetOnSharedEdges)
{
    // Mirrored ends on edges 1 and 3; the second quad lies beyond edge 1 of the first and is bent.
    StitchTemplate const made = filled(square(), {{0, 0.25f, 0}, {0.5f, 0.5f, 0.2f}, {1, 0.25f, 0}}, {0, 3}, false);
    Points const left{{0, 0, 0}, {2, 0.5f, 1}, {3, 2, 1}, {0, 2, 0.5f}}, right{left[1], {5, 1, 0}, {4, 4, 1}, left[2]};
    float3 end{}, start{};
    made.findControlPointPos(left, made.getStrands()[0].controlPoints[2], 1, false, end);
    made.findControlPointPos(right, made.getStrands()[0].controlPoints[0], 1, false, start);
    EXPECT_EQ(std::memcmp(&end, &start, sizeof end), 0);

    // Of short arrays what is there is taken; without a height or a triangle the point stays in the polygon.
    Weights const quarter{0.25f, 0.25f};
    made.findControlPointPos(Points{{4, 8, 0}}, quarter, 1, false, end);
    EXPECT_TRUE(end.x == 1 && end.y == 2 && end.z == 0);
    made.findControlPointPos(Points{{4, 8, 0}, {4, 8, 4}}, quarter, 1, Points{}, false, end);
    EXPECT_TRUE(end.x == 2 && end.y == 4 && end.z == 1);
}

TEST(StitchTemplate, FailingAllocationsLeaveTemplatesUsable)
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
