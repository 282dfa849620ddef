#include "geometry/MeshTopology.h"
#include "geometry/MeshRequirements.h"

#include "support/MeshBuilder.h"
#include "support/Random.h"
#include "support/Testing.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <map>
#include <numeric>
#include <set>

namespace ModelingProgram {

namespace {

    using testing::ElementsAre;
    using testing::HasSubstr;
    using TestSupport::MeshBuilder;
    using Faces = std::vector<std::vector<unsigned int>>;
    using Mesh = Orvan::MutablePtr<Tessara::Object>;

    Mesh meshOf(unsigned int pointCount, Faces const& faces)
    {
        TestSupport::PolygonMesh mesh;
        for (unsigned int p = 0; p != pointCount; ++p)
            mesh.points.push_back({static_cast<float>(p), 0.5f, 0});
        for (auto const& face : faces) {
            mesh.faceVertex.insert(mesh.faceVertex.end(), face.begin(), face.end());
            mesh.faceOffset.push_back(static_cast<unsigned int>(mesh.faceVertex.size()));
        }
        return mesh.build();
    }

    Faces const kTetrahedron = {{0, 2, 1}, {0, 1, 3}, {1, 2, 3}, {2, 0, 3}};

    Faces joined(Faces faces, Faces const& others)
    {
        faces.insert(faces.end(), others.begin(), others.end());
        return faces;
    }

    /// Triangles that share only one point.
    Faces looseFan(unsigned int triangles)
    {
        Faces faces;
        for (unsigned int i = 0; i != triangles; ++i)
            faces.push_back({0, 2 * i + 1, 2 * i + 2});
        return faces;
    }

    /// Edges, boundary edges, non-manifold edges, winding conflicts, non-manifold points, isolated points, parts,
    /// genus.
    using Counts = std::vector<long>;
    constexpr long kNone = -1;

    Counts countsOf(Mesh const& mesh)
    {
        MeshTopology const t = analyzeTopology(arraysOf(*mesh));
        auto const counts = {t.edgeCount, t.boundaryEdges.count, t.nonManifoldEdges.count, t.windingConflicts.count,
            t.nonManifoldPoints.count, t.isolatedPoints.count, t.partCount};
        Counts result(counts.begin(), counts.end());
        result.push_back(t.genus.value_or(kNone));
        return result;
    }

    /// For each element the lowest one of its set, given pairs of elements of the same set.
    std::vector<std::size_t> setsOf(std::size_t count, std::vector<std::array<std::size_t, 2>> const& pairs)
    {
        std::vector<std::size_t> sets(count);
        std::iota(sets.begin(), sets.end(), std::size_t{0});
        for (auto const& [a, b] : pairs)
            std::replace(sets.begin(), sets.end(), std::size_t{std::max(sets[a], sets[b])},
                std::size_t{std::min(sets[a], sets[b])});
        return sets;
    }

