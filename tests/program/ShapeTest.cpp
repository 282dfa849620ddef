#include "geometry/Shape.h"

#include "geometry/FaceMeasures.h"
#include "geometry/NearestPoint.h"
#include "geometry/largestDistance.h"

#include "support/MeshBuilder.h"
#include "support/Testing.h"

#include <TessaraGeometry/Makers.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <functional>
#include <limits>
#include <tuple>

namespace ModelingProgram {

namespace {

    using testing::ElementsAre;
    using testing::HasSubstr;
    using TestSupport::MeshBuilder;
    using Mesh = Orvan::MutablePtr<Tessara::Object>;

    /// A cube of side 1, cut in half along the diagonals of two sides.
    Mesh wedge(float at, std::initializer_list<unsigned int> corners)
    {
        return Tessara::Geometry::makeMesh(
            {{at, 0, 0}, {at + 1, 0, 0}, {at + 1, 1, 0}, {at, 1, 0}, {at, 0, 1}, {at, 1, 1}}, corners,
            {0, 4, 8, 12, 15, 18});
    }
    constexpr std::initializer_list<unsigned int> kWedge = {0, 3, 2, 1, 0, 4, 5, 3, 1, 2, 5, 4, 0, 1, 4, 3, 5, 2};
    constexpr std::initializer_list<unsigned int> kTurnedWedge = {1, 2, 3, 0, 3, 5, 4, 0, 4, 5, 2, 1, 4, 1, 0, 2, 5, 3};

    ExaminedMesh examined(Mesh const& mesh)
    {
        return examine(arraysOf(*mesh));
    }

    std::vector<unsigned int> sharpPointsOf(Mesh const& mesh, double degrees)
    {
        MeshArrays const arrays = arraysOf(*mesh);
        return sharpPoints(arrays, EdgeSides(arrays), degrees);
    }

    /// Two triangles with a common edge and an angle in degrees between their normals; the second one is optionally
    /// flipped.
    Mesh hinge(double degrees, bool isTurned)
    {
        auto const angle = static_cast<float>(degrees * std::acos(-1) / 180);
        Tessara::Math::float3 const end{-std::cos(angle), 0.5f, std::sin(angle)};
        return Tessara::Geometry::makeMesh(
            {{0, 0, 0}, {0, 1, 0}, {1, 0.5f, 0}, end}, {0, 2, 1, 0, isTurned ? 3u : 1u, isTurned ? 1u : 3u}, {0, 3, 6});
    }

