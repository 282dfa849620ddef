#include "triangulation/triangulatePolygon.h"
#include "triangulation/cutQuads.h"

#include "frame/VectorMath.h"
#include "support/Testing.h"

using namespace TestSupport;
using namespace Modeling;

namespace {

using Corners = std::vector<float3>;
using Triangles = std::vector<unsigned int>;

Triangles triangulated(Corners const& corners)
{
    static Modeling::Internal::PolygonStorage storage; // reused, as for the faces of a mesh
    Triangles triangles(3 * (corners.size() - 2), 12345);
    Modeling::Internal::triangulatePolygon(corners, triangles, storage);
    return triangles;
}

Triangles fan(std::size_t cornerCount)
{
    Triangles triangles;
    for (unsigned int k = 2; k < cornerCount; ++k)
        triangles.insert(triangles.end(), {0, k - 1, k});
    return triangles;
}

/// Polygons of any kind: on a coarse lattice, corners coincide or are collinear, and edges intersect. Some corners are
/// NaN or infinite.
Corners soup(std::size_t n, Random& random)
{
    static float const kScales[] = {0.01f, 1, 1, 1, 1e4f, 1e18f};
    unsigned int const lattice = random.below(3);
    static float const kFlatness[] = {0, 0.3f, 0.005f}; // the last one tilts normals from -z by about the tolerance
    float const flatness = kFlatness[random.below(3)];
    float const scale = kScales[random.below(6)];
    Corners corners(n);
    for (float3& p : corners) {
        auto const coordinate = [&] {
            float const c = random.coordinate();
            return lattice == 0 ? c : std::round(c * static_cast<float>(lattice));
        };
        float const x = coordinate(), y = coordinate();
        p = {scale * x, scale * y, scale * flatness * coordinate()};
        if (random.below(400) == 0)
            p.x = random.below(2) ? kNan : std::numeric_limits<float>::infinity();
    }
    return corners;
}

}

TEST(TriangulatePolygon, CutsOrFallsBackToTheFan)
{
    struct Case {
        Corners corners;
        Triangles triangles;
    };
    std::map<std::string, Case> const cases{
        {"unit square", {{{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}}, {3, 0, 1, 3, 1, 2}}},
        {"clockwise", {{{0, 0, 0}, {0, 1, 0}, {1, 1, 0}, {1, 0, 0}}, {3, 0, 1, 3, 1, 2}}},
        {"sharp at corner 1", {{{0, 0, 0}, {3, 0, 0}, {1, 1, 0}, {0, 1, 0}}, {0, 1, 2, 3, 0, 2}}},
        {"no sharper than the hysteresis", {{{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0.00005f, 1, 0}}, {3, 0, 1, 3, 1, 2}}},
        {"reflex at corner 0", {{{1, 1, 0}, {0, 3, 0}, {0, 0, 0}, {3, 0, 0}}, {0, 1, 2, 2, 3, 0}}},
        {"all corners on a line", {{{0, 0, 0}, {1, 0, 0}, {2, 0, 0}, {3, 0, 0}}, fan(4)}},
        {"all corners equal", {{{1, 2, 3}, {1, 2, 3}, {1, 2, 3}, {1, 2, 3}, {1, 2, 3}}, fan(5)}},
        {"reflex, but below the smallest area",
            {{{0.001f, 0.001f, 0}, {0, 0.003f, 0}, {0, 0, 0}, {0.003f, 0, 0}}, fan(4)}},
        {"two equal consecutive corners, which never become ears",
            {{{0, 0, 0}, {1, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}}, fan(5)}},
        {"bow-tie without area", {{{0, 0, 0}, {1, 1, 0}, {1, 0, 0}, {0, 1, 0}}, fan(4)}},
        {"NaN", {{{0, 0, 0}, {1, kNan, 0}, {1, 1, 0}, {0, 1, 0}, {0, 0.5f, 0}}, fan(5)}},
        {"triangle without area", {{{0, 0, 0}, {0, 0, 0}, {2, 0, 0}}, {0, 1, 2}}},
    };
    for (auto const& [name, polygon] : cases)
        EXPECT_EQ(triangulated(polygon.corners), polygon.triangles) << name;
}

TEST(TriangulatePolygon, CoversSimplePolygonsWithoutOverlap)
{
    Random random(1);
    for (unsigned int run = 0; run != 400; ++run) { // mostly concave
        unsigned int const corners = run == 0 ? 3000 : 4 + random.below(run % 10 ? 20 : 200);
        Corners const polygon = PolygonMesh::stars(1, corners, corners, run).points;
        float3 normal{0, 0, 0};
        for (unsigned int k = 2; k < corners; ++k)
            normal = normal + cross(polygon[k - 1] - polygon[0], polygon[k] - polygon[0]);
        float const area = length(normal);
        Triangles const triangles = triangulated(polygon);
        float sum = 0;
        for (std::size_t k = 0; k != triangles.size(); k += 3) {
            float3 const a = polygon[triangles[k]], b = polygon[triangles[k + 1]], c = polygon[triangles[k + 2]];
            float const part = dot(cross(b - a, c - a), normal) / area;
            EXPECT_GT(part, -1e-4f * area) << "star " << run << ", triangle " << k / 3;
            sum += part;
        }
        EXPECT_NEAR(sum, area, 1e-3f * area) << "star " << run;
    }
}

TEST(TriangulatePolygon, GivesTheSameTrianglesInAllBuilds)
{
    Random random(1);
    std::uint64_t hash = 0;
    auto const add = [&](Corners const& corners) {
        for (unsigned int const corner : triangulated(corners))
            hash = (hash ^ corner) * 0x100000001B3u;
    };
    for (int run = 0; run != 500'000; ++run)
        add(soup(4, random));
    EXPECT_EQ(hash, 15772097239691920056u) << "quads";
    for (int run = 0; run != 20'000; ++run)
        add(soup(5 + random.below(run % 50 ? 12 : 150), random));
    EXPECT_EQ(hash, 547060884204956746u) << "polygons";
}

TEST(TriangulatePolygon, CutsFourQuadsAtOnceAsItCutsEach)
{
    Random random(2);
    std::size_t cutCount = 0;
    for (int run = 0; run != 100'000; ++run) {
        Corners corners;
        for (int quad = 0; quad != 4; ++quad)
            for (float3 const& corner :
                run % 2 == 0 ? soup(4, random) : PolygonMesh::stars(1, 4, 4, random.below(1000)).points)
                corners.push_back(corner);
        unsigned int triangles[24];
        unsigned int const cut = Modeling::Internal::cutQuads(std::span<float3 const, 16>(corners), triangles);
        ASSERT_LT(cut, 16u);
        for (int quad = 0; quad != 4; ++quad) {
            if ((cut >> quad & 1) == 0)
                continue;
            ++cutCount;
            Triangles const expected = triangulated({corners.begin() + 4 * quad, corners.begin() + 4 * quad + 4});
            ASSERT_EQ(Triangles(triangles + 6 * quad, triangles + 6 * quad + 6), expected) << run << ", quad " << quad;
        }
    }
    EXPECT_GT(cutCount, 150'000u); // of 400,000: many are flat or have a corner in an ear
}
