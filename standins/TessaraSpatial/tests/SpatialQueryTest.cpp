#include "support/Testing.h"

#include <TessaraSpatial/SpatialQuery.h>

using namespace Tessara::SpatialQuery;
using Tessara::Math::float2, TestSupport::kNan, TestSupport::Random;

namespace {

constexpr float kInfinity = std::numeric_limits<float>::infinity();

int turn(float2 const& a, float2 const& b, float2 const& c)
{
    return static_cast<int>(pointEdgeOrientation(a, b, c));
}

struct Answer {
    int place;
    float u, v, w;

    bool isInside() const { return place >= kInsideTriangle && place <= kOnEdgeAB; }
};

Answer query(float2 const& p, float2 const& a, float2 const& b, float2 const& c)
{
    Answer answer{};
    bool const isInside = pointInTriangle(p, a, b, c, answer.u, answer.v, answer.w, &answer.place);
    EXPECT_EQ(isInside, answer.isInside());
    float u = -1, v = -1, w = -1;
    EXPECT_EQ(pointInTriangle(p, a, b, c, u, v, w, nullptr), isInside);
    return answer;
}

}

TEST(PointEdgeOrientation, FindsTheTurn)
{
    struct Case {
        char const* name;
        float2 a, b, c;
        int turn;
    };
    float const tiny = std::numeric_limits<float>::denorm_min();
    float const huge = std::numeric_limits<float>::max();
    for (auto const& [name, a, b, c, expected] : std::vector<Case>{
             {"left", {0, 0}, {1, 0}, {1, 1}, 1},
             {"right", {0, 0}, {1, 0}, {1, -1}, -1},
             {"straight on", {0, 0}, {1, 1}, {3, 3}, 0},
             {"straight back", {0, 0}, {2, 4}, {1, 2}, 0},
             {"smallest numbers", {0, 0}, {tiny, 0}, {0, tiny}, 1},
             {"largest numbers", {-huge, -huge}, {huge, -huge}, {huge, huge}, 1},
             {"one unit beside a long line", {0, 0}, {8388608, 8388607}, {16777216, 16777215}, 1},
             {"not a number", {0, 0}, {1, kNan}, {1, 1}, 0},
             {"back to an infinite start", {kInfinity, 0}, {1, 1}, {kInfinity, 0}, 0},
             {"back from infinity", {0, 0}, {kInfinity, 1}, {0, 0}, 0},
         }) {
        EXPECT_EQ(turn(a, b, c), expected) << name;
        EXPECT_EQ(turn(c, b, a), -expected) << name;
    }
    // Paths with equal points do not turn, even if areas are rounded.
    Random random(1);
    auto const coordinate = [&] { return std::ldexp(random.coordinate(), static_cast<int>(random.below(200)) - 85); };
    for (int i = 0; i < 20'000; ++i) {
        float2 const a{coordinate(), coordinate()}, b{coordinate(), coordinate()};
        ASSERT_TRUE(turn(a, b, a) == 0 && turn(a, a, b) == 0 && turn(a, b, b) == 0);
    }
}

