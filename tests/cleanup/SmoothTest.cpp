#include <Modeling/smooth.h>

#include "support/FailingAllocations.h"
#include "support/MeshBuilder.h"
#include "support/PolygonMesh.h"
#include "support/Random.h"
#include "support/Threads.h"

#include <TessaraMathSupport/Stepper.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <bit>
#include <cmath>
#include <limits>
#include <map>
#include <optional>
#include <string>
#include <vector>

using namespace TestSupport;

namespace {

constexpr float kNan = std::numeric_limits<float>::quiet_NaN();
using Weights = std::optional<std::vector<float>>;

std::vector<float3> smoothed(PolygonMesh const& mesh, float amount, Weights const& weights = {})
{
    Orvan::Array<float3> positions{std::span(mesh.points)};
    Orvan::Array<float> const weightArray{std::span(weights ? *weights : std::vector<float>())};
    Geometry::Mesh::smooth(amount, static_cast<unsigned int>(mesh.points.size()),
        static_cast<unsigned int>(mesh.faceCount()), Orvan::Array<unsigned int>(std::span(mesh.faceVertex)),
        Orvan::Array<unsigned int>(std::span(mesh.faceOffset)), weights ? &weightArray : nullptr, positions,
        CoreGL::NOPLogger());
    return {positions.begin(), positions.end()};
}

// Written out once more, so that a fault in the library's own arithmetic does not cancel out.
float3 plus(float3 a, float3 b)
{
    return {a.x + b.x, a.y + b.y, a.z + b.z};
}
float3 minus(float3 a, float3 b)
{
    return {a.x - b.x, a.y - b.y, a.z - b.z};
}
float3 divided(float3 a, float d)
{
    return {a.x / d, a.y / d, a.z / d};
}
float3 times(float3 a, float s)
{
    return {a.x * s, a.y * s, a.z * s};
}
float3 vectorProduct(float3 a, float3 b)
{
    return {a.y * b.z - a.z * b.y, a.z * b.x - a.x * b.z, a.x * b.y - a.y * b.x};
}
float lengthOf(float3 a)
{
    return std::sqrt(a.x * a.x + a.y * a.y + a.z * a.z);
}

/// Smoothing once more, written plainly: one list of faces a point, and every face looked at as a whole.
std::vector<float3> smoothedPlainly(PolygonMesh const& mesh, float amount, Weights const& weights)
{
    std::size_t const count = mesh.points.size();
    std::vector<float3> p = mesh.points, normals(count, {0, 0, 0}), centroids(count, {0, 0, 0});
    std::vector<unsigned int> samples(count);
    std::vector<std::vector<std::size_t>> faces(count);
    for (std::size_t f = 0; f != mesh.faceCount(); ++f)
        for (unsigned int k = mesh.faceOffset[f]; k != mesh.faceOffset[f + 1]; ++k)
            faces[mesh.faceVertex[k]].push_back(f);
    for (Tessara::Math::Stepper stepper(amount, 0.9f); stepper; stepper.step(CoreGL::NOPLogger())) {
        for (std::size_t point = 0; point != count; ++point) {
            auto const add = [&](float3 normal, float3 centroid) {
                normals[point] = plus(normals[point], normal);
                centroids[point] = plus(centroids[point], centroid);
                ++samples[point];
            };
            for (std::size_t const f : faces[point]) {
                unsigned int const s = mesh.faceOffset[f], e = mesh.faceOffset[f + 1];
                auto const& v = mesh.faceVertex;
                if (e - s == 3) {
                    float3 const a = p[v[s]], b = p[v[s + 1]], c = p[v[s + 2]];
                    add(vectorProduct(minus(b, a), minus(c, a)), divided(plus(plus(b, a), c), 3));
                    continue;
                }
                float3 m{0, 0, 0};
                for (unsigned int k = s; k != e; ++k)
                    m = plus(m, divided(p[v[k]], static_cast<float>(e - s)));
                for (unsigned int k = s; k != e; ++k) {
                    unsigned int const u = v[k], w = v[k + 1 == e ? s : k + 1];
                    if (u == point || w == point)
                        add(vectorProduct(minus(p[u], m), minus(p[w], m)), divided(plus(plus(m, p[u]), p[w]), 3));
                }
            }
        }
        for (std::size_t point = 0; point != count; ++point) {
            float3 n = normals[point];
            if (lengthOf(n) > std::numeric_limits<float>::min())
                n = times(n, 1 / lengthOf(n));
            float3 d = times(
                minus(divided(centroids[point], static_cast<float>(samples[point])), p[point]), stepper.increment());
            d = minus(d, times(n, n.x * d.x + n.y * d.y + n.z * d.z));
            if (weights) {
                float v = (*weights)[point];
                v = 0.0f > v ? 0.0f : v;
                d = times(d, v > 1.0f ? 1.0f : v);
            }
            p[point] = plus(p[point], d);
        }
    }
    return p;
}

testing::AssertionResult sameBits(std::vector<float3> const& actual, std::vector<float3> const& expected)
{
    auto const bits = [](float value) { return std::isnan(value) ? 0x7FC00000u : std::bit_cast<unsigned int>(value); };
    for (std::size_t point = 0; point != expected.size(); ++point) {
        float3 const &a = actual[point], &b = expected[point];
        if (bits(a.x) != bits(b.x) || bits(a.y) != bits(b.y) || bits(a.z) != bits(b.z))
            return testing::AssertionFailure() << "point " << point << ": (" << a.x << ", " << a.y << ", " << a.z
                                               << ") instead of (" << b.x << ", " << b.y << ", " << b.z << ")";
    }
    return testing::AssertionSuccess();
}

PolygonMesh trianglesOf(MeshBuilder const& builder)
{
    PolygonMesh mesh;
    mesh.points = builder.points;
    for (auto const& face : builder.faces) {
        mesh.faceVertex.insert(mesh.faceVertex.end(), face.begin(), face.end());
        mesh.faceOffset.push_back(static_cast<unsigned int>(mesh.faceVertex.size()));
    }
    return mesh;
}

/// Faces of up to seven corners, also of none, over few points: many visit a point twice, and points may be of no face.
PolygonMesh soup(Random& random)
{
    PolygonMesh mesh;
    mesh.points.resize(2 + random.below(9));
    for (float3& p : mesh.points)
        p = {random.coordinate(), random.coordinate(), random.coordinate()};
    for (unsigned int face = random.below(9); face != 0; --face) {
        for (unsigned int corner = random.below(8); corner != 0; --corner)
            mesh.faceVertex.push_back(random.below(mesh.points.size()));
        mesh.faceOffset.push_back(static_cast<unsigned int>(mesh.faceVertex.size()));
    }
    return mesh;
}

struct Spread {
    double mean = 0;
    double deviation = 0; // as a fraction of the mean
};

Spread spreadOf(std::vector<double> const& values)
{
    Spread spread;
    double squares = 0;
    for (double const value : values) {
        spread.mean += value / static_cast<double>(values.size());
        squares += value * value / static_cast<double>(values.size());
    }
    spread.deviation = std::sqrt(std::max(0.0, squares - spread.mean * spread.mean)) / spread.mean;
    return spread;
}

Spread radiiOf(std::vector<float3> const& points)
{
    std::vector<double> radii;
    for (float3 const& p : points)
        radii.push_back(lengthOf(p));
    return spreadOf(radii);
}

Spread edgesOf(PolygonMesh const& mesh, std::vector<float3> const& points)
{
    std::vector<double> lengths;
    for (std::size_t corner = 0; corner != mesh.faceVertex.size(); corner += 3)
        lengths.push_back(lengthOf(minus(points[mesh.faceVertex[corner]], points[mesh.faceVertex[corner + 1]])));
    return spreadOf(lengths);
}

}

