#include "geometry/Geometry.h"
#include "geometry/MeshTopology.h"
#include "geometry/Shape.h"
#include "repair/repairMesh.h"

#include "support/MeshBuilder.h"
#include "support/PropertyBag.h"
#include "support/Testing.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <map>
#include <numeric>

namespace ModelingProgram {

namespace {

    using namespace Tessara::Geometry;
    using TestSupport::MeshBuilder;
    using TestSupport::PolygonMesh;
    using Mesh = Orvan::MutablePtr<Tessara::Object>;
    using FaceLists = std::vector<std::vector<unsigned int>>;

    PolygonMesh polygonsOf(std::vector<float3> points, FaceLists const& faces)
    {
        PolygonMesh mesh;
        mesh.points = std::move(points);
        for (auto const& face : faces) {
            mesh.faceVertex.insert(mesh.faceVertex.end(), face.begin(), face.end());
            mesh.faceOffset.push_back(static_cast<unsigned int>(mesh.faceVertex.size()));
        }
        return mesh;
    }

    PolygonMesh cube(float size, float3 offset = {}, bool isInward = false)
    {
        PolygonMesh mesh =
            polygonsOf({}, {{0, 2, 3, 1}, {4, 5, 7, 6}, {0, 1, 5, 4}, {2, 6, 7, 3}, {0, 4, 6, 2}, {1, 3, 7, 5}});
        for (unsigned int i = 0; i != 8; ++i)
            mesh.points.push_back(
                {offset.x + (i & 1 ? size : 0), offset.y + (i & 2 ? size : 0), offset.z + (i & 4 ? size : 0)});
        if (isInward)
            std::reverse(mesh.faceVertex.begin(), mesh.faceVertex.end());
        return mesh;
    }

    PolygonMesh without(PolygonMesh const& mesh, std::vector<unsigned int> const& faces)
    {
        FaceLists kept;
        for (unsigned int face = 0; face != mesh.faceCount(); ++face)
            if (!std::binary_search(faces.begin(), faces.end(), face))
                kept.emplace_back(mesh.faceVertex.begin() + mesh.faceOffset[face],
                    mesh.faceVertex.begin() + mesh.faceOffset[face + 1]);
        return polygonsOf(mesh.points, kept);
    }

    PolygonMesh bothOf(PolygonMesh mesh, PolygonMesh const& other)
    {
        return std::move(mesh).joinedWith(other);
    }

    /// Numbers all elements, so that it shows where new ones come from.
    Mesh numbered(PolygonMesh const& polygons)
    {
        Mesh mesh = polygons.build();
        for (auto const& [name, component] :
            {std::pair{"point", sPointComp}, {"corner", sFaceVertexComp}, {"face", sFaceComp}}) {
            Orvan::Array<int> numbers(getElementCount(*mesh, component));
            for (unsigned int i = 0; i != numbers.size; ++i)
                numbers[i] = static_cast<int>(i);
            addDataProperty<int>(name, component, std::move(numbers), *mesh);
        }
        return mesh;
    }

    struct Repaired {
        Mesh mesh;
        RepairCounts counts;
        MeshTopology topology;
        double volume;
    };

    Repaired repaired(Mesh mesh, RepairOptions const& options = {})
    {
        RepairCounts const counts = repairMesh(options, *mesh);
        auto const [topology, shape, slivers] = examine(arraysOf(*mesh));
        return {std::move(mesh), counts, topology, shape.volume.value_or(0)};
    }

    bool areEqual(float3 const& a, float3 const& b)
    {
        return a.x == b.x && a.y == b.y && a.z == b.z;
    }