    /// The same counts by definition, except the genus.
    Counts countsByDefinition(std::size_t pointCount, Faces const& faces)
    {
        std::map<std::array<unsigned int, 2>, std::array<long, 2>> edges; // numbers of sides in the two directions
        std::map<std::array<unsigned int, 2>, std::size_t> cornerAt; // of a point and the other point of an edge
        std::vector<std::array<std::size_t, 2>> facePairs, fanPairs; // of points, of corners
        std::vector<std::size_t> pointAt;
        std::vector<bool> hasFan;
        for (auto const& face : faces) {
            std::size_t const first = pointAt.size();
            pointAt.insert(pointAt.end(), face.begin(), face.end());
            hasFan.resize(pointAt.size(), face.size() >= 3);
            for (std::size_t k = 0; k != face.size(); ++k) {
                std::size_t const next = (k + 1) % face.size();
                unsigned int const a = face[k], b = face[next];
                facePairs.push_back({a, b});
                if (face.size() < 3)
                    continue;
                if (a == b)
                    fanPairs.push_back({first + k, first + next});
                else {
                    ++edges[{std::min(a, b), std::max(a, b)}][a < b ? 0 : 1];
                    fanPairs.push_back({cornerAt.try_emplace({a, b}, first + k).first->second, first + k});
                    fanPairs.push_back({cornerAt.try_emplace({b, a}, first + next).first->second, first + next});
                }
            }
        }
        Counts counts{static_cast<long>(edges.size()), 0, 0, 0, 0, 0, 0};
        for (auto const& [points, sides] : edges) {
            counts[1] += sides[0] + sides[1] == 1;
            counts[2] += sides[0] + sides[1] > 2;
            counts[3] += (sides[0] > 1) + (sides[1] > 1);
        }
        auto const parts = setsOf(pointCount, facePairs), fans = setsOf(pointAt.size(), fanPairs);
        for (std::size_t point = 0; point != pointCount; ++point) {
            bool const isUsed = std::find(pointAt.begin(), pointAt.end(), point) != pointAt.end();
            std::set<std::size_t> fansHere;
            for (std::size_t corner = 0; corner != pointAt.size(); ++corner)
                if (pointAt[corner] == point && hasFan[corner])
                    fansHere.insert(fans[corner]);
            counts[4] += fansHere.size() > 1;
            counts[5] += !isUsed;
            counts[6] += isUsed && parts[point] == point;
        }
        return counts;
    }

}

TEST(MeshTopology, FindsTheSameAsByDefinitionInRandomFaces)
{
    TestSupport::Random random(1);
    MeshBuilder const closed = MeshBuilder::sphere(2).joinedWith(MeshBuilder::bipyramid(11), {3, 0, 0});
    for (unsigned int round = 0; round != 300; ++round) {
        bool const isSoup = round % 2 == 0;
        std::size_t const pointCount = isSoup ? 1 + random.below(30) : closed.points.size();
        Faces faces;
        for (auto const& face : closed.faces)
            faces.push_back(
                isSoup ? std::vector<unsigned int>(random.below(7)) : std::vector(face.begin(), face.end()));
        std::size_t const changes = isSoup ? faces.size() : random.below(6);
        for (std::size_t change = 0; change != changes; ++change) {
            auto& face = faces[isSoup ? change : random.below(faces.size())];
            if (!isSoup && random.below(2) == 0)
                std::reverse(face.begin(), face.end());
            else
                std::generate(face.begin(), face.end(), [&] { return random.below(pointCount); });
        }
        Counts found = countsOf(meshOf(static_cast<unsigned int>(pointCount), faces));
        found.pop_back();
        EXPECT_EQ(found, countsByDefinition(pointCount, faces)) << round;
    }
}

TEST(MeshTopology, CountsEdgesPointsPartsAndGenus)
{
    struct Case {
        char const* name;
        Mesh mesh;
        Counts expected;
    };
    Faces const byEdge = {{0, 1, 4}, {0, 5, 1}, {1, 5, 4}, {0, 4, 5}};
    Faces const byPoint = {{0, 5, 4}, {0, 4, 6}, {4, 5, 6}, {5, 0, 6}};
    Faces const apart = {{4, 6, 5}, {4, 5, 7}, {5, 6, 7}, {6, 4, 7}};
    Faces const openBox = {{0, 3, 2, 1}, {0, 1, 5, 4}, {1, 2, 6, 5}, {2, 3, 7, 6}, {3, 0, 4, 7}};
    Faces const moebiusStrip = {{0, 1, 3, 2}, {2, 3, 5, 4}, {4, 5, 7, 6}, {6, 7, 0, 1}};
    auto const torus = MeshBuilder::torus(5, 4);
    Case const cases[] = {
        {"nothing", meshOf(0, {}), {0, 0, 0, 0, 0, 0, 0, 0}},
        {"tetrahedron", meshOf(6, kTetrahedron), {6, 0, 0, 0, 0, 2, 1, 0}},
        {"open box", meshOf(8, openBox), {12, 4, 0, 0, 0, 0, 1, kNone}},
        {"tetrahedra with a common edge", meshOf(6, joined(kTetrahedron, byEdge)), {11, 0, 1, 2, 0, 0, 1, kNone}},
        {"tetrahedra with a common point", meshOf(7, joined(kTetrahedron, byPoint)), {12, 0, 0, 0, 1, 0, 1, kNone}},
        {"tetrahedra apart", meshOf(8, joined(kTetrahedron, apart)), {12, 0, 0, 0, 0, 0, 2, 0}},
        {"torus", torus.build(), {60, 0, 0, 0, 0, 0, 1, 1}},
        {"tori apart", MeshBuilder(torus).joinedWith(torus, {9, 0, 0}).build(), {120, 0, 0, 0, 0, 0, 2, 2}},
        {"Moebius strip", meshOf(8, moebiusStrip), {12, 8, 0, 1, 0, 0, 1, kNone}},
        {"hub", MeshBuilder::bipyramid(100'000).build(), {300'000, 0, 0, 0, 0, 0, 1, 0}},
        {"loose fan", meshOf(200'001, looseFan(100'000)), {300'000, 300'000, 0, 0, 1, 0, 1, kNone}},
        {"polygon with a hole, cut open", meshOf(8, {{0, 1, 2, 3, 0, 4, 7, 6, 5, 4}}), {9, 8, 0, 0, 0, 0, 1, kNone}},
        {"polygon that touches itself", meshOf(5, {{0, 1, 2, 0, 3, 4}}), {6, 6, 0, 0, 1, 0, 1, kNone}},
        {"two sides of one triangle", meshOf(3, {{0, 1, 2}, {0, 2, 1}}), {3, 0, 0, 0, 0, 0, 1, 0}},
        {"one triangle twice", meshOf(3, {{0, 1, 2}, {0, 1, 2}}), {3, 0, 0, 3, 0, 0, 1, kNone}},
        {"faces of few points", meshOf(4, {{}, {2}, {0, 1}, {1, 1, 0}}), {1, 0, 0, 0, 0, 1, 2, kNone}},
    };
    for (Case const& c : cases)
        for (int const threads : {1, 8})
            EXPECT_EQ(TestSupport::withThreads(threads, [&] { return countsOf(c.mesh); }), c.expected) << c.name;
}