    double largestDistanceByBruteForce(MeshArrays const& points, MeshArrays const& surface)
    {
        double largest = 0;
        for (auto const& p : *points.positions) {
            double nearest = std::numeric_limits<double>::infinity();
            for (unsigned int face = 0; face != surface.faceCount(); ++face) {
                auto const corners = surface.corners(face);
                auto const at = [&](std::size_t i) { return Corner{inDoubles((*surface.positions)[corners[i]]), 0}; };
                nearest =
                    std::min(nearest, length(nearestOf({at(0), at(1), at(2)}, inDoubles(p)).position - inDoubles(p)));
            }
            largest = std::max(largest, nearest);
        }
        return largest;
    }

}

TEST(Shape, OfAMoveEqualsThoseBeforeAndAfter)
{
    MeshBuilder const smooth = MeshBuilder::torus(60, 40);
    Mesh const before = smooth.build(), after = MeshBuilder(smooth).withNoise(0.1f, 3).build();
    MeshArrays const a = arraysOf(*before), b = arraysOf(*after);
    ExaminedMove const move = examineMove(a, b);
    auto const valuesOf = [](Shape const& shape) {
        return std::tuple(shape.volume, shape.area, shape.foldOvers, shape.diagonal);
    };
    EXPECT_EQ(valuesOf(move.before), valuesOf(examine(a).shape));
    EXPECT_EQ(valuesOf(move.after), valuesOf(examine(b).shape));
    EXPECT_NE(move.after.foldOvers, move.before.foldOvers);
    EXPECT_EQ(move.topology.edgeCount, examine(b).topology.edgeCount);
    EXPECT_EQ(move.topology.genus, 1);
}

TEST(Shape, MeshesAreIdenticalIfAllBitsAre)
{
    auto const triangle = [](float x, std::initializer_list<unsigned int> corners) {
        return Tessara::Geometry::makeMesh({{x, 0, 0}, {1, 0, 0}, {0, 1, 0}}, corners, {0, 3});
    };
    auto const isIdentical = [&](Mesh const& mesh) {
        return areIdentical(arraysOf(*triangle(0, {0, 1, 2})), arraysOf(*mesh));
    };
    EXPECT_TRUE(isIdentical(triangle(0, {0, 1, 2})));
    EXPECT_FALSE(isIdentical(triangle(-0.0f, {0, 1, 2})));
    EXPECT_FALSE(isIdentical(triangle(0, {0, 2, 1})));
    EXPECT_FALSE(
        isIdentical(Tessara::Geometry::makeMesh({{0, 0, 0}, {1, 0, 0}, {0, 1, 0}}, {0, 1, 2, 0, 1, 2}, {0, 3, 6})));
}

TEST(Shape, MeasuresVolumeAreaAndFoldOvers)
{
    for (float const at : {0.0f, 4096.0f}) {
        Shape const shape = examined(wedge(at, kWedge)).shape;
        EXPECT_NEAR(shape.volume.value_or(0), 0.5, 1e-12);
        EXPECT_NEAR(shape.area, 3 + std::sqrt(2), 1e-12);
        EXPECT_NEAR(shape.diagonal, std::sqrt(3), 1e-12);
        EXPECT_EQ(shape.foldOvers, 0);
        EXPECT_NEAR(examined(wedge(at, kTurnedWedge)).shape.volume.value_or(0), -0.5, 1e-12);
    }
    EXPECT_FALSE(examined(hinge(0, false)).shape.volume.has_value());
    for (bool const isTurned : {false, true})
        for (double const degrees : {0.0, 90.0, 149.0, 151.0, 180.0}) {
            EXPECT_EQ(examined(hinge(degrees, isTurned)).shape.foldOvers, degrees > kFoldOverDegrees ? 1 : 0);
            EXPECT_EQ(sharpPointsOf(hinge(degrees, isTurned), 89).size(), degrees > 89 ? 2 : 0) << degrees;
        }
    EXPECT_THAT(sharpPointsOf(wedge(0, kWedge), 134), ElementsAre(1, 2, 4, 5)); // where the slope begins and ends
    EXPECT_THAT(sharpPointsOf(wedge(0, kWedge), 136), ElementsAre());
    auto const fin = Tessara::Geometry::makeMesh(
        {{0, 0, 0}, {0, 1, 0}, {1, 0, 0}, {-1, 0, 0}, {0, 0, 1}}, {0, 1, 2, 1, 0, 3, 0, 1, 4}, {0, 3, 6, 9});
    EXPECT_THAT(sharpPointsOf(fin, 180), ElementsAre(0, 1)); // three faces
    auto const nothing = Tessara::Geometry::makeMesh({}, {}, {0});
    EXPECT_EQ(examined(nothing).shape.area, 0);
}

TEST(Shape, FindsFoldOversAndSliversAtAnyScale)
{
    for (float const scale : {1e-15f, 1.0f, 1e15f})
        for (unsigned int const rim : {3u, 8u, 9u, 16u, 40u}) { // the valence of two points
            MeshBuilder wheel = MeshBuilder::wheel(rim, {1});
            for (Tessara::Math::float3& p : wheel.points)
                p = {p.x * scale, p.y * scale, p.z * scale};
            EXPECT_EQ(examined(wheel.build()).shape.foldOvers, rim) << scale;
            wheel.points[rim].z *= 1000; // no longer flat
            EXPECT_EQ(examined(wheel.build()).shape.foldOvers, 0) << scale;
        }
    auto const needle = arraysOf(*MeshBuilder::of({{0, 0, 0}, {1, 0, 0}, {10, 0, 0}}, {{0, 1, 2}}).build());
    float const above = std::nextafter(0.1f, 1.0f); // 10 times 0.1f is rounded to 1
    EXPECT_THAT(countSlivers(needle, {0.1f, above, 0}), ElementsAre(0, 1, 0));
    EXPECT_EQ(examine(needle, 0.1f).sliverCount, 0);
    EXPECT_EQ(examine(needle, above).sliverCount, 1);
}

TEST(Shape, FindsTheLargestDistanceOfFewPointsAmongTheFacesNearThem)
{
    MeshBuilder const sphere = MeshBuilder::sphere(40);
    std::size_t const last = sphere.points.size() - 1;
    struct Case {
        char const* what;
        std::function<void(MeshBuilder&)> change;
    };
    Case const cases[] = {
        {"a point moves far",
            [](MeshBuilder& m) {
                m.points[700] = {3, 0, 0};
            }},
        {"a point moves through the surface",
            [](MeshBuilder& m) {
                m.points[700] = {-m.points[700].x, 0, 0};
            }},
        {"neighbors move",
            [](MeshBuilder& m) {
                for (std::size_t i = 700; i != 703; ++i)
                    m.points[i].z += 0.1f;
            }},
        {"all neighbors of a point move too",
            [](MeshBuilder& m) {
                for (std::size_t i = 640; i != 760; ++i)
                    m.points[i].z += 0.05f;
            }},
        {"two points swap their numbers",
            [=](MeshBuilder& m) {
                std::swap(m.points[5], m.points[last]);
                for (auto& face : m.faces)
                    for (unsigned int& point : face)
                        point = point == 5 ? static_cast<unsigned int>(last) : point == last ? 5u : point;
                m.points[300].x += 0.01f;
            }},
        {"the faces around a point are gone",
            [](MeshBuilder& m) {
                std::erase_if(
                    m.faces, [](auto const& face) { return std::find(face.begin(), face.end(), 700u) != face.end(); });
                m.points[800].y += 1e-4f;
            }},
        {"only faces far away are left",
            [](MeshBuilder& m) {
                m.faces.resize(20);
                m.points[700].y += 1e-4f;
            }},
    };
    auto const before = sphere.build();
    for (Case const& c : cases) {
        MeshBuilder changed = sphere;
        c.change(changed);
        auto const after = changed.build();
        // Points that did not move are taken to be on the surface, whether a face uses them or not.
        MeshBuilder moved = sphere;
        moved.points.clear();
        for (std::size_t i = 0; i != sphere.points.size(); ++i)
            if (auto const& a = sphere.points[i], &b = changed.points[i]; a.x != b.x || a.y != b.y || a.z != b.z)
                moved.points.push_back(sphere.points[i]);
        moved.faces = {{0, 0, 0}};
        EXPECT_EQ(largestDistance(arraysOf(*before), arraysOf(*after)),
            largestDistanceByBruteForce(arraysOf(*moved.build()), arraysOf(*after)))
            << c.what;
    }
}

TEST(Shape, FindsTheSameLargestDistanceAsBruteForce)
{
    auto const before = MeshBuilder::sphere(12).withNoise(0.05f, 1).build();
    auto after = MeshBuilder::sphere(10).withNoise(0.1f, 2).shuffled(3).build();
    MeshArrays const points = arraysOf(*before), surface = arraysOf(*after);
    double const expected = largestDistanceByBruteForce(points, surface);
    auto const measures = [&] {
        Shape const shape = examined(before).shape;
        return std::vector<double>{largestDistance(points, surface), largestMove(points, surface), *shape.volume,
            shape.area, shape.diagonal, static_cast<double>(shape.foldOvers)};
    };
    EXPECT_GT(expected, 0.01);
    EXPECT_NEAR(measures()[0], expected, 1e-15);
    EXPECT_EQ(largestDistance(points, points), 0);
    for (int const threads : {1, 2, 8})
        EXPECT_EQ(TestSupport::withThreads(threads, measures), measures()) << threads;
}

TEST(Shape, WarnsOnlyOfLargeChanges)
{
    Shape const cube{1, 6, 3, 2};
    struct Case {
        ShapeChange change;
        char const* warning;
    };
    constexpr auto kOpen = std::nullopt;
    Case const cases[] = {
        {{cube, cube, 0.041}, "a point by 2.1 % of the diagonal"},
        {{cube, {0.98, 6, 3, 2}, 0}, "the volume by -2 %"},
        {{cube, {-1, 6, 3, 2}, 0}, "turned inside out"},
        {{{kOpen, 6, 3, 2}, {kOpen, 3, 3, 2}, 0}, "the area by -50 %"},
        {{cube, {1, 6, 5, 2}, 0}, "2 edges folded over"},
    };
    auto const warningsOf = [](ShapeChange const& change) {
        Report report("test");
        warnOfShape(change, "Advice.", report);
        return report.document["warnings"];
    };
    for (Case const& c : cases) {
        EXPECT_EQ(warningsOf(c.change).size(), 1) << c.warning;
        EXPECT_THAT(warningsOf(c.change).dump(), HasSubstr(c.warning));
    }
    ShapeChange const small[] = {{cube, cube, 0.039}, {cube, {0.991, 6, 2, 2}, 0}, {cube, {1, 6.2, 3, 2}, 0},
        {{-1, 6, 3, 2}, {-1.005, 6, 3, 2}, 0}, {{1e-9, 6, 3, 2}, {-1e-9, 6, 3, 2}, 0}, // a sheet with two sides
        {{0, 0, 0, 0}, {0, 0, 0, 0}, 0}};
    for (ShapeChange const& change : small)
        EXPECT_EQ(warningsOf(change).dump(), "[]");
}

}
