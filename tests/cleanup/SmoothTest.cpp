#include <Modeling/smooth.h>

#include "frame/VectorMath.h"
#include "support/Testing.h"

#include <TessaraMathSupport/Stepper.h>

#include <bit>
#include <map>
#include <optional>

using namespace Modeling;
using namespace TestSupport;

namespace {

using Weights = std::optional<std::vector<float>>;

template <class Logger = CoreGL::NOPLogger>
void smooth(PolygonMesh const& mesh, float amount, Weights const& weights, Orvan::Array<float3>& positions)
{
    Orvan::Array<float> const weightArray{std::span(weights ? *weights : std::vector<float>())};
    Geometry::Mesh::smooth(amount, static_cast<unsigned int>(mesh.points.size()),
        static_cast<unsigned int>(mesh.faceCount()), Orvan::Array<unsigned int>(std::span(mesh.faceVertex)),
        Orvan::Array<unsigned int>(std::span(mesh.faceOffset)), weights ? &weightArray : nullptr, positions, Logger());
}

std::vector<float3> smoothed(PolygonMesh const& mesh, float amount, Weights const& weights = {})
{
    Orvan::Array<float3> positions{std::span(mesh.points)};
    smooth(mesh, amount, weights, positions);
    return {positions.begin(), positions.end()};
}

float3 divided(float3 a, float d)
{
    return {a.x / d, a.y / d, a.z / d};
}

/// A plain reference that visits the whole face for each of its corners.
std::vector<float3> smoothedPlainly(PolygonMesh const& mesh, float amount, Weights const& weights)
{
    std::size_t const count = mesh.points.size();
    std::vector<float3> p = mesh.points, normals(count, {0, 0, 0}), centroids(count, {0, 0, 0});
    std::vector<unsigned int> samples(count);
    auto const& v = mesh.faceVertex;
    for (Tessara::Math::Stepper stepper(amount, 0.9f); stepper; stepper.step(CoreGL::NOPLogger())) {
        // Each corner adds the triangles of its face to its point.
        for (std::size_t corner = 0, f = 0; corner != v.size(); ++corner) {
            while (corner >= mesh.faceOffset[f + 1])
                ++f;
            auto const add = [&](float3 normal, float3 centroid) {
                normals[v[corner]] = normals[v[corner]] + normal;
                centroids[v[corner]] = centroids[v[corner]] + centroid;
                ++samples[v[corner]];
            };
            unsigned int const s = mesh.faceOffset[f], e = mesh.faceOffset[f + 1];
            if (e - s == 3) {
                float3 const a = p[v[s]], b = p[v[s + 1]], c = p[v[s + 2]];
                add(cross(b - a, c - a), divided((b + a) + c, 3));
                continue;
            }
            float3 m{0, 0, 0};
            for (unsigned int k = s; k != e; ++k)
                m = m + divided(p[v[k]], static_cast<float>(e - s));
            for (unsigned int k = s; k != e; ++k) {
                unsigned int const u = v[k], w = v[k + 1 == e ? s : k + 1];
                if (u == v[corner] || w == v[corner])
                    add(cross(p[u] - m, p[w] - m), divided((m + p[u]) + p[w], 3));
            }
        }
        for (std::size_t point = 0; point != count; ++point) {
            float3 const n = safeNormalize(normals[point]);
            float3 d = (divided(centroids[point], static_cast<float>(samples[point])) - p[point]) * stepper.increment();
            d = d - n * dot(n, d);
            if (weights) {
                float const weight = (*weights)[point];
                float const atLeast0 = 0.0f > weight ? 0.0f : weight;
                d = d * (atLeast0 > 1.0f ? 1.0f : atLeast0);
            }
            p[point] = p[point] + d;
        }
    }
    return p;
}

/// The same bits for every NaN, because those depend on the compiler.
std::vector<unsigned int> bitsOf(std::vector<float3> const& points)
{
    std::vector<unsigned int> bits;
    for (float3 const& p : points)
        for (float const c : {p.x, p.y, p.z})
            bits.push_back(c == c ? std::bit_cast<unsigned int>(c) : ~0u);
    return bits;
}

}