TEST(Smooth, agreesWithPlainSmoothingToTheBit)
{
    Random random(1);
    float const amounts[] = {0.0f, 0.3f, 0.9f, 2.0f, 5.4f, -1.0f};
    for (int run = 0; run != 3000; ++run) {
        SCOPED_TRACE(run);
        PolygonMesh const mesh = soup(random);
        Weights weights;
        if (run % 2)
            for (weights.emplace(); weights->size() != mesh.points.size();)
                weights->push_back(random.below(5) == 0 ? kNan : 2 * random.coordinate());
        float const amount = amounts[random.below(6)];
        ASSERT_TRUE(sameBits(smoothed(mesh, amount, weights), smoothedPlainly(mesh, amount, weights)));
    }
    for (auto const& mesh : {trianglesOf(MeshBuilder::torus(20, 30).withNoise(0.05f, 1).shuffled(2)),
             PolygonMesh::quads(30).withNoise(0.2f, 3), PolygonMesh::stars(300, 2, 40, 4)})
        EXPECT_TRUE(sameBits(smoothed(mesh, 4.0f), smoothedPlainly(mesh, 4.0f, {})));
}

TEST(Smooth, slidesPointsWithinTheSurface)
{
    PolygonMesh const sphere = trianglesOf(MeshBuilder::sphere(24).withNoise(0.02f, 1));
    for (float const amount : {1.0f, 9.0f}) {
        std::vector<float3> const points = smoothed(sphere, amount);
        EXPECT_NEAR(radiiOf(points).mean, radiiOf(sphere.points).mean, 0.003);
        EXPECT_LT(edgesOf(sphere, points).deviation, 0.8 * edgesOf(sphere, sphere.points).deviation);
    }

    PolygonMesh grid = PolygonMesh::quads(12).withNoise(0.3f, 2);
    for (float3& p : grid.points)
        p.z = 7;
    std::vector<float3> const flat = smoothed(grid, 3);
    EXPECT_FALSE(sameBits(flat, grid.points));
    for (float3 const& p : flat)
        EXPECT_EQ(p.z, 7);
}