    /// Points and corners have the positions of those whose numbers they have, except for new points at the centers of
    /// holes; and faces have the corners of those whose numbers they have, except for new ones.
    void expectElementsOf(PolygonMesh const& original, Repaired const& result)
    {
        MeshArrays const mesh = arraysOf(*result.mesh);
        ASSERT_TRUE(TestSupport::isValid(*result.mesh));
        auto const point = dataOf<int>(*result.mesh, "point"), corner = dataOf<int>(*result.mesh, "corner"),
                   face = dataOf<int>(*result.mesh, "face");
        ASSERT_EQ(point->size, mesh.pointCount());
        ASSERT_EQ(corner->size, mesh.cornerCount());
        ASSERT_EQ(face->size, mesh.faceCount());
        unsigned int differentCount = 0;
        auto const expectPosition = [&](unsigned int p, std::size_t expected) {
            differentCount += areEqual((*mesh.positions)[p], original.points[expected]) ? 0u : 1u;
        };
        for (unsigned int p = 0; p != mesh.pointCount(); ++p)
            expectPosition(p, static_cast<std::size_t>((*point)[p]));
        EXPECT_EQ(differentCount, result.counts.holes.centerCount);
        differentCount = 0;
        for (unsigned int c = 0; c != mesh.cornerCount(); ++c)
            expectPosition((*mesh.faceVertex)[c], original.faceVertex[static_cast<std::size_t>((*corner)[c])]);
        EXPECT_TRUE(differentCount == 0 || result.counts.holes.centerCount != 0) << differentCount;
        unsigned int const keptCount = mesh.faceCount() - result.counts.holes.faceCount;
        for (unsigned int f = 0; f != keptCount; ++f)
            if (!mesh.corners(f).empty()) {
                auto const first = static_cast<unsigned int>((*corner)[(*mesh.faceOffset)[f]]);
                unsigned int const* const offset = original.faceOffset.data() + (*face)[f];
                EXPECT_TRUE(offset[0] <= first && first < offset[1]) << f;
            }
    }