TEST(Smooth, AgreesWithPlainSmoothingToTheBit)
{
    Random random(1);
    float const amounts[] = {0.0f, 0.3f, 0.9f, 2.0f, 5.4f, -1.0f};
    for (int run = 0; run != 3000; ++run) {
        SCOPED_TRACE(run);
        // Few points: many faces visit a point twice, and some points belong to no face.
        std::size_t const points = 2 + random.below(9);
        PolygonMesh const mesh = PolygonMesh::soup(points, random.below(9), 0, 7, random);
        Weights weights;
        if (run % 2)
            for (weights.emplace(); weights->size() != mesh.points.size();)
                weights->push_back(random.below(5) == 0 ? kNan : 2 * random.coordinate());
        float const amount = amounts[random.below(6)];
        ASSERT_EQ(bitsOf(smoothed(mesh, amount, weights)), bitsOf(smoothedPlainly(mesh, amount, weights)));
    }
    for (auto const& mesh : {MeshBuilder::torus(20, 30).withNoise(0.05f, 1).shuffled(2).polygons(),
             PolygonMesh::quads(30).withNoise(0.2f, 3), PolygonMesh::stars(300, 2, 40, 4)})
        EXPECT_TRUE(bitsOf(smoothed(mesh, 4.0f)) == bitsOf(smoothedPlainly(mesh, 4.0f, {})));
}

TEST(Smooth, AgreesWithPlainSmoothingForAnyDivisionOfThePoints)
{
    Random random(1);
    PolygonMesh const sphere = MeshBuilder::sphere(50).withNoise(0.005f, 1).polygons();
    std::map<std::string, PolygonMesh> const meshes{
        {"triangles in order", sphere},
        {"triangles in random order", MeshBuilder::sphere(50).withNoise(0.005f, 1).shuffled(2).polygons()},
        {"triangles of random points", PolygonMesh::soup(9'000, 20'000, 3, 3, random)},
        {"faces of random points", PolygonMesh::soup(9'000, 9'000, 0, 7, random)},
        {"large faces with repeated points", PolygonMesh::soup(5'000, 4, 900, 1'100, random)},
        {"no faces", PolygonMesh::soup(5'000, 0, 3, 3, random)},
        {"mixed",
            PolygonMesh(sphere)
                .joinedWith(PolygonMesh::quads(60).withNoise(0.2f, 3))
                .joinedWith(PolygonMesh::soup(40, 30, 0, 90, random))},
    };
    for (auto const& [name, mesh] : meshes) {
        auto const expected = bitsOf(smoothedPlainly(mesh, 2.0f, {}));
        for (int const threads : {1, 2, 8, 200})
            EXPECT_TRUE(withThreads(threads, [&, &given = mesh] { return bitsOf(smoothed(given, 2.0f)); }) == expected)
                << name << ", " << threads << " threads";
    }
}

TEST(Smooth, MovesPointsWithinTheSurfaceWhereverItsFacesBegin)
{
    PolygonMesh square = PolygonMesh::quads(4).withNoise(0.2f, 1);
    for (float3& p : square.points)
        p.z = 7;
    std::vector<float3> const flat = smoothed(square, 2);
    EXPECT_NE(bitsOf(flat), bitsOf(square.points));
    for (float3 const& p : flat)
        EXPECT_EQ(p.z, 7);
    square.faceVertex.insert(square.faceVertex.begin(), {3, 3, 4000000000u}); // corners that belong to no face
    for (unsigned int& offset : square.faceOffset)
        offset += 3;
    EXPECT_EQ(bitsOf(smoothed(square, 2)), bitsOf(flat));
    EXPECT_TRUE(smoothed(PolygonMesh(), 1).empty());
}

TEST(Smooth, LogsEachStep)
{
    static std::vector<std::string> lines;
    CoreGL::OrvanLogger::setSink([](char const* line) { lines.emplace_back(line); });
    Orvan::Array<float3> positions(9);
    smooth<CoreGL::OrvanLogger>(PolygonMesh::quads(2), 1.4f, {}, positions);
    CoreGL::OrvanLogger::setSink({});
    EXPECT_EQ(lines, (std::vector<std::string>{"step 1: 0.9, 0.5 remain", "step 2: 0.5, 0 remain"}));
}