TEST(Smooth, obeysWeightsAndKeepsToItsOddities)
{
    PolygonMesh const square = PolygonMesh::quads(4).withNoise(0.2f, 1);
    std::size_t const count = square.points.size();
    EXPECT_TRUE(sameBits(smoothed(square, 2, Weights(std::vector<float>(count, 0.0f))), square.points));
    EXPECT_TRUE(sameBits(smoothed(square, 2, Weights(std::vector<float>(count, -3.0f))), square.points));
    EXPECT_TRUE(sameBits(smoothed(square, 2, Weights(std::vector<float>(count, 5.0f))), smoothed(square, 2)));

    PolygonMesh isolated = square;
    isolated.points.push_back({1, 2, 3});
    EXPECT_TRUE(sameBits(smoothed(isolated, 0), isolated.points));
    Weights const none(std::vector<float>(count + 1, 0.0f));
    EXPECT_TRUE(std::isnan(smoothed(isolated, 0.1f, none).back().x)) << "a point of no face goes, whatever its weight";
    EXPECT_TRUE(smoothed(PolygonMesh(), 1).empty());

    PolygonMesh late = square; // its faces begin behind some corners that belong to none
    late.faceVertex.insert(late.faceVertex.begin(), {3, 3, 4000000000u});
    for (unsigned int& offset : late.faceOffset)
        offset += 3;
    EXPECT_TRUE(sameBits(smoothed(late, 2), smoothed(square, 2)));
}

TEST(Smooth, tellsEachStepToTheLogger)
{
    static std::vector<std::string> lines;
    CoreGL::OrvanLogger::setSink([](char const* line) { lines.emplace_back(line); });
    PolygonMesh const mesh = PolygonMesh::quads(2);
    Orvan::Array<float3> positions{std::span(mesh.points)};
    Geometry::Mesh::smooth(1.4f, 9, 4, Orvan::Array<unsigned int>(std::span(mesh.faceVertex)),
        Orvan::Array<unsigned int>(std::span(mesh.faceOffset)), nullptr, positions, CoreGL::OrvanLogger());
    CoreGL::OrvanLogger::setSink({});
    EXPECT_EQ(lines, (std::vector<std::string>{"step 1: 0.9, 0.5 remain", "step 2: 0.5, 0 remain"}));
}

TEST(Smooth, givesTheSameBitsForAnyNumberOfThreadsAndEveryCompiler)
{
    PolygonMesh const sphere = trianglesOf(MeshBuilder::sphere(40).withNoise(0.01f, 5).shuffled(6));
    PolygonMesh const stars = PolygonMesh::stars(2000, 3, 9, 7);
    std::vector<std::uint64_t> hashes;
    for (PolygonMesh const& mesh : {sphere, stars}) {
        auto const expected = withThreads(1, [&] { return smoothed(mesh, 3); });
        for (int const threads : {2, 8})
            EXPECT_TRUE(sameBits(withThreads(threads, [&] { return smoothed(mesh, 3); }), expected));
        std::uint64_t hash = 0;
        for (float3 const& p : expected)
            for (float const value : {p.x, p.y, p.z})
                hash = (hash ^ std::bit_cast<unsigned int>(value)) * 0x100000001B3u;
        hashes.push_back(hash);
    }
    EXPECT_EQ(hashes, (std::vector<std::uint64_t>{17504384294922683943u, 4675071567944403358u}))
        << "unlike other builds";
}

TEST(Smooth, leavesThePositionsAsTheyWereWhenMemoryRunsOut)
{
    PolygonMesh const mesh = PolygonMesh::quads(40).withNoise(0.2f, 1);
    Orvan::Array<unsigned int> const faceVertex{std::span(mesh.faceVertex)};
    Orvan::Array<unsigned int> const faceOffset{std::span(mesh.faceOffset)};
    std::vector<float3> const expected = smoothed(mesh, 2);
    sweepFailingAllocations([&](Attempt const& attempt) {
        Orvan::Array<float3> positions{std::span(mesh.points)};
        bool const isDone = attempt([&] {
            Geometry::Mesh::smooth(2, 1681, 1600, faceVertex, faceOffset, nullptr, positions, CoreGL::NOPLogger());
        });
        EXPECT_TRUE(sameBits({positions.begin(), positions.end()}, isDone ? expected : mesh.points));
    });
}