    /// Breaks a closed mesh in many ways.
    PolygonMesh broken(PolygonMesh const& mesh, TestSupport::Random& random, bool isShredded)
    {
        PolygonMesh result;
        result.points = mesh.points;
        auto const addFace = [&](std::vector<unsigned int> points) {
            if (isShredded)
                for (unsigned int& point : points) {
                    result.points.push_back(result.points[point]);
                    point = static_cast<unsigned int>(result.points.size() - 1);
                }
            result.faceVertex.insert(result.faceVertex.end(), points.begin(), points.end());
            result.faceOffset.push_back(static_cast<unsigned int>(result.faceVertex.size()));
        };
        for (unsigned int face = 0; face != mesh.faceCount(); ++face) {
            std::vector<unsigned int> points(
                mesh.faceVertex.begin() + mesh.faceOffset[face], mesh.faceVertex.begin() + mesh.faceOffset[face + 1]);
            unsigned int const fate = random.below(20);
            if (fate < 3)
                std::reverse(points.begin(), points.end());
            if (fate != 4 && fate != 5)
                addFace(points);
            if (fate == 6)
                addFace({points[1], points[2], points[0]});
            if (fate == 7)
                addFace({points[1], points[0], points[2]});
            if (fate == 8)
                addFace({points[0], points[1], random.below(mesh.points.size())});
            if (fate == 9)
                addFace({points[0], points[1], points[1], points[0]});
        }
        return result;
    }

}

TEST(Repair, MendsWhatItIsFor)
{
    struct Case {
        PolygonMesh mesh;
        std::vector<long> expected; // points, faces, parts, genus
        double volume;
    };
    PolygonMesh const tetrahedron = MeshBuilder::tetrahedron().polygons();
    PolygonMesh const lower = cube(1), upper = cube(1, {1, 1, 0}), beside = cube(1, {1, 0, 0});
    PolygonMesh const sheet = PolygonMesh::quads(2);
    PolygonMesh back = sheet;
    std::reverse(back.faceVertex.begin(), back.faceVertex.end());
    PolygonMesh const withCopy = bothOf(without(lower, {}), polygonsOf(lower.points, {{0, 1, 3, 2}, {0, 4, 5, 1}}));
    std::vector<unsigned int> ring; // around an island of 3 x 3 faces
    for (unsigned int face = 0; face != 49; ++face)
        if (std::max(std::abs(static_cast<int>(face % 7) - 3), std::abs(static_cast<int>(face / 7) - 3)) == 2)
            ring.push_back(face);
    FaceLists klein;
    for (unsigned int i = 0; i != 4; ++i)
        for (unsigned int j = 0; j != 4; ++j) {
            auto const at = [](unsigned int a, unsigned int b) {
                return 4 * (a % 4) + (a < 4 ? b % 4 : (4 - b % 4) % 4);
            };
            klein.push_back({at(i, j), at(i + 1, j), at(i + 1, j + 1), at(i, j + 1)});
        }
    std::vector<float3> kleinPoints;
    TestSupport::Random random(1);
    for (unsigned int i = 0; i != 16; ++i)
        kleinPoints.push_back(random.point());

    std::map<std::string, Case> const cases = {
        {"cube", {cube(2), {8, 6, 1, 0}, 8}},
        {"inside out", {cube(2, {}, true), {8, 6, 1, 0}, 8}},
        {"cavity", {bothOf(cube(4), cube(2, {1, 1, 1}, true)), {16, 12, 2, 0}, 56}},
        {"solid in a cavity",
            {bothOf(bothOf(cube(4), cube(3, {.5f, .5f, .5f}, true)), cube(1, {1, 1, 1}, true)), {24, 18, 3, 0},
                64 - 27 + 1}},
        {"inward, one inside the other", {bothOf(cube(4, {}, true), cube(2, {1, 1, 1})), {16, 12, 2, 0}, 72}},
        {"cubes with a common edge", {bothOf(lower, upper), {16, 12, 2, 0}, 2}},
        {"cubes with a common wall", {bothOf(lower, beside), {16, 12, 2, 0}, 2}},
        {"cubes with a common point", {bothOf(lower, cube(1, {1, 1, 1})), {16, 12, 2, 0}, 2}},
        {"inward cubes with a common edge", {bothOf(lower, cube(1, {1, 1, 0}, true)), {16, 12, 2, 0}, 2}},
        {"two-sided sheet", {bothOf(sheet, back), {10, 8, 1, 0}, 0}},
        {"reversed copies", {withCopy, {8, 6, 1, 0}, 1}},
        {"no lid", {without(cube(1), {1}), {8, 7, 1, 0}, 1}},
        {"two faces of a tetrahedron", {without(tetrahedron, {0, 1}), {4, 4, 1, 0}, -1}},
        {"holes that touch at a point", {without(MeshBuilder::icosahedron().polygons(), {0, 7}), {12, 20, 1, 0}, -1}},
        {"degenerate faces",
            {bothOf(tetrahedron, polygonsOf({{5, 5, 5}, {6, 6, 6}}, {{0, 1, 0}, {0, 0, 1, 1}, {0}})), {4, 4, 1, 0},
                -1}},
        {"spike",
            {bothOf(without(cube(1), {5}),
                 polygonsOf({{1, 0, 0}, {1, 1, 0}, {1, 1, 1}, {1, 0, 1}, {2, 2, 2}}, {{0, 1, 1, 2, 4, 2, 3}})),
                {8, 6, 1, 0}, 1}},
        {"island in a hole", {without(PolygonMesh::quads(7), ring), {64, 87, 2, 0}, 0}},
        {"Klein bottle", {polygonsOf(kleinPoints, klein), {-1, -1, -1, -1}, -1}},
        {"three sheets at an edge",
            {polygonsOf({{0, 0, 0}, {0, 0, 1}, {1, 0, 0}, {0, 1, 0}, {-1, -1, 0}}, {{0, 1, 2}, {0, 1, 3}, {0, 1, 4}}),
                {-1, -1, -1, -1}, -1}},
    };
    for (auto const& [name, c] : cases) {
        SCOPED_TRACE(name);
        Repaired const result = repaired(numbered(c.mesh));
        expectElementsOf(c.mesh, result);
        EXPECT_TRUE(result.topology.isClosedManifold());
        std::vector<long> const found = {static_cast<long>(arraysOf(*result.mesh).pointCount()),
            static_cast<long>(arraysOf(*result.mesh).faceCount()), static_cast<long>(result.topology.partCount),
            static_cast<long>(result.topology.genus.value_or(-1))};
        if (c.expected[0] >= 0) {
            EXPECT_EQ(found, c.expected);
        }
        if (c.volume >= 0)
            EXPECT_NEAR(result.volume, c.volume, 1e-6);
        else
            EXPECT_GE(result.volume, 0);
    }
}

// Seen from above, edges of one cavity are exactly above those of the other, and above its points.
TEST(Repair, KeepsCavitiesAboveEachOther)
{
    PolygonMesh const box = bothOf(bothOf(cube(4), cube(1, {1, 1, .5f}, true)), cube(1, {1, 1, 2.5f}, true));
    TestSupport::Random random(3);
    std::vector<unsigned int> order(box.points.size());
    std::iota(order.begin(), order.end(), 0u);
    for (int i = 0; i != 100; ++i) {
        random.shuffle(order);
        PolygonMesh mesh = box;
        for (std::size_t point = 0; point != order.size(); ++point)
            mesh.points[order[point]] = box.points[point];
        for (unsigned int& point : mesh.faceVertex)
            point = order[point];
        Repaired const result = repaired(mesh.build());
        ASSERT_EQ(result.counts.flippedFaces, 0u);
        ASSERT_NEAR(result.volume, 62, 1e-6);
    }
}

TEST(Repair, ClosesRandomBrokenMeshes)
{
    TestSupport::Random random(7);
    MeshBuilder const builders[] = {MeshBuilder::sphere(5), MeshBuilder::torus(9, 7),
        MeshBuilder::sphere(3).joinedWith(MeshBuilder::icosahedron(), {2, 0, 0}), MeshBuilder::bipyramid(40)};
    for (unsigned int i = 0; i != 400; ++i) {
        SCOPED_TRACE(i);
        PolygonMesh const mesh = broken(builders[i % 4].polygons(), random, i % 8 < 4);
        Repaired const result = repaired(numbered(mesh));
        expectElementsOf(mesh, result);
        MeshTopology const& t = result.topology;
        EXPECT_EQ(t.boundaryEdges.count, 3 * result.counts.holes.looseFaces);
        EXPECT_EQ(t.nonManifoldEdges.count + t.windingConflicts.count + t.nonManifoldPoints.count, 0);
        EXPECT_EQ(t.isolatedPoints.count, 0);
        if (result.counts.holes.looseFaces == 0) {
            Repaired const again = repaired(TestSupport::deepCopy(*result.mesh), {.steps = {.weld = false}});
            EXPECT_TRUE(TestSupport::sameContents(*again.mesh, *result.mesh));
        }
    }
    for (unsigned int i = 0; i != 300; ++i) { // polygons that may repeat points, and any subset of the steps
        PolygonMesh const soup = PolygonMesh::soup(6 + random.below(20), 1 + random.below(30), 0, 7, random);
        RepairOptions options;
        bool RepairSteps::*const steps[] = {&RepairSteps::weld, &RepairSteps::degenerate, &RepairSteps::doubled,
            &RepairSteps::orient, &RepairSteps::fill, &RepairSteps::split, &RepairSteps::unused};
        for (auto const step : steps)
            options.steps.*step = i % 2 == 0 || random.below(3) != 0;
        SCOPED_TRACE(i);
        Repaired const result = repaired(numbered(soup), options);
        expectElementsOf(soup, result);
        if (options.steps.split) {
            EXPECT_EQ(result.topology.nonManifoldEdges.count + result.topology.nonManifoldPoints.count, 0);
        }
        if (options.steps.split && options.steps.orient) {
            EXPECT_EQ(result.topology.windingConflicts.count, 0);
        }
    }
}

TEST(Repair, CarriesPropertiesOfAllTypesAndSharesNothing)
{
    TestSupport::Random random(3);
    Mesh const mesh = bothOf(without(cube(1), {2}), polygonsOf({{0, 0, 0}, {1, 0, 0}, {1, 0, 1}}, {{0, 1, 2}})).build();
    for (char const* const component : {sPointComp, sFaceVertexComp, sFaceComp})
        TestSupport::addAllTypes(component, random, *mesh);
    addRangeProperty("groups", sFaceComp, {1, 0, 1, 0, 1, 0}, *mesh);
    addDataProperty<int>("number", "groups", {10, 20}, *mesh);
    Mesh const before = TestSupport::deepCopy(*mesh);
    TestSupport::expectSameForThreads({1, 2, 8}, [&] {
        auto mended = TestSupport::deepCopy(*mesh);
        repairMesh({}, *mended);
        return mended;
    });
    TestSupport::withThreads(8, [&] {
        Tessara::Object result = *mesh;
        RepairCounts const counts = repairMesh({}, result);
        EXPECT_EQ(counts.weldedPoints, 3);
        EXPECT_GT(counts.lossyProperties.size(), 30); // random values differ
        EXPECT_EQ(counts.holes.filledCount, 1);
        EXPECT_TRUE(TestSupport::isValid(result));
        EXPECT_EQ(TestSupport::countsOf(result), (TestSupport::Counts{8, 26, 7}));
        EXPECT_EQ(getRangeGeoPropIndices(result, "groups")->size, 7);
        for (Property const& property : propertiesOf(result))
            if (!property.isStandard && property.range.empty() && !property.component.empty()) {
                EXPECT_EQ(property.length, getElementCount(result, property.component.c_str())) << property.name;
            }
        EXPECT_TRUE(TestSupport::sameContents(*mesh, *before));
    });
}

TEST(Repair, WeldsNearPointsToTheLowest)
{
    std::vector<float3> points = {
        {0, 0, 0}, {0.9f, 0, 0}, {1.8f, 0, 0}, {0, 0, 0.5f}, {-0.0f, 0, 0}, {1e20f, 0, 0}, {1e20f, 0, 0}};
    struct Case {
        double distance;
        std::vector<int> kept;
    };
    for (Case const& c :
        {Case{0, {0, 1, 2, 3, 5}}, {0.5, {0, 1, 2, 5}}, {1, {0, 2, 5}}, {1e-9, {0, 1, 2, 3, 5}}, {1e30, {0}}}) {
        RepairOptions options;
        options.steps = {
            .degenerate = false, .doubled = false, .orient = false, .fill = false, .split = false, .unused = false};
        options.weldDistance = c.distance;
        Mesh const mesh = numbered(polygonsOf(points, {{0, 1, 2}, {3, 4, 5, 6}}));
        repairMesh(options, *mesh);
        EXPECT_EQ(TestSupport::valuesOf<int>(*mesh, "point"), c.kept) << c.distance;
    }
    // Against comparing all pairs.
    TestSupport::Random random(5);
    points.clear();
    for (unsigned int i = 0; i != 1500; ++i)
        points.push_back(random.point());
    std::vector<int> kept;
    for (unsigned int i = 0; i != points.size(); ++i)
        if (std::none_of(kept.begin(), kept.end(),
                [&](int k) { return distance(points[static_cast<std::size_t>(k)], points[i]) <= 0.1; }))
            kept.push_back(static_cast<int>(i));
    Mesh const mesh = numbered(polygonsOf(points, {}));
    RepairOptions options{.steps = {.unused = false}, .weldDistance = 0.1};
    repairMesh(options, *mesh);
    EXPECT_EQ(TestSupport::valuesOf<int>(*mesh, "point"), kept);
}

/// They exceed the time limit of the test if a step takes quadratic time.
TEST(Repair, CopesWithHubsAndLongHoles)
{
    constexpr unsigned int kCount = 100'000;
    FaceLists hub;
    std::vector<float3> points = {{0, 0, 1}};
    for (unsigned int i = 0; i != kCount; ++i) {
        points.push_back({static_cast<float>(i), 0, 0});
        points.push_back({static_cast<float>(i), 1, 0});
        hub.push_back({0, 2 * i + 1, 2 * i + 2});
    }
    Repaired const loose = repaired(polygonsOf(points, hub).build());
    EXPECT_EQ(loose.counts.splitPoints, kCount - 1);
    EXPECT_EQ(loose.counts.holes.looseFaces, kCount);
    for (auto& face : hub)
        face = {0, 1, face[2]}; // all at one edge
    EXPECT_EQ(repaired(polygonsOf(points, hub).build()).topology.nonManifoldEdges.count, 0);

    std::vector<unsigned int> upper(10'000);
    std::generate(upper.begin(), upper.end(), [face = 0u]() mutable { return 2 * face++; });
    Repaired const closed = repaired(without(MeshBuilder::bipyramid(10'000).polygons(), upper).build());
    EXPECT_TRUE(closed.topology.isClosedManifold());
    EXPECT_EQ(closed.counts.holes.longestFilled, 10'000);
}

}