TEST(PointInTriangle, IncludesEdgesButNotCorners)
{
    float2 const a{0, 0}, b{4, 0}, c{0, 4};
    for (auto const& [p, expected] : std::vector<std::pair<float2, Answer>>{
             {{1, 1}, {kInsideTriangle, 0.5f, 0.25f, 0.25f}},
             {{2, 2}, {kOnEdgeBC, 0, 0.5f, 0.5f}},
             {{0, 1}, {kOnEdgeCA, 0.75f, 0, 0.25f}},
             {{3, 0}, {kOnEdgeAB, 0.25f, 0.75f, 0}},
             {{0, -0.0f}, {kAtCornerA, 1, 0, 0}},
             {{4, 0}, {kAtCornerB, 0, 1, 0}},
             {{0, 4}, {kAtCornerC, 0, 0, 1}},
             {{5, 0}, {kOutsideTriangle, -0.25f, 1.25f, 0}}, // on the line of an edge, past its end
             {{-1, 1}, {kOutsideTriangle, 1, -0.25f, 0.25f}},
             {{3, 3}, {kOutsideTriangle, -0.5f, 0.75f, 0.75f}},
             {{std::nextafter(0.0f, 1.0f), 0}, {kOnEdgeAB, 1, 0, 0}}, // next to a corner
             {{2, std::nextafter(2.0f, 3.0f)}, {kOutsideTriangle, 0, 0.5f, 0.5f}},
         }) {
        SCOPED_TRACE(testing::PrintToString(p.x) + ", " + testing::PrintToString(p.y));
        Answer const answer = query(p, a, b, c), mirrored = query(p, a, c, b);
        EXPECT_EQ(answer.place, expected.place);
        EXPECT_LT(std::max({std::abs(answer.u - expected.u), std::abs(answer.v - expected.v),
                      std::abs(answer.w - expected.w)}),
            1e-6f);
        EXPECT_TRUE(mirrored.isInside() == answer.isInside() && mirrored.v == answer.w && mirrored.w == answer.v);
    }
}

TEST(PointInTriangle, FindsNothingInTrianglesWithoutArea)
{
    using Triangle = std::array<float2, 3>;
    for (auto const& [a, b, c] :
        {Triangle{{{0, 0}, {2, 2}, {4, 4}}}, Triangle{{{0, 0}, {4, 4}, {4, 4}}}, Triangle{{{1, 1}, {1, 1}, {1, 1}}},
            Triangle{{{0, 0}, {kNan, 0}, {0, 4}}}, Triangle{{{0, 0}, {kInfinity, 0}, {0, 4}}},
            Triangle{{{-kInfinity, -kInfinity}, {kInfinity, 0}, {0, kInfinity}}}})
        for (float2 const& p : {float2{1, 1}, float2{3, 3}, float2{0, 1}, float2{9, 9}, a, b, c}) {
            Answer const answer = query(p, a, b, c);
            EXPECT_FALSE(answer.isInside());
            EXPECT_TRUE(answer.u == 0.0f && answer.v == 0.0f && answer.w == 0.0f);
        }
    for (float2 const& p : {float2{kNan, 1}, float2{1, kInfinity}, float2{-kInfinity, kInfinity}})
        EXPECT_FALSE(query(p, {0, 0}, {4, 0}, {0, 4}).isInside());
}

// Each point near the shared edge of two triangles is in at least one of them, even if areas are rounded.
TEST(PointInTriangle, LeavesNoGapAtASharedEdge)
{
    Random random(2);
    auto const between0And1 = [&] { return std::abs(random.coordinate()); };
    for (int i = 0; i < 20'000; ++i) {
        float2 const a{between0And1(), -between0And1()}, b{between0And1() * 1e-3f, 1.0f + between0And1()};
        float2 const left{-5.0f - between0And1(), between0And1()}, right{5.0f + between0And1(), between0And1()};
        float const t = 0.1f + 0.8f * between0And1();
        float2 const p{a.x + t * (b.x - a.x), a.y + t * (b.y - a.y)};
        ASSERT_TRUE(query(p, a, b, left).isInside() || query(p, a, b, right).isInside());
        ASSERT_EQ(query(p, a, b, left).isInside(), query(p, left, b, a).isInside());
    }
}

// The coordinates are of such different magnitudes that all three areas at the point are rounded to 0.
TEST(PointInTriangle, FindsNothingPastTheTipOfANeedle)
{
    float const past = std::nextafter(1.0f, 2.0f);
    float2 const b{0x1.94fdfap-30f, 0x1.94fdf6p-30f}, c{0x1.3b22d8p-30f, 0x1.3b22d8p-30f};
    EXPECT_EQ(query({past, past}, {1, 1}, b, c).place, kOutsideTriangle);
}