TEST(MeshTopology, FindsWhatIsWrongAnywhereInALargeMesh)
{
    auto const torus = MeshBuilder::torus(150, 150);
    auto const build = [&](auto const& change) {
        Faces faces;
        for (auto const& face : torus.faces)
            faces.emplace_back(face.begin(), face.end());
        return meshOf(22'505, (change(faces), faces));
    };
    auto const merge = [](unsigned int point) {
        return [=](Faces& faces) {
            for (auto& face : faces)
                std::replace(face.begin(), face.end(), point, 0u);
        };
    };
    struct Case {
        char const* name;
        Mesh mesh;
        Counts expected;
    };
    Case const cases[] = {
        {"torus", build([](Faces&) {}), {67'500, 0, 0, 0, 0, 5, 1, 1}},
        {"in random order", MeshBuilder(torus).shuffled(1).build(), {67'500, 0, 0, 0, 0, 0, 1, 1}},
        {"tori in random order", MeshBuilder(torus).joinedWith(torus, {9, 0, 0}).shuffled(1).build(),
            {135'000, 0, 0, 0, 0, 0, 2, 2}},
        {"last face missing", build([](Faces& faces) { faces.pop_back(); }), {67'500, 3, 0, 0, 0, 5, 1, kNone}},
        {"last face turned", build([](Faces& faces) { std::reverse(faces.back().begin(), faces.back().end()); }),
            {67'500, 0, 0, 3, 0, 5, 1, kNone}},
        {"last face twice", build([](Faces& faces) { faces.push_back(faces.back()); }),
            {67'500, 0, 3, 3, 0, 5, 1, kNone}},
        {"far points merged", build(merge(11'300)), {67'500, 0, 0, 0, 1, 6, 1, kNone}},
        {"with two pentagons", build([](Faces& faces) {
             faces.push_back({22'500, 22'501, 22'502, 22'503, 22'504});
             faces.emplace_back(faces.back().rbegin(), faces.back().rend());
         }),
            {67'505, 0, 0, 0, 0, 0, 2, 1}},
        {"with an edge", build([](Faces& faces) {
             faces.insert(faces.begin(), {0, 22'500});
         }),
            {67'500, 0, 0, 0, 0, 4, 1, kNone}},
    };
    for (Case const& c : cases)
        for (int const threads : {1, 8})
            EXPECT_EQ(TestSupport::withThreads(threads, [&] { return countsOf(c.mesh); }), c.expected) << c.name;
}

TEST(MeshTopology, CountsFacesByCorners)
{
    Mesh const mesh = meshOf(6, {{}, {0, 1, 2}, {0, 1, 2, 3}, {0}, {0, 1, 2, 3, 4}, {5, 1, 5, 2}, {2, 2, 2}});
    MeshTopology const t = analyzeTopology(arraysOf(*mesh));
    std::uint64_t const found[] = {t.triangleCount, t.quads.count, t.quads.first, t.polygons.count, t.polygons.first,
        t.facesBelowThreeCorners.count, t.facesWithRepeatedPoints.count, t.facesWithRepeatedPoints.first};
    EXPECT_THAT(found, ElementsAre(2, 2, 2, 1, 4, 2, 2, 5));
}

TEST(MeshTopology, CountsTrianglesWithRepeatedPointsOnce)
{
    for (std::vector<unsigned int> const& triangle :
        {std::vector<unsigned int>{4, 4, 5}, {4, 5, 4}, {5, 4, 4}, {4, 4, 4}}) {
        Faces faces = kTetrahedron;
        faces.push_back(triangle);
        Mesh const mesh = meshOf(6, faces);
        Finding const found = analyzeTopology(arraysOf(*mesh)).facesWithRepeatedPoints;
        EXPECT_EQ(found.count, 1);
        EXPECT_EQ(found.first, 4);
    }
}

TEST(MeshTopology, ConnectsAnyNumberOfFacesAtAPoint)
{
    for (unsigned int const count : {3u, 7u, 8u, 9u, 10u, 16u, 17u, 40u}) {
        Faces faces; // of a double pyramid with apexes 0 and 1
        for (unsigned int i = 0; i != count; ++i) {
            unsigned int const a = 2 + i, b = 2 + (i + 1) % count;
            faces.push_back({0, a, b});
            faces.push_back({1, b, a});
        }
        Mesh const mesh = meshOf(2 + count, faces);
        MeshTopology const closed = analyzeTopology(arraysOf(*mesh));
        EXPECT_TRUE(closed.isClosedManifold()) << count;
        EXPECT_EQ(closed.edgeCount, 3 * count);
        faces.pop_back();
        Mesh const open = meshOf(2 + count, faces);
        EXPECT_EQ(analyzeTopology(arraysOf(*open)).boundaryEdges.count, 3) << count;
    }
}

TEST(MeshRequirements, NamesFaultsWithTheirFirstOccurrence)
{
    auto const faultsOf = [](Mesh const& mesh) {
        MeshArrays const arrays = arraysOf(*mesh);
        MeshTopology const topology = analyzeTopology(arrays);
        std::vector<std::string> faults = faultsOfTriangles(arrays, topology);
        for (std::string const& fault : faultsOfClosedManifold(arrays, topology))
            faults.push_back(fault);
        return faults;
    };
    Faces open = kTetrahedron;
    open[1] = {};
    EXPECT_THAT(faultsOf(meshOf(4, kTetrahedron)), ElementsAre());
    EXPECT_THAT(faultsOf(meshOf(4, open)),
        ElementsAre(HasSubstr("1 face has fewer than three corners. The first is face 1."),
            HasSubstr(
                "3 of 6 edges are boundary edges: they belong to one face only. The first is the edge of face 0 from "
                "point 1 at (1, 0.5, 0) to point 0 at (0, 0.5, 0). Fill the holes first (modeling repair --only "
                "fill).")));
    EXPECT_THAT(faultsOf(meshOf(3, {{0, 1, 2}, {0, 1, 2}})),
        ElementsAre(
            HasSubstr("At 3 edges neighboring faces have opposite orientations. The first is the edge of face 0 "
                      "from point 0")));
    EXPECT_THAT(faultsOf(meshOf(8, {{0, 1, 2, 3}, {0, 3, 2, 1}, {0, 4, 5, 6, 7}, {0, 7, 6, 5, 4}})),
        ElementsAre(HasSubstr("4 faces have more than three corners. The first is face 0 with 4."),
            HasSubstr("non-manifold at 1 point: some faces there share only the point. The first is point 0 at (0, ")));
}

}
